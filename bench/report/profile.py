"""Where the service's threads spend their time while reports come."""
import argparse
import collections
import re
import signal
import subprocess

import measures
import runs

SECONDS = 5
LEAST_PART = 0.03     # of a thread's samples; functions with fewer are left out
LEAST_SAMPLES = 100   # a thread with fewer did almost nothing
# The functions that our code calls. Functions inside the libraries and the kernel are left out.
TOLD = re.compile(r"(UDPServer|SyncServiceReport|BoostLogger|OrvekSqlite|Metrik|SystemTool|Poco"
                  r"|fmt::v\d+::vformat|boost::(log|basic_format)|sqlite3_(step|exec|prepare|bind|wal)"
                  r"|rapidjson::GenericReader|do_syscall_64|__x64_sys_)")


def samples(record):
    """The thread and the functions of each sample, innermost first."""
    script = subprocess.run(["perf", "script", "-i", record, "-F", "tid,ip,sym"], capture_output=True,
                            text=True, check=True).stdout
    for sample in script.split("\n\n"):
        thread, *frames = sample.strip().split("\n")
        if frames:
            yield int(thread), {re.sub(r"[(<].*", "", frame.strip().partition(" ")[2]) for frame in frames}


def recorded(subject, record, rate):
    """Call stacks of 4 KiB, unwound by the debug information: the frame pointers are left out in what
    ships."""
    with subprocess.Popen(["perf", "record", "--call-graph", "dwarf,4096", "-F", "997", "-o", record,
                           "-p", str(subject.process.pid)], stderr=subprocess.DEVNULL) as perf:
        try:
            runs.send(subject, int(rate * SECONDS), rate)
            runs.settle(subject)
        finally:
            perf.send_signal(signal.SIGINT)
    return samples(record)


def arguments():
    parser = argparse.ArgumentParser(prog="bench/profile", description=__doc__)
    parser.add_argument("rate", nargs="?", type=int, default=100_000, help="reports a second")
    parser.add_argument("--of", choices=measures.STORES, default="service", help="where the reports go")
    return parser.parse_args()


def main():
    options = arguments()
    with measures.SUBJECTS[options.of]() as subject:
        total, found = collections.Counter(), collections.Counter()
        for thread, functions in recorded(subject, subject.directory / "perf.data", options.rate):
            total[thread] += 1
            found.update((thread, function) for function in functions if TOLD.match(function))
    for thread, count in total.most_common():
        if count < LEAST_SAMPLES:
            break
        print(f"thread {thread}{' (receiving)' if thread == subject.receiver else ''}: {count} samples")
        for (of, function), times in found.most_common():
            if of == thread and times >= LEAST_PART * count:
                print(f"  {times / count:5.1%}  {function}")


if __name__ == "__main__":
    main()
