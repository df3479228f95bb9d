"""A reporter and its surroundings: a service that stops and starts, other users, a full buffer, threads,
forks."""
import contextlib
import errno
import gc
import os
import pathlib
import resource
import shutil
import socket
import subprocess
import sys
import tempfile
import threading
import time
import unittest
import warnings
from unittest import mock

from support import ADDRESS, NOBODY, ROOT, Listener, in_child, listener_of_another_user, wait_until

import hublink_report
from hublink_report import Module, Reporter, Result

NO_TABLE = (pathlib.Path("/nowhere"), pathlib.Path("/nowhere"))


def later(seconds):
    """The clock of the module, so far ahead."""
    now = time.monotonic()
    return mock.patch.object(hublink_report.time, "monotonic", lambda: now + seconds)


@contextlib.contextmanager
def no_free_descriptor():
    """The program can open no file within it."""
    before = resource.getrlimit(resource.RLIMIT_NOFILE)
    resource.setrlimit(resource.RLIMIT_NOFILE, (0, before[1]))
    try:
        yield
    finally:
        resource.setrlimit(resource.RLIMIT_NOFILE, before)


class Reporting(unittest.TestCase):
    def setUp(self):
        self.reporter = Reporter(Module("A100", "2.1", "Painter"))
        self.addCleanup(self.reporter.close)

    def expect(self, result, event_id="A100|1"):
        self.assertIs(self.reporter.event(event_id), result)


class AServiceThatIsGone(Reporting):
    def test_is_noticed_at_each_event(self):
        self.expect(Result.NOBODY_LISTENS)
        self.expect(Result.NOBODY_LISTENS, "B100|1")
        self.assertIs(self.reporter.set_user("u1"), Result.NOBODY_LISTENS)
        self.assertEqual(self.reporter.count(Result.NOBODY_LISTENS), 3)

    def test_is_told_user_and_module_when_it_comes(self):
        self.reporter.set_user("u1")
        self.expect(Result.NOBODY_LISTENS)
        with Listener() as listener:
            self.expect(Result.SENT)
            self.assertEqual(listener.kinds(), ["updateOpenID", "init", "A100|1"])

    def test_is_told_both_again_when_it_comes_back(self):
        with Listener():
            self.expect(Result.SENT)
            self.reporter.set_user("u1")
        self.expect(Result.NOBODY_LISTENS)
        with Listener() as listener:
            self.expect(Result.SENT, "B100|1")
            self.expect(Result.SENT)
            self.assertEqual(listener.kinds(), ["updateOpenID", "B100|1", "init", "A100|1"])

    def test_is_noticed_where_the_system_has_no_table(self):
        with mock.patch.object(hublink_report, "_TABLES", NO_TABLE):
            self.reporter.set_user("u1")
            self.expect(Result.NOBODY_LISTENS)
            with Listener() as listener:
                self.expect(Result.SENT)
                self.assertEqual(listener.kinds(), ["updateOpenID", "init", "A100|1"])


class ARestart(Reporting):
    def setUp(self):
        super().setUp()
        with Listener():
            self.expect(Result.SENT)
            self.reporter.set_user("u1")
        self.listener = Listener()
        self.addCleanup(self.listener.socket.close)

    def test_between_two_events_is_noticed_within_a_second(self):
        with later(1):
            self.expect(Result.SENT)
        self.assertEqual(self.listener.kinds(), ["updateOpenID", "init", "A100|1"])

    def test_is_noticed_once(self):
        for seconds in (5, 10, 100):
            with later(seconds):
                self.expect(Result.SENT)
        self.assertEqual(self.listener.kinds(), ["updateOpenID", "init", "A100|1", "A100|1", "A100|1"])

    def test_is_allowed_for_every_few_minutes_where_the_system_has_no_table(self):
        with mock.patch.object(hublink_report, "_TABLES", NO_TABLE):
            for seconds in (5, 100, 170, 190, 360, 380):
                with later(seconds):
                    self.expect(Result.SENT)
        told = ["updateOpenID", "init"]
        # This is the first time that the reporter finds no table, so it announces both first.
        self.assertEqual(self.listener.kinds(),
                         told + ["A100|1"] * 3 + told + ["A100|1"] * 2 + told + ["A100|1"])

    def test_that_the_system_tells_late_costs_no_event(self):
        """As a busy system does: the error of an earlier datagram comes up at the next."""
        sends = iter([ConnectionRefusedError()])

        class Late(socket.socket):
            def send(self, *arguments):
                for error in sends:
                    raise error
                return super().send(*arguments)

        self.reporter.close()
        with mock.patch.object(hublink_report.socket, "socket", Late):
            self.expect(Result.SENT)
        self.assertEqual(self.listener.kinds(), ["updateOpenID", "init", "A100|1"])


class AnAnnouncement(Reporting):
    """Is repeated, because the service may not have got it."""

    def setUp(self):
        super().setUp()
        self.listener = Listener()
        self.addCleanup(self.listener.socket.close)

    def kinds_at(self, seconds, event_id="A100|1"):
        with later(seconds):
            self.expect(Result.SENT, event_id)
        return self.listener.kinds()

    def users(self):
        """Open id and version of each user that was told, and the event ids, in their order."""
        return [tuple(message["exdata"].values()) if "msgType" in message else message["eventID"]
                for message in self.listener.messages()]

    def test_that_the_full_buffer_of_the_listener_lost_is_repeated_within_a_second(self):
        self.listener.fill()
        self.assertIs(self.reporter.set_user("u1", "5.1"), Result.SENT)
        self.expect(Result.SENT)
        self.listener.datagrams()  # what filled the buffer
        self.assertEqual(self.kinds_at(0), ["A100|1"])  # the loss is not seen yet
        self.assertEqual(self.kinds_at(1), ["updateOpenID", "init", "A100|1"])
        self.assertEqual(self.kinds_at(2), ["A100|1"])  # nothing was lost since

    def test_is_repeated_every_three_minutes_in_any_case(self):
        self.reporter.set_user("u1")
        told = ["updateOpenID", "init", "A100|1"]
        self.assertEqual([self.kinds_at(seconds) for seconds in (0, 100, 181, 300, 362)],
                         [told, ["A100|1"], told, ["A100|1"], told])

    def test_of_a_user_is_repeated_with_the_last_version_that_was_not_empty(self):
        self.reporter.set_user("u1", "5.1")
        self.reporter.set_user("u2")
        self.assertEqual(self.users(), [("u1", "5.1"), ("u2", "")])
        with later(181):
            self.expect(Result.SENT, "B100|1")
        self.assertEqual(self.users(), [("u2", "5.1"), "B100|1"])

    def test_of_a_user_has_the_version_that_could_not_be_told_before(self):
        self.listener.fill()
        self.reporter.set_user("u1", "5.1")
        self.listener.datagrams()
        with later(1):
            self.reporter.set_user("u2")
        self.assertEqual(self.users(), [("u2", "5.1")])

    def test_of_a_user_goes_without_the_version_when_both_together_are_too_long(self):
        self.reporter.set_user("u1", "5" * 5000)
        self.reporter.set_user("u" * 6000)
        self.listener.datagrams()
        with later(181):
            self.expect(Result.SENT, "B100|1")
        self.assertEqual(self.users(), [("u" * 6000, ""), "B100|1"])


class AServiceOfAnotherUser(Reporting):
    def setUp(self):
        super().setUp()
        if os.geteuid() != 0 or subprocess.run(["setpriv", f"--reuid={NOBODY}", "true"],
                                               capture_output=True).returncode != 0:
            self.skipTest("needs the right to become another user")

    def test_is_sent_nothing(self):
        with listener_of_another_user() as received:
            self.expect(Result.OTHER_USERS_SERVICE)
            self.expect(Result.OTHER_USERS_SERVICE, "B100|1")
            self.assertIs(self.reporter.set_user("u1"), Result.OTHER_USERS_SERVICE)
            self.assertEqual(received(), "nothing")

    def test_is_sent_to_where_it_is_allowed(self):
        with listener_of_another_user() as received:
            self.assertIs(Reporter(allow_other_users_service=True).event("B100|1"), Result.SENT)
            self.assertIn("B100|1", received())

    def test_that_ends_makes_room_for_ones_own(self):
        self.reporter.set_user("u1")
        with listener_of_another_user():
            self.expect(Result.OTHER_USERS_SERVICE)
            self.expect(Result.OTHER_USERS_SERVICE)
        with Listener() as listener:
            self.expect(Result.SENT)
            self.assertEqual(listener.kinds(), ["updateOpenID", "init", "A100|1"])

    def test_is_sent_nothing_without_a_free_descriptor(self):
        self.expect(Result.NOBODY_LISTENS, "B100|1")
        with listener_of_another_user() as received:
            with no_free_descriptor():
                self.expect(Result.SYSTEM_ERROR, "B100|1")
                self.assertIs(self.reporter.set_user("u1"), Result.SYSTEM_ERROR)
            self.expect(Result.OTHER_USERS_SERVICE, "B100|1")
            with no_free_descriptor():
                self.expect(Result.OTHER_USERS_SERVICE, "B100|1")
            self.assertEqual(received(), "nothing")

    def test_that_takes_the_place_of_ones_own_is_noticed_within_a_second(self):
        with Listener():
            self.expect(Result.SENT)
        with listener_of_another_user() as received, later(1):
            self.expect(Result.OTHER_USERS_SERVICE)
            self.assertEqual(received(), "nothing")


class TheTableOfSockets(unittest.TestCase):
    LINE = ("  696: {}:270D {}:{} 07 00000000:00000000 00:00000000 00000000 {:5}        0 {} 2 "
            "00000000370a03e8 0\n")
    LOCAL, ANY = "0100007F", "00000000"

    def found(self, *lines):
        table = "".join(self.LINE.format(address, remote, port, user, inode)
                        for address, remote, port, user, inode in lines)
        return [listener[1:3] for listener in sorted(hublink_report._listeners(table, 1000))]

    def test_has_the_service_first_at_its_very_address(self):
        self.assertEqual(self.found((self.ANY, self.ANY, "0000", 0, 1),
                                    (self.LOCAL, self.ANY, "0000", 1000, 2)),
                         [(True, "2"), (False, "1")])

    def test_has_another_users_before_ones_own(self):
        self.assertEqual(self.found((self.LOCAL, self.ANY, "0000", 1000, 1),
                                    (self.LOCAL, self.ANY, "0000", 7, 2),
                                    (self.LOCAL, self.ANY, "0000", 1000, 3)),
                         [(False, "2"), (True, "1"), (True, "3")])

    def test_has_no_service_in_senders_and_other_addresses(self):
        self.assertEqual(self.found((self.LOCAL, self.LOCAL, "270D", 0, 1),
                                    ("0200007F", self.ANY, "0000", 0, 2)), [])

    def test_is_read_as_this_machine_writes_it(self):
        for address in ("127.0.0.1", "0.0.0.0"):
            with self.subTest(address), socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as bound:
                bound.bind((address, ADDRESS[1]))
                found = hublink_report._listener(hublink_report._table())
                self.assertEqual((found.is_own, found.inode), (True, str(os.fstat(bound.fileno()).st_ino)))
                self.assertIs(Reporter().event("B100|1"), Result.SENT)
        self.assertIsNone(hublink_report._listener(hublink_report._table()))


class AFullBuffer(Reporting):
    def test_is_told_and_never_waited_for(self):
        if not shutil.which("tc"):
            self.skipTest("needs tc")
        # A network that passes a byte a second, so that sent datagrams stay in the sender's buffer.
        tc = ["tc", "qdisc", "add", "dev", "lo", "root", "tbf", "rate", "8bit", "burst", "4000", "limit",
              "10000000"]
        with Listener():
            self.expect(Result.SENT)
            if subprocess.run(tc, capture_output=True).returncode != 0:
                self.skipTest("needs a kernel with a token bucket")
            self.addCleanup(subprocess.run, ["tc", "qdisc", "del", "dev", "lo", "root"], check=True)
            results = [self.reporter.event("B100|1", "x" * 1000) for _ in range(2000)]
            self.assertEqual(set(results), {Result.SENT, Result.WOULD_BLOCK})
            self.assertIs(results[-1], Result.WOULD_BLOCK)
            self.assertEqual(self.reporter.count(Result.WOULD_BLOCK), results.count(Result.WOULD_BLOCK))

    def test_of_another_system_is_told_likewise(self):
        for error in (BlockingIOError(errno.EAGAIN, ""), OSError(errno.ENOBUFS, "")):
            with mock.patch.object(hublink_report.socket.socket, "send", side_effect=error):
                self.expect(Result.WOULD_BLOCK, "B100|1")

    def test_is_made_large_enough_for_a_report(self):
        made = mock.Mock()
        made.getsockopt.return_value = 9216
        with mock.patch.object(hublink_report.socket, "socket", return_value=made):
            hublink_report._connected()
        made.setsockopt.assert_called_once_with(socket.SOL_SOCKET, socket.SO_SNDBUF, 65536)


class AnErrorOfTheSystem(Reporting):
    def test_is_a_result(self):
        with mock.patch.object(hublink_report.socket, "socket", side_effect=OSError(errno.EMFILE, "")):
            self.expect(Result.SYSTEM_ERROR)
        for error in (OSError(errno.EPERM, ""), MemoryError(), RuntimeError()):
            with mock.patch.object(hublink_report.socket.socket, "send", side_effect=error):
                self.expect(Result.SYSTEM_ERROR)
        with Listener():
            self.expect(Result.SENT)

    def test_leaves_a_file_alone_that_got_the_sockets_number(self):
        with Listener() as listener, tempfile.TemporaryFile() as file:
            self.expect(Result.SENT)
            number = self.reporter._socket.fileno()
            os.dup2(file.fileno(), number)  # as in a program that closed all of its files and opened others
            self.addCleanup(os.close, number)
            self.expect(Result.SENT)
            self.assertNotEqual(self.reporter._socket.fileno(), number)
            self.assertEqual((file.read(), os.fstat(number).st_ino), (b"", os.fstat(file.fileno()).st_ino))
            self.assertEqual(listener.kinds(), ["init", "A100|1", "A100|1"])

    def test_leaves_another_socket_alone_that_got_the_sockets_number(self):
        with Listener() as listener, Listener(("127.0.0.1", 9998)) as others, \
                socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as connected:
            connected.connect(("127.0.0.1", 9998))
            self.expect(Result.SENT)
            number = self.reporter._socket.fileno()
            os.dup2(connected.fileno(), number)
            self.addCleanup(os.close, number)  # which fails unless it was left open
            with later(1):
                self.expect(Result.SENT)
            self.assertEqual((listener.kinds(), others.datagrams()), (["init", "A100|1", "A100|1"], []))

    def test_of_no_free_descriptor_leaves_ones_own_service_the_events(self):
        with Listener() as listener:
            self.expect(Result.SENT)
            with no_free_descriptor(), later(1):
                self.expect(Result.SENT)
            self.assertEqual(listener.kinds(), ["init", "A100|1", "A100|1"])

    def test_within_a_table_is_no_table(self):
        with tempfile.NamedTemporaryFile() as table, Listener():
            table.write(b"  1: 0100007F:270D 00000000:0000 07\n")
            table.flush()
            with mock.patch.object(hublink_report, "_TABLES",
                                   (pathlib.Path(table.name), pathlib.Path("/nowhere"))):
                self.expect(Result.SENT)


class AFork(Reporting):
    def test_leaves_each_process_a_socket(self):
        with Listener() as listener:
            self.expect(Result.SENT)
            mine = self.reporter._socket.getsockname()
            self.assertEqual(in_child(lambda: self.reporter.event("A100|2") is Result.SENT
                                      and self.reporter._socket.getsockname() != mine), 0)
            self.expect(Result.SENT, "A100|3")
            self.assertEqual(listener.kinds(), ["init", "A100|1", "A100|2", "A100|3"])

    def test_while_a_thread_reports_leaves_no_lock_behind(self):
        held, release = threading.Event(), threading.Event()

        def hold():
            with self.reporter._lock:
                held.set()
                release.wait()

        thread = threading.Thread(target=hold)
        thread.start()
        held.wait()
        try:
            with Listener():
                self.assertEqual(in_child(lambda: self.reporter.event("A100|2") is Result.SENT), 0)
        finally:
            release.set()
            thread.join()

    def test_never_meets_a_thread_that_imports_for_the_module(self):
        """The child would wait for ever for the import's lock."""
        script = ("import sys; from hublink_report import Json, Module, Reporter, Result;"
                  "before = set(sys.modules);"
                  "reporter = Reporter(Module('A100', '1', 'n'));"
                  "results = {reporter.set_user('u'), reporter.event('A100|1', Json('{\"a\":[1.5,1]}')),"
                  "reporter.event('B100|1', '\\u00fc'), reporter.event('B100|1', '\\ud800')};"
                  "assert results == {Result.SENT, Result.INVALID_TEXT}, results;"
                  "print(*set(sys.modules) - before)")
        with Listener():
            outcome = subprocess.run([sys.executable, "-B", "-c", script], cwd=ROOT / "clients/python",
                                     text=True, check=True, stdout=subprocess.PIPE)
        self.assertEqual(outcome.stdout.strip(), "")

    def test_in_the_midst_of_many_threads_costs_no_event(self):
        forks, events = 20, Listener.AT_ONCE - 10
        codes, kinds, permits = [], [], threading.Semaphore(0)

        def report():
            while permits.acquire() and len(codes) < forks:
                self.expect(Result.SENT)

        workers = [threading.Thread(target=report) for _ in range(4)]
        with Listener() as listener:
            for worker in workers:
                worker.start()
            while len(codes) < forks:
                permits.release(events)
                code = in_child(lambda: self.reporter.event("A100|child") is Result.SENT)
                wait_until(lambda: self.reporter.count(Result.SENT) == (len(codes) + 1) * events)
                kinds += listener.kinds()
                codes.append(code)
            permits.release(len(workers))
            for worker in workers:
                worker.join()
        self.assertEqual(codes, [0] * forks)
        self.assertEqual((kinds.count("A100|1"), kinds.count("A100|child")), (forks * events, forks))


class Threads(Reporting):
    THREADS, ROUNDS = 8, 100
    EVENTS = Listener.AT_ONCE // THREADS  # each thread's events in a round

    def test_send_each_event_once_and_the_announcement_first(self):
        self.addCleanup(sys.setswitchinterval, sys.getswitchinterval())
        sys.setswitchinterval(1e-6)  # so that threads switch at every place
        received, self.turn = [], threading.Barrier(self.THREADS + 1)
        workers = [threading.Thread(target=self.report, args=(name,)) for name in range(self.THREADS)]
        with Listener() as listener:
            for worker in workers:
                worker.start()
            for _ in range(self.ROUNDS):
                self.turn.wait(60)
                received += listener.kinds()
                self.turn.wait(60)
            for worker in workers:
                worker.join()
        sent = self.ROUNDS * self.EVENTS
        self.assertEqual(received[0], "init")
        for name in range(self.THREADS):  # the events of one thread must be in order
            self.assertEqual([kind for kind in received if kind.startswith(f"A100|{name}.")],
                             [f"A100|{name}.{number}" for number in range(sent)])
        self.assertEqual(len(received), 1 + self.THREADS * sent)
        self.assertEqual(self.reporter.count(Result.SENT), self.THREADS * sent)

    def report(self, name):
        for number in range(self.ROUNDS * self.EVENTS):
            self.reporter.event(f"A100|{name}.{number}")
            if number % self.EVENTS == self.EVENTS - 1:
                self.turn.wait(60)
                self.turn.wait(60)


class AReporter(Reporting):
    def test_that_was_closed_opens_again(self):
        with Listener() as listener, self.reporter:
            self.expect(Result.SENT)
            self.reporter.close()
            self.expect(Result.SENT)
            self.assertEqual(listener.kinds(), ["init", "A100|1", "A100|1"])

    def test_that_is_dropped_closes_its_socket_and_says_nothing(self):
        before = set(os.listdir("/proc/self/fd"))
        with warnings.catch_warnings(record=True) as told:
            warnings.simplefilter("always")
            Reporter().event("B100|1")
            gc.collect()
        self.assertEqual(told, [])
        self.assertEqual(set(os.listdir("/proc/self/fd")), before)

    def test_lets_an_interruption_of_the_program_through(self):
        with mock.patch.object(hublink_report.socket.socket, "send", side_effect=KeyboardInterrupt):
            with self.assertRaises(KeyboardInterrupt):
                self.reporter.event("B100|1")
        with Listener():
            self.expect(Result.SENT)

    def test_may_report_within_a_report(self):
        """As a signal handler does, or a finaliser."""
        send = socket.socket.send
        inner = []

        class Interrupted(socket.socket):
            def send(this, data):
                if not inner:
                    inner.append(None)
                    inner.append(self.reporter.event("B100|inner"))
                return send(this, data)

        with Listener() as listener, mock.patch.object(hublink_report.socket, "socket", Interrupted):
            self.expect(Result.SENT, "B100|outer")
            self.assertEqual(listener.kinds(), ["B100|inner", "B100|outer"])
        self.assertIs(inner[1], Result.SENT)


if __name__ == "__main__":
    unittest.main()
