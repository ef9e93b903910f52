"""A session of libtiktal, and its time references as a repeated capability."""
from __future__ import annotations

import ctypes
import datetime
import threading
from ctypes import byref
from typing import Any, Callable, Iterator, List, NamedTuple, Optional, Tuple

from . import _library
from ._attributes import SessionAttributes, TimeReferenceAttributes
from .attributes import from_text, to_boolean, to_text
from .errors import ERROR_MESSAGE_SIZE, INVALID_OBJECT, Error, Warning, status_hex, warn

# Give "AllConnected" as either end of a disconnect to remove every route from or to the other end.
ALL_CONNECTED = "AllConnected"

# The library's texts come from answers it bounds at 4 MiB. A size query that answers more than
# this is no size: it fails as the (unknown) status it is, rather than allocating what it asks.
MAX_TEXT_SIZE = 1 << 26

# The epoch of tiktal_GetTime.
EPOCH = datetime.datetime(1970, 1, 1, tzinfo=datetime.timezone.utc)

# A text output: called with (bufferSize, buffer), returns the status.
TextCall = Callable[[int, Any], int]


class SelfTestResult(NamedTuple):
    """What tiktal_self_test reports: its result code (0 passed) and message."""

    code: int
    message: str


class Time(NamedTuple):
    """The time of a time service: seconds and nanoseconds since 1970-01-01 UTC, and the same as
    an aware datetime in UTC (to the microsecond)."""

    seconds: int
    nanoseconds: int
    utc: datetime.datetime


class Session(SessionAttributes):
    """A session of libtiktal on a resource: "SyncTestInternal___" (the call-tracing session),
    "sync://HOST/DEVICE" (a time service), or a device alias or PXI resource name (a timing
    module or a simulated device).

    Use it as a context manager, or call close(). Calls on one session may come from several
    threads: the library serializes them. A closed session raises Error (tiktalerr_invalidObject)
    on every use but close(), which may be called any number of times.

    The attributes that name no time reference are properties of the session
    (selected_time_reference, terminal_58_value, serial_number, ...); those of a time reference
    are properties of session.time_references[name].
    """

    __slots__ = ("_library", "_handle", "_resource_name", "_close_lock", "__weakref__")

    def __init__(self, resource_name: str, reset: bool = False) -> None:
        self._handle: Optional[int] = None
        self._close_lock = threading.Lock()
        self._resource_name = resource_name
        name = to_text(resource_name, "resource_name")
        reset_flag = to_boolean(reset, "reset")
        self._library = _library.library()
        vi = _library.ViSession(0)
        status = self._library.tiktal_init(name, 0, 1 if reset_flag else 0, byref(vi))
        if status < 0:
            if vi.value:  # a failed open leaves no session behind
                self._library.tiktal_close(vi.value)
            raise Error(status, self._message(status), "tiktal_init")
        self._handle = vi.value
        if status > 0:
            warn(Warning(status, self._message(status), "tiktal_init"))

    # --- life -----------------------------------------------------------------------------

    @property
    def resource_name(self) -> str:
        return self._resource_name

    @property
    def closed(self) -> bool:
        return self._handle is None

    def close(self) -> None:
        """Closes the session; closing a closed session does nothing. A call another thread is
        making on the session fails or finishes; later calls raise Error."""
        with self._close_lock:
            handle, self._handle = self._handle, None
        if handle is not None:
            self._check("tiktal_close", self._library.tiktal_close(handle))

    def __enter__(self) -> "Session":
        return self

    def __exit__(self, *exc_info: Any) -> None:
        self.close()

    def __del__(self) -> None:
        try:
            if getattr(self, "_handle", None) is not None:
                self.close()
        except Exception:  # nothing can report a failure of the clean-up of a forgotten session
            pass

    def __repr__(self) -> str:
        return f"<tiktal.Session {self._resource_name!r} {'closed' if self.closed else 'open'}>"

    # --- functions of every session --------------------------------------------------------

    def self_test(self) -> SelfTestResult:
        """Runs the self test: its result code (0 passed) and message."""
        vi = self._vi("tiktal_self_test")
        result = _library.ViInt16(0)
        message = ctypes.create_string_buffer(ERROR_MESSAGE_SIZE + 1)
        self._check("tiktal_self_test", self._library.tiktal_self_test(vi, byref(result), message))
        return SelfTestResult(result.value, from_text(message.value))

    def reset(self) -> None:
        """Resets the device (a timing module); a time service refuses it."""
        self._check("tiktal_reset", self._library.tiktal_reset(self._vi("tiktal_reset")))

    # --- time services ---------------------------------------------------------------------

    @property
    def time_reference_names(self) -> List[str]:
        """The names of the time service's time references, in the service's order."""
        vi = self._vi("tiktal_GetTimeReferenceNames")
        text = self._text("tiktal_GetTimeReferenceNames",
                          lambda size, buffer: int(self._library.tiktal_GetTimeReferenceNames(vi, size, buffer)))
        return text.split(",") if text else []

    @property
    def time_references(self) -> "TimeReferences":
        """The time references by name: session.time_references["PTP1"].ptp_priority1, or
        `for reference in session.time_references`."""
        return TimeReferences(self)

    def get_time(self) -> Time:
        """The time service's time."""
        vi = self._vi("tiktal_GetTime")
        seconds, nanoseconds, fraction = _library.ViUInt32(0), _library.ViUInt32(0), _library.ViUInt16(0)
        self._check("tiktal_GetTime",
                    self._library.tiktal_GetTime(vi, byref(seconds), byref(nanoseconds), byref(fraction)))
        utc = EPOCH + datetime.timedelta(seconds=seconds.value, microseconds=nanoseconds.value // 1000)
        return Time(seconds.value, nanoseconds.value, utc)

    def persist_config(self) -> None:
        """The time service stores its configuration."""
        self._check("tiktal_PersistConfig", self._library.tiktal_PersistConfig(self._vi("tiktal_PersistConfig")))

    # --- timing modules --------------------------------------------------------------------

    def connect_trigger(self, src: str, dest: str, invert: bool = False, sync_clock: Optional[str] = None) -> None:
        """Routes the trigger terminal `src` to `dest` (inverted when `invert`), synchronized to
        `sync_clock` when given. The route lasts until it is disconnected or the session closes."""
        vi = self._vi("tiktal_ConnectTrigTerminals")
        clock = b"" if sync_clock is None else to_text(sync_clock, "sync_clock")
        self._check("tiktal_ConnectTrigTerminals", self._library.tiktal_ConnectTrigTerminals(
            vi, to_text(src, "src"), to_text(dest, "dest"), clock, 1 if to_boolean(invert, "invert") else 0, 0))

    def disconnect_trigger(self, src: str, dest: str) -> None:
        """Removes the trigger route from `src` to `dest`; ALL_CONNECTED at either end stands for
        every terminal routed from or to the other."""
        vi = self._vi("tiktal_DisconnectTrigTerminals")
        self._check("tiktal_DisconnectTrigTerminals", self._library.tiktal_DisconnectTrigTerminals(
            vi, to_text(src, "src"), to_text(dest, "dest")))

    def connect_clock(self, src: str, dest: str) -> None:
        """Routes the clock terminal `src` to `dest`, until it is disconnected or the session closes."""
        vi = self._vi("tiktal_ConnectClkTerminals")
        self._check("tiktal_ConnectClkTerminals", self._library.tiktal_ConnectClkTerminals(
            vi, to_text(src, "src"), to_text(dest, "dest")))

    def disconnect_clock(self, src: str, dest: str) -> None:
        """Removes the clock route from `src` to `dest` (ALL_CONNECTED accepted at either end)."""
        vi = self._vi("tiktal_DisconnectClkTerminals")
        self._check("tiktal_DisconnectClkTerminals", self._library.tiktal_DisconnectClkTerminals(
            vi, to_text(src, "src"), to_text(dest, "dest")))

    # --- attributes (called by the properties) ----------------------------------------------

    def _attribute_access(self) -> Tuple["Session", Optional[str]]:
        return self, None

    def _get_attribute(self, type_name: str, item: Optional[str], attribute: int) -> Any:
        function = f"tiktal_GetAttributeVi{type_name}"
        vi = self._vi(function)
        name = None if item is None else to_text(item, "time reference name")
        if type_name == "String":
            call = self._library.tiktal_GetAttributeViString
            return self._text(function, lambda size, buffer: int(call(vi, name, attribute, size, buffer)))
        value: Any = {"Int32": _library.ViInt32, "Real64": _library.ViReal64, "Boolean": _library.ViBoolean}[type_name]()
        self._check(function, getattr(self._library, function)(vi, name, attribute, byref(value)))
        return value.value != 0 if type_name == "Boolean" else value.value

    def _set_attribute(self, type_name: str, item: Optional[str], attribute: int, value: Any) -> None:
        function = f"tiktal_SetAttributeVi{type_name}"
        vi = self._vi(function)
        name = None if item is None else to_text(item, "time reference name")
        if type_name == "Boolean":
            value = 1 if value else 0
        self._check(function, getattr(self._library, function)(vi, name, attribute, value))

    # --- statuses --------------------------------------------------------------------------

    def _vi(self, function: str) -> int:
        """The session's handle; a closed session fails here, before any call."""
        handle = self._handle
        if handle is None:
            raise Error(INVALID_OBJECT, self._message(INVALID_OBJECT), function)
        return handle

    def _message(self, status: int) -> str:
        message = ctypes.create_string_buffer(ERROR_MESSAGE_SIZE + 1)
        result = self._library.tiktal_error_message(self._handle or 0, status, message)
        if result < 0:
            return f"(no message: tiktal_error_message returned {status_hex(result)})"
        return message.value.decode("utf-8", "replace")

    def _is_known_status(self, status: int) -> bool:
        """Whether the library has a message of its own for `status` (an unknown one gets the
        warning tiktalerr_warn_unknownStatus)."""
        message = ctypes.create_string_buffer(ERROR_MESSAGE_SIZE + 1)
        return bool(self._library.tiktal_error_message(self._handle or 0, status, message) == 0)

    def _check(self, function: str, status: int) -> int:
        """Raises Error for a negative status, emits Warning for a positive one."""
        if status < 0:
            raise Error(status, self._message(status), function)
        if status > 0:
            warn(Warning(status, self._message(status), function))
        return status

    def _text(self, function: str, call: TextCall) -> str:
        """A text output through the size query: the size first, then the text in a buffer of
        that size. A warning answering the size query is no size: it is emitted, and the text
        is empty, as the library gave none."""
        status = call(0, None)
        if status < 0:
            raise Error(status, self._message(status), function)
        if status == 0:
            return ""
        if self._is_known_status(status):
            warn(Warning(status, self._message(status), function))
            return ""
        if status > MAX_TEXT_SIZE:
            raise Error(status, self._message(status), function)
        buffer = ctypes.create_string_buffer(status + 1)  # a NUL beyond what the library may write
        self._check(function, call(status, buffer))
        return from_text(buffer.value)


class TimeReference(TimeReferenceAttributes):
    """One time reference of a time service, by name; its attributes are its properties."""

    __slots__ = ("_session", "_name")

    def __init__(self, session: Session, name: str) -> None:
        to_text(name, "time reference name")
        self._session = session
        self._name = name

    @property
    def name(self) -> str:
        return self._name

    @property
    def session(self) -> Session:
        return self._session

    def _attribute_access(self) -> Tuple[Session, Optional[str]]:
        return self._session, self._name

    def __eq__(self, other: object) -> bool:
        if not isinstance(other, TimeReference):
            return NotImplemented
        return self._session is other._session and self._name == other._name

    def __hash__(self) -> int:
        return hash((id(self._session), self._name))

    def __repr__(self) -> str:
        return f"<tiktal.TimeReference {self._name!r} of {self._session!r}>"


class TimeReferences:
    """The time references of a session's time service: indexed by name (no call is made until
    an attribute is read), and iterated in the service's order (each iteration asks the service
    for the names once; len(session.time_reference_names) counts them)."""

    __slots__ = ("_session",)

    def __init__(self, session: Session) -> None:
        self._session = session

    def __getitem__(self, name: str) -> TimeReference:
        if not isinstance(name, str):
            raise TypeError(f"time references are indexed by name, not {type(name).__name__}")
        return TimeReference(self._session, name)

    def __iter__(self) -> Iterator[TimeReference]:
        return iter([TimeReference(self._session, name) for name in self._session.time_reference_names])

    def __contains__(self, name: object) -> bool:
        return name in self._session.time_reference_names

    def __repr__(self) -> str:
        return f"<tiktal.TimeReferences of {self._session!r}>"
