"""What all that is measured has in common."""
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


class Subject:
    """Runs in a new directory on the disk of the build, from `with` to its end."""
    name = ""
    title = ""
    event = "B100|10001"
    process = None       # until it is started
    syncs_disk = True    # before each run, so that the measured run does not write what earlier ones left
    longest_pause = 1.0  # in seconds: the longest time without progress while there is work
    watch = "select id, createTime from OperLog where id > ?1 order by id"  # the new rows, for the watcher

    def __enter__(self):
        self.directory = pathlib.Path(tempfile.mkdtemp(prefix="bench.", dir=ROOT / "build"))
        try:
            self.prepare()
            if self.syncs_disk:
                os.sync()
            self.start()
        except BaseException:
            if self.process:
                self.stop()
            shutil.rmtree(self.directory)
            raise
        return self

    def __exit__(self, *_):
        self.stop()
        shutil.rmtree(self.directory)

    def prepare(self):
        pass

    def start(self):
        # A file, because a full pipe without a reader would stop the program.
        errors = self.directory / "errors"
        with errors.open("w") as file:
            self.process = subprocess.Popen(self.command(), env=self.environment(), stdout=file, stderr=file)
        begin = time.monotonic()
        while not procfs.is_bound():
            if self.process.poll() is not None or time.monotonic() - begin > START_SECONDS:
                self.process.kill()
                raise SystemExit(f"{self.title} did not start: {errors.read_text()}")
            time.sleep(0.0005)
        self.ready_seconds = time.monotonic() - begin
        self.receiver = procfs.receiving_thread(self.process.pid)

    def stop(self):
        self.process.terminate()
        self.process.wait()

    def environment(self):
        """Without a collector that the caller's shell may name: it would take events away from what is
        counted."""
        return {name: value for name, value in os.environ.items() if not name.startswith("OTEL_")}

    def database(self):
        """The file whose rows count; None when nothing is stored."""
        return None

    def last_write_ns(self):
        """When the database last changed on the system's clock, seen without opening it: an open database
        slows the service down (docs/Database.md, "Other programs and the write lock")."""
        files = [pathlib.Path(f"{self.database()}{suffix}")
                 for suffix in ("", "-wal")] if self.database() else []
        return max((file.stat().st_mtime_ns for file in files if file.exists()), default=0)

    def query(self, statement):
        connection = sqlite3.connect(f"file:{self.database()}?mode=ro", uri=True, timeout=30)
        try:
            return connection.execute(statement).fetchone()[0]
        finally:
            connection.close()

    def refused(self):
        """How many rows the store did not take; None when nothing tells."""
        return None

    def stored(self):
        return self.query("select count(*) from OperLog") if self.last_write_ns() else 0
