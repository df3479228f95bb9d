"""What the service is to reach, each against a figure of the same run."""
from collections.abc import Callable
from typing import NamedTuple


class Target(NamedTuple):
    text: str
    limit: float
    at_least: bool
    value: Callable  # gets the results; None or KeyError when a part of them is missing
    unit: str = "×"


class Verdict(NamedTuple):
    text: str
    limit: str
    measured: str
    reached: bool | None  # None: not measured


def _rate(results, subject):
    return results["rates"][subject]["confirmed"]["offered"]


def _receiving_ratio(results):
    """Against the cheapest that the bare loop was seen to be: it varies with how often it has to wait."""
    bare = [results["floods"]["bare"]["cpu"]["receiving"]]
    confirmed = results.get("rates", {}).get("bare", {}).get("confirmed")
    bare += [confirmed["cpu"]["receiving"]] if confirmed else []
    return results["floods"]["service"]["cpu"]["receiving"] / min(bare)


def _storing_ratio(results):
    stored = results["floods"]["service"]
    per_row = stored["cpu"]["storing"] * stored["received"] / stored["stored"]
    return per_row / results["baselines"]["sqlite"]["1000"]["cpu_ns"]


def _floor_ratio(results):
    return sum(results["floods"]["service"]["cpu"].values()) / sum(results["floor"]["service"].values())


def _event_ratio(results):
    flood = results["floods"]["analytics"]
    per_event = flood["cpu"]["storing"] * flood["received"] / flood["stored"]
    return per_event / results["baselines"]["sqlite"]["1"]["cpu_ns"]


def _growth_ratio(results):
    sizes = results["growth"]["service"]
    return sizes[max(sizes, key=int)]["rows_per_second"] / sizes["0"]["rows_per_second"]


def _lone_p99(results):
    return min(results["latencies"]["service"], key=lambda run: run["rate"])["p99_ms"]


TARGETS = (
    Target("highest rate without loss, against the tuned daemon", 2.5, True,
           lambda r: _rate(r, "service") / _rate(r, "daemon")),
    Target("rows a second of a flood, against the tuned daemon", 2.5, True,
           lambda r: r["floods"]["service"]["rows_per_second"] / r["floods"]["daemon"]["rows_per_second"]),
    Target("reports of a flood that were lost between socket and table", 0, False,
           lambda r: r["floods"]["service"]["lost_after"], ""),
    Target("receiving thread's processor time for a datagram and its log record in a flood, "
           "against a bare recvfrom loop",
           2.5, False, _receiving_ratio),
    Target("storing thread's processor time for a row, against bare SQLite with 1,000 rows to a commit", 2,
           False, _storing_ratio),
    Target("whole processor time for a report in a flood, against the floor", 1.5, False, _floor_ratio),
    Target("an event's processor time on the storing thread, against bare SQLite with 1 row to a commit", 1.5,
           False, _event_ratio),
    Target("memory at rest, without a collector", 8, False,
           lambda r: r["rest"]["service"]["resident_bytes"] / 2**20, " MiB"),
    Target("rows a second into the largest table, against an empty one", 0.9, True, _growth_ratio),
    Target("memory of a queued report of 180 bytes", 400, False,
           lambda r: r["queue"]["service"]["bytes_per_item"], " bytes"),
    Target("counting a report in the ledger", 20, False, lambda r: r["ledger"]["service"]["CountedReport"],
           " ns"),
    Target("latency of a report that comes alone, 99 of 100", 5, False, _lone_p99, " ms"),
)


def verdicts(results):
    return [_verdict(target, results) for target in TARGETS]


def _verdict(target, results):
    limit = f"{'at least' if target.at_least else 'at most'} {target.limit:g}{target.unit}"
    try:
        value = target.value(results)
    except (KeyError, TypeError):  # a part was not measured, or there was no rate without loss
        return Verdict(target.text, limit, "not measured", None)
    reached = value >= target.limit if target.at_least else value <= target.limit
    return Verdict(target.text, limit, f"{value:,.4g}{target.unit}", reached)
