"""What the tests of the Python package share: the time-service simulator and the simulated machine,
each run as separate processes, the routes the routing stand-in holds, and the call-tracing
session's trace.

run_tests.sh sets the environment: TIKTAL_LIBRARY (the built libtiktal.so), TIMESERVICE_SIM,
TIKTAL_MACHINE and TIKTAL_DEVD (the programs), TIKTAL_SYSROOT (a folder for the machine),
ZRSHAREDDIR, and LD_LIBRARY_PATH with the routing and chassis-query stand-ins.
"""
import ctypes
import json
import os
import re
import sys

import pytest

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "support"))
from stand_ins import Machine, Simulator  # noqa: E402

TRACE = "SyncTestInternal___"

# The default state of the simulator (sim/timeservice/state.cpp) as the tests rely on it.
REFERENCE_NAMES = ["PTP1", "BC1", "AS1", "TAB1"]


@pytest.fixture(scope="session")
def simulator():
    sim = Simulator()
    yield sim
    sim.stop()


@pytest.fixture
def sim(simulator):
    """The simulator in its default state for one test."""
    simulator.restore()
    yield simulator
    simulator.restore()


@pytest.fixture(scope="session")
def machine():
    m = Machine(os.environ["TIKTAL_SYSROOT"])
    yield m
    m.stop()


class Routes:
    """The routing stand-in loaded in this process: the library opens the same copy by its name."""

    def __init__(self):
        self.library = ctypes.CDLL("libzrrocoapi.so")
        self.library.zrrocoapi_sim_routes.restype = ctypes.c_void_p
        self.library.zrrocoapi_sim_routes.argtypes = [ctypes.c_char_p]
        self.library.zrrocoapi_destroyString.argtypes = [ctypes.c_void_p]

    def on(self, device):
        """(source, destination, inverted) of every route in effect on `device`."""
        text = self.library.zrrocoapi_sim_routes(device.encode())
        try:
            routes = json.loads(ctypes.string_at(text).decode())
        finally:
            self.library.zrrocoapi_destroyString(text)
        return sorted((r["source"], r["destination"], r["inversionNeeded"]) for r in routes)


@pytest.fixture(scope="session")
def routes():
    return Routes()


TRACE_CALL = re.compile(r"^\[iktal_impl\|[^]]*\] ([{}]) tiktal::SessionDebugPrintOnly::(~?\w+)$")
TRACE_ARGUMENT = re.compile(r"^\[iktal_impl\|[^]]*\] (\w+): (.*)$")


def traced_calls(text):
    """The calls that the call-tracing session wrote: [(operation, {parameter: value text})]. The
    self test is not traced; outputs (addresses) are left out."""
    calls = []
    for line in text.splitlines():
        call = TRACE_CALL.match(line)
        if call and call.group(1) == "{":
            calls.append((call.group(2), {}))
            continue
        argument = TRACE_ARGUMENT.match(line)
        if argument and calls:
            operation, arguments = calls[-1]
            # Outputs show as addresses, different each run.
            if argument.group(1) != "valueString" and not (operation.startswith("get") and argument.group(1) == "value"):
                arguments[argument.group(1)] = argument.group(2)
    return calls
