"""What the tables of deploy/clickhouse/ show in an engine that got the collector's rows."""
import itertools
import json
import subprocess
import time

import configs
import engines
import fleet
from broker import Broker
from checks import expect
from expected import body_of

DEPLOY = fleet.ROOT / "deploy"
WIDE_COLUMNS = ["module", "event", "user", "suite_version", "milliseconds", "sequence", "os", "data", "body"]
TOPIC = "hublink.rows"
TOPIC_SECONDS = 120  # a first reader waits some 20 for its partitions
STORE_UID = "2c8f9a52-5f7a-5d6e-9b0a-0c3b5a1d7e42"
# For the old engine, which takes a list or an object only as a text. docs/Analytics.md has the same.
VALUE_AS_TEXT = '.value |= (if type == "object" or type == "array" then tojson else . end)'


def copies(number):
    """How often the batch of that number is delivered."""
    return 1 + number % 2


def load(engine, collector):
    """Writes what the collector has, with the test events of `reportctl`; every other batch twice; a record
    of another program; and a row of a local store, twice."""
    for statement in 2 * engines.statements(DEPLOY / "clickhouse" / engine.tables):
        engine.run(statement)
    for number, batch in enumerate(collector.batches):
        for _ in range(copies(number)):
            engine.insert_rows(batch)
    foreign = {**collector.batches[0][0], "ResourceAttributes": {"service.name": "another program"}}
    engine.insert_rows([foreign, *store_row_twice(collector.batches[0][0])])


def store_row_twice(row):
    """A row of a local store without a time of its own: it has the time of each sending."""
    attributes = {
        "log.record.uid": STORE_UID,
        "hublink.source": "store",
        "hublink.row": "17",
        "metrik.event": "started",
        "metrik.data.mark": "17",
    }
    sent = ("2025-11-30 23:59:59.000000000", "2025-12-01 00:00:01.000000000")
    return [{**row, "Timestamp": time, "LogAttributes": attributes} for time in sent]


def wide_table(engine):
    """The lines of `events` by the mark in their data."""
    lines = engine.rows(
        f"""SELECT data.values[indexOf(data.keys, 'mark')], module, event, user, suite_version,
            {engine.milliseconds}, sequence, os,
            arrayStringConcat(data.keys, '~'), arrayStringConcat(data.values, '~'), body
            FROM hublink.events WHERE source = 'outbox'"""
    )
    found = {}
    for mark, *columns, names, values, body in lines:
        data = dict(zip(names.split("~"), values.split("~")))
        added = [data.pop(name, "") for name in ("openid", "sys_version")]
        expect(f"{engine.name}: what the service adds to {mark}", "" in added, False)
        expect(f"{engine.name}: {mark} is there before", mark in found, False)
        found[mark] = dict(zip(WIDE_COLUMNS, [*columns, data, body_of(body)]))
    return found


def check_rows(engine, collector, truth):
    """Everything was delivered, some of it twice, and `events` has each event once."""
    delivered = sum(copies(number) * len(batch) for number, batch in enumerate(collector.batches))
    count = engine.number("SELECT count() FROM hublink.otel_logs")
    expect(f"{engine.name}: rows in otel_logs", count, delivered + 3)
    expect(f"{engine.name}: events came twice", delivered > len(truth.arrived), True)
    expect(f"{engine.name}: the wide table", wide_table(engine), truth.wide_table())
    sql = f"SELECT source, row, event, module, sequence FROM hublink.events WHERE uid = '{STORE_UID}'"
    stored = engine.rows(sql)
    expect(f"{engine.name}: the row of a store", stored, [["store", "17", "started", "", "0"]])


def check_store_rows(engine, truth):
    """The rows that `reportctl forward` sent are lines of `events`, each once."""
    lines = engine.rows(
        f"""SELECT if(has(resource.values, 'home'), 'home', 'office') AS installation, row, module, event,
            user, suite_version, {engine.milliseconds}, sequence,
            arrayStringConcat(data.keys, '~'), arrayStringConcat(data.values, '~')
            FROM hublink.events WHERE source = 'store' AND uid != '{STORE_UID}' ORDER BY installation, row"""
    )
    found = []
    for *columns, names, values in lines:
        data = dict(zip(names.split("~"), values.split("~")))
        expect(f"{engine.name}: the user in the data of a row", data.pop("openid", ""), columns[4])
        found.append([*columns, data])
    expect(f"{engine.name}: the rows of the stores", found, truth.store_lines())


def check_columns(engine, truth):
    """What an event has from its resource."""
    count = engine.number("SELECT uniqExact(outbox) FROM hublink.events")
    expect(f"{engine.name}: installations", count, 2)
    home = "SELECT count() FROM hublink.events WHERE has(resource.values, 'home')"
    count = engine.number(f"{home} AND NOT has(resource.keys, 'os.type')")
    expect(f"{engine.name}: one environment", count, truth.count_of("home"))
    names = engine.rows(
        """SELECT DISTINCT module, module_name, module_version FROM hublink.events WHERE source = 'outbox'
           ORDER BY module, module_version"""
    )
    expected = [["A100", "Painter", "2.1"], ["A100", "Painter", "2.2"], ["A200", "Writer", "1.0"]]
    expect(f"{engine.name}: the modules' names", names, expected)
    arrival = engine.number("SELECT toUnixTimestamp(min(received)) FROM hublink.events")
    expect(f"{engine.name}: the time of arrival", time.time() - 600 < arrival <= time.time(), True)


def check_queries(engine, truth):
    queries = engines.statements(DEPLOY / "clickhouse/queries.sql")
    pairs = itertools.zip_longest(queries, truth.queries(engine))
    for number, (query, expected) in enumerate(pairs, 1):
        expect(f"{engine.name}: query {number}", engine.rows(query), expected)


def check_merged(engine, truth):
    """The engine itself keeps one line of each event once it has merged."""
    parts = "FROM system.parts WHERE database = 'hublink' AND table = 'events_store' AND active"
    for (partition,) in engine.rows(f"SELECT DISTINCT partition {parts}"):
        engine.run(f"OPTIMIZE TABLE hublink.events_store PARTITION {partition} FINAL")
    count = engine.number("SELECT count() FROM hublink.events_store WHERE source = 'outbox'")
    expect(f"{engine.name}: lines after a merge", count, len(truth.arrived))


def check_clocks(engine, row, settings):
    """A batch of desktops whose clocks are wrong by years is written, with the connection's settings."""
    batch = [
        {
            **row,
            "Timestamp": f"{year}-{month:02}-01 00:00:00.000000000",
            "LogAttributes": {**row["LogAttributes"], "log.record.uid": f"clock-{year}-{month}"},
        }
        for year in range(1970, 2040)
        for month in range(1, 13)
    ]
    pairs = ", ".join(f"{name} = {value}" for name, value in settings.items())
    engine.insert_rows(batch, f"SETTINGS {pairs}")
    count = engine.number("SELECT count() FROM hublink.events WHERE uid LIKE 'clock-%'")
    expect(f"{engine.name}: events of wrong clocks", count, len(batch))


def piped(text, *command):
    return subprocess.run(command, input=text, check=True, stdout=subprocess.PIPE, text=True).stdout


def as_text(value):
    return value if isinstance(value, str) else json.dumps(value, separators=(",", ":"))


def check_exports(engine, exports):
    """Exports that are loaded twice are there once."""
    expected = []
    for source, export in sorted(exports.items()):
        lines = [json.loads(line) for line in export.splitlines()]
        text = export if engine.is_current else piped(export, "jq", "-c", VALUE_AS_TEXT)
        text = piped(text, "sed", f's/^{{/{{"source":"{source}",/')
        for _ in range(2):
            engine.insert("hublink.reports_store", ["source", *lines[0]], text.splitlines())
        for line in lines:
            expected.append([source, str(line["id"]), line["event"], as_text(line["value"]), line["openid"]])
    found = engine.rows("SELECT source, id, event, value, openid FROM hublink.reports ORDER BY source, id")
    expect(f"{engine.name}: the stores' rows", found, expected)


def check_topic(engine, made, truth):
    """The engine reads the script's rows from a topic; with them come those that the collector rejected."""
    broker = Broker(TOPIC)
    for statement in engines.statements(DEPLOY / "clickhouse/from-kafka.sql"):
        engine.run(statement.replace("kafka.example:9093", broker.address))
    in_table = "SELECT count() FROM hublink.otel_logs"
    before = engine.number(in_table)
    made = [{"@timestamp": 1.5, **row} for row in made]
    expect("the broker takes the rows", broker.send(json.dumps(row).encode() for row in made), True)

    def arrived():  # the wide table is the last to have them
        sql = "SELECT count() FROM hublink.events WHERE source = 'outbox'"
        return engine.number(sql) == len(truth.sequences)

    fleet.until("the rows' way from the topic", arrived, TOPIC_SECONDS)
    expect(f"{engine.name}: rows from the topic", engine.number(in_table), before + len(made))


def check(engine, collector, truth, exports, made):
    """`made` are the rows that fluent-bit's script made of the same records."""
    try:
        load(engine, collector)
        check_rows(engine, collector, truth)
        check_store_rows(engine, truth)
        check_columns(engine, truth)
        check_queries(engine, truth)
        check_merged(engine, truth)
        check_exports(engine, exports)
        if engine.is_current:
            check_topic(engine, made, truth)
            check_clocks(engine, collector.batches[0][0], configs.connection_settings(DEPLOY))
        print(f"{engine.name}, {engine.run('SELECT version()').strip()}: {len(truth.arrived)} events")
    finally:
        engine.stop()
