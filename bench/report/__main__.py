"""Measures the service from end to end beside its bounds and another daemon. Prints the report as Markdown,
and leaves it as JSON, with a chart, in build/bench/."""
import argparse
import json
import pathlib
import signal
import sys

import machine
import measures
import output
import plan
import progress
import subjects
from subject import Subject


def arguments():
    parser = argparse.ArgumentParser(prog="bench/run", description=__doc__)
    parser.add_argument("--quick", action="store_true", help="in about a minute, for a look")
    parser.add_argument("--only", action="append", choices=measures.MEASURES,
                        help="this measure; may be repeated")
    parser.add_argument("--of", action="append", choices=[*measures.SUBJECTS, "sqlite"],
                        help="of this one only")
    parser.add_argument("--update-docs", action="store_true",
                        help="write the figures into docs/Performance.md")
    parser.add_argument("--from", dest="file", type=pathlib.Path,
                        help="measure nothing: the report of this JSON file")
    parser.add_argument("--install", action="store_true",
                        help="first install the packages of the other daemon, which "
                        "Debian then also runs as the system's log daemon; bench/run leaves that one alone")
    return parser.parse_args()


def measured(options):
    chosen = plan.QUICK if options.quick else plan.FULL
    Subject.syncs_disk = chosen.syncs_disk
    steps = list(measures.steps(chosen, options.only, options.of))
    if not subjects.Daemon.is_installed():
        print("syslog-ng is left out; bench/run --install installs it.\n")
        steps = [step for step in steps if step[2] != "daemon"]
    report = {"quick": options.quick, "machine": machine.describe(), "results": {}}
    bar = progress.Progress({name: seconds for name, _, _, seconds in steps})
    for name, measure, subject, _ in steps:
        with bar.step(name):
            result = measures.MEASURES[measure][2](subject, chosen, bar.tell)
            report["results"].setdefault(measure, {})[subject] = result
    bar.finish()
    return json.loads(json.dumps(report))  # keys become texts, as when it is read from a file


def main():
    # This also ends the programs that it has started.
    options = arguments()
    signal.signal(signal.SIGTERM, lambda *_: sys.exit("ended by a signal"))
    report = json.loads(options.file.read_text()) if options.file else measured(options)
    output.write(report)
    print(output.text(report))
    if options.update_docs:
        output.update_page(report)


if __name__ == "__main__":
    main()
