"""Reports that wait in the queue while another program holds the store's write lock, and what happens when it
lets go: the one way to fill the queue of the real program, and to see its consuming thread work without
sender and receiver."""
import sqlite3
import time

import procfs
import runs

# Fast enough to queue a million reports before the plug-in gives up waiting for the lock (docs/Database.md).
RATE = 100_000


def measure(subject_class, reports):
    with subject_class() as subject:
        pid = subject.process.pid
        udp, before = procfs.udp_counters(), procfs.memory_bytes(pid, "VmRSS")
        lock = sqlite3.connect(subject.database(), isolation_level=None)
        lock.execute("begin immediate")
        sender = runs.send(subject, reports, RATE)
        while procfs.waiting_bytes():
            time.sleep(0.01)
        memory = procfs.memory_bytes(pid, "VmRSS") - before
        cpu, last_write = procfs.thread_ns(pid), subject.last_write_ns()
        lock.execute("rollback")
        lock.close()
        begin = _first_write_after(subject, last_write)
        runs.settle(subject)
        held = procfs.memory_bytes(pid, "VmRSS") - before
        received = procfs.udp_counters()["InDatagrams"] - udp["InDatagrams"]
        stored, seconds = subject.stored(), (subject.last_write_ns() - begin) / 1e9
        return {"sent": sender["sent"], "queued": received, "stored": stored,
                "bytes_per_item": memory / received, "held_bytes": held, "rows_per_second": stored / seconds,
                "storing_cpu_ns": _busiest(pid, cpu) / stored}


def _first_write_after(subject, last_write):
    while subject.last_write_ns() == last_write:
        time.sleep(0.0005)
    return subject.last_write_ns()


def _busiest(pid, before):
    return max(ns - before.get(thread, 0) for thread, ns in procfs.thread_ns(pid).items())
