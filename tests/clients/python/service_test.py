"""Through the real service: service_test.py PROGRAMS CASES. Every event that the module calls sent is in the
store as it was given, or in the outbox as the same JSON; each event that it refuses has the reason for which
it is refused."""
import json
import random
import sys
import unittest

from support import Service, in_child, wait_until

from hublink_report import Json, Module, Reporter, Result

PROGRAMS, CASES = sys.argv[1], int(sys.argv[2])
SEED = random.randrange(2**32)
AT_ONCE_BYTES = 100_000  # the service's buffer holds this much in any case, with what the system adds

PIECES = ["'", "''", "\"", "\\", "%", "%s", "%1%", "\\u0027", "\\'", "eventID", '"eventID":"A1|1"', "|", "\n",
          "\r\n", "\t", "\x01", "\x1f", "\x7f", "\u00e4", "\u2028", "\ufeff", "\uffff", "\U0001f600",
          "\U0010ffff",
          "');--", "values(", "{}", "[", "null", "true", "1.5", " ", "a", "B100", "A759", "openid.", "x" * 40]
BROKEN = ["\0", "\ud800", "\udfff", "\udc00\ud800"]
NUMBERS = [0, 1, -1, 2**31, 2**53 + 1, 2**63 - 1, -(2**63), 2**64 - 1, 0.0, -0.0, 1.5, -2.5e-7, 5e-324,
           1.7976931348623157e308, 1e16, 1e22, 123456789.125, 0.1, 1 / 3]
NO_NUMBERS = [2**64, -(2**63) - 1, 10**30, float("nan"), float("inf")]
SCALARS = [None, True, False]


class Cases:
    """What is sent, and what is expected of it. Broken pieces are rare, so that most cases are sent."""

    def __init__(self, seed):
        self.random = random.Random(seed)

    def text(self, longest=12):
        pieces = self.random.choices(PIECES, k=self.random.randrange(longest))
        if self.random.random() < 0.01:
            pieces.append(self.random.choice(BROKEN))
        if self.random.random() < 0.3:
            low, high = self.random.choice([(1, 0xd800), (0xe000, 0x110000)])  # all except the surrogates
            pieces.append(chr(self.random.randrange(low, high)))
        self.random.shuffle(pieces)
        if longest > 20 and self.random.random() < 0.02:
            # Some longer than the longest datagram, some shorter.
            pieces.append("\u00e4" * self.random.randrange(4900, 5200))
        if self.random.random() < 0.01:
            pieces *= self.random.randrange(1, 400)
        return "".join(pieces)

    def json(self, depth=0):
        kind = self.random.randrange(8 if depth < 4 else 5)
        if kind >= 6:
            return {self.text(4): self.json(depth + 1) for _ in range(self.random.randrange(4))}
        if kind == 5:
            return [self.json(depth + 1) for _ in range(self.random.randrange(4))]
        if kind >= 3:
            return self.text(5)
        return self.random.choice(SCALARS) if kind == 2 else self.number()

    def number(self):
        if self.random.random() < 0.01:
            return self.random.choice(NO_NUMBERS)
        return self.random.choice([self.random.choice(NUMBERS), self.random.randrange(-(2**63), 2**64),
                                   self.random.uniform(-1, 1) * 10.0 ** self.random.randrange(-300, 300)])

    def value(self):
        kind = self.random.randrange(10)
        if kind < 3:
            return self.text(30)
        if kind < 4:
            return None
        made = self.json()
        if kind < 7:
            return made if isinstance(made, (dict, list)) else {"a": made}
        if kind < 9:
            try:
                return Json(json.dumps(made, ensure_ascii=self.random.random() < 0.5,
                                       indent=self.random.choice([None, 1])))
            except (TypeError, ValueError):
                return None
        return Json(self.random.choice(['{"a":1,"a":{"a":2},"a":"\'"}', '{"a\\u0027":"\\u0000\\/\\b"}',
                                        "[1e2,-0,-0.0,1E-5]", " [ ] ", "{", "1 1", '"\\ud800"',
                                        "[" * 127 + "]" * 127, "[" * 128 + "]" * 128,
                                        self.text()]))

    def event_id(self):
        start = self.random.choice(["B100|", "B100|", "", "A759|", "A759|", "A100|", "A200|"])
        return start + self.text(3)


def broken(text):
    return "\0" in text or any(0xd800 <= ord(character) < 0xe000 for character in text)


def parsed(text):
    """JSON with all members of an object in their order, also of one name, and 1 apart from 1.0 and from
    true."""
    return repr(json.loads(text, object_pairs_hook=lambda members: ("object", members)))


def as_json(value):
    return value.text if isinstance(value, Json) else json.dumps(value)


def members(text):
    return json.loads(text, object_pairs_hook=lambda pairs: ("object", pairs))


class Sent(unittest.TestCase):
    """One service, and all cases sent to it."""

    @classmethod
    def setUpClass(cls):
        cls.results = {result: [] for result in Result}
        cls.users = {result: [] for result in Result}
        cls.stored, cls.kept = [], []
        with Service(PROGRAMS) as service:
            cls.send_all(Cases(SEED), service, Reporter(Module("A100", "2.1 'eventID", "Painter's")))
            cls.rows, cls.events = cls.received(service)

    @staticmethod
    def received(service):
        """All that came before two last events; the service keeps the order."""
        reporter = Reporter()
        service.drain()
        reporter.event("B100|last")
        reporter.event("A759|last")
        wait_until(lambda: service.rows("select 1 from event where event_id = 'A759|last'", "MetrikOutbox.db")
                   and service.rows("select 1 from OperLog where eventID = 'B100|last'"), 60)
        return service.stored()[:-1], service.kept()[:-1]

    @classmethod
    def send_all(cls, cases, service, reporter):
        user, waiting = ("visitor", "3.0.0.0"), 0
        for number in range(CASES):
            if waiting > AT_ONCE_BYTES:
                service.drain()
                waiting = 0
            if cases.random.random() < 0.02:
                new = (cases.text(4), cases.text(3))
                result = reporter.set_user(*new)
                cls.users[result].append(new)
                if result is Result.SENT:
                    user = (new[0], new[1] or user[1])
            time_ms = cases.random.choice([number, 1234567890, 1700000000123 + number, -number])
            case = (cases.event_id(), cases.value(), time_ms)
            waiting += 1000 + 4 * len(all_of(case[1]))
            result = reporter.event(*case[:2], time_ms=case[2], day_report=number % 2 == 0)
            cls.results[result].append(case)
            if result is Result.SENT:
                (cls.kept if case[0].startswith("A") else cls.stored).append((*case, *user))

    def describe(self, number, case):
        return f"case {number} of seed {SEED}: {case!r}"

    def test_to_the_store_is_there_as_it_was_given(self):
        self.assertEqual(len(self.rows), len(self.stored))
        for number, (case, row) in enumerate(zip(self.stored, self.rows)):
            event_id, value, time_ms, open_id, version = case
            stored_id, stored_value, stored_time, kind, stored_version, stored_open_id = row
            about = self.describe(number, case)
            self.assertEqual(stored_id, event_id, about)
            self.assertEqual(int(stored_time), time_ms, about)
            self.assertEqual(kind, 0 if event_id.count("|") == 1 else 1, about)
            self.assertEqual((stored_open_id, stored_version), (open_id, version), about)
            if value is None or isinstance(value, str):
                self.assertEqual(stored_value, value or "", about)
            else:
                self.assertEqual(parsed(stored_value), parsed(as_json(value)), about)

    def test_to_analytics_is_there_as_the_same_json(self):
        self.assertEqual(len(self.events), len(self.kept))
        for number, (case, (kept_id, payload)) in enumerate(zip(self.kept, self.events)):
            event_id, value, time_ms, open_id, version = case
            about = self.describe(number, case)
            self.assertEqual(kept_id, event_id, about)
            root = json.loads(payload)
            self.assertEqual(int(root["extend"]["createTime"]), time_ms, about)
            self.assertEqual((root["eventData"]["openid"], root["extend"]["hublinkVersion"]),
                             (open_id, version), about)
            data = dict(members(payload)[1])["eventData"][1]
            given = members(as_json(value))[1] if value else []
            self.assertEqual(repr(data[:-2]), repr(given), about)
            self.assertEqual([name for name, _ in data[-2:]], ["openid", "sys_version"], about)

    def test_is_most_of_what_was_given(self):
        counts = {result: len(cases) for result, cases in self.results.items()}
        self.assertGreater(len(self.stored), CASES / 3, counts)
        self.assertGreater(len(self.kept), CASES / 20, counts)
        failures = (Result.NOBODY_LISTENS, Result.OTHER_USERS_SERVICE, Result.WOULD_BLOCK,
                    Result.SYSTEM_ERROR)
        self.assertEqual([result for result in failures if counts[result]], [])
        if CASES >= 10_000:  # fewer cases may miss one by chance
            self.assertEqual([result for result in (Result.TOO_LONG, Result.INVALID_TEXT, Result.INVALID_JSON,
                                                    Result.INVALID_EVENT_ID) if not counts[result]], [])

    def test_is_all_that_had_no_reason_against_it(self):
        for case in self.results[Result.INVALID_TEXT]:
            self.assertTrue(any(broken(all_of(text)) for text in case[:2]), case)
        for case in self.results[Result.TOO_LONG]:
            # A byte of the text takes at most six bytes in the datagram, even after it was escaped twice.
            self.assertGreater(6 * len("".join(map(all_of, case[:2])).encode("utf-8", "replace")), 9000, case)
        for event_id, *_ in self.results[Result.INVALID_EVENT_ID]:
            module, bar, _ = event_id.partition("|")
            self.assertTrue(not event_id or broken(event_id) or
                            event_id.startswith("A") and not (bar and module in ("A759", "A100")), event_id)
        for event_id, value, _ in self.results[Result.INVALID_JSON]:
            self.assertTrue(no_json(value) or event_id.startswith("A") and no_object(value),
                            (event_id, value))
        for open_id, version in self.users[Result.QUOTE_IN_USER]:
            self.assertIn("'", open_id + version)
        for open_id, version in self.users[Result.INVALID_TEXT]:
            self.assertTrue(not open_id or broken(open_id + version), (open_id, version))


def all_of(value):
    """All texts within a value, as they are."""
    if isinstance(value, Json):
        return value.text
    return value if isinstance(value, str) else json.dumps(value, ensure_ascii=False)


def no_json(value):
    try:
        json.dumps(json.loads(as_json(value)), allow_nan=False, ensure_ascii=False).encode()
    except (ValueError, RecursionError):
        return True
    return False


def no_object(value):
    """That the service reads."""
    return isinstance(value, str) or not as_json(value).lstrip().startswith("{") or \
        any(str(number) in as_json(value) for number in NO_NUMBERS)


class AService(unittest.TestCase):
    def test_that_was_restarted_is_told_module_and_user_again(self):
        with Service(PROGRAMS) as service:
            reporter = Reporter(Module("A100", "2.1", "Painter"))
            self.assertIs(reporter.set_user("u1", "5.1"), Result.SENT)
            self.assertIs(reporter.event("A100|1", {"n": 1}), Result.SENT)
            wait_until(lambda: service.count() == 1)
            service.stop()
            self.assertIs(reporter.event("A100|2"), Result.NOBODY_LISTENS)
            service.start()
            self.assertIs(reporter.event("A100|3", {"n": 3}), Result.SENT)
            self.assertIs(reporter.event("B100|4", "it's"), Result.SENT)
            self.assertEqual(in_child(lambda: reporter.event("B100|5") is Result.SENT), 0)
            wait_until(lambda: service.count() == 4)
            self.assertEqual([event for event, _ in service.kept()], ["A100|1", "A100|3"])
            self.assertEqual([(row[0], row[1], row[4], row[5]) for row in service.stored()],
                             [("B100|4", "it's", "5.1", "u1"), ("B100|5", "", "5.1", "u1")])


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1])
