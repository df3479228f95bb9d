"""Where the report goes: to files of the build, and on request into docs/Performance.md and beside it."""
import json
import re

import chart
import measures
import tables
from subject import ROOT

FOLDER = ROOT / "build/bench"
PAGE = ROOT / "docs/Performance.md"


def text(report):
    return "\n\n".join(tables.sections(report).values()) + "\n"


def write(report, folder=FOLDER):
    """A quick or partial run does not take the place of a full one."""
    name = "performance" if is_full(report) else "quick" if report["quick"] else "part"
    folder.mkdir(parents=True, exist_ok=True)
    (folder / f"{name}.json").write_text(json.dumps(report, indent=1) + "\n")
    results = report["results"]
    if "rates" in results:
        (folder / f"{name}.svg").write_text(chart.draw(results["rates"], results.get("floods", {})))


def is_full(report):
    """Every measure, of every subject."""
    results = report["results"]
    return not report["quick"] and all(subject in results.get(name, {})
                                       for name, (subjects, *_) in measures.MEASURES.items()
                                       for subject in subjects)


def update_page(report):
    """The text between the page's marks. All of it or nothing: a page with figures of two runs would lie."""
    if not is_full(report):
        raise SystemExit(f"{PAGE.name} takes the figures of a full run only")
    page, written = PAGE.read_text(), tables.sections(report)
    for name in re.findall(r"<!-- figures: (\w+) -->", page):
        page = re.sub(rf"(<!-- figures: {name} -->\n).*?(<!-- end -->)",
                      lambda mark: f"{mark[1]}\n{written[name]}\n\n{mark[2]}", page, flags=re.DOTALL)
    PAGE.write_text(page)
    write(report, PAGE.parent)
