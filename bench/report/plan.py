"""How much is measured: all of it, or as much as a minute allows."""
import dataclasses


@dataclasses.dataclass(frozen=True)
class Plan:
    flood_reports: int = 1_000_000
    probe_seconds: float = 4
    probes: int = 10             # about as many as are needed; for the progress bar
    confirm_seconds: float = 20
    lag: float = 0.05            # the last row may come this part of the run's time after the last report
    tries: int = 2               # at each rate: only a loss that happens again is the subject's fault
    exactness: float = 1.05      # the search ends when the rates without and with loss are this close
    searched: tuple = ("service", "analytics", "daemon", "bare")
    latency_seconds: float = 20
    latency_rates: tuple = (10, 100, 1_000, 20_000)
    baselines: tuple = (  # commit after, rows
        ("1", 100_000), ("1000", 1_000_000), ("1000 prepared", 1_000_000))
    rows_before: tuple = (0, 1_000_000, 5_000_000)
    growth_reports: int = 500_000
    growth_rounds: int = 3       # all sizes in turn, so that a disturbance affects each; the median counts
    queued_reports: int = 1_000_000
    rest_seconds: float = 10
    repetitions: int = 5         # of the benchmarks of single parts; the smallest result counts
    repetition_seconds: float = 0.5
    syncs_disk: bool = True      # before each run; it takes long while other programs write


FULL = Plan()

QUICK = Plan(flood_reports=50_000, probe_seconds=0.5, probes=3, tries=1, confirm_seconds=0.5, exactness=4,
             searched=("service", "daemon"), latency_seconds=1, latency_rates=(10, 20_000),
             baselines=(("1", 2_000), ("1000", 50_000), ("1000 prepared", 50_000)), rows_before=(0, 50_000),
             growth_reports=50_000, growth_rounds=1, queued_reports=30_000, rest_seconds=1, repetitions=1,
             repetition_seconds=0.02, syncs_disk=False)
