"""Finding and loading libtiktal.so, and the C signatures of the functions the package calls.

The library is looked for, first match wins:

1. the file that the environment variable TIKTAL_LIBRARY names (when it is set, nowhere else, so
   that a wrong path is reported rather than passed over);
2. the library installed beside this package: when the package lies in
   PREFIX/lib/pythonX.Y/site-packages (or dist-packages), PREFIX/lib, PREFIX/lib64 and
   PREFIX/lib/MULTIARCH, as `cmake --install` lays a prefix out;
3. the system's loader (LD_LIBRARY_PATH, its cache, the system folders).

When none loads, LibraryError names every place looked at and why it failed there.
"""
from __future__ import annotations

import ctypes
import os
import sysconfig
import threading
from ctypes import POINTER, c_char, c_char_p, c_double, c_int16, c_int32, c_uint16, c_uint32
from pathlib import Path
from typing import Any, List, Optional, Tuple

from .errors import LibraryError

ENVIRONMENT_VARIABLE = "TIKTAL_LIBRARY"
# The library's file names: its SONAME first, then the development link.
FILE_NAMES = ("libtiktal.so.0", "libtiktal.so")

# The IVI scalar types of tiktal.h.
ViStatus = c_int32
ViSession = c_uint32
ViBoolean = c_uint16
ViInt16 = c_int16
ViInt32 = c_int32
ViUInt16 = c_uint16
ViUInt32 = c_uint32
ViReal64 = c_double
ViAttr = c_uint32
ViConstString = c_char_p
ViBuffer = POINTER(c_char)  # a text output: the caller's buffer, or None for the size query

# name: parameter types after none (every function returns ViStatus)
SIGNATURES = {
    "tiktal_init": (ViConstString, ViBoolean, ViBoolean, POINTER(ViSession)),
    "tiktal_close": (ViSession,),
    "tiktal_error_message": (ViSession, ViStatus, ViBuffer),
    "tiktal_reset": (ViSession,),
    "tiktal_self_test": (ViSession, POINTER(ViInt16), ViBuffer),
    "tiktal_PersistConfig": (ViSession,),
    "tiktal_GetTime": (ViSession, POINTER(ViUInt32), POINTER(ViUInt32), POINTER(ViUInt16)),
    "tiktal_GetTimeReferenceNames": (ViSession, ViInt32, ViBuffer),
    "tiktal_GetAttributeViInt32": (ViSession, ViConstString, ViAttr, POINTER(ViInt32)),
    "tiktal_GetAttributeViReal64": (ViSession, ViConstString, ViAttr, POINTER(ViReal64)),
    "tiktal_GetAttributeViBoolean": (ViSession, ViConstString, ViAttr, POINTER(ViBoolean)),
    "tiktal_GetAttributeViString": (ViSession, ViConstString, ViAttr, ViInt32, ViBuffer),
    "tiktal_SetAttributeViInt32": (ViSession, ViConstString, ViAttr, ViInt32),
    "tiktal_SetAttributeViReal64": (ViSession, ViConstString, ViAttr, ViReal64),
    "tiktal_SetAttributeViBoolean": (ViSession, ViConstString, ViAttr, ViBoolean),
    "tiktal_SetAttributeViString": (ViSession, ViConstString, ViAttr, ViConstString),
    "tiktal_ConnectTrigTerminals": (ViSession, ViConstString, ViConstString, ViConstString, ViInt32, ViInt32),
    "tiktal_DisconnectTrigTerminals": (ViSession, ViConstString, ViConstString),
    "tiktal_ConnectClkTerminals": (ViSession, ViConstString, ViConstString),
    "tiktal_DisconnectClkTerminals": (ViSession, ViConstString, ViConstString),
}


class Library:
    """libtiktal loaded, with each function of SIGNATURES as an attribute of the same name."""

    def __init__(self, handle: ctypes.CDLL, path: str) -> None:
        self.path = path
        self._handle = handle  # keeps the library loaded
        for name, parameters in SIGNATURES.items():
            try:
                function = getattr(handle, name)
            except AttributeError:
                raise LibraryError(f"{path} lacks {name}: it is no libtiktal this package can use", [path]) from None
            function.restype = ViStatus
            function.argtypes = parameters
            setattr(self, name, function)

    def __getattr__(self, name: str) -> Any:  # for type checkers: the functions are set in __init__
        raise AttributeError(name)


_lock = threading.Lock()
_library: Optional[Library] = None


def installed_prefix(package: Optional[Path] = None) -> Optional[Path]:
    """PREFIX when the package lies in PREFIX/lib*/python*/site-packages (or dist-packages)."""
    package = package or Path(__file__).resolve().parent
    packages = package.parent
    python = packages.parent
    lib = python.parent
    if packages.name in ("site-packages", "dist-packages") and python.name.startswith("python") and \
            lib.name in ("lib", "lib64"):
        return lib.parent
    return None


def candidates_beside(prefix: Path) -> List[Path]:
    """The files the library may have in the library folders of `prefix`."""
    folders = [prefix / "lib", prefix / "lib64"]
    multiarch = sysconfig.get_config_var("MULTIARCH")
    if multiarch:
        folders.append(prefix / "lib" / multiarch)
    return [folder / name for folder in folders for name in FILE_NAMES]


def _open(name: str) -> Tuple[Optional[Library], str]:
    """The library loaded from `name` (a path, or a bare name for the loader), or why it failed."""
    try:
        return Library(ctypes.CDLL(name), name), ""
    except OSError as error:
        return None, str(error)


def _find() -> Library:
    looked: List[str] = []
    explicit = os.environ.get(ENVIRONMENT_VARIABLE)
    if explicit:
        library, why = _open(explicit)
        if library:
            return library
        raise LibraryError(f"libtiktal could not be loaded from {ENVIRONMENT_VARIABLE}={explicit}: {why}",
                           [f"{explicit} ({why})"])
    looked.append(f"{ENVIRONMENT_VARIABLE} (not set)")
    prefix = installed_prefix()
    if prefix is None:
        looked.append(f"beside the package ({Path(__file__).resolve().parent} is in no installed prefix)")
    else:
        for path in candidates_beside(prefix):
            if not path.is_file():
                looked.append(f"{path} (no such file)")
                continue
            library, why = _open(str(path))
            if library:
                return library
            looked.append(f"{path} ({why})")
    for name in FILE_NAMES:
        library, why = _open(name)
        if library:
            return library
        looked.append(f"the system loader for {name} ({why})")
    raise LibraryError("libtiktal was not found; looked at:\n  " + "\n  ".join(looked), looked)


def library() -> Library:
    """The loaded library, loading it on first use. A failed attempt is not remembered, so a later
    call after the environment changed looks again."""
    global _library
    with _lock:
        if _library is None:
            _library = _find()
        return _library
