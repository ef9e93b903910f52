"""The examples of examples/python, run as a user runs them with the installed package."""
import os
import subprocess
import sys

EXAMPLES = os.path.join(os.environ["TIKTAL_SOURCE_DIR"], "examples", "python")


def run_example(name, *args):
    done = subprocess.run([sys.executable, os.path.join(EXAMPLES, name), *args], capture_output=True, text=True,
                          timeout=120)
    assert done.returncode == 0, done.stderr
    return done.stdout


def test_time_references_of_a_time_service(sim):
    sim.control("state", {"epochOffsetInNsec": "1700000000123456789"})
    assert run_example("time_references.py", sim.resource).splitlines() == [
        "time      2023-11-14T22:13:20.123456+00:00 (1700000000 s 123456789 ns)",
        "selected  PTP1 (IEEE 1588-2008), offset 1.5 s",
        "NAME  TYPE                   ENABLED  SELECTED  PORT STATE  PRIORITY1",
        "PTP1  IEEE 1588-2008         yes      yes       SLAVE (8)   128",
        "BC1   IEEE 1588-2008 BC      yes      no        -           128",
        "AS1   IEEE 802.1AS-2011      yes      no        MASTER (6)  246",
        "TAB1  IEEE 802.1AS-2011 TAB  no       no        -           246",
    ]


def test_routing_and_terminal_values_on_a_simulated_machine(machine):
    machine.clear()
    assert run_example("routing.py", "PXI1Slot4").splitlines() == [
        "PXI1Slot4: serial number 1a2b0002, device 0x7406",
        "terminal_58_value = 2.5",
        "terminal_65_value = 1000.125",
        "refused: tiktal_SetAttributeViReal64: 0xBFFF0078 A parameter for this operation is invalid.",
        "routed PFI0 -> PXI_Trig3, inverted",
        "routed clock ClkIn -> PXI_Clk10",
        "refused: tiktal_ConnectTrigTerminals: 0xBFFA4003 This operation requires a feature that is not supported.",
        "routes removed",
    ]
    values = machine.terminal_values("tiktal1")
    assert (values[58], values[65]) == (2500, 1000125)
