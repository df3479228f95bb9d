"""Two installations of the real service, one after the other, and what is sent to them: the tables are
compared with it."""
import dataclasses
import os
import pathlib
import subprocess
import sys
import time

ROOT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "clients/python"))
import hublink_report  # noqa: E402 (it lies beside the tests, not in Python's path)

DEADLINE_SECONDS = 30
DAY_MS = 86_400_000
LAST_ROW = "B900"  # an event id for the store
NO_USER, NO_VERSION = "visitor", "3.0.0.0"  # what the service says before a user is announced


@dataclasses.dataclass
class Event:
    """An event as it was sent. `mark` is in its data, and in no other event's."""

    installation: str
    module: str
    event: str
    user: str
    suite_version: str
    time_ms: int
    data: dict
    mark: int = 0


def store_row_data(value):
    """The members that a row's value becomes: those of an object, or the value itself under `value`."""
    return value if isinstance(value, dict) else {"value": value}


def until(what, condition, seconds=DEADLINE_SECONDS):
    deadline = time.monotonic() + seconds
    while not condition():
        if time.monotonic() > deadline:
            sys.exit(f"FAILED: {what} did not happen in {seconds} seconds")
        time.sleep(0.02)


def is_bound():
    return ": 0100007F:270D " in pathlib.Path("/proc/net/udp").read_text()


class Installation:
    """The service with a data directory of its own, told of a collector."""

    def __init__(self, name, programs, data, endpoint):
        self.name, self.programs = name, programs
        self.environment = {
            **{key: value for key, value in os.environ.items() if not key.startswith("OTEL_")},
            "XDG_DATA_HOME": str(data),
            "OTEL_EXPORTER_OTLP_ENDPOINT": endpoint,
            "METRIK_START_SPREAD": "0",
            "OTEL_RESOURCE_ATTRIBUTES": f"deployment.environment.name={name}",
        }
        self.reportctl("setup")
        self.process = subprocess.Popen([programs / "SyncServiceReport"], env=self.environment)
        until("the service's start", lambda: is_bound() or self.process.poll() is not None)
        self.sent = []
        self.stored = []  # rows of the local store, in their order
        self.user, self.suite_version = NO_USER, NO_VERSION

    def reportctl(self, *arguments):
        command = [self.programs / "reportctl", *arguments]
        ended = subprocess.run(
            command, env=self.environment, check=True, stdout=subprocess.PIPE, text=True
        )
        return ended.stdout

    def module(self, module_id, version, name):
        module = hublink_report.Module(module_id, version, name)
        return hublink_report.Reporter(module, allow_other_users_service=True)

    def set_user(self, reporter, user, suite_version):
        self.must_be_sent(reporter.set_user(user, suite_version))
        self.user, self.suite_version = user, suite_version

    def send(self, reporter, event, data, time_ms):
        """An event for analytics; `data` gets the mark."""
        mark = len(self.sent) + (1000 if self.name == "office" else 2000)
        data = {**data, "mark": mark}
        self.must_be_sent(reporter.event(event, data, time_ms=time_ms))
        module = event.split("|")[0]
        event = Event(self.name, module, event, self.user, self.suite_version, time_ms, data, mark)
        self.sent.append(event)

    def store(self, reporter, event, value, time_ms):
        """A row for the local store."""
        self.must_be_sent(reporter.event(event, value, time_ms=time_ms))
        module = event.split("|")[0] if "|" in event else ""
        data = store_row_data(value)
        self.stored.append(
            Event(self.name, module, event, self.user, self.suite_version, time_ms, data)
        )

    @staticmethod
    def must_be_sent(result):
        if result is not hublink_report.Result.SENT:
            sys.exit(f"FAILED: a report was not sent: {result}")

    def stop(self):
        self.process.terminate()
        self.process.wait(timeout=DEADLINE_SECONDS)


def use_office(office, now_ms):
    """Two users, one with a new version of the suite; two modules; a rejected event between others."""
    painter = office.module("A100", "2.1", "Painter")
    writer = office.module("A200", "1.0", "Writer")
    office.send(painter, "A100|10001", {"clicks": 1}, now_ms - 2 * DAY_MS)
    office.set_user(painter, "u4711", "5.1.0.2")
    for clicks in range(2, 12):
        office.send(painter, "A100|10001", {"clicks": clicks}, now_ms - 2 * DAY_MS + clicks)
    office.send(painter, "A100|rejected", {}, now_ms - 2 * DAY_MS + 20)
    colour = {"colour": "red & \"blue\" <green>", "dark": True, "ratio": 0.25}
    office.send(painter, "A100|20002", colour, now_ms - DAY_MS)
    office.send(painter, "A100|40004", {"clicks": 1000}, now_ms - 40 * DAY_MS)  # too old for the queries
    office.send(painter, "A100|40004", {"clicks": 1000}, 31_536_000_000)  # a clock that stands at 1971
    office.set_user(writer, "u0815", "5.2.0.0")
    for pages in range(5):
        value = {"pages": pages, "nested": {"deep": [pages]}}
        office.send(writer, "A200|print", value, now_ms - DAY_MS + 1000 * (pages + 1))
    office.store(writer, "B100|printed", "", now_ms)
    office.store(writer, LAST_ROW, "the last", now_ms)


def use_home(home, now_ms):
    painter = home.module("A100", "2.2", "Painter")
    home.set_user(painter, "u4711", "5.1.0.2")
    for clicks in range(20, 25):  # all at one moment
        home.send(painter, "A100|10001", {"clicks": clicks + 0.5}, now_ms - DAY_MS)
    home.send(painter, "A100|rejected", {}, now_ms - DAY_MS + 30)
    home.send(painter, "A100|rejected", {}, now_ms - DAY_MS + 31)
    home.send(painter, "A100|20002", {}, now_ms)
    home.store(painter, "B100|opened", "it's \"open\" \\ now", now_ms - DAY_MS)
    home.store(painter, "B100|opened", {"door": 1, "open": True}, now_ms - DAY_MS)
    home.store(painter, LAST_ROW, ["the", "last"], now_ms)
