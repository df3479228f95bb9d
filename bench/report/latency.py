"""From the moment before a report is sent to the moment when another program sees its row."""
import array
import json
import math
import subprocess

import runs
from subject import PROGRAMS


def measure(subject_class, rate, seconds):
    count = int(rate * seconds)
    with subject_class() as subject:
        sent, seen = subject.directory / "sent", subject.directory / "seen"
        watcher = subprocess.Popen([PROGRAMS / "bench_watcher", subject.database(), "--query", subject.watch,
                                    "--stamps", seen, "--count", str(count)], stdout=subprocess.PIPE,
                                   text=True)
        try:
            watcher.stdout.readline()  # its first line says that it watches
            sender = runs.send(subject, count, rate, sent)
            watched = json.loads(watcher.communicate()[0])
        finally:
            watcher.kill()  # no effect when it has ended
            watcher.wait()
        return {"rate": rate, "offered": count / sender["seconds"], "sent": count, "seen": watched["found"],
                "look_ms_p50": watched["gap_ns_p50"] / 1e6, "look_ms_p99": watched["gap_ns_p99"] / 1e6,
                **_figures(_stamps(sent), _stamps(seen))}


def _stamps(file):
    stamps = array.array("q")
    stamps.frombytes(file.read_bytes())
    return stamps


def _figures(sent, seen):
    waits = sorted((end - begin) / 1e6 for begin, end in zip(sent, seen) if end)
    return {"p50_ms": quantile(waits, 0.5), "p99_ms": quantile(waits, 0.99),
            "max_ms": waits[-1] if waits else None}


def quantile(ordered, part):
    """The smallest value that so large a part of all are not above."""
    return ordered[max(0, math.ceil(len(ordered) * part) - 1)] if ordered else None
