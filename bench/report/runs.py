"""One run: a number of reports at one rate into a subject that was just started, and where each of them
ended."""
import json
import subprocess
import time

import procfs
from subject import PROGRAMS

LONGEST_SETTLING = 600.0   # seconds: enough for a million rows at 2,000 a second


def send(subject, count, rate=0, stamps=None):
    """Returns what the sender says of itself. Rate 0 is as fast as it goes."""
    command = [PROGRAMS / "bench_sender", "--count", str(count), "--rate", str(rate), "--event",
               subject.event]
    if stamps:
        command += ["--stamps", stamps]
    return json.loads(subprocess.run(command, capture_output=True, text=True, check=True).stdout)


def settle(subject):
    """Until the subject has had nothing to do for as long as it may pause: no write, no datagram, no work."""
    pid = subject.process.pid
    calm_since, last, worked = time.monotonic(), None, 0
    deadline = calm_since + LONGEST_SETTLING
    while time.monotonic() < deadline:
        work = sum(procfs.thread_ns(pid).values())
        state = subject.last_write_ns()
        busy = state != last or work - worked > 10e6 or procfs.waiting_bytes() or procfs.waits_for_disk(pid)
        if busy:
            calm_since, last, worked = time.monotonic(), state, work
        elif time.monotonic() - calm_since >= subject.longest_pause:
            return
        time.sleep(0.05)
    raise SystemExit(f"{subject.title}: still busy after {LONGEST_SETTLING:.0f} seconds")


def measure(subject_class, count, rate=0):
    """A dictionary of plain numbers. `subject_class` is a class or a function that makes a subject."""
    with subject_class() as subject:
        pid = subject.process.pid
        udp, cpu = procfs.udp_counters(), procfs.thread_ns(pid)
        sender = send(subject, count, rate)
        settle(subject)
        last_write = subject.last_write_ns()
        cpu_after = procfs.thread_ns(pid)
        used = {thread: ns - cpu.get(thread, 0) for thread, ns in cpu_after.items()}
        udp_after = procfs.udp_counters()
        run = {"rate": rate, "sent": sender["sent"], "offered": sender["sent"] / sender["seconds"],
               "seconds": sender["seconds"], "sender_cpu_ns": sender["cpu_ns"] / sender["sent"],
               "received": udp_after["InDatagrams"] - udp["InDatagrams"],
               "kernel_lost": udp_after["RcvbufErrors"] - udp["RcvbufErrors"],
               "socket_buffer": procfs.socket_buffer_bytes(), "peak_bytes": procfs.memory_bytes(pid)}
        run["stored"] = subject.stored()
        run["refused"] = subject.refused()
        run["last_row"] = (last_write - sender["begin_unix_ns"]) / 1e9 if last_write else None
        run["lag"] = max(0.0, run["last_row"] - run["seconds"]) if last_write else 0.0
        run["cpu"] = _per_thread(used, subject.receiver, run["received"])
        return run | _losses(run)


def _per_thread(used, receiver, received):
    """Nanoseconds per received datagram: of the receiving thread, of the busiest other, of the rest."""
    others = sorted((ns for thread, ns in used.items() if thread != receiver), reverse=True)
    parts = {"receiving": used[receiver], "storing": others[0] if others else 0, "others": sum(others[1:])}
    return {name: ns / max(received, 1) for name, ns in parts.items()}


def _losses(run):
    """Each report that is no row was lost at one of three places; the namespace has no other datagrams. The
    first, between the sender and what the kernel counts, should lose none."""
    kept = run["received"] if run["stored"] is None else run["stored"]
    return {"lost_before": run["sent"] - run["received"] - run["kernel_lost"],
            "lost_after": run["received"] - kept,
            "lost": run["sent"] - kept, "rows_per_second": kept / (run["last_row"] or run["seconds"])}
