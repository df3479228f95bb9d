"""Each measure: what it is measured of, about how long one takes, and how."""
import json
import statistics
import subprocess
import time

import backlog
import latency
import procfs
import runs
import search
import subjects
import tables
from subject import PROGRAMS

SUBJECTS = {subject.name: subject for subject in
            (subjects.Service, subjects.Analytics, subjects.Daemon, subjects.BareReceiver)}
STORES = ("service", "analytics")


def flood(subject, plan, _):
    return runs.measure(SUBJECTS[subject], plan.flood_reports)


def rate(subject, plan, tell):
    return search.highest_rate(SUBJECTS[subject], plan, tell)


def latencies(subject, plan, tell):
    result = []
    for per_second in plan.latency_rates:
        tell(f"{per_second:,}/s")
        result.append(latency.measure(SUBJECTS[subject], per_second, plan.latency_seconds))
    return result


def bare_sqlite(_, plan, tell):
    """Into a store as reportctl makes it, the service's own program being left out."""
    result = {}
    for kind, rows in plan.baselines:
        tell(tables.baseline(kind))
        rows_per_commit, _, prepared = kind.partition(" ")
        with subjects.EmptyStore() as store:
            run = _inserted(store, rows, rows_per_commit, prepared)
        result[kind] = {"rows_per_second": run["rows"] / run["seconds"],
                        "cpu_ns": run["cpu_ns"] / run["rows"]}
    return result


def _inserted(store, rows, rows_per_commit, prepared):
    command = [PROGRAMS / "bench_inserter", store.database(), "--rows", str(rows), "--rows-per-commit",
               rows_per_commit, *(["--prepared"] if prepared else [])]
    return json.loads(subprocess.run(command, capture_output=True, text=True, check=True).stdout)


def growth(_, plan, tell):
    """All sizes in turn, several times, so that a disturbance meets all of them; the median counts."""
    rounds = []
    for number in range(plan.growth_rounds):
        for rows in plan.rows_before:
            tell(f"round {number + 1}, {rows:,} rows before")
            rounds.append({"rows_before": rows,
                           **backlog.measure(lambda: subjects.FilledService(rows), plan.growth_reports)})
    return {rows: _median([run for run in rounds if run["rows_before"] == rows]) for rows in plan.rows_before}


def _median(runs_of_a_size):
    return {name: statistics.median(run[name] for run in runs_of_a_size) for name in runs_of_a_size[0]}


def queue(_, plan, tell):
    """In the real program; then the queue's own part, in a program without sockets and database."""
    full = backlog.measure(subjects.Service, plan.queued_reports)
    tell("the queue alone")
    full["item_ns"] = {name.split("/")[1]: ns
                       for name, ns in _item_ns(plan, "poco_tasker_bench", "^Item/").items()}
    return full


def floor(_, plan, tell):
    """The processor time that each part of a report's way needs at least, in nanoseconds. Each part is
    measured here, in the same run. A receive takes longer when it has to wait for the next datagram, so the
    shortest time of three floods counts."""
    tell("a bare receive")
    received = min(runs.measure(subjects.BareReceiver, plan.flood_reports)["cpu"]["receiving"]
                   for _ in range(3))
    tell("bare inserts")
    with subjects.EmptyStore() as store:
        rows = plan.baselines[-1][1]
        insert = _inserted(store, rows, "1000", True)["cpu_ns"] / rows
    tell("a bare write, parse and queue")
    return {"receive": received, "insert": insert,
            **{part.split("/")[0].lower(): ns for part, ns in _item_ns(plan, "floor_bench", ".").items()}}


def ledger(_, plan, __):
    """What the two threads count of a report, alone; and its way through the queue, counted and not."""
    return _item_ns(plan, "ledger_bench", "^(Counted|Queued)")


def _item_ns(plan, program, names):
    """Processor time for an item of each benchmark of these names: the least of all tries; a disturbance
    makes it longer."""
    command = [PROGRAMS / program, f"--benchmark_filter={names}", "--benchmark_format=json",
               f"--benchmark_repetitions={plan.repetitions}",
               f"--benchmark_min_time={plan.repetition_seconds}"]
    report = json.loads(subprocess.run(command, capture_output=True, text=True, check=True).stdout)
    times = {}
    for run in report["benchmarks"]:
        if run["run_type"] == "iteration":
            times.setdefault(run["run_name"], []).append(1e9 / run["items_per_second"])
    return {name: min(found) for name, found in times.items()}


def rest(_, plan, __):
    """While no program sends anything."""
    with subjects.Service() as service:
        before = sum(procfs.thread_ns(service.process.pid).values())
        time.sleep(plan.rest_seconds)
        used = sum(procfs.thread_ns(service.process.pid).values()) - before
        return {"ready_ms": service.ready_seconds * 1000, "core_part": used / 1e9 / plan.rest_seconds,
                "resident_bytes": procfs.memory_bytes(service.process.pid, "VmRSS")}


MEASURES = {  # name: the subjects, the seconds for one subject, the function
    "rest": (("service",), lambda plan: plan.rest_seconds, rest),
    "baselines": (("sqlite",), lambda plan: sum(rows for _, rows in plan.baselines) / 1e5, bare_sqlite),
    "floods": (tuple(SUBJECTS), lambda plan: plan.flood_reports / 60_000 + 2, flood),
    "rates": (tuple(SUBJECTS), lambda plan: plan.probes * (plan.probe_seconds + 2) + plan.confirm_seconds + 2,
              rate),
    "latencies": (STORES, lambda plan: len(plan.latency_rates) * (plan.latency_seconds + 1), latencies),
    "queue": (("service",), lambda plan: plan.queued_reports / 40_000 + 5, queue),
    "ledger": (("service",), lambda plan: 20, ledger),
    "floor": (("service",), lambda plan: plan.flood_reports / 60_000 + 15, floor),
    "growth": (("service",), lambda plan: plan.growth_rounds * (sum(plan.rows_before) / 3e5
               + len(plan.rows_before) * (plan.growth_reports / 40_000 + 2)), growth),
}


def steps(plan, only, wanted):
    """Name of the step, measure, subject, seconds."""
    for name, (subjects_of, seconds, _) in MEASURES.items():
        for subject in subjects_of:
            left_out = name == "rates" and subject not in plan.searched
            if (not only or name in only) and (not wanted or subject in wanted) and not left_out:
                yield f"{name}: {subject}", name, subject, seconds(plan)
