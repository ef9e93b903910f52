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
import select
import socket
import subprocess
import tempfile
import urllib.request

import pytest

TRACE = "SyncTestInternal___"

# The default state of the simulator (sim/timeservice/state.cpp) as the tests rely on it.
REFERENCE_NAMES = ["PTP1", "BC1", "AS1", "TAB1"]


class Simulator:
    """timeservice_sim on 127.0.0.2 with a port of its choice and a state file in a fresh folder."""

    def __init__(self):
        self.folder = tempfile.TemporaryDirectory()
        self.state_file = os.path.join(self.folder.name, "state.json")
        self.process = subprocess.Popen(
            [os.environ["TIMESERVICE_SIM"], "--listen", "127.0.0.2:0", "--state", self.state_file],
            stdout=subprocess.PIPE, text=True)
        ready, _, _ = select.select([self.process.stdout], [], [], 60)
        line = self.process.stdout.readline() if ready else ""
        match = re.fullmatch(r"listening on (127\.0\.0\.2:\d+)\n", line)
        if not match:
            self.stop()
            raise RuntimeError(f"the simulator did not start: {line!r}")
        self.address = match.group(1)
        self.resource = f"sync://{self.address}/sync_1"
        # No proxy from the environment may stand between the test and the simulator.
        self.opener = urllib.request.build_opener(urllib.request.ProxyHandler({}))
        self.default_state = self.control("state")

    def control(self, path, body=None, method=None):
        """GET /_sim/PATH, or POST (or `method`) it with a JSON body; the JSON answer."""
        data = None if body is None else json.dumps(body).encode()
        request = urllib.request.Request(f"http://{self.address}/_sim/{path}", data=data, method=method,
                                         headers={"Content-Type": "application/json"})
        with self.opener.open(request, timeout=60) as answer:
            text = answer.read()
        return json.loads(text) if text.strip() else None

    def state(self):
        return self.control("state")

    def reference(self, name):
        return self.state()["timeReferences"][name]

    def served(self):
        return self.control("stats")["served"]

    def restore(self):
        """Back to the default state, without directives or counts."""
        self.control("state", self.default_state, method="PUT")
        self.control("reset", {})

    def stop(self):
        self.process.terminate()
        self.process.wait(timeout=60)
        self.process.stdout.close()
        self.folder.cleanup()


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


# The machine: two timing modules in chassis 1 and a simulated device.
MACHINE_LAYOUT = '{"chassis":[{"number":1,"slots":{"2":{"serial":"c0ffee"},"4":{"device":"0x7406"}}}]}'


class Machine:
    """A machine laid out by tiktal-machine at TIKTAL_SYSROOT, with a driver stand-in per module."""

    def __init__(self, root):
        self.root = root
        self.command("create", root, MACHINE_LAYOUT)
        self.command("fake", root, "board1")
        self.command("start-daemons", root)

    @staticmethod
    def command(*args):
        subprocess.run([os.environ["TIKTAL_MACHINE"], *args], check=True, stdout=subprocess.DEVNULL,
                       timeout=60)

    def control(self, entry, command):
        """One command on the control socket of the driver stand-in of `entry` (tiktal0, ...)."""
        with socket.socket(socket.AF_UNIX, socket.SOCK_STREAM) as connection:
            connection.connect(os.path.join(self.root, "dev", entry + ".control"))
            connection.sendall(json.dumps(command).encode() + b"\n")
            answer = json.loads(connection.makefile(encoding="utf-8").readline())
        assert answer.get("ok", True), answer
        return answer

    def requests(self, entry):
        """The names of the requests the module's driver received since the last clear."""
        return [packet.get("request", hex(packet["code"])) for packet in self.control(entry, {"command": "packets"})["packets"]]

    def terminal_values(self, entry):
        """Terminal -> the value in thousandths the driver holds, for the terminals written."""
        return {v["terminal"]: v["value"] for v in self.control(entry, {"command": "terminalValues"})["values"]}

    def clear(self):
        for entry in ("tiktal0", "tiktal1"):
            self.control(entry, {"command": "clearPackets"})

    def stop(self):
        self.command("stop-daemons", self.root)


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
