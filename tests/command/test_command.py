"""The tiktal command as a user runs it: the built program as a subprocess, against the
call-tracing session and against the time-service simulator running as a separate process.

Environment: TIKTAL_COMMAND (the program), TIMESERVICE_SIM (the simulator), TIKTAL_STATUS_TABLE
(src/tables/statuses.tsv, where the expected messages come from), ZRSHAREDDIR for the library;
for local devices TIKTAL_MACHINE (the machine command) and TIKTAL_DEVD (the driver stand-in), with
the routing and chassis-query stand-ins on LD_LIBRARY_PATH. Arguments select test classes, as for
unittest.
"""
import datetime
import json
import os
import re
import subprocess
import sys
import tempfile
import unittest

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "support"))
from stand_ins import Machine, Simulator  # noqa: E402

COMMAND = os.environ["TIKTAL_COMMAND"]
TRACE = "SyncTestInternal___"
TRACE_LINE = re.compile(r"^\[iktal_impl\|", re.M)


def tiktal(*args):
    """Runs the command; the time-out only bounds a hung program."""
    return subprocess.run([COMMAND, *map(str, args)], capture_output=True, text=True, timeout=120)


def messages():
    """Status code (unsigned) -> message, from the library's status table."""
    table = {}
    with open(os.environ["TIKTAL_STATUS_TABLE"], encoding="utf-8") as lines:
        for line in lines:
            if not line.startswith("#") and line.strip():
                code, _, message = line.rstrip("\n").split("\t")
                table[int(code, 16)] = message
    return table


MESSAGES = messages()


class CommandTest(unittest.TestCase):
    def succeed(self, *args):
        """Runs the command, expects success; its standard output."""
        done = tiktal(*args)
        self.assertEqual(done.returncode, 0, done.stderr)
        return done.stdout

    def succeed_json(self, *args):
        return json.loads(self.succeed(*args, "--json"))

    def fail_call(self, status, *args):
        """Runs the command, expects a failing call with `status`; the function it names."""
        done = tiktal(*args)
        self.assertEqual(done.returncode, 1, done.stderr)
        self.assertEqual(done.stdout, "")
        match = re.fullmatch(r"tiktal: (tiktal_\w+): (0x[0-9A-F]{8}) (.*)\n", done.stderr)
        self.assertIsNotNone(match, done.stderr)
        self.assertEqual(match.group(2), f"0x{status:08X}")
        self.assertEqual(match.group(3), MESSAGES[status])
        done = tiktal(*args, "--json")
        self.assertEqual(done.returncode, 1, done.stderr)
        self.assertEqual(json.loads(done.stderr), {
            "function": match.group(1), "status": status - (1 << 32 if status >= 1 << 31 else 0),
            "statusHex": f"0x{status:08X}", "message": MESSAGES[status]})
        return match.group(1)

    def fail_usage(self, *args):
        done = tiktal(*args)
        self.assertEqual(done.returncode, 2, f"{args}: {done.stdout}")
        self.assertEqual(done.stdout, "")
        self.assertRegex(done.stderr, r"^tiktal: ")
        self.assertIsNone(TRACE_LINE.search(done.stderr), "a session was opened")
        return done.stderr


class TraceSessionTest(CommandTest):
    """The call-tracing session: calls succeed, and its trace on stderr shows what reached the library."""

    def test_open_with_and_without_reset(self):
        for reset in ([], ["--reset"]):
            done = tiktal("open", TRACE, *reset)
            self.assertEqual(done.returncode, 0, done.stderr)
            self.assertRegex(done.stdout, r"self test\s+0 Self test passed\n")
            self.assertRegex(done.stderr, r"SessionDebugPrintOnly::SessionDebugPrintOnly\n")
            opened = self.succeed_json("open", TRACE, *reset)
            self.assertEqual(opened["resource"], TRACE)
            self.assertEqual(opened["reset"], bool(reset))
            self.assertEqual((opened["selfTestResult"], opened["selfTestMessage"]), (0, "Self test passed"))
            self.assertIsInstance(opened["handle"], int)

    def test_each_type_goes_through_its_own_accessor(self):
        cases = [  # arguments, accessor of the trace, value printed, value the trace shows
            (["get", "1588_PRIORITY1", "--item", "PTP1"], "getAttributeViInt32", "0", None),
            (["set", "1588_PRIORITY1", "-7", "--item", "PTP1"], "setAttributeViInt32", "-7", "-7"),
            (["get", "MEAN_PATH_DELAY", "--item", "PTP1"], "getAttributeViReal64", "0", None),
            (["set", "0x118FE9", "2.5", "--type", "real64"], "setAttributeViReal64", "2.5", "2.5"),  # not in the table
            (["get", "time_reference_enabled", "--item", "AS1"], "getAttributeViBoolean", "false", None),
            (["set", "AS_CAPABLE", "on", "--item", "AS1"], "setAttributeViBoolean", "true", "1"),
            (["get", "TIKTAL_ATTR_1588_CLOCK_ID", "--item", "PTP1"], "getAttributeViString", "", None),
            (["set", "1588_INTERFACE", "eth 9, spare", "--item", "PTP1"], "setAttributeViString", "eth 9, spare",
             "eth 9, spare"),
            (["get", "1588_PRIORITY1", "--item", "PTP1", "--type", "string"], "getAttributeViString", "", None),
        ]
        for args, accessor, printed, traced in cases:
            with self.subTest(args=args):
                done = tiktal(args[0], TRACE, *args[1:])
                self.assertEqual(done.returncode, 0, done.stderr)
                self.assertEqual(done.stdout.split(" = ", 1)[1], printed + "\n")
                self.assertRegex(done.stderr, r"SessionDebugPrintOnly::" + accessor + "\n")
                if "--item" in args:
                    self.assertIn("terminalName: " + args[args.index("--item") + 1] + "\n", done.stderr)
                else:
                    self.assertIn("terminalName: (null)\n", done.stderr)
                if traced is not None:
                    self.assertIn(f"value: {traced}\n", done.stderr)
        self.assertEqual(self.succeed_json("get", TRACE, "1588_PRIORITY1", "--item", "PTP1"), {
            "attribute": "TIKTAL_ATTR_1588_PRIORITY1", "id": 1150732, "item": "PTP1", "type": "int32", "value": 0})

    def test_time_persist_and_refs(self):
        self.assertEqual(self.succeed_json("time", TRACE),
                         {"seconds": 0, "nanoseconds": 0, "utc": "1970-01-01T00:00:00.000000000Z"})
        self.assertRegex(self.succeed("time", TRACE), r"utc\s+1970-01-01T00:00:00.000000000Z\n")
        self.assertEqual(self.succeed_json("persist", TRACE), {"resource": TRACE, "persisted": True})
        done = tiktal("persist", TRACE)
        self.assertEqual(done.returncode, 0)
        self.assertIn("SessionDebugPrintOnly::persistConfig", done.stderr)
        self.assertEqual(self.succeed_json("refs", TRACE), [])
        self.assertEqual(self.succeed("refs", TRACE).split(), "NAME TYPE ENABLED SELECTED PORT STATE CLOCK ID GM CLOCK ID".split())


class SimulatorTest(CommandTest):
    """A time-service session on the simulator: values come from, and go to, the simulator's state."""

    @classmethod
    def setUpClass(cls):
        cls.sim = Simulator()
        cls.resource = cls.sim.resource

    @classmethod
    def tearDownClass(cls):
        cls.sim.stop()

    def state(self):
        return self.sim.control("state")

    def get(self, *args):
        return self.succeed_json("get", self.resource, *args)["value"]

    def test_open(self):
        opened = self.succeed_json("open", self.resource)
        self.assertEqual((opened["selfTestResult"], opened["selfTestMessage"], opened["reset"]),
                         (0, "Self test passed", False))
        self.assertIn("Self test passed", self.succeed("open", self.resource))

    def test_get_each_type_in_every_form(self):
        ptp1 = self.state()["timeReferences"]["PTP1"]
        for form in ["TIKTAL_ATTR_1588_PRIORITY1", "tiktal_attr_1588_priority1", "1588_PRIORITY1", "1588_priority1",
                     "ATTR_1588_PRIORITY1", "1150732", "0x118F0C", "0X118f0c"]:
            with self.subTest(form=form):
                self.assertEqual(self.succeed_json("get", self.resource, form, "--item", "PTP1"), {
                    "attribute": "TIKTAL_ATTR_1588_PRIORITY1", "id": 1150732, "item": "PTP1", "type": "int32",
                    "value": ptp1["priority1"]})
        self.assertEqual(self.get("GM_IP_ADDRESS", "--item", "PTP1"), ptp1["gmIpAddress"])
        self.assertEqual(self.get("1588_mean_path_delay", "--item", "PTP1"), float(ptp1["meanPathDelay_ns"]))
        self.assertEqual(self.get("AS_CAPABLE", "--item", "AS1"), True)
        self.assertEqual(self.get("TIME_REFERENCE_ENABLED", "--item", "TAB1"), False)
        self.assertEqual(self.get("SELECTED_TIME_REFERENCE"), self.state()["selectedTrId"])
        self.assertEqual(self.succeed("get", self.resource, "1588_CLOCK_ID", "--item", "PTP1"),
                         f"TIKTAL_ATTR_1588_CLOCK_ID[PTP1] = {ptp1['localClockId']}\n")
        self.assertEqual(self.succeed("get", self.resource, "SELECTED_TIME_REFERENCE_OFFSET"),
                         f"TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET = {int(self.state()['selectedTrOffsetNanos']) / 1e9:g}\n")

    def test_set_then_get(self):
        cases = [  # attribute, reference, value given, value read back, member of the state, stored value
            ("1588_PRIORITY1", "PTP1", "2147483647", 2147483647, "priority1", 2147483647),
            ("1588_PRIORITY1", "PTP1", "-2147483648", -2147483648, "priority1", -2147483648),
            ("8021AS_LOG_SYNC_INTERVAL", "AS1", "-4", -4, "logSyncInterval", -4),
            ("TIME_REFERENCE_ENABLED", "TAB1", "YES", True, "isEnabled", True),
            ("TIME_REFERENCE_ENABLED", "TAB1", "off", False, "isEnabled", False),
            ("1588_INTERFACE", "PTP1", 'eth "9"/b', 'eth "9"/b', "interface", 'eth "9"/b'),
        ]
        for attribute, reference, given, read, member, stored in cases:
            with self.subTest(attribute=attribute, value=given):
                written = self.succeed_json("set", self.resource, attribute, given, "--item", reference)
                self.assertEqual((written["item"], written["value"]), (reference, read))
                self.assertEqual(self.sim.control("last")["method"], "PUT")
                self.assertEqual(self.state()["timeReferences"][reference][member], stored)
                self.assertEqual(self.get(attribute, "--item", reference), read)
        self.assertEqual(self.succeed("set", self.resource, "1588_PRIORITY2", "+99", "--item", "PTP1"),
                         "TIKTAL_ATTR_1588_PRIORITY2[PTP1] = 99\n")

    def test_refs_match_the_state(self):
        state = self.state()
        expected_states = {"PTP1": (8, "SLAVE"), "AS1": (6, "MASTER"), "BC1": (None, None), "TAB1": (None, None)}
        rows = self.succeed_json("refs", self.resource)
        self.assertEqual([row["name"] for row in rows], list(state["timeReferences"]))
        for row in rows:
            reference = state["timeReferences"][row["name"]]
            self.assertEqual(row, {
                "name": row["name"], "type": reference["type"], "enabled": reference["isEnabled"],
                "selected": row["name"] == state["selectedTrId"],
                "portState": expected_states[row["name"]][0], "portStateName": expected_states[row["name"]][1],
                "clockId": reference["localClockId"], "gmClockId": reference["gmClockId"]})
        lines = self.succeed("refs", self.resource).splitlines()
        self.assertEqual(lines[0].split(), "NAME TYPE ENABLED SELECTED PORT STATE CLOCK ID GM CLOCK ID".split())
        starts = [lines[0].index(title) for title in ["TYPE", "ENABLED", "SELECTED", "PORT STATE", "CLOCK ID"]]
        for line, row in zip(lines[1:], rows):
            self.assertEqual([line[start - 2:start] for start in starts], ["  "] * len(starts))  # aligned
            self.assertTrue(line[starts[0]:].startswith(row["type"]))
        self.assertRegex(lines[1 + [r["name"] for r in rows].index("PTP1")], r"  8 SLAVE  ")
        self.assertRegex(lines[1 + [r["name"] for r in rows].index("BC1")], r"  -  ")

    def test_time_from_the_epoch_offset(self):
        for seconds, nanoseconds in [(0, 0), (951782400, 1), (1700000000, 123456789), (4294967295, 999999999)]:
            with self.subTest(seconds=seconds):
                self.sim.control("state", {"epochOffsetInNsec": str(seconds * 10**9 + nanoseconds)})
                utc = datetime.datetime.fromtimestamp(seconds, datetime.timezone.utc)
                expected = utc.strftime("%Y-%m-%dT%H:%M:%S") + f".{nanoseconds:09d}Z"
                self.assertEqual(self.succeed_json("time", self.resource),
                                 {"seconds": seconds, "nanoseconds": nanoseconds, "utc": expected})
                self.assertEqual(self.succeed("time", self.resource).split(),
                                 ["seconds", str(seconds), "nanoseconds", str(nanoseconds), "utc", expected])
        self.assertEqual(expected, "2106-02-07T06:28:15.999999999Z")
        self.sim.control("state", {"epochOffsetInNsec": str(2**32 * 10**9)})
        self.assertEqual(self.fail_call(0xBFFA4019, "time", self.resource), "tiktal_GetTime")

    def test_persist_rewrites_the_state_file(self):
        self.sim.control("state", {"timeReferences": {"BC1": {"priority2": 77}}})
        with open(self.sim.state_file, encoding="utf-8") as file:
            self.assertNotEqual(json.load(file)["timeReferences"]["BC1"]["priority2"], 77)
        self.assertEqual(self.succeed_json("persist", self.resource), {"resource": self.resource, "persisted": True})
        self.assertEqual(self.sim.control("last")["method"], "PUT")
        self.assertTrue(self.sim.control("last")["path"].endswith("/persist"))
        with open(self.sim.state_file, encoding="utf-8") as file:
            self.assertEqual(json.load(file)["timeReferences"]["BC1"]["priority2"], 77)
        self.assertEqual(self.succeed("persist", self.resource), f"configuration stored: {self.resource}\n")

    def test_usage_errors_send_nothing(self):
        served = self.sim.served()
        r = self.resource
        self.assertIn('unknown attribute "NO_SUCH_THING"', self.fail_usage("get", r, "NO_SUCH_THING", "--item", "PTP1"))
        self.fail_usage("get", r, "", "--item", "PTP1")
        self.fail_usage("get", r, "_PRIORITY1", "--item", "PTP1")  # not at a "_" boundary of one name
        ambiguous = self.fail_usage("get", r, "priority1", "--item", "PTP1")
        for name in ["1588_PRIORITY1", "1588_GM_PRIORITY1", "8021AS_PRIORITY1", "8021AS_GM_PRIORITY1"]:
            self.assertIn("TIKTAL_ATTR_" + name, ambiguous)
        self.assertIn("--type", self.fail_usage("get", r, "1150999"))
        self.fail_usage("get", r, "0x100000000", "--type", "int32")
        self.fail_usage("get", r, "1588_PRIORITY1", "--item", "PTP1", "--type", "int64")
        self.assertIn("--item", self.fail_usage("get", r, "1588_PRIORITY1"))
        for attribute, value in [("1588_PRIORITY1", "12x"), ("1588_PRIORITY1", "2147483648"),
                                 ("1588_PRIORITY1", "-2147483649"), ("1588_PRIORITY1", ""), ("1588_PRIORITY1", " 1"),
                                 ("1588_PRIORITY1", "0x10"), ("1588_PRIORITY1", "1.0"), ("MEAN_PATH_DELAY", "abc"),
                                 ("MEAN_PATH_DELAY", "nan"), ("MEAN_PATH_DELAY", "1e999"),
                                 ("TIME_REFERENCE_ENABLED", "maybe"), ("TIME_REFERENCE_ENABLED", "2")]:
            with self.subTest(attribute=attribute, value=value):
                self.assertIn("bad value", self.fail_usage("set", r, attribute, value, "--item", "PTP1"))
        self.assertEqual(self.sim.served(), served)

    def test_failing_calls(self):
        self.assertEqual(self.fail_call(0xBFFA4065, "get", self.resource, "8021AS_PRIORITY1", "--item", "PTP1"),
                         "tiktal_GetAttributeViInt32")
        self.assertEqual(self.fail_call(0xBFFA4065, "get", self.resource, "8021AS_CLOCK_ID", "--item", "BC1"),
                         "tiktal_GetAttributeViString")
        self.assertEqual(self.fail_call(0xBFFA4008, "get", self.resource, "1588_PRIORITY1", "--item", "PTP1",
                                        "--type", "real64"), "tiktal_GetAttributeViReal64")
        # A time service has no Real64 attribute to write.
        self.assertEqual(self.fail_call(0xBFFF001D, "set", self.resource, "1588_PRIORITY1", "1", "--item", "PTP1",
                                        "--type", "real64"), "tiktal_SetAttributeViReal64")
        self.assertEqual(self.fail_call(0xBFFA4068, "set", self.resource, "1588_PORT_STATE", "3", "--item", "PTP1"),
                         "tiktal_SetAttributeViInt32")  # read-only: the service answers 400
        for query in range(2):  # the --json run of fail_call needs one directive too
            self.sim.control("next", {"status": 404})
        self.fail_call(0xBFFA406C, "refs", self.resource)
        self.fail_call(0xBFFA4007, "open", self.resource, "--reset")  # a time service cannot be reset
        # A warning from a size query is a warning, not the size of a buffer to allocate: the service
        # answers the value request (after the device list and the type) with 202, in both runs.
        for run in range(2):
            self.sim.control("next", {"count": 2})
            self.sim.control("next", {"status": 202})
        self.assertEqual(self.fail_call(0x3FFA4064, "get", self.resource, "1588_CLOCK_ID", "--item", "PTP1"),
                         "tiktal_GetAttributeViString")


FEATURE_NOT_SUPPORTED = 0xBFFA4003  # what a timing module says to a route it never makes


class LocalDevicesTest(CommandTest):
    """Timing modules and a simulated device of a machine laid out by the machine command, with a
    driver stand-in on each module's interface path."""

    def setUp(self):
        self.folder = tempfile.TemporaryDirectory()
        self.root = self.folder.name
        self.saved = os.environ.get("TIKTAL_SYSROOT")
        os.environ["TIKTAL_SYSROOT"] = self.root
        self.machine = Machine(self.root)

    def tearDown(self):
        self.machine.stop()
        os.environ["TIKTAL_SYSROOT"] = self.saved
        self.folder.cleanup()

    def test_devices_in_both_forms(self):
        lines = self.succeed("devices").splitlines()
        self.assertEqual(lines[0].split(), ["ALIAS", "PRESENT", "SIMULATED", "PCI", "PXI", "DEVICE", "SERIAL", "TOKEN"])
        self.assertEqual([line.split()[:7] for line in lines[1:]], [
            ["Sync1", "yes", "no", "255:0.0", "-", "0x7405", "5eed0001"],
            ["PXI1Slot2", "yes", "no", "2:2.0", "1/2", "0x7405", "c0ffee"],
            ["PXI1Slot4", "yes", "no", "2:4.0", "1/4", "0x7406", "1a2b0002"]])
        devices = self.succeed_json("devices")
        self.assertEqual([device["token"] for device in devices][0], "FAKE:TIKTAL:board1")
        module = devices[1]
        self.assertEqual((module["alias"], module["is_present"], module["pxi_chassis_number"], module["pci_bus"],
                          module["interface_path"]), ("PXI1Slot2", True, 1, 2, self.root + "/dev/tiktal0"))

    def test_routes_terminal_values_and_reset(self):
        self.assertEqual(self.succeed("route", "pxi1slot2", "PFI0", "PXI_Trig3", "--invert"),
                         "routed PFI0 -> PXI_Trig3 on pxi1slot2\n")
        self.assertEqual(self.succeed("unroute", "PXI1Slot2", "PFI0", "AllConnected"),
                         "unrouted PFI0 -> AllConnected on PXI1Slot2\n")
        self.assertEqual(self.succeed_json("route", "PXI0::2-4.0::INSTR", "ClkIn", "PXI_Clk10", "--clock"),
                         {"resource": "PXI0::2-4.0::INSTR", "routed": "ClkIn -> PXI_Clk10", "clock": True})
        # A source the module refuses for a trigger route, and a device that is not there.
        self.assertEqual(self.fail_call(FEATURE_NOT_SUPPORTED, "route", "PXI1Slot2", "ClkIn", "PXI_Trig0"),
                         "tiktal_ConnectTrigTerminals")
        self.assertEqual(self.fail_call(0xBFFA4016, "reset", "PXI9Slot9"), "tiktal_init")

        self.succeed("set", "PXI1Slot2", "TERMINAL_58_VALUE", "2.5")
        self.assertEqual(self.succeed("get", "PXI2::2::INSTR", "TERMINAL_58_VALUE"), "TIKTAL_ATTR_TERMINAL_58_VALUE = 2.5\n")
        self.assertEqual(self.succeed("get", "PXI1Slot2", "SERIAL_NUMBER"), f"TIKTAL_ATTR_SERIAL_NUMBER = {0xc0ffee}\n")
        self.assertEqual(self.succeed("reset", "PXI1Slot2"), "reset: PXI1Slot2\n")
        self.assertEqual(self.succeed("get", "PXI1Slot2", "TERMINAL_58_VALUE"), "TIKTAL_ATTR_TERMINAL_58_VALUE = 0\n")
        self.assertIn("Self test passed", self.succeed("open", "Sync1"))


class UsageTest(CommandTest):
    """What needs no session: status codes, help, and the command line itself."""

    def test_status_in_every_notation(self):
        message = MESSAGES[0xBFFA4003]
        for code in ["0xBFFA4003", "0xbffa4003", "-1074118653", "3220848643"]:
            with self.subTest(code=code):
                self.assertEqual(self.succeed("status", code), f"0xBFFA4003 {message}\n")
                self.assertEqual(self.succeed_json("status", code), {
                    "status": -1074118653, "statusHex": "0xBFFA4003", "message": message, "known": True})
        self.assertEqual(self.succeed("status", "0x3FFF0085"), f"0x3FFF0085 {MESSAGES[0x3FFF0085]}\n")
        self.assertEqual(self.succeed("status", "0x12345678"), "0x12345678 Unknown status value 0x12345678\n")
        self.assertEqual(self.succeed_json("status", "-1")["message"], "Unknown status value 0xFFFFFFFF")
        self.assertFalse(self.succeed_json("status", "4294967295")["known"])
        for code in ["zz", "0x", "0x1FFFFFFFF", "4294967296", "-2147483649", "12 ", "-", "0xBFFA4003x"]:
            with self.subTest(code=code):
                self.assertIn("bad status code", self.fail_usage("status", code))

    def test_help_of_the_command_and_every_subcommand(self):
        self.assertIn("Usage: tiktal [OPTIONS] SUBCOMMAND", self.succeed("--help"))
        for command in ["open", "get", "set", "refs", "time", "persist", "status", "devices", "route", "unroute",
                        "reset"]:
            with self.subTest(command=command):
                text = self.succeed(command, "--help")
                self.assertIn(f"Usage: tiktal {command} ", text)
                self.assertIn("--json", text)

    def test_bad_command_lines(self):
        self.assertIn('unknown subcommand "frobnicate"', self.fail_usage("frobnicate", TRACE))
        self.fail_usage()
        self.fail_usage("get", TRACE)
        self.fail_usage("set", TRACE, "1588_PRIORITY1", "--item", "PTP1")
        self.fail_usage("open", TRACE, "--bogus")
        self.fail_usage("status")


if __name__ == "__main__":
    unittest.main(verbosity=2)
