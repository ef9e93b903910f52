"""Timing modules of a simulated machine: the module's attributes and terminal values, which reach
the driver stand-in (tiktal_devd, a separate process), and routes, which the routing stand-in
loaded in this process holds while the session lasts."""
import math
import threading

import pytest

import tiktal

INVALID_PARAMETER = 0xBFFF0078 - (1 << 32)


@pytest.fixture
def module(machine):
    machine.clear()
    with tiktal.Session("PXI1Slot2") as session:
        yield session


class TestAttributes:
    def test_identity_of_both_modules(self, machine):
        with tiktal.Session("pxi1slot2") as first, tiktal.Session("PXI0::2-4.0::INSTR") as second:
            assert (first.serial_number, first.device_id) == (0xC0FFEE, 0x7405)
            assert second.device_id == 0x7406
            assert first.self_test() == (0, "Self test passed")

    def test_terminal_values_reach_the_driver_in_thousandths(self, machine, module):
        values = {"terminal_58_value": (58, 2.5, 2500), "terminal_65_value": (65, 0.001, 1),
                  "terminal_72_value": (72, 0.0, 0), "terminal_79_value": (79, 4294967.295, 4294967295),
                  "terminal_86_value": (86, 1000.125, 1000125), "terminal_93_value": (93, 7, 7000)}
        for name, (_, value, _) in values.items():
            setattr(module, name, value)
        held = machine.terminal_values("tiktal0")
        for name, (terminal, value, thousandths) in values.items():
            assert held[terminal] == thousandths
            assert getattr(module, name) == float(value)
        assert machine.requests("tiktal0") == ["writeTerminalValue"] * 6 + ["readTerminalValue"] * 6
        # The same module opened by another name sees the same values.
        with tiktal.Session("PXI2::2::INSTR") as again:
            assert again.terminal_58_value == 2.5

    def test_values_the_module_cannot_hold_are_refused_and_nothing_is_sent(self, machine, module):
        module.terminal_58_value = 1.0
        machine.clear()
        for value in (-0.001, 4294967.296, math.nan, math.inf, -math.inf):
            with pytest.raises(tiktal.Error) as failure:
                module.terminal_58_value = value
            assert (failure.value.code, failure.value.function) == (INVALID_PARAMETER, "tiktal_SetAttributeViReal64")
            assert failure.value.message == "A parameter for this operation is invalid."
        with pytest.raises(AttributeError):
            module.serial_number = 1
        with pytest.raises(TypeError):
            module.terminal_58_value = "1.0"
        assert machine.requests("tiktal0") == []
        assert module.terminal_58_value == 1.0

    def test_attributes_a_module_lacks(self, module):
        with pytest.raises(tiktal.Error) as failure:
            module.selected_time_reference_offset
        assert (failure.value.code, failure.value.function) == (0xBFFF001D - (1 << 32), "tiktal_GetAttributeViReal64")
        with pytest.raises(tiktal.Error) as failure:
            module.time_references["PTP1"].ptp_clock_id
        assert failure.value.function == "tiktal_GetAttributeViString"

    def test_reset_clears_the_module(self, machine, module):
        module.terminal_86_value = 3.25
        module.reset()
        assert "resetDevice" in machine.requests("tiktal0")
        assert module.terminal_86_value == 0.0


class TestRoutes:
    def test_trigger_and_clock_routes_last_until_disconnected(self, module, routes):
        module.connect_trigger("PFI0", "PXI_Trig3", invert=True)
        module.connect_trigger("PFI1", "PXI_Trig4")
        module.connect_clock("ClkIn", "PXI_Clk10")
        assert routes.on("PXI1Slot2") == [
            ("/PXI1Slot2/ClkIn", "/PXI1Slot2/PXI_Clk10_In", False),
            ("/PXI1Slot2/PFI0", "/PXI1Slot2/PXI_Trig3", True),
            ("/PXI1Slot2/PFI1", "/PXI1Slot2/PXI_Trig4", False)]
        module.disconnect_trigger("PFI0", tiktal.ALL_CONNECTED)
        module.disconnect_clock("ClkIn", "PXI_Clk10")
        assert routes.on("PXI1Slot2") == [("/PXI1Slot2/PFI1", "/PXI1Slot2/PXI_Trig4", False)]

    def test_closing_the_session_ends_its_routes(self, machine, routes):
        with tiktal.Session("PXI1Slot4") as session:
            session.connect_trigger("PFI2", "PXI_Trig5")
            assert routes.on("PXI1Slot4") == [("/PXI1Slot4/PFI2", "/PXI1Slot4/PXI_Trig5", False)]
        assert routes.on("PXI1Slot4") == []

    def test_routes_the_module_refuses(self, module, routes):
        with pytest.raises(tiktal.Error) as failure:
            module.connect_trigger("ClkIn", "PXI_Trig0")  # a clock is no trigger source
        assert (failure.value.code, failure.value.function, failure.value.message) == (
            0xBFFA4003 - (1 << 32), "tiktal_ConnectTrigTerminals",
            "This operation requires a feature that is not supported.")
        with pytest.raises(tiktal.Error) as failure:
            module.disconnect_trigger("PFI0", "PXI_Trig0")  # no such route
        assert failure.value.function == "tiktal_DisconnectTrigTerminals"
        assert routes.on("PXI1Slot2") == []

    def test_a_device_that_is_not_there(self, machine):
        with pytest.raises(tiktal.Error) as failure:
            tiktal.Session("PXI9Slot9")
        assert (failure.value.code, failure.value.function) == (0xBFFA4016 - (1 << 32), "tiktal_init")


class TestThreads:
    def test_threads_on_one_session_and_on_separate_sessions(self, machine, module):
        failures = []

        def run(work):
            try:
                work()
            except Exception as error:  # reported below
                failures.append(error)

        def on_shared(name, first):
            for step in range(20):
                setattr(module, name, first + step)
                assert getattr(module, name) == first + step

        def on_own(resource, name, first):
            with tiktal.Session(resource) as session:
                for step in range(20):
                    setattr(session, name, first + step)
                    assert getattr(session, name) == first + step

        work = [lambda: on_shared("terminal_58_value", 100), lambda: on_shared("terminal_65_value", 200),
                lambda: on_own("PXI1Slot4", "terminal_58_value", 300), lambda: on_own("PXI0::2-2.0::INSTR", "terminal_79_value", 400)]
        threads = [threading.Thread(target=run, args=(w,)) for w in work]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        assert failures == []
        assert (module.terminal_58_value, module.terminal_65_value, module.terminal_79_value) == (119.0, 219.0, 419.0)
        assert machine.terminal_values("tiktal1")[58] == 319000
