"""What the wide table and the five queries must show of the events that were sent, counted in Python."""
import collections
import datetime
import json

import rows
from collector import REJECTED_EVENT
from fleet import DAY_MS, NO_USER


def utc(time_ms):
    return datetime.datetime(1970, 1, 1) + datetime.timedelta(milliseconds=time_ms)


def day(event):
    return f"{utc(event.time_ms):%Y-%m-%d}"


def last(events, engine):
    """The latest time as the engine prints it: the old one has no milliseconds in it."""
    text = rows.time_text(max(event.time_ms for event in events) * 1_000_000)[:-6]
    return text if engine.is_current else text[:-4]


def users(events):
    return len({event.user for event in events} - {NO_USER})


def installations(events):
    return len({event.installation for event in events})


def grouped(events, key):
    groups = collections.defaultdict(list)
    for event in events:
        groups[key(event)].append(event)
    return groups


def texts(lines):
    return [[str(value) for value in line] for line in lines]


def number(value):
    return rows.json_text(int(value) if float(value).is_integer() else value)


def scalars_of(event):
    """The members of the data that become attributes, as texts."""
    return {
        name: value if isinstance(value, str) else rows.json_text(value)
        for name, value in event.data.items()
        if not isinstance(value, (dict, list))
    }


class Expected:
    def __init__(self, sent, stored, now_ms):
        self.sequences = {}
        for lines in grouped(sent, lambda event: (event.installation, event.module)).values():
            self.sequences.update({event.mark: place for place, event in enumerate(lines, 1)})
        self.arrived = [event for event in sent if event.event != REJECTED_EVENT]
        self.recent = [event for event in self.arrived if event.time_ms > now_ms - 30 * DAY_MS]
        self.stored = stored
        self.recent_and_stored = self.recent + stored

    def count_of(self, installation):
        return sum(event.installation == installation for event in self.arrived + self.stored)

    def store_lines(self):
        """The rows of all stores, numbered from 1 in each."""
        lines = []
        for _, each in sorted(grouped(self.stored, lambda event: event.installation).items()):
            for row, event in enumerate(each, 1):
                columns = (event.installation, row, event.module, event.event, event.user,
                           event.suite_version)
                lines.append([*map(str, columns), str(event.time_ms), "0", scalars_of(event)])
        return lines

    def wide_table(self):
        """Each event by its mark."""
        return {
            str(event.mark): {
                "module": event.module,
                "event": event.event,
                "user": event.user,
                "suite_version": event.suite_version,
                "milliseconds": str(event.time_ms),
                "sequence": str(self.sequences[event.mark]),
                "os": "linux",
                "data": scalars_of(event),
                "body": event.data,
            }
            for event in self.arrived
        }

    def queries(self, engine):
        return [self.days(), self.events(engine), self.versions(engine), self.clicks(), self.gaps()]

    def days(self):
        groups = grouped(self.recent_and_stored, lambda event: (day(event), event.module))
        lines = [[*key, len(each), users(each), installations(each)] for key, each in groups.items()]
        return texts(sorted(lines))

    def events(self, engine):
        groups = grouped(self.recent_and_stored, lambda event: event.event).items()
        by_count = sorted(groups, key=lambda group: (-len(group[1]), group[0]))
        return texts([key, len(each), users(each), last(each, engine)] for key, each in by_count)

    def versions(self, engine):
        newest = [
            max(each, key=lambda event: event.time_ms)
            for each in grouped(self.recent_and_stored, lambda event: event.installation).values()
        ]
        groups = grouped(newest, lambda event: event.suite_version).items()
        by_count = sorted(groups, key=lambda group: (-len(group[1]), group[0]))
        return texts([key, len(each), last(each, engine)] for key, each in by_count)

    def clicks(self):
        lines = []
        with_clicks = [event for event in self.recent if "clicks" in event.data]
        for key, each in sorted(grouped(with_clicks, lambda event: event.event).items()):
            values = sorted(event.data["clicks"] for event in each)
            chosen = [sum(values), *(values[int(level * len(values))] for level in (0.5, 0.95)), values[-1]]
            lines.append([key, len(values), *map(number, chosen)])
        return texts(lines)

    def gaps(self):
        lines = collections.defaultdict(lambda: [0, 0, 0, 0])
        groups = grouped(self.recent, lambda event: (event.installation, event.module))
        for (_, module), each in groups.items():
            numbers = {self.sequences[event.mark] for event in each}
            sent = max(numbers) - min(numbers) + 1
            missing = sent - len(numbers)
            figures = (sent, len(numbers), missing, missing > 0)
            lines[module] = [sum(pair) for pair in zip(lines[module], figures)]
        return texts([module, *line] for module, line in sorted(lines.items()))


def body_of(text):
    """The members of a body's eventData that were sent, without those that the service adds."""
    data = json.loads(text)["eventData"]
    return {name: value for name, value in data.items() if name not in ("openid", "sys_version")}
