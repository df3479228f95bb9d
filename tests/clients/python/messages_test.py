"""What the module makes of an event, a module and a user: the datagrams, byte for byte, and what it
refuses."""
import ast
import decimal
import json
import re
import time
import unittest

from support import ROOT, Listener

from hublink_report import Json, Module, Reporter, Result

STORE, ANALYTICS = "B100|10001", "A759|10001"


class Sending(unittest.TestCase):
    def setUp(self):
        self.listener = Listener()
        self.addCleanup(self.listener.socket.close)
        self.reporter = Reporter(Module("A100", "2.1", "Painter"))
        self.addCleanup(self.reporter.close)

    def sent(self, *arguments, **more):
        """The datagram of an event."""
        self.assertIs(self.reporter.event(*arguments, **more), Result.SENT)
        return self.listener.datagrams()[-1]

    def value(self, *arguments):
        return json.loads(self.sent(*arguments))["value"]

    def refused(self, result, *arguments, **more):
        self.assertIs(self.reporter.event(*arguments, **more), result)
        self.assertEqual(self.listener.datagrams(), [])


class AnEvent(Sending):
    def test_is_one_json_object(self):
        self.assertEqual(self.sent(STORE, "hello", time_ms=1700000000123, day_report=True),
                         '{"eventID":"B100|10001","value":"hello",'
                         '"createTime":1700000000123,"isDayReport":1}')

    def test_has_no_value_where_none_is_given(self):
        self.assertEqual(self.sent(STORE, time_ms=0),
                         '{"eventID":"B100|10001","createTime":0,"isDayReport":0}')

    def test_is_of_now_in_milliseconds(self):
        before = time.time_ns() // 1_000_000
        self.assertIn(json.loads(self.sent(STORE))["createTime"],
                      range(before, time.time_ns() // 1_000_000 + 1))

    def test_gives_a_time_of_ten_characters_an_eleventh(self):
        for time_ms, text in ((1234567890, "01234567890"), (-123456789, "-0123456789")):
            self.assertEqual(json.loads(self.sent(STORE, time_ms=time_ms))["createTime"], text)
        for time_ms in (123456789, 12345678901, -12345678, -1234567890):
            self.assertEqual(json.loads(self.sent(STORE, time_ms=time_ms))["createTime"], time_ms)

    def test_needs_an_id_in_utf8(self):
        for event_id in ("", "B\ud800", "B\0", None, 5, b"B100|1"):
            self.refused(Result.INVALID_EVENT_ID, event_id)

    def test_begins_with_a_only_for_a_module_that_the_service_knows(self):
        for event_id in ("A", "A100", "A759", "A7590|1", "A10|1", "A200|1", "A 100|1"):
            self.refused(Result.INVALID_EVENT_ID, event_id)
        for event_id in ("A100|1", "A100|1|2", "A100|", "A759|1", "a200", "|A200"):
            self.sent(event_id)

    def test_has_at_most_10240_bytes(self):
        room = 10240 - len(self.sent(STORE, "", time_ms=1700000000123))
        self.assertEqual(len(self.sent(STORE, "x" * room, time_ms=1700000000123)), 10240)
        self.refused(Result.TOO_LONG, STORE, "x" * (room + 1), time_ms=1700000000123)
        self.refused(Result.TOO_LONG, STORE, "x" * (room - 1) + "\u00fc", time_ms=1700000000123)
        self.sent(STORE, Json("[" + " " * 10240 + "]"))
        self.refused(Result.TOO_LONG, STORE, ["x" * 1_000_000])


class AText(Sending):
    def test_has_its_quotes_doubled_for_the_store(self):
        self.assertEqual(self.value(STORE, "it's ''"), "it''s ''''")
        self.assertEqual(json.loads(self.sent("B'1"))["eventID"], "B''1")

    def test_has_them_as_they_are_in_an_id_for_analytics(self):
        self.assertEqual(json.loads(self.sent("A759|'1"))["eventID"], "A759|'1")

    def test_is_utf8_and_has_no_zero(self):
        self.assertEqual(self.value(STORE, "\u00fc\U0001f600\x01\x7f\"\\%s"),
                         "\u00fc\U0001f600\x01\x7f\"\\%s")
        self.refused(Result.INVALID_TEXT, STORE, "a\0b")
        self.refused(Result.INVALID_TEXT, STORE, "a\ud800b")

    def test_is_no_value_for_analytics(self):
        for text in ("hello", "{}", ""):
            self.refused(Result.INVALID_JSON, ANALYTICS, text)


class AnObject(Sending):
    def test_goes_as_an_object(self):
        self.assertIn(',"value":{"page":"start","n":[1,2.5,null,true]},',
                      self.sent(STORE, {"page": "start", "n": [1, 2.5, None, True]}))

    def test_has_quotes_doubled_in_keys_and_texts_for_the_store_alone(self):
        self.assertEqual(self.value(STORE, {"a'": ["it's"]}), {"a''": ["it''s"]})
        self.assertEqual(self.value(ANALYTICS, {"a'": ["it's"]}), {"a'": ["it's"]})

    def test_has_quotes_doubled_that_are_escaped(self):
        self.assertIn(r"""{"a":"\\u0027 '' \\''"}""",
                      self.sent(STORE, Json(r"""{"a":"\\u0027 \u0027 \\'"}""")))
        self.assertIn(r'{"a":"\u0027"}', self.sent(ANALYTICS, Json(r'{"a":"\u0027"}')))

    def test_keeps_the_text_that_was_given_but_for_white_space(self):
        for event_id in (STORE, ANALYTICS):
            self.assertIn(r',"value":{"b ":1.50,"a":1e2,"a":"\u0000"},',
                          self.sent(event_id, Json(' { "b " : 1.50,\n"a":\t1e2, "a":\r"\\u0000" }\t')))

    def test_is_refused_where_it_is_no_json(self):
        for value in ({"a": float("nan")}, {"a": float("inf")}, {"a": object()}, {"a": {1}}, {b"a": 1},
                      {"a": decimal.Decimal(1)}, {"a": Json("1")}):
            for event_id in (STORE, ANALYTICS):
                self.refused(Result.INVALID_JSON, event_id, value)
        circle = []
        circle.append(circle)
        self.refused(Result.INVALID_JSON, STORE, circle)

    def test_goes_as_a_text_to_the_store_where_the_service_would_print_it_as_another(self):
        for number in (str(2**64), str(-(2**63) - 1), "1" * 5000, "1e400", "-0", "0.12345678901234567",
                       "1e-400"):
            text = '{"a":%s,"b":"\'"}' % number
            self.assertEqual(self.value(STORE, Json(text)), text.replace("'", "''"))
        for number in (2**64 - 1, -(2**63), 1.7976931348623157e308, 5e-324, -0.0, 0.1 + 0.2, 1e22 * 10):
            self.assertEqual(self.value(STORE, {"a": number}), {"a": number})

    def test_is_refused_for_analytics_where_the_service_cannot_read_it(self):
        for value in ({"a": 2**64}, {"a": -(2**63) - 1}, Json('{"a":1e400}'),
                      Json('{"a":%s}' % ("1" * 5000))):
            self.refused(Result.INVALID_JSON, ANALYTICS, value)

    def test_with_a_lone_surrogate_is_no_text(self):
        self.refused(Result.INVALID_TEXT, STORE, {"a": "\ud800"})
        self.refused(Result.INVALID_TEXT, STORE, Json('{"a":"\ud800"}'))
        self.refused(Result.INVALID_TEXT, STORE, Json('{"a":"\0"}'))


class Jsons(Sending):
    def test_are_checked(self):
        for text in ("", " ", "{", "{'a':1}", '{"a":1}}', "[1,]", "NaN", "-Infinity", "01", "1.", "\ufeff{}",
                     '"\n"', "tru", '"\\x"', '"\\u12"', "\u0661", "1.\u0661"):
            self.refused(Result.INVALID_JSON, STORE, Json(text))

    def test_may_hold_whole_surrogate_pairs_in_escapes(self):
        for text in (r'["\ud83d\ude00"]', r'["\\ud800"]', r'["\uD83D\uDE00\ud83d\ude00"]'):
            self.assertIn(text, self.sent(STORE, Json(text)))
        for text in (r'["\ud83d"]', r'["\ude00\ud83d"]', r'["\ud83d\\\ude00"]',
                     r'["\ud83d\ud83d\ude00\ude00"]', r'{"\udc00":1}', r'"\\\ud800"'):
            self.refused(Result.INVALID_JSON, STORE, Json(text))

    def test_may_nest_127_levels_for_analytics_and_more_for_the_store(self):
        def nested(levels):
            return '{"a":' * levels + "1" + "}" * levels
        self.assertEqual(json.dumps(self.value(STORE, Json(nested(127))), separators=(",", ":")), nested(127))
        self.assertEqual(self.value(STORE, Json(nested(128))), nested(128))
        self.sent(ANALYTICS, Json(nested(127)))
        self.refused(Result.INVALID_JSON, ANALYTICS, Json(nested(128)))
        self.refused(Result.INVALID_JSON, STORE, Json("[" * 10000))
        self.assertEqual(self.value(STORE, Json('[%s"%s"]' % ("[]," * 200, "[" * 200))),
                         [[]] * 200 + ["[" * 200])

    def test_that_are_no_object_are_refused_for_analytics(self):
        for text in ("null", "1", '"a"', "[]", "true"):
            self.refused(Result.INVALID_JSON, ANALYTICS, Json(text))
        self.refused(Result.INVALID_JSON, ANALYTICS, [])

    def test_stay_json_in_the_store_where_they_are_a_scalar(self):
        for text in ("null", "true", "1.50", '"a"'):
            self.assertEqual(self.value(STORE, Json(f" {text} ")), text)
        self.assertEqual(self.value(STORE, Json('"it\'s"')), '"it\'\'s"')

    def test_of_another_type_are_refused(self):
        for value in (1, 1.5, True, b"x", (1,), {1}, object(), Json(5), Json(None)):
            self.refused(Result.INVALID_JSON, STORE, value)
        self.refused(Result.INVALID_JSON, STORE, time_ms=1.5)
        self.refused(Result.INVALID_JSON, STORE, time_ms=2**63)


class AModule(Sending):
    def test_is_announced_before_its_first_event(self):
        self.sent(STORE)
        self.reporter.event("A100|1")
        self.reporter.event("A100|2")
        self.assertEqual(self.listener.datagrams()[0],
                         '{"msgType":"init","exdata":{"moduleID":"A100","moduleVersion":"2.1",'
                         '"moduleName":"Painter","logPath":"","dbPath":"","openID":"","hublinkVersion":""}}')
        self.reporter.event("A100|3")
        self.assertEqual(self.listener.kinds(), ["A100|3"])

    def test_hides_the_word_that_would_make_its_announcement_a_report(self):
        self.assertIs(Reporter(Module("A100", "", '\\eventIDeventID"')).event("A100|1"), Result.SENT)
        announcement = self.listener.datagrams()[0]
        self.assertNotIn("eventID", announcement)
        self.assertEqual(json.loads(announcement)["exdata"]["moduleName"], '\\eventIDeventID"')

    def test_that_cannot_be_announced_has_events_that_cannot_be_sent(self):
        for module, result in ((Module("A1", "\0"), Result.INVALID_TEXT),
                               (Module("A1", "", "\ud800"), Result.INVALID_TEXT),
                               (Module("A1", 2.1), Result.INVALID_TEXT),
                               (Module("A1", "", None), Result.INVALID_TEXT),
                               (Module("A1", b"2.1"), Result.INVALID_TEXT),
                               (Module(1), Result.INVALID_EVENT_ID),
                               (Module("A1", "x" * 10240), Result.TOO_LONG)):
            reporter = Reporter(module)
            self.assertIs(reporter.event("A1|1"), result)
            self.assertIs(reporter.event(STORE), Result.SENT)

    def test_must_be_a_module(self):
        with self.assertRaises(TypeError):
            Reporter("A100")


class AUser(Sending):
    def test_is_told_at_once(self):
        self.assertIs(self.reporter.set_user("u1 eventID", "5.1"), Result.SENT)
        self.assertEqual(self.listener.datagrams(),
                         ['{"msgType":"updateOpenID",'
                          '"exdata":{"openID":"u1 event\\u0049D","hublinkVersion":"5.1"}}'])

    def test_is_refused_with_a_quote_or_without_a_text(self):
        for user, result in ((("u'1",), Result.QUOTE_IN_USER), (("u", "5'"), Result.QUOTE_IN_USER),
                             (("",), Result.INVALID_TEXT), (("u\0",), Result.INVALID_TEXT),
                             (("u", "\ud800"), Result.INVALID_TEXT), ((None,), Result.INVALID_TEXT),
                             (("x" * 10240,), Result.TOO_LONG)):
            self.assertIs(self.reporter.set_user(*user), result)
        self.sent(STORE)
        self.assertEqual(self.listener.datagrams(), [])


class Counters(Sending):
    def test_have_each_result(self):
        self.sent(STORE)
        self.refused(Result.INVALID_TEXT, STORE, "\0")
        self.reporter.set_user("it's")
        self.reporter.set_user("me")
        counts = {result: self.reporter.count(result) for result in Result if self.reporter.count(result)}
        self.assertEqual([self.reporter.count(other) for other in ("SENT", 0, None, [])], [0] * 4)
        self.assertEqual(counts, {Result.SENT: 2, Result.INVALID_TEXT: 1, Result.QUOTE_IN_USER: 1})


class TheModule(unittest.TestCase):
    FILE = ROOT / "clients/python/hublink_report.py"

    def test_is_written_for_python_3_9(self):
        ast.parse(self.FILE.read_text(), feature_version=(3, 9))

    def test_has_itself_as_its_stubs(self):
        """Without installed stubs, type checkers take each name of an installed module for Any."""
        self.assertEqual((self.FILE.parent / "hublink_report-stubs/__init__.pyi").read_text(),
                         self.FILE.read_text())

    def test_has_the_version_of_the_library_for_cpp(self):
        library = re.search(r"VERSION ([0-9.]+)",
                            (ROOT / "Client/CMakeLists.txt").read_text().split("project(")[1])[1]
        self.assertIn(f'\nversion = "{library}"\n', (self.FILE.parent / "pyproject.toml").read_text())


if __name__ == "__main__":
    unittest.main()
