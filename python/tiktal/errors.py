"""The statuses of libtiktal as Python exceptions and warnings.

Every C function returns a status: 0 is success, a negative status an error (raised as Error), a
positive one a warning (emitted as Warning through the warnings module; the call goes on and
returns its value). The message of a status is the library's own, from tiktal_error_message.
"""
from __future__ import annotations

import os
import sys
import warnings
from types import FrameType
from typing import Any, List, Optional, Tuple

# tiktal_error_message writes at most this many bytes, its NUL included.
ERROR_MESSAGE_SIZE = 256

# Statuses that the package itself reports.
INVALID_OBJECT = 0xBFFF000E - (1 << 32)  # tiktalerr_invalidObject: the session is closed


def status_hex(code: int) -> str:
    """A status as the library prints it: 0x and eight upper-case hexadecimal digits."""
    return f"0x{code & 0xFFFFFFFF:08X}"


class _Status:
    """What an error and a warning both carry: the status, the library's text of it, and the C
    function that returned it."""

    code: int
    message: str
    function: str

    def __init__(self, code: int, message: str, function: str) -> None:
        super().__init__(code, message, function)  # type: ignore[call-arg]
        self.code = code
        self.message = message
        self.function = function

    def __str__(self) -> str:
        return f"{self.function}: {status_hex(self.code)} {self.message}"


class Error(_Status, Exception):
    """A call of libtiktal failed.

    code is the status (a negative number, as the C interface returns it), message the library's
    text of it, and function the C function that returned it.
    """


class Warning(_Status, UserWarning):  # noqa: A001 - the package's warning class is tiktal.Warning
    """A call of libtiktal returned a warning: a positive status. It is emitted through the
    warnings module (warnings.simplefilter("error", tiktal.Warning) raises it instead).

    code is the status, message the library's text of it, and function the C function.
    """


class LibraryError(OSError):
    """libtiktal could not be loaded. looked lists every place tried, each with why it failed."""

    def __init__(self, message: str, looked: List[str]) -> None:
        super().__init__(message)
        self.looked = list(looked)

    def __reduce__(self) -> Tuple[Any, ...]:
        return (type(self), (self.args[0], self.looked))


_PACKAGE_FOLDER = os.path.dirname(os.path.abspath(__file__)) + os.sep


def warn(warning: Warning) -> None:
    """Emits `warning` as raised by the caller's line: the first frame outside this package."""
    level = 2  # warnings.warn's stack level of warn's caller
    frame: Optional[FrameType] = sys._getframe(1)
    while frame is not None and os.path.abspath(frame.f_code.co_filename).startswith(_PACKAGE_FOLDER):
        frame = frame.f_back
        level += 1
    warnings.warn(warning, stacklevel=level)
