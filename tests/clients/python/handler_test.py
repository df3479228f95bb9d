"""The handler that sends log records as events."""
import contextlib
import io
import json
import logging
import pathlib
import unittest

from support import Listener

from hublink_report import Reporter, ReportHandler, Result


class Handler(unittest.TestCase):
    def setUp(self):
        self.listener = Listener()
        self.addCleanup(self.listener.socket.close)
        self.reporter = Reporter()
        self.addCleanup(self.reporter.close)
        self.logger = logging.getLogger("painter.canvas")
        self.logger.propagate = False
        self.logger.setLevel(logging.DEBUG)
        self.use(ReportHandler(self.reporter))

    def use(self, handler):
        self.handler = handler
        self.logger.handlers = [handler]

    def one(self):
        """The event that was sent, after it was stored: the service takes two quotes for one."""
        (text,) = self.listener.datagrams()
        return json.loads(text.replace("''", "'"))


class ARecord(Handler):
    def test_is_an_event_of_its_logger(self):
        self.logger.warning("it's %d%%", 5)
        event = self.one()
        self.assertEqual(event["eventID"], "Log|painter.canvas")
        line = event["value"].pop("line")
        self.assertEqual(event["value"],
                         {"level": "WARNING", "logger": "painter.canvas", "message": "it's 5%",
                          "file": __file__})
        self.assertIn("it's %d%%", pathlib.Path(__file__).read_text().splitlines()[line - 1])

    def test_has_the_time_of_its_making(self):
        record = self.logger.makeRecord("a", logging.INFO, "f", 1, "m", (), None)
        record.created = 1700000000.123
        self.logger.handle(record)
        self.assertEqual(self.one()["createTime"], 1700000000123)

    def test_has_the_event_id_that_was_asked_for(self):
        for event_id in ("B100|%(name)s.%(levelno)d", lambda record: f"B100|{record.name}.{record.levelno}"):
            self.use(ReportHandler(self.reporter, event_id))
            self.logger.error("x")
            self.assertEqual(self.one()["eventID"], "B100|painter.canvas.40")

    def test_below_the_handlers_level_is_not_sent(self):
        self.use(ReportHandler(self.reporter, level=logging.ERROR))
        self.logger.warning("x")
        self.assertEqual(self.listener.datagrams(), [])

    def test_may_go_to_analytics(self):
        self.use(ReportHandler(self.reporter, "A759|%(levelname)s"))
        self.logger.error("x")
        event = self.one()
        self.assertEqual((event["eventID"], event["value"]["message"]), ("A759|ERROR", "x"))

    def test_is_told_as_the_handlers_formatter_says(self):
        self.handler.setFormatter(logging.Formatter("<%(message)s>"))
        self.logger.error("x")
        self.assertEqual(self.one()["value"]["message"], "<x>")

    def test_has_the_trace_of_its_exception(self):
        try:
            raise ValueError("no such brush")
        except ValueError:
            self.logger.exception("x")
        message = self.one()["value"]["message"]
        self.assertTrue(message.startswith("x\nTraceback"), message)
        self.assertTrue(message.endswith("ValueError: no such brush"), message)

    def test_that_is_too_long_is_cut_at_its_end(self):
        for character in ("x", "'", "\x01", "\U0001f600"):
            self.logger.error("begin " + character * 1_000_000)
            (text,) = self.listener.datagrams()
            value = json.loads(text)["value"]
            self.assertIs(value["cut"], True)
            self.assertTrue(value["message"].startswith("begin " + character))
            self.assertGreater(len(text.encode()), 6000)

    def test_with_half_a_character_is_told_in_escapes(self):
        self.logger.error("cannot open %s", b"\xff.png".decode("utf-8", "surrogateescape"))
        self.assertEqual(self.one()["value"]["message"], "cannot open \\udcff.png")


class ARecordThatFails(Handler):
    def test_is_counted_and_neither_raised_nor_printed(self):
        class Bad:
            def __str__(self):
                raise RuntimeError("bad")
        with contextlib.redirect_stderr(io.StringIO()) as errors:
            self.logger.error("%s", Bad())
            self.logger.error("%d", "x")
            self.use(ReportHandler(self.reporter, "%(nothing)s"))
            self.logger.error("x")
        self.assertEqual((errors.getvalue(), self.handler.failed), ("", 1))
        self.assertEqual(self.listener.datagrams(), [])

    def test_is_counted_by_the_reporter_where_it_was_not_sent(self):
        self.listener.socket.close()
        self.logger.error("x")
        self.use(ReportHandler(self.reporter, "%(name)s"))
        logging.Logger.handle(self.logger, self.logger.makeRecord("App", 40, "f", 1, "m", (), None))
        self.assertEqual((self.reporter.count(Result.NOBODY_LISTENS),
                          self.reporter.count(Result.INVALID_EVENT_ID)),
                         (1, 1))

    def test_because_it_logs_itself_does_so_once(self):
        logger = self.logger

        class Talkative:
            def __str__(self):
                logger.error("%s", self)
                return "hello"

        self.logger.error("%s", Talkative())
        self.assertEqual(self.one()["value"]["message"], "hello")
        self.assertEqual(self.handler.failed, 1)
        self.logger.error("next")
        self.assertEqual(self.one()["value"]["message"], "next")


if __name__ == "__main__":
    unittest.main()
