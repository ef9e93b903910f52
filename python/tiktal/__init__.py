"""tiktal: Python binding of libtiktal, the driver library for timing and synchronization hardware.

    import tiktal

    with tiktal.Session("sync://192.0.2.7/system") as session:
        print(session.get_time().utc)
        for reference in session.time_references:
            print(reference.name, reference.time_reference_type, reference.time_reference_enabled)
        session.time_references["PTP1"].ptp_priority1 = 100

Attributes are typed properties: of the session when they name no time reference, of
session.time_references[name] when they do. Port states, clock accuracies and BMCA modes read as
members of IntEnum classes. A failing call raises tiktal.Error; a warning is emitted as
tiktal.Warning through the warnings module. The package calls libtiktal.so through ctypes; where
it looks for the library is told in tiktal._library (TIKTAL_LIBRARY names it).
"""
from ._attributes import BmcaMode, GptpClockAccuracy, GptpPortState, PtpClockAccuracy, PtpPortState
from ._library import library as _load_library
from .errors import Error, LibraryError, Warning
from .session import ALL_CONNECTED, SelfTestResult, Session, Time, TimeReference, TimeReferences

# Warning is left out: `from tiktal import *` would hide the built-in Warning. Use tiktal.Warning.
__all__ = [
    "ALL_CONNECTED", "BmcaMode", "Error", "GptpClockAccuracy", "GptpPortState", "LibraryError",
    "PtpClockAccuracy", "PtpPortState", "SelfTestResult", "Session", "Time", "TimeReference",
    "TimeReferences", "library_path",
]


def library_path() -> str:
    """Where libtiktal was loaded from (a path, or the bare name the system's loader found),
    loading it if no session has yet."""
    return _load_library().path
