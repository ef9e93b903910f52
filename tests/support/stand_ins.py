"""The stand-ins that the Python tests run as separate processes: the time-service simulator, and a
machine laid out by tiktal-machine with a driver stand-in per module.

Environment: TIMESERVICE_SIM and TIKTAL_MACHINE (the programs), TIKTAL_DEVD for the daemons.
"""
import json
import os
import re
import select
import socket
import subprocess
import tempfile
import urllib.request


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


# The machine of the tests: two timing modules in chassis 1 (and a simulated device, board1).
MACHINE_LAYOUT = '{"chassis":[{"number":1,"slots":{"2":{"serial":"c0ffee"},"4":{"device":"0x7406"}}}]}'


class Machine:
    """A machine laid out by tiktal-machine at TIKTAL_SYSROOT, with a driver stand-in per module."""

    def __init__(self, root, layout=MACHINE_LAYOUT):
        self.root = root
        self.command("create", root, layout)
        self.command("fake", root, "board1")
        self.command("start-daemons", root)

    @staticmethod
    def command(*args):
        subprocess.run([os.environ["TIKTAL_MACHINE"], *args], check=True, stdout=subprocess.DEVNULL,
                       stderr=subprocess.DEVNULL, timeout=60)

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
