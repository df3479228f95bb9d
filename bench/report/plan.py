"""How much is measured: all of it, or as much as a minute allows."""
import dataclasses


@dataclasses.dataclass(frozen=True)
class Plan:
    flood_reports: int = 1_000_000
    probe_seconds: float = 4
    confirm_seconds: float = 20
    exactness: float = 1.05      # the search ends when the last rate without loss and the first with one are so close
    latency_seconds: float = 20
    latency_rates: tuple = (100, 1_000, 20_000)
    baseline_rows: tuple = ((1, 100_000), (1000, 1_000_000))  # rows to a commit, rows
    rows_before: tuple = (0, 1_000_000, 5_000_000)
    growth_reports: int = 500_000
    growth_rounds: int = 3       # in turn, so that a disturbance meets all sizes; the median counts
    queued_reports: int = 1_000_000
    rest_seconds: float = 10


FULL = Plan()

QUICK = Plan(flood_reports=100_000, probe_seconds=1, confirm_seconds=2, exactness=1.5, latency_seconds=2,
             latency_rates=(100, 20_000), baseline_rows=((1, 10_000), (1000, 100_000)), rows_before=(0, 100_000),
             growth_reports=50_000, growth_rounds=1, queued_reports=100_000, rest_seconds=2)
