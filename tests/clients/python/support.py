"""What the tests of the Python module share: a listener in the service's place, the service itself, and a
child of another user. All of them run in tests/in-sandbox."""
import contextlib
import json
import os
import pathlib
import shutil
import signal
import socket
import sqlite3
import subprocess
import sys
import tempfile
import time

ROOT = pathlib.Path(__file__).resolve().parent.parent.parent.parent
sys.path.insert(0, str(ROOT / "clients/python"))

ADDRESS = ("127.0.0.1", 9997)
SOCKET_TABLE = pathlib.Path("/proc/net/udp")
NOBODY = 65534  # a user that exists everywhere


def wait_until(condition, seconds=30.0):
    """The condition's first true result. A busy machine may need long; a good one is not made to wait."""
    deadline = time.monotonic() + seconds
    while not (result := condition()):
        if time.monotonic() > deadline:
            raise AssertionError("waited in vain")
        time.sleep(0.002)
    return result


class Listener:
    """Takes datagrams in the service's place. Its buffer holds AT_ONCE short ones on every machine."""

    AT_ONCE = 150

    def __init__(self, address=ADDRESS):
        self.socket = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)
        self.socket.bind(address)
        self.socket.setblocking(False)

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.socket.close()

    def datagrams(self):
        """All that came: over loopback they are there once the send returned."""
        found = []
        with contextlib.suppress(BlockingIOError):
            while True:
                found.append(self.socket.recv(65536).decode())
        return found

    def fill(self):
        """Fills the buffer. The system then drops all datagrams until they are taken."""
        with socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as sender:
            for size in (60_000, 1):  # the small ones take the room that is too small for a large one
                for _ in range(500):
                    sender.sendto(b"x" * size, self.socket.getsockname())

    def messages(self):
        return [json.loads(text) for text in self.datagrams()]

    def kinds(self):
        """The event ids and the kinds of control message, in their order."""
        return [message.get("msgType") or message["eventID"] for message in self.messages()]


@contextlib.contextmanager
def listener_of_another_user():
    """A child that binds the port as another user, and holds it until the end."""
    script = ("import os, socket, sys; os.setuid(%d); s = socket.socket(socket.AF_INET, socket.SOCK_DGRAM); "
              "s.bind(%r); print(flush=True); sys.stdin.read(); s.setblocking(False)\n"
              "try: print(s.recv(65536).decode())\n"
              "except BlockingIOError: print('nothing')" % (NOBODY, ADDRESS))
    child = subprocess.Popen([sys.executable, "-c", script], stdin=subprocess.PIPE, stdout=subprocess.PIPE,
                             text=True)
    child.stdout.readline()
    try:
        yield lambda: child.communicate()[0].strip()  # ends the child, and returns what it got
    finally:
        child.kill()
        child.wait()
        child.stdin.close()
        child.stdout.close()


class Service:
    """The program with a data directory of its own, from `with` to its end."""

    def __init__(self, programs):
        self.programs = pathlib.Path(programs)

    def __enter__(self):
        self.directory = pathlib.Path(tempfile.mkdtemp(prefix="hublink."))
        self.environment = {"XDG_DATA_HOME": str(self.directory), "HOME": str(self.directory),
                            "PATH": "/usr/bin:/bin", "ASAN_OPTIONS": "detect_leaks=0"}
        subprocess.run([self.programs / "reportctl", "setup"], env=self.environment, check=True,
                       capture_output=True)
        self.start()
        return self

    def __exit__(self, *_):
        self.stop()
        output = (self.directory / "output").read_text()
        shutil.rmtree(self.directory)
        if "Sanitizer" in output:
            raise AssertionError(output)

    def start(self):
        with (self.directory / "output").open("a") as output:
            self.process = subprocess.Popen([self.programs / "SyncServiceReport"], env=self.environment,
                                            stdout=output, stderr=output)
        wait_until(self.line_of_its_socket)

    def stop(self):
        self.process.send_signal(signal.SIGTERM)
        self.process.wait()

    @staticmethod
    def line_of_its_socket():
        lines = SOCKET_TABLE.read_text().splitlines()
        return next((line.split() for line in lines if ": 0100007F:270D " in line), None)

    def drain(self):
        """Waits until the service has taken all datagrams off its socket, so that none is dropped."""
        wait_until(lambda: self.line_of_its_socket()[4].endswith(":00000000"))

    def rows(self, query, file="Report.db"):
        connection = sqlite3.connect(f"file:{self.directory}/hublink/database/{file}?mode=ro", uri=True,
                                     timeout=30)
        try:
            return connection.execute(query).fetchall()
        finally:
            connection.close()

    def stored(self):
        """Event id, value, time, kind, suite version and open id of each report in the local store."""
        return self.rows("select eventID, value, createTime, pType, extData3, extData4 from OperLog"
                         " order by id")

    def kept(self):
        """Event id and payload of each event in the outbox."""
        return self.rows("select event_id, payload from event order by id", "MetrikOutbox.db")

    def count(self):
        return self.rows("select count(*) from OperLog")[0][0] + \
            self.rows("select count(*) from event", "MetrikOutbox.db")[0][0]


def in_child(work):
    """The exit code of a child that does `work`: 0 when it returned true."""
    child = os.fork()
    if child == 0:
        code = 2
        try:
            signal.alarm(20)
            code = 0 if work() else 1
        finally:
            os._exit(code)
    return os.waitstatus_to_exitcode(os.waitpid(child, 0)[1])
