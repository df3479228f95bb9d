"""What is measured: each takes datagrams on 127.0.0.1:9997 and, but for the bare loop, stores them."""
import os
import pathlib
import shutil
import sqlite3
import subprocess
import tempfile
import time

import procfs

ROOT = pathlib.Path(__file__).resolve().parent.parent.parent
PROGRAMS = ROOT / "build/release/bin"
START_SECONDS = 20

# Rows as the service makes them of the sender's reports.
FILL = """with recursive n(i) as (select 0 union all select i + 1 from n limit :rows)
          insert into OperLog (eventID, value, createTime, pType, extData3, extData4) select 'B100|10001',
          '{"button":"save","page":"editor","count":3,"ratio":1.5,"text":"a text as people write it"}',
          1700000000000 + i, 0, '3.0.0.0', 'visitor' from n"""


class Subject:
    """Runs in a new directory on the disk of the build, from `with` to its end."""
    name = ""
    title = ""
    event = "B100|10001"
    watch = "select id, createTime from OperLog where id > ?1 order by id"  # the new rows, for the watcher

    def __enter__(self):
        self.directory = pathlib.Path(tempfile.mkdtemp(prefix="bench.", dir=ROOT / "build"))
        self.prepare()
        self.start()
        return self

    def __exit__(self, *_):
        self.stop()
        shutil.rmtree(self.directory)

    def prepare(self):
        pass

    def start(self):
        self.process = subprocess.Popen(self.command(), env=self.environment(),
                                        stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, text=True)
        begin = time.monotonic()
        while not procfs.is_bound():
            if self.process.poll() is not None or time.monotonic() - begin > START_SECONDS:
                self.process.kill()
                raise SystemExit(f"{self.title} did not start: {self.process.communicate()[1]}")
            time.sleep(0.0005)
        self.ready_seconds = time.monotonic() - begin
        self.receiver = procfs.receiving_thread(self.process.pid)

    def stop(self):
        self.process.terminate()
        self.process.communicate()

    def environment(self):
        """Without a collector that the caller's shell may name: it would take events away from what is counted."""
        return {name: value for name, value in os.environ.items() if not name.startswith("OTEL_")}

    def database(self):
        """The file whose rows count; None when nothing is stored."""
        return None

    def last_write_ns(self):
        """When the database last changed on the system's clock, seen without opening it: an open database slows the
        service down (docs/Database.md, "Other programs and the write lock")."""
        files = [pathlib.Path(f"{self.database()}{suffix}") for suffix in ("", "-wal")] if self.database() else []
        return max((file.stat().st_mtime_ns for file in files if file.exists()), default=0)

    def query(self, statement):
        connection = sqlite3.connect(f"file:{self.database()}?mode=ro", uri=True, timeout=30)
        try:
            return connection.execute(statement).fetchone()[0]
        finally:
            connection.close()

    def stored(self):
        return self.query("select count(*) from OperLog") if self.last_write_ns() else 0


class Service(Subject):
    name = "service"
    title = "the service, reports to the store"

    def prepare(self):
        subprocess.run([PROGRAMS / "reportctl", "setup"], env=self.environment(), check=True,
                       stdout=subprocess.DEVNULL)

    def command(self):
        return [PROGRAMS / "SyncServiceReport"]

    def environment(self):
        return {**super().environment(), "XDG_DATA_HOME": str(self.directory)}

    def database(self):
        return self.directory / "hublink/database/Report.db"


class EmptyStore(Service):
    """The store without a service."""

    def start(self):
        pass

    def stop(self):
        pass


class FilledService(Service):
    """With rows in the table before it starts."""

    def __init__(self, rows):
        self.rows_before = rows

    def prepare(self):
        super().prepare()
        connection = sqlite3.connect(self.database(), isolation_level=None)
        connection.execute(FILL, {"rows": self.rows_before})
        connection.execute("pragma wal_checkpoint(truncate)")  # what is left to write would be the run's to write
        connection.close()
        os.sync()

    def stored(self):
        return super().stored() - self.rows_before


class Analytics(Service):
    name = "analytics"
    title = "the service, events to the outbox"
    event = "A759|10001"
    watch = "select id, json_extract(payload, '$.extend.createTime') from event where id > ?1 order by id"

    def database(self):
        return self.directory / "hublink/database/MetrikOutbox.db"

    def stored(self):
        return self.query("select stored from outbox_status") if self.last_write_ns() else 0


class Daemon(Subject):
    name = "daemon"
    title = "syslog-ng, rows to SQLite"

    @staticmethod
    def is_installed():
        libraries = pathlib.Path("/usr/lib")
        return (shutil.which("syslog-ng") is not None and any(libraries.glob("**/syslog-ng/*/libafsql.so"))
                and any(libraries.glob("*/dbd/libdbdsqlite3.so")))

    def command(self):
        own = {"-R": "persist", "-p": "pid", "-c": "control"}
        return ["syslog-ng", "--foreground", "--no-caps", "--stderr", "-f", ROOT / "bench/load/syslog-ng.conf",
                *(word for option, file in own.items() for word in (option, self.directory / file))]

    def environment(self):
        return {**super().environment(), "SSR_BENCH_STORE": str(self.database())}

    def database(self):
        return self.directory / "Report.db"


class BareReceiver(Subject):
    name = "bare"
    title = "a bare recvfrom loop, nothing stored"

    def command(self):
        return [PROGRAMS / "bench_receiver"]

    def stored(self):
        return None
