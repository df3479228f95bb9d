"""What is measured: each takes datagrams on 127.0.0.1:9997 and, but for the bare loop, stores them."""
import pathlib
import shutil
import sqlite3
import subprocess

from subject import PROGRAMS, ROOT, Subject

# Makes rows like those that the service makes of the sender's reports.
FILL = """with recursive n(i) as (select 0 union all select i + 1 from n limit :rows)
          insert into OperLog (eventID, value, createTime, pType, extData3, extData4) select 'B100|10001',
          '{"button":"save","page":"editor","count":3,"ratio":1.5,"text":"a text as people write it"}',
          1700000000000 + i, 0, '3.0.0.0', 'visitor' from n"""


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

    def refused(self):
        """The errors in the log, which keeps its last 100 MiB: the least, when older files went."""
        files = (self.directory / "hublink/log/metrik").iterdir()
        return sum(file.read_bytes().count(b" ExecSql] ") for file in files)


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
        # Otherwise the measured run would have to write the rows back.
        connection.execute("pragma wal_checkpoint(truncate)")
        connection.close()

    def stored(self):
        return super().stored() - self.rows_before


class Analytics(Service):
    name = "analytics"
    title = "the service, events to the outbox"
    event = "A759|10001"
    watch = "select id, json_extract(payload, '$.extend.createTime') from event where id > ?1 order by id"

    def database(self):
        return self.directory / "hublink/database/MetrikOutbox.db"

    def refused(self):
        return None  # the outbox says why it refuses events, but not how many

    def stored(self):
        return self.query("select stored from outbox_status") if self.last_write_ns() else 0


class Daemon(Subject):
    name = "daemon"
    title = "syslog-ng, rows to SQLite"
    longest_pause = 3.0  # after a failed statement, it waits a second before it tries again

    @staticmethod
    def is_installed():
        libraries = pathlib.Path("/usr/lib")
        return (shutil.which("syslog-ng") is not None and any(libraries.glob("**/syslog-ng/*/libafsql.so"))
                and any(libraries.glob("*/dbd/libdbdsqlite3.so")))

    def command(self):
        own = {"-R": "persist", "-p": "pid", "-c": "control"}
        return ["syslog-ng", "--foreground", "--no-caps", "--stderr", "-f",
                ROOT / "bench/load/syslog-ng.conf",
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
