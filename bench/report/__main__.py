"""The driver of bench/run: measures, and writes the report."""
import argparse
import json

import measures
import plan
import progress
import subjects


def arguments():
    parser = argparse.ArgumentParser(prog="bench/run", description=__doc__)
    parser.add_argument("--quick", action="store_true", help="about a minute, with figures to match")
    parser.add_argument("--only", action="append", choices=measures.MEASURES, help="this measure; may be repeated")
    parser.add_argument("--of", action="append", help="of this subject only; may be repeated")
    return parser.parse_args()


def main():
    options = arguments()
    chosen = plan.QUICK if options.quick else plan.FULL
    steps = [step for step in measures.steps(chosen, options.only, options.of)
             if step[2] != "daemon" or subjects.Daemon.is_installed()]
    bar = progress.Progress({name: seconds for name, _, _, seconds in steps})
    results = {}
    for name, measure, subject, _ in steps:
        with bar.step(name):
            results.setdefault(measure, {})[subject] = measures.MEASURES[measure][2](subject, chosen, bar.tell)
    bar.finish()
    print(json.dumps(results, indent=1))


if __name__ == "__main__":
    main()
