"""Where the report goes: to files of the build, and on request into docs/Performance.md and beside it."""
import json
import re

import chart
import tables
from subjects import ROOT

FOLDER = ROOT / "build/bench"
PAGE = ROOT / "docs/Performance.md"


def text(report):
    return "\n\n".join(tables.sections(report).values()) + "\n"


def write(report, folder=FOLDER, name="performance"):
    folder.mkdir(parents=True, exist_ok=True)
    (folder / f"{name}.json").write_text(json.dumps(report, indent=1) + "\n")
    if "rates" in report["results"]:
        (folder / f"{name}.svg").write_text(chart.draw(report["results"]["rates"]))


def update_page(report):
    """The text between the page's marks. Every section must be there: a page with figures of two runs would lie."""
    page, written = PAGE.read_text(), tables.sections(report)
    for name in re.findall(r"<!-- figures: (\w+) -->", page):
        if name not in written:
            raise SystemExit(f"{PAGE.name} shows '{name}', which this run did not measure")
        page = re.sub(rf"(<!-- figures: {name} -->\n).*?(<!-- end -->)",
                      lambda mark: f"{mark[1]}\n{written[name]}\n\n{mark[2]}", page, flags=re.DOTALL)
    PAGE.write_text(page)
    write(report, PAGE.parent)
