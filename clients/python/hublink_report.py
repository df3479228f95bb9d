"""Sends usage reports to the report service of the HubLink suite, which listens on 127.0.0.1:9997.

    from hublink_report import Module, Reporter, Result

    reporter = Reporter(Module("A100", "2.1", "Painter"))
    reporter.event("A100|10001", {"page": "start"})  # the id begins with A: goes to analytics
    reporter.event("B100|10001", "it's open")        # any other id: goes to the local store

Purpose: a text arrives exactly as it was given, or the result says why it was not sent. A reporter doubles
quotes for the store and escapes JSON. It announces its own module and tells the service who is signed in. It
does both again after the service was restarted, after Linux dropped datagrams to the service, and every three
minutes of events in any case.

Threads: every operation may be called from any thread, and in the child of a fork, where the reporter opens a
socket of its own. This library starts no thread.

Failure: `event` and `set_user` never raise, with any arguments. They never wait, and they write nothing to
the terminal. An argument of a wrong type gives a result that says that it cannot be sent. Only exceptions
such as KeyboardInterrupt, which are not errors, pass through.

What `Result.SENT` promises: the system took the datagram, and a program listens. Linux drops a datagram
without an error when the listener's buffer is full. So events of a long burst that come faster than the
service reads them can be lost. When an announcement is dropped, the module's events of the next second can be
lost, too.

Uses the standard library only. Needs Python 3.9 or later.
"""

from __future__ import annotations

import contextlib
import enum
import errno
import json
import logging
import os
import re
import socket
import sys
import threading
import time
import weakref
from dataclasses import dataclass
from pathlib import Path
from types import TracebackType
from typing import Any, Callable, Dict, List, NamedTuple, Optional, Tuple, Type, Union

__all__ = ["Json", "Module", "ReportHandler", "Reporter", "Result", "Value"]

_HOST, _PORT = "127.0.0.1", 9997
_MAX_BYTES = 10240  # the service cuts off what is longer
_MAX_DEPTH = 127  # levels of a value: the service reads 128, and the report's object around it is one of them
_SEND_BUFFER_BYTES = 65536  # the default of macOS is 9216, and a report may be longer
_LOOK_SECONDS = 1.0  # between two looks at the system's table of sockets; a look takes about 50 microseconds
_TELL_SECONDS = 180.0  # between two announcements in any case: a look may not show that the service lost one
_DEFAULT_MODULE = "A759"  # the service knows this module from its start


class Result(enum.Enum):
    """What happened to an event, or to a user that was set."""

    SENT = 0  #: the system took the datagram, and a program listens; see the top of the file
    NOBODY_LISTENS = 1  #: no service runs; the event is lost, and the next event tries again
    TOO_LONG = 2  #: the datagram would have more than 10240 bytes
    #: A text has half a surrogate pair, which UTF-8 cannot hold, or a zero character. Or an open id is empty,
    #: or a part of a user or of the module is not a str.
    INVALID_TEXT = 3
    #: The value is not JSON, or the time is not an int of 64 bits. Or the value of an event for analytics is
    #: given, but is not an object that the service can read: at most 127 levels, integers of at most 64 bits,
    #: other numbers within the range of a double.
    INVALID_JSON = 4
    #: The event id is empty, or is not a valid text (see INVALID_TEXT). Or it is for analytics, and has no
    #: bar, or the module before the bar is neither the reporter's nor A759.
    INVALID_EVENT_ID = 5
    #: An open id or a suite version has a single quote in it. The store needs a quote written twice, and
    #: analytics needs it written once, so no text would be right for both.
    QUOTE_IN_USER = 6
    #: The service runs for another user and would put the report into that user's store.
    OTHER_USERS_SERVICE = 7
    WOULD_BLOCK = 8  #: the send buffer of the reporter's socket is full
    #: Any other reason. Without a free descriptor, this library cannot see whose service it is, so it sends
    #: nothing to a service that it has not seen before.
    SYSTEM_ERROR = 9


class Module(NamedTuple):
    """The module of the suite that reports. Its event ids begin with its id and a bar, and its id begins with
    A."""

    id: str
    version: str = ""
    name: str = ""


@dataclass(frozen=True)
class Json:
    """A value that is given as JSON text. The text is checked when the event is sent."""

    text: str


#: The value of an event: nothing, a text, or JSON.
Value = Union[None, str, Json, Dict[str, Any], List[Any]]


class _Refusal(Exception):
    def __init__(self, result: Result) -> None:
        super().__init__(result)
        self.result = result


# --- Writing messages ---------------------------------------------------------------------------------------

_ENCODER = json.JSONEncoder(ensure_ascii=False, allow_nan=False, separators=(",", ":"))


def _any_number(text: str) -> None:
    """Refuses digits of other scripts, which Python's own reader may accept."""
    if not text.isascii():
        raise ValueError(text + " is no JSON")


def _kept_integer(text: str) -> None:
    _any_number(text)
    if len(text) > 20 or not -(2**63) <= int(text) < 2**64:
        raise ValueError("an integer of more than 64 bits, of which the service keeps some digits only")


def _kept_real(text: str) -> None:
    _any_number(text)
    if abs(float(text)) == float("inf"):
        raise ValueError("a number beyond the range of a double, which the service refuses")


def _exact_integer(text: str) -> None:
    _kept_integer(text)
    if text == "-0":
        raise ValueError("an integer has no negative zero")


def _exact_real(text: str) -> None:
    """Refuses a number that a double may change. A double keeps 15 digits, except close to its limits."""
    _kept_real(text)
    number = float(text)
    if repr(number) != text and (len(text) > 15 or not 1e-300 < abs(number) < 1e300):
        raise ValueError("a number of more digits than a double has")


def _no_number(text: str) -> None:
    raise ValueError(text + " is no JSON")


#: Three readers, each stricter than the one before. _JSON reads all JSON, _KEPT_JSON what the service can
#: read, and _EXACT_JSON what the service also prints again as the same value.
_JSON = json.JSONDecoder(parse_int=_any_number, parse_float=_any_number, parse_constant=_no_number)
_KEPT_JSON = json.JSONDecoder(parse_int=_kept_integer, parse_float=_kept_real, parse_constant=_no_number)
_EXACT_JSON = json.JSONDecoder(parse_int=_exact_integer, parse_float=_exact_real, parse_constant=_no_number)

_STRING = re.compile(r'"[^"\\]*(?:\\.[^"\\]*)*"', re.DOTALL)
_STRING_OR_BLANKS = re.compile(r'("[^"\\]*(?:\\.[^"\\]*)*")|[ \t\r\n]+', re.DOTALL)
_PAIR = re.compile(r"\\u[dD][89abAB][0-9a-fA-F]{2}\\u[dD][c-fC-F][0-9a-fA-F]{2}")
_SURROGATE = re.compile(r"\\u[dD][89a-fA-F]")
_QUOTE = re.compile(r"\\\\|'|\\u0027")


def _is_read(text: str, decoder: json.JSONDecoder) -> bool:
    try:
        decoder.decode(text)
        return True
    except (ValueError, RecursionError):
        return False


def _is_flat(text: str) -> bool:
    """Whether the service can read all levels of the JSON."""
    if text.count("[") + text.count("{") <= _MAX_DEPTH:
        return True
    depth = deepest = 0
    for character in _STRING.sub("", text):
        depth += (character in "[{") - (character in "]}")
        deepest = max(deepest, depth)
    return deepest <= _MAX_DEPTH


def _has_lone_surrogate(text: str) -> bool:
    """Whether one half of a surrogate pair, such as \\udc00, stands alone as an escape. A "u" after an
    escaped backslash is not an escape."""
    return "\\u" in text and _SURROGATE.search(_PAIR.sub("", text.replace("\\\\", "--"))) is not None


def _is_text(text: str) -> bool:
    try:
        return b"\0" not in text.encode()
    except UnicodeEncodeError:
        return False


def _checked_text(text: str) -> str:
    if not isinstance(text, str) or not _is_text(text):
        raise _Refusal(Result.INVALID_TEXT)
    return text


def _doubled(text: str) -> str:
    """Doubles the quotes of a text for the store, because the service puts it unchanged into an SQL
    statement."""
    return text.replace("'", "''")


def _doubled_in_json(text: str) -> str:
    """Doubles the quotes in the strings of an object or array. The service reads it and prints it again, so a
    quote that is written as an escape becomes a quote there, too."""
    if "'" not in text and "\\u0027" not in text:
        return text
    return _QUOTE.sub(lambda found: found[0] if found[0] == "\\\\" else "''", text)


def _json_text(value: Union[Json, Dict[str, Any], List[Any]]) -> str:
    """Returns `value` as JSON without white space."""
    if isinstance(value, Json) and isinstance(value.text, str):
        text = _checked_text(value.text)
    elif isinstance(value, (dict, list)):
        text = _checked_text(_encoded(value))
    else:
        raise _Refusal(Result.INVALID_JSON)
    if not _is_read(text, _JSON) or _has_lone_surrogate(text):
        raise _Refusal(Result.INVALID_JSON)
    return _STRING_OR_BLANKS.sub(r"\1", text)


def _encoded(value: Union[Dict[str, Any], List[Any]]) -> str:
    try:
        return _ENCODER.encode(value)
    # RuntimeError: another thread changes the value
    except (TypeError, ValueError, RecursionError, RuntimeError):
        raise _Refusal(Result.INVALID_JSON) from None


def _value_for_store(value: Value) -> Optional[str]:
    """The report's member "value", as JSON; None when the report has none."""
    if value is None:
        return None
    if isinstance(value, str):
        return _ENCODER.encode(_doubled(_checked_text(value)))
    text = _json_text(value)
    if text[0] in "{[" and _is_flat(text) and _is_read(text, _EXACT_JSON):
        return _doubled_in_json(text)
    # As JSON, the service would print this as another value: a string without its quotation marks, null as
    # nothing. It does not change a text, so the JSON goes as a text.
    return _ENCODER.encode(_doubled(text))


def _value_for_analytics(value: Value) -> Optional[str]:
    if value is None:
        return None
    if isinstance(value, str):
        raise _Refusal(Result.INVALID_JSON)
    text = _json_text(value)
    if text[0] != "{" or not _is_flat(text) or not _is_read(text, _KEPT_JSON):
        raise _Refusal(Result.INVALID_JSON)
    return text


def _time(time_ms: Optional[int]) -> str:
    """The time as JSON, in milliseconds. The service takes a time of ten characters for seconds. So a number
    of ten characters is written as a string with a leading zero."""
    if time_ms is None:
        return str(time.time_ns() // 1_000_000)
    if not isinstance(time_ms, int) or not -(2**63) <= time_ms < 2**63:
        raise _Refusal(Result.INVALID_JSON)
    text = str(int(time_ms))
    return text if len(text) != 10 else f'"{int(time_ms):011d}"'


def _datagram(text: str) -> bytes:
    data = text.encode()
    if len(data) > _MAX_BYTES:
        raise _Refusal(Result.TOO_LONG)
    return data


def _is_for_analytics(event_id: str) -> bool:
    return event_id.startswith("A")


def _report(event_id: str, value: Value, time_ms: Optional[int], day_report: bool) -> bytes:
    if _is_for_analytics(event_id):
        spelled_id, spelled_value = event_id, _value_for_analytics(value)
    else:
        spelled_id, spelled_value = _doubled(event_id), _value_for_store(value)
    member = "" if spelled_value is None else f',"value":{spelled_value}'
    return _datagram(
        f'{{"eventID":{_ENCODER.encode(spelled_id)}{member},"createTime":{_time(time_ms)},'
        f'"isDayReport":{1 if day_report else 0}}}'
    )


def _control(kind: str, **exdata: str) -> bytes:
    """Writes a control message. The service takes every datagram with the letters eventID in it for a report.
    So one of the letters is written as an escape, which a JSON reader turns back into the letter."""
    for text in exdata.values():
        _checked_text(text)
    message = _ENCODER.encode({"msgType": kind, "exdata": exdata})
    return _datagram(message.replace("eventID", "event\\u0049D"))


def _announcement(module: Module) -> Union[bytes, Result]:
    """The datagram that announces the module, or the reason why the module's events cannot be sent."""
    try:
        return _control(
            "init",
            moduleID=module.id,
            moduleVersion=module.version,
            moduleName=module.name,
            logPath="",
            dbPath="",
            openID="",
            hublinkVersion="",
        )
    except _Refusal as refusal:
        return refusal.result


def _user(open_id: str, suite_version: str) -> bytes:
    if not isinstance(open_id, str) or not isinstance(suite_version, str) or not open_id:
        raise _Refusal(Result.INVALID_TEXT)  # the service ignores an empty open id
    if "'" in _checked_text(open_id) or "'" in _checked_text(suite_version):
        raise _Refusal(Result.QUOTE_IN_USER)
    return _control("updateOpenID", openID=open_id, hublinkVersion=suite_version)


# --- Looking for the service --------------------------------------------------------------------------------


class _Service(enum.Enum):
    """What the last look found on the service's port."""

    UNKNOWN = 0
    ABSENT = 1
    USABLE = 2  #: this user's; or others' are allowed; or this system does not show whose it is
    OTHERS = 3


class _Listener(NamedTuple):
    is_wildcard: bool
    is_own: bool
    inode: str
    dropped: int  #: the datagrams that the system dropped because the socket's buffer was full


def _in_table(address: str) -> str:
    """The address as the kernel's table writes it: one number in the machine's byte order."""
    return f"{int.from_bytes(socket.inet_aton(address), sys.byteorder):08X}"


_EXACT_ADDRESS, _WILDCARD = _in_table(_HOST), _in_table("0.0.0.0")
#: Of the calling thread's network, and where that file does not exist, of the process's. The service binds an
#: address of IPv4, so the table of IPv6 cannot show it.
_TABLES = (Path("/proc/thread-self/net/udp"), Path("/proc/net/udp"))


def _listeners(table: str, user: int) -> List[_Listener]:
    found = []
    for fields in (line.split() for line in table.splitlines() if f":{_PORT:04X} " in line):
        address, _, port = fields[1].partition(":")
        is_ours = port == f"{_PORT:04X}" and address in (_EXACT_ADDRESS, _WILDCARD)
        if is_ours and fields[2].endswith(":0000"):
            is_own = int(fields[7]) == user
            found.append(_Listener(address == _WILDCARD, is_own, fields[9], int(fields[12])))
    return found


def _table() -> Optional[bytes]:
    """The system's table of UDP sockets; None when it has none or the program may not read it, which does not
    change. Raises OSError when the table cannot be read now, for example without a free descriptor."""
    for path in _TABLES:
        try:
            return path.read_bytes()
        except (FileNotFoundError, PermissionError):
            pass
    return None


def _listener(table: bytes) -> Optional[_Listener]:
    """The socket that receives a datagram to the service; None when there is none.

    A socket that is bound to 127.0.0.1 itself comes before one that is bound to all addresses. Of several
    such sockets, one of another user is returned.
    """
    # The table is bytes, not text: Python imports a text's codec at its first use. A fork during an import
    # would leave the child a lock that no thread releases.
    return min(_listeners(table.decode(), os.geteuid()), default=None)


def _inode(number: int) -> int:
    """The inode of an open file or socket; 0 when the number belongs to none. No other open socket has it."""
    try:
        return os.fstat(number).st_ino
    except OSError:
        return 0


#: Errors that an open, connected socket never returns. Then the program has closed our descriptor, and its
#: number may belong to another file now.
_NOT_OURS = {errno.EBADF, errno.ENOTSOCK, errno.EDESTADDRREQ, errno.ENOTCONN}

# --- Sending ------------------------------------------------------------------------------------------------


def _connected() -> socket.socket:
    """A new socket that is connected to the service's port. The system would not report to an unconnected
    socket that no program listens."""
    made = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)
    try:
        made.setblocking(False)
        if made.getsockopt(socket.SOL_SOCKET, socket.SO_SNDBUF) < _SEND_BUFFER_BYTES:
            made.setsockopt(socket.SOL_SOCKET, socket.SO_SNDBUF, _SEND_BUFFER_BYTES)
        made.connect((_HOST, _PORT))
    except BaseException:
        made.close()
        raise
    return made


class Reporter:
    """Sends events and tells the service who is signed in. See the top of the file for threads and failure.

    Without a module of its own, a reporter sends events for the local store and for the default module A759
    only. It sends nothing to a service that runs for another user, unless `allow_other_users_service` is set.
    Raises TypeError when `module` is not a Module.
    """

    def __init__(self, module: Optional[Module] = None, *, allow_other_users_service: bool = False) -> None:
        if module is not None and not isinstance(module, Module):
            raise TypeError("module must be a Module")
        self._module_id = None if module is None else module.id
        self._announcement = None if module is None else _announcement(module)
        self._allow_others = allow_other_users_service
        # Guards all members below. It is recursive, because a signal handler may report while its thread
        # reports.
        self._lock = threading.RLock()
        self._counts = dict.fromkeys(Result, 0)
        self._socket: Optional[socket.socket] = None
        self._socket_inode = 0
        self._user: Optional[bytes] = None  # with the last version that was not empty
        self._due_user: Optional[bytes] = None  # what must be sent before the next event
        self._suite_version = ""
        self._module_is_told = False
        self._service = _Service.UNKNOWN
        self._listener: Optional[_Listener] = None  # that the last look found
        self._next_look = 0.0
        self._next_tell = 0.0
        _REPORTERS.add(self)

    def event(
        self, event_id: str, value: Value = None, *, time_ms: Optional[int] = None, day_report: bool = False
    ) -> Result:
        """Sends an event that happened now, or `time_ms` milliseconds after the beginning of 1970.

        For an event id that begins with A, the value must be None or an object; the service itself sets the
        members "openid" and "sys_version" in it.
        """
        return self._counted(lambda: self._event(event_id, value, time_ms, day_report))

    def set_user(self, open_id: str, suite_version: str = "") -> Result:
        """Tells the service who is signed in: now, and again as the module is announced again. The service
        adds the user to every later report, also to those of other programs, because it knows one user only.
        So two programs should not set different users. With an empty `suite_version`, it keeps the version
        that it knows, and after a restart it is told the last version that was not empty. When a text cannot
        be sent (INVALID_TEXT, QUOTE_IN_USER, TOO_LONG), nothing changes. When the system does not take the
        message now, it is sent before the next event."""
        return self._counted(lambda: self._set_user(open_id, suite_version))

    def count(self, result: Result) -> int:
        """How many calls of event and set_user returned this result. The child of a fork starts with its
        parent's counts. For an argument that is not a Result: 0."""
        with self._lock:
            return self._counts[result] if isinstance(result, Result) else 0

    def close(self) -> None:
        """Closes the socket. A later event opens another one."""
        with self._lock:
            self._drop_socket()

    def __enter__(self) -> Reporter:
        return self

    def __exit__(
        self, kind: Optional[Type[BaseException]], error: Optional[BaseException],
        trace: Optional[TracebackType]
    ) -> None:
        self.close()

    def __del__(self) -> None:
        # Without this, the interpreter may print a warning that a socket was left open.
        if getattr(self, "_socket", None) is not None:
            self._drop_socket()

    def _counted(self, work: Callable[[], Result]) -> Result:
        try:
            result = work()
        except _Refusal as refusal:
            result = refusal.result
        except Exception:  # an error in the reporter must not end the program that reports
            result = Result.SYSTEM_ERROR
        with self._lock:
            self._counts[result] += 1
        return result

    def _event(self, event_id: str, value: Value, time_ms: Optional[int], day_report: bool) -> Result:
        announcement = self._announcement_for(event_id)
        message = _report(event_id, value, time_ms, day_report)
        with self._lock:
            return self._deliver(message, announcement)

    def _set_user(self, open_id: str, suite_version: str) -> Result:
        message = _user(open_id, suite_version)
        with self._lock:
            everything, version = message, suite_version or self._suite_version
            with contextlib.suppress(_Refusal):  # id and version fit into a datagram each, but not together
                everything = _user(open_id, version)
            is_known = self._user is not None and self._due_user is None
            self._user, self._suite_version = everything, version
            self._due_user = message if is_known else everything
            return self._deliver(None, None)

    def _announcement_for(self, event_id: str) -> Optional[bytes]:
        """The announcement that must be sent before the event; None for the store and for the default
        module."""
        if not isinstance(event_id, str) or not event_id or not _is_text(event_id):
            raise _Refusal(Result.INVALID_EVENT_ID)
        if not _is_for_analytics(event_id):
            return None
        module, bar, _ = event_id.partition("|")
        if bar and module == _DEFAULT_MODULE:
            return None
        if not bar or module != self._module_id:
            raise _Refusal(Result.INVALID_EVENT_ID)
        if isinstance(self._announcement, Result):
            raise _Refusal(self._announcement)
        return self._announcement

    # The methods below are called with self._lock held.

    def _deliver(self, message: Optional[bytes], announcement: Optional[bytes]) -> Result:
        result = Result.SYSTEM_ERROR
        for _ in range(2):
            try:
                return self._try_to_deliver(message, announcement)
            except ConnectionRefusedError:
                # The system reports late that an earlier datagram was refused. The service may run again by
                # now, so we try once more.
                self._forget_service()
                result = Result.NOBODY_LISTENS
            except OSError as error:
                if error.errno not in _NOT_OURS or self._socket is None:
                    return self._result_of(error)
                self._socket.detach()
                self._socket = None
        return result

    def _try_to_deliver(self, message: Optional[bytes], announcement: Optional[bytes]) -> Result:
        now = time.monotonic()
        if self._service is not _Service.USABLE or self._socket is None or now >= self._next_look:
            self._look_for_service(now)
        if self._service is _Service.OTHERS:
            return Result.OTHER_USERS_SERVICE
        if self._service is _Service.UNKNOWN and not self._allow_others:
            return Result.SYSTEM_ERROR
        if self._socket is None:
            self._socket = _connected()
            self._socket_inode = _inode(self._socket.fileno())
        return Result.SENT if self._are_taken(self._socket, message, announcement) else Result.NOBODY_LISTENS

    def _are_taken(self, to: socket.socket, message: Optional[bytes], announcement: Optional[bytes]) -> bool:
        """Sends the announcements that are due, then the message."""
        if self._due_user is not None:
            if not self._is_taken(to, self._due_user):
                return False
            self._due_user = None
        if announcement is not None and not self._module_is_told:
            self._module_is_told = self._is_taken(to, announcement)
            if not self._module_is_told:
                return False
        return message is None or self._is_taken(to, message)

    def _is_taken(self, to: socket.socket, message: bytes) -> bool:
        to.send(message)
        if to.getsockopt(socket.SOL_SOCKET, socket.SO_ERROR) == 0 and not self._is_nobody_there():
            return True
        self._forget_service()
        return False

    def _is_nobody_there(self) -> bool:
        """The system may not report a refusal: a flood of datagrams can fill the buffer for such messages. So
        when the last look found no listener, we look again after the datagram was sent."""
        if self._service is _Service.ABSENT:
            self._look_for_service(time.monotonic())
        return self._service is _Service.ABSENT

    def _look_for_service(self, now: float) -> None:
        self._give_up_a_reused_number()
        self._next_look = now + _LOOK_SECONDS
        if now >= self._next_tell:
            self._announce_again()
            self._next_tell = now + _TELL_SECONDS
        try:
            table = _table()
        except OSError:  # what was known about a usable service holds on
            if self._service is _Service.ABSENT:  # another user's service may have come
                self._service = _Service.UNKNOWN
            return
        listener, self._service = self._found_in(table)
        # A listener of which the system has dropped datagrams may have lost our announcements. After a
        # restart, the listener is another one.
        if listener != self._listener:
            self._announce_again()
        self._listener = listener

    def _found_in(self, table: Optional[bytes]) -> Tuple[Optional[_Listener], _Service]:
        try:
            listener = None if table is None else _listener(table)
        except (ValueError, IndexError):  # another table than the one that we know
            table = listener = None
        if table is None:
            return None, _Service.USABLE
        if listener is None:
            return None, _Service.ABSENT
        return listener, _Service.USABLE if listener.is_own or self._allow_others else _Service.OTHERS

    def _give_up_a_reused_number(self) -> None:
        """Looks whether the program closed our descriptor and opened something else that got its number."""
        if self._socket is not None and _inode(self._socket.fileno()) != self._socket_inode:
            self._socket.detach()  # we do not close it: it is the program's
            self._socket = None

    def _forget_service(self) -> None:
        self._service = _Service.UNKNOWN
        self._announce_again()

    def _announce_again(self) -> None:
        """Makes the announcements due again: a service that was restarted knows neither the module nor the
        user."""
        self._due_user = self._user
        self._module_is_told = False

    def _result_of(self, error: OSError) -> Result:
        if error.errno in (errno.EAGAIN, errno.EWOULDBLOCK, errno.ENOBUFS):
            return Result.WOULD_BLOCK
        if error.errno == errno.EMSGSIZE:
            return Result.TOO_LONG
        self._drop_socket()
        return Result.SYSTEM_ERROR

    def _drop_socket(self) -> None:
        if self._socket is not None:
            self._socket.close()
        self._socket = None

    def _begin_in_child(self) -> None:
        self._lock = threading.RLock()  # a thread that the child does not have may hold the old lock
        self._drop_socket()  # on a shared socket, parent and child could each get the other's errors


_REPORTERS: weakref.WeakSet[Reporter] = weakref.WeakSet()


def _begin_in_child() -> None:
    for reporter in list(_REPORTERS):
        reporter._begin_in_child()


if hasattr(os, "register_at_fork"):
    os.register_at_fork(after_in_child=_begin_in_child)


# --- The program's log --------------------------------------------------------------------------------------

_EventIdOf = Union[str, Callable[[logging.LogRecord], str]]


class ReportHandler(logging.Handler):
    """A handler for Python's own logging. It sends each log record as an event.

        logging.getLogger().addHandler(ReportHandler(reporter, "B100|%(name)s", level=logging.WARNING))

    `event_id` is a text in which "%(name)s" and the record's other attributes are filled in, or a function
    that gets the record and returns the event id. The value is an object with "level", "logger", "message",
    "file" and "line". The message is what the handler's formatter makes of the record: by default the message
    and the exception's trace. A message that is too long for a datagram is cut at its end; the object then
    has "cut": true.

    Failure: the handler raises and prints nothing. `failed` counts the records that could not be formatted,
    and those that were logged while the handler was sending another record of the same thread. The reporter
    counts the results of all other records.
    """

    def __init__(self, reporter: Reporter, event_id: _EventIdOf = "Log|%(name)s",
                 level: int = logging.NOTSET) -> None:
        super().__init__(level)
        self.failed = 0
        self._reporter = reporter
        self._event_id = event_id
        self._thread = threading.local()

    def emit(self, record: logging.LogRecord) -> None:
        # Sending a record may log this record in the same thread.
        if getattr(self._thread, "is_busy", False):
            self.failed += 1
            return
        self._thread.is_busy = True
        try:
            self._send(record)
        except Exception:
            self.failed += 1
        finally:
            self._thread.is_busy = False

    def _send(self, record: logging.LogRecord) -> None:
        made = self._event_id(record) if callable(self._event_id) else self._event_id % record.__dict__
        event_id = _readable(made)
        time_ms = int(record.created * 1000)
        value: Dict[str, Any] = {
            "level": record.levelname,
            "logger": _readable(record.name),
            "message": _readable(self.format(record)),
            "file": _readable(record.pathname),
            "line": record.lineno,
        }
        while value["message"] and _is_too_long(event_id, value, time_ms):
            value["message"] = value["message"][: min(len(value["message"]) * 3 // 4, _MAX_BYTES)]
            value["cut"] = True
        self._reporter.event(event_id, value, time_ms=time_ms)


def _readable(text: str) -> str:
    """The text with each lone surrogate written as an escape. Python reads a file name that is not UTF-8 with
    lone surrogates; without the escapes, such a record could not be sent."""
    return text.encode("utf-8", "backslashreplace").decode()


def _is_too_long(event_id: str, value: Value, time_ms: int) -> bool:
    try:
        _report(event_id, value, time_ms, False)
    except _Refusal as refusal:
        return refusal.result is Result.TOO_LONG
    return False
