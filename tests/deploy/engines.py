"""Two ClickHouse engines to run statements in: a current one as a library, and the old server of Debian."""
import json
import os
import pathlib
import re
import subprocess
import time
import urllib.error
import urllib.request

HERE = pathlib.Path(__file__).resolve().parent
PORT = 18123
START_SECONDS = 30

CONFIGURATION = """<?xml version="1.0"?>
<yandex>
    <logger>
        <level>warning</level><log>{directory}/log</log><errorlog>{directory}/errors</errorlog>
    </logger>
    <http_port>{port}</http_port>
    <listen_host>127.0.0.1</listen_host>
    <path>{directory}/data/</path>
    <tmp_path>{directory}/tmp/</tmp_path>
    <users_config>{directory}/users.xml</users_config>
    <default_profile>default</default_profile>
    <default_database>default</default_database>
    <mark_cache_size>67108864</mark_cache_size>
    <timezone>UTC</timezone>
</yandex>
"""
USERS = """<?xml version="1.0"?>
<yandex>
    <profiles><default><max_memory_usage>1000000000</max_memory_usage></default></profiles>
    <users><default>
        <password></password><networks><ip>127.0.0.1</ip></networks>
        <profile>default</profile><quota>default</quota>
    </default></users>
    <quotas><default></default></quotas>
</yandex>
"""


class EngineError(Exception):
    pass


def statements(path):
    """The statements of a file. There is no semicolon and no double hyphen in our texts."""
    text = re.sub(r"--.*", "", path.read_text())
    return [each.strip() for each in text.split(";") if each.strip()]


def unescaped(field):
    """A field as the engine prints it between tabs."""
    names = {"b": "\b", "f": "\f", "n": "\n", "r": "\r", "t": "\t", "0": "\0"}
    return re.sub(r"\\(.)", lambda match: names.get(match[1], match[1]), field)


class Engine:
    def rows(self, sql):
        """The rows of a query, each a list of texts."""
        return [[unescaped(field) for field in line.split("\t")] for line in self.run(sql).splitlines()]

    def number(self, sql):
        return int(self.run(sql))

    def insert(self, table, columns, lines, settings=""):
        names = ", ".join(f"`{each}`" for each in columns)
        self.run(f"INSERT INTO {table} ({names}) {settings} FORMAT JSONEachRow\n" + "\n".join(lines))

    def insert_rows(self, batch, settings=""):
        lines = [self.as_stored(row) for row in batch]
        if lines:
            self.insert("hublink.otel_logs", lines[0], [json.dumps(each) for each in lines], settings)


class Current(Engine):
    """The library is of this year, and runs in a process of its own."""

    name = "current engine"
    tables = "events.sql"
    milliseconds = "toUnixTimestamp64Milli(time)"
    is_current = True

    def __init__(self, modules):
        self.process = subprocess.Popen(
            ["node", HERE / "engine/chdb.js"],
            env={**os.environ, "NODE_PATH": str(modules), "TZ": "UTC"},
            stdin=subprocess.PIPE,
            stdout=subprocess.PIPE,
            text=True,
        )

    def run(self, sql):
        self.process.stdin.write(json.dumps({"sql": sql}) + "\n")
        self.process.stdin.flush()
        answer = json.loads(self.process.stdout.readline())
        if "error" in answer:
            raise EngineError(f"{sql[:300]}\n{answer['error'][:1000]}")
        return answer["result"]

    @staticmethod
    def as_stored(row):
        return row

    def stop(self):
        self.process.stdin.close()
        self.process.wait(timeout=START_SECONDS)


class Old(Engine):
    """The server is an ordinary process with a directory and a port of its own."""

    name = "Debian's engine"
    tables = "events-old.sql"
    milliseconds = "toUInt64(toUnixTimestamp(time)) * 1000 + milliseconds"
    is_current = False

    def __init__(self, program, directory):
        self.log = directory / "errors"
        (directory / "config.xml").write_text(CONFIGURATION.format(directory=directory, port=PORT))
        (directory / "users.xml").write_text(USERS)
        self.process = subprocess.Popen(
            [program, f"--config-file={directory}/config.xml"],
            stdout=subprocess.DEVNULL,
            stderr=subprocess.DEVNULL,
        )
        deadline = time.monotonic() + START_SECONDS
        while not self.answers():
            if self.process.poll() is not None or time.monotonic() > deadline:
                log = self.log.read_text() if self.log.exists() else ""
                raise EngineError(f"{program} did not start: {log}")
            time.sleep(0.05)

    def answers(self):
        try:
            return self.run("SELECT 1") == "1\n"
        except OSError:
            return False

    def run(self, sql):
        try:
            with urllib.request.urlopen(f"http://127.0.0.1:{PORT}/", sql.encode()) as answer:
                return answer.read().decode()
        except urllib.error.HTTPError as error:
            raise EngineError(f"{sql[:300]}\n{error.read().decode()[:1000]}") from None

    @staticmethod
    def as_stored(row):
        """Each map as two lists."""
        stored = {}
        for name, value in row.items():
            if isinstance(value, dict):
                stored[f"{name}.keys"], stored[f"{name}.values"] = list(value), list(value.values())
            else:
                stored[name] = value
        return stored

    def stop(self):
        self.process.terminate()
        self.process.wait(timeout=START_SECONDS)
