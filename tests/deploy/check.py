#!/usr/bin/env python3
"""check.py PROGRAMS MODULES SERVER: what tests/clickhouse runs in its sandbox.

Starts the service in PROGRAMS twice, sends it events, takes what it sends to a collector, and writes that
into the tables of deploy/clickhouse/ in two engines. Then the tables and the five queries must show what was
sent.
"""
import json
import pathlib
import sys
import tempfile
import time

import configs
import engines
import fleet
import lua
import rows
import tables
from checks import expect
from collector import REJECTED_EVENT, Collector
from expected import Expected

COLLECTOR_PORT = 4318
ENVIRONMENT = "deployment.environment.name"


def distinct(collector, name):
    """How many different events of an installation the collector has."""
    with collector.lock:
        every = [row for batch in collector.batches for row in batch]
    mine = [row for row in every if row["ResourceAttributes"].get(ENVIRONMENT) == name]
    return len({row["LogAttributes"]["log.record.uid"] for row in mine})


def run_installation(name, use, programs, directory, collector, now_ms):
    """Lets an installation send what `use` says, until the collector has it, and then the rows of its store.
    Returns the events that were sent, the rows, and an export of the rows."""
    collector.loses_next_answer = True
    before = collector.rejected
    installation = fleet.Installation(
        name, programs, directory / name, f"http://127.0.0.1:{COLLECTOR_PORT}"
    )
    try:
        use(installation, now_ms)
        bad = sum(event.event == REJECTED_EVENT for event in installation.sent)
        good = len(installation.sent) - bad
        fleet.until(f"the events of {name}", lambda: distinct(collector, name) == good)
        fleet.until(f"the rejected events of {name}", lambda: collector.rejected - before == bad)
        installation.reportctl("outbox", "test")
        fleet.until("the last row", lambda: fleet.LAST_ROW in installation.reportctl("export"))
        collector.loses_next_answer = True
        installation.reportctl("forward", "--once")
        return installation.sent, installation.stored, installation.reportctl("export", "--format", "jsonl")
    finally:
        installation.stop()


def check_script(collector):
    """The script of fluent-bit makes the rows that the collector writes; returns them."""
    records = [record for request in collector.requests for record in rows.records(request)]
    made = lua.run(tables.DEPLOY / "fluent-bit/otel_logs.lua", records)
    for record, row in zip(records, made):
        row = dict(row)
        expected = {name: value for name, value in rows.row(*record).items() if value not in ("", {}, 0)}
        expected["SeverityNumber"] = str(expected["SeverityNumber"])
        expected["Body"], row["Body"] = json.loads(expected["Body"]), json.loads(row["Body"])
        expect("the row that fluent-bit's script makes", row, expected)
    return made


def main():
    programs, modules, server = (pathlib.Path(argument).resolve() for argument in sys.argv[1:])
    now_ms = time.time_ns() // 1_000_000
    configs.check(tables.DEPLOY, expect)
    collector = Collector(COLLECTOR_PORT)
    sent, stored, exports = [], [], {}
    with tempfile.TemporaryDirectory() as name:
        directory = pathlib.Path(name)
        for source, use in (("office", fleet.use_office), ("home", fleet.use_home)):
            events, lines, exports[source] = run_installation(
                source, use, programs, directory, collector, now_ms
            )
            sent += events
            stored += lines
        expect("what the collector complains of", collector.complaints, [])
        made = check_script(collector)
        truth = Expected(sent, stored, now_ms)
        tables.check(engines.Current(modules), collector, truth, exports, made)
        tables.check(engines.Old(server, directory), collector, truth, exports, made)
    print(f"{expect.passed} passed, {expect.failed} failed")
    return 1 if expect.failed else 0


if __name__ == "__main__":
    sys.exit(main())
