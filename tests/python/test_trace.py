"""The call-tracing session: every call succeeds and writes its arguments to standard error, so the
trace shows what reached the library: which accessor, which time-reference name, which value.
Values the C types cannot hold are refused in Python, before any call."""
import math

import pytest

import tiktal
from conftest import TRACE, traced_calls


@pytest.fixture
def session():
    with tiktal.Session(TRACE) as s:
        yield s


def calls(capfd):
    return traced_calls(capfd.readouterr().err)


class TestLife:
    def test_open_self_test_reset_and_close(self, capfd):
        with tiktal.Session(TRACE, reset=True) as session:
            assert session.self_test() == (0, "Self test passed")
            assert session.self_test().message == "Self test passed"
            session.reset()
            assert not session.closed
        assert session.closed
        assert [name for name, _ in calls(capfd)] == [
            "SessionDebugPrintOnly", "reset", "reset", "~SessionDebugPrintOnly"]

    def test_close_is_idempotent_and_a_closed_session_calls_nothing(self, capfd):
        session = tiktal.Session(TRACE.lower())
        session.close()
        session.close()
        capfd.readouterr()
        uses = [
            ("tiktal_self_test", lambda: session.self_test()),
            ("tiktal_reset", lambda: session.reset()),
            ("tiktal_GetTime", lambda: session.get_time()),
            ("tiktal_PersistConfig", lambda: session.persist_config()),
            ("tiktal_GetTimeReferenceNames", lambda: session.time_reference_names),
            ("tiktal_GetTimeReferenceNames", lambda: list(session.time_references)),
            ("tiktal_GetAttributeViReal64", lambda: session.terminal_58_value),
            ("tiktal_SetAttributeViReal64", lambda: setattr(session, "terminal_58_value", 1.0)),
            ("tiktal_GetAttributeViString", lambda: session.time_references["PTP1"].ptp_clock_id),
            ("tiktal_SetAttributeViInt32", lambda: setattr(session.time_references["PTP1"], "ptp_priority1", 1)),
            ("tiktal_ConnectTrigTerminals", lambda: session.connect_trigger("PFI0", "PXI_Trig0")),
            ("tiktal_DisconnectClkTerminals", lambda: session.disconnect_clock("ClkIn", "ClkOut")),
        ]
        for function, use in uses:
            with pytest.raises(tiktal.Error) as failure:
                use()
            assert (failure.value.code, failure.value.function) == (0xBFFF000E - (1 << 32), function)
            assert failure.value.message == "The given session or object reference is invalid."
            assert str(failure.value) == f"{function}: 0xBFFF000E The given session or object reference is invalid."
        assert calls(capfd) == []
        assert repr(session) == "<tiktal.Session 'synctestinternal___' closed>"

    def test_a_session_left_open_is_closed_when_it_is_collected(self, capfd):
        tiktal.Session(TRACE)
        assert [name for name, _ in calls(capfd)] == ["SessionDebugPrintOnly", "~SessionDebugPrintOnly"]

    def test_an_unknown_resource_fails_to_open(self):
        with pytest.raises(tiktal.Error) as failure:
            tiktal.Session("NoSuchDevice")
        assert (failure.value.code, failure.value.function, failure.value.message) == (
            0xBFFA4016 - (1 << 32), "tiktal_init", "The specified device was not found.")

    def test_the_resource_name_is_text_without_nul(self):
        with pytest.raises(TypeError):
            tiktal.Session(b"SyncTestInternal___")
        with pytest.raises(ValueError):
            tiktal.Session("SyncTestInternal___\0x")
        with pytest.raises(TypeError):
            tiktal.Session(TRACE, reset="yes")


class TestAttributes:
    def test_each_type_goes_through_its_own_accessor_with_the_time_reference_name(self, session, capfd):
        reference = session.time_references["PTP 1/a"]
        assert reference.ptp_priority1 == 0 and type(reference.ptp_priority1) is int
        assert reference.ptp_mean_path_delay == 0.0 and type(reference.ptp_mean_path_delay) is float
        assert reference.time_reference_enabled is False
        assert reference.ptp_clock_id == ""
        assert reference.ptp_port_state is tiktal.PtpPortState.INITIALIZING
        assert session.selected_time_reference_offset == 0.0
        assert session.serial_number == 0
        assert calls(capfd) == [
            ("getAttributeViInt32", {"terminalName": "PTP 1/a", "attribute": "1150732"}),
            ("getAttributeViInt32", {"terminalName": "PTP 1/a", "attribute": "1150732"}),
            ("getAttributeViReal64", {"terminalName": "PTP 1/a", "attribute": "1150740"}),
            ("getAttributeViReal64", {"terminalName": "PTP 1/a", "attribute": "1150740"}),
            ("getAttributeViBoolean", {"terminalName": "PTP 1/a", "attribute": "1150812"}),
            # The size query, then the text.
            ("getAttributeViString", {"terminalName": "PTP 1/a", "attribute": "1150729"}),
            ("getAttributeViString", {"terminalName": "PTP 1/a", "attribute": "1150729"}),
            ("getAttributeViInt32", {"terminalName": "PTP 1/a", "attribute": "1150712"}),
            ("getAttributeViReal64", {"terminalName": "(null)", "attribute": "1150802"}),
            ("getAttributeViInt32", {"terminalName": "(null)", "attribute": "1150001"}),
        ]

    def test_written_values_reach_the_library_as_given(self, session, capfd):
        reference = session.time_references["AS1"]
        reference.gptp_priority1 = -2147483648
        reference.gptp_priority2 = 2147483647
        reference.time_reference_enabled = True
        reference.time_reference_enabled = 0
        reference.gptp_interface = 'eth "9", ü'
        reference.ptp_bmca_mode = tiktal.BmcaMode.MASTER_ONLY
        reference.ptp_bmca_mode = 1
        session.terminal_93_value = 4294967.295
        session.terminal_65_value = 3  # an int is a real number too
        assert [(name, args["terminalName"], args["attribute"], args["value"]) for name, args in calls(capfd)] == [
            ("setAttributeViInt32", "AS1", "1151104", "-2147483648"),
            ("setAttributeViInt32", "AS1", "1151105", "2147483647"),
            ("setAttributeViBoolean", "AS1", "1150812", "1"),
            ("setAttributeViBoolean", "AS1", "1150812", "0"),
            ("setAttributeViString", "AS1", "1151113", 'eth "9", ü'),
            ("setAttributeViInt32", "AS1", "1150742", "2"),
            ("setAttributeViInt32", "AS1", "1150742", "1"),
            ("setAttributeViReal64", "(null)", "1150105", "4.29497e+06"),
            ("setAttributeViReal64", "(null)", "1150101", "3"),
        ]

    def test_values_the_c_types_cannot_hold_are_refused_before_any_call(self, session, capfd):
        reference = session.time_references["PTP1"]
        refusals = [
            (TypeError, lambda: setattr(reference, "ptp_priority1", 1.5)),
            (TypeError, lambda: setattr(reference, "ptp_priority1", "1")),
            (TypeError, lambda: setattr(reference, "ptp_priority1", True)),
            (ValueError, lambda: setattr(reference, "ptp_priority1", 2147483648)),
            (ValueError, lambda: setattr(reference, "ptp_priority1", -2147483649)),
            (TypeError, lambda: setattr(reference, "time_reference_enabled", "false")),
            (TypeError, lambda: setattr(reference, "time_reference_enabled", 2)),
            (TypeError, lambda: setattr(reference, "time_reference_enabled", None)),
            (TypeError, lambda: setattr(reference, "ptp_interface", b"eth0")),
            (ValueError, lambda: setattr(reference, "ptp_interface", "eth\x000")),
            (TypeError, lambda: setattr(session, "terminal_58_value", "2.5")),
            (TypeError, lambda: setattr(session, "terminal_58_value", False)),
            # A member of another enumeration is a mistake, not a number.
            (TypeError, lambda: setattr(reference, "ptp_bmca_mode", tiktal.PtpPortState.MASTER)),
            (ValueError, lambda: setattr(reference, "ptp_bmca_mode", 1 << 40)),
            (TypeError, lambda: session.time_references[1]),
            (ValueError, lambda: session.time_references["PT\0P1"]),
            (TypeError, lambda: session.connect_trigger("PFI0", None)),
            (ValueError, lambda: session.connect_trigger("PFI0", "PXI_Trig0", sync_clock="a\0b")),
        ]
        for error, refusal in refusals:
            with pytest.raises(error):
                refusal()
        assert calls(capfd) == []

    def test_read_only_attributes_refuse_a_write_before_any_call(self, session, capfd):
        reference = session.time_references["PTP1"]
        for obj, name, value in [(session, "serial_number", 5), (session, "device_id", 0x7405),
                                 (session, "selected_time_reference", "PTP1"),
                                 (session, "selected_time_reference_offset", 0.0),
                                 (reference, "ptp_port_state", tiktal.PtpPortState.SLAVE),
                                 (reference, "ptp_gm_clock_id", "x"), (reference, "gptp_as_capable", True),
                                 (reference, "time_reference_type", "IEEE 1588-2008")]:
            with pytest.raises(AttributeError, match=f"^{name} \\(TIKTAL_ATTR_\\w+\\) is read only$"):
                setattr(obj, name, value)
        with pytest.raises(AttributeError):
            del reference.ptp_priority1
        # Properties of a time reference are not the session's, nor are unknown names.
        with pytest.raises(AttributeError):
            session.ptp_priority1 = 1
        with pytest.raises(AttributeError):
            reference.terminal_58_value = 1.0
        with pytest.raises(AttributeError):
            reference.no_such_attribute = 1
        assert calls(capfd) == []

    def test_not_a_number_is_the_library_s_to_refuse(self, session, capfd):
        session.terminal_58_value = math.nan  # the call-tracing session takes anything
        assert calls(capfd) == [("setAttributeViReal64", {"terminalName": "(null)", "attribute": "1150100",
                                                          "value": "nan"})]


class TestOtherCalls:
    def test_time_names_persist_and_routes(self, session, capfd):
        assert session.get_time() == (0, 0, __import__("datetime").datetime(
            1970, 1, 1, tzinfo=__import__("datetime").timezone.utc))
        assert session.time_reference_names == []
        assert list(session.time_references) == []
        assert "PTP1" not in session.time_references
        session.persist_config()
        session.connect_trigger("PFI0", "PXI_Trig3", invert=True)
        session.connect_trigger("PFI1", "PXI_Trig4", sync_clock="PXI_Clk10")
        session.disconnect_trigger("PFI0", tiktal.ALL_CONNECTED)
        session.connect_clock("ClkIn", "PXI_Clk10")
        session.disconnect_clock(tiktal.ALL_CONNECTED, "PXI_Clk10")
        traced = calls(capfd)
        assert [name for name, _ in traced] == [
            "getTime"] + ["getTimeReferenceNames"] * 6 + ["persistConfig",
            "connectTrigTerminals", "connectTrigTerminals", "disconnectTrigTerminals", "connectClkTerminals",
            "disconnectClkTerminals"]
        traced = traced[8:]
        assert traced[0][1] == {"srcTerminal": "PFI0", "destTerminal": "PXI_Trig3", "syncClock": "", "invert": "1",
                                "updateEdge": "0"}
        assert traced[1][1] == {"srcTerminal": "PFI1", "destTerminal": "PXI_Trig4", "syncClock": "PXI_Clk10",
                                "invert": "0", "updateEdge": "0"}
        assert traced[2][1] == {"srcTerminal": "PFI0", "destTerminal": "AllConnected"}
        assert traced[4][1] == {"srcTerminal": "AllConnected", "destTerminal": "PXI_Clk10"}


class TestSizeQueryAnswers:
    """What a text output does with each answer of its size query. No library gives the hostile
    ones, so the call is a stand-in here: it records what it was asked and answers as told."""

    @staticmethod
    def text_call(size_answer, text=b""):
        asked = []

        def call(size, buffer):
            asked.append(size)
            if buffer is None:
                return size_answer
            __import__("ctypes").memmove(buffer, text, len(text))
            return 0
        return call, asked

    def test_a_size_gets_a_buffer_of_that_size(self, session):
        call, asked = self.text_call(6, b"abcdef")  # no NUL of its own in the 6 bytes: it still ends there
        assert session._text("tiktal_Text", call) == "abcdef"
        assert asked == [0, 6]

    def test_no_size_is_no_text(self, session):
        call, asked = self.text_call(0)
        assert session._text("tiktal_Text", call) == ""
        assert asked == [0]

    def test_an_error_is_raised(self, session):
        call, asked = self.text_call(0xBFFA4068 - (1 << 32))
        with pytest.raises(tiktal.Error) as failure:
            session._text("tiktal_Text", call)
        assert (failure.value.code, failure.value.function) == (0xBFFA4068 - (1 << 32), "tiktal_Text")
        assert asked == [0]

    def test_a_warning_is_no_size(self, session):
        for warning in (0x3FFA4064, 0x3FFF0085, 0x3FFA403C):
            call, asked = self.text_call(warning)
            with pytest.warns(tiktal.Warning) as caught:
                assert session._text("tiktal_Text", call) == ""
            assert [w.message.code for w in caught] == [warning]
            assert asked == [0]

    def test_a_size_beyond_any_text_of_the_library_fails_as_the_status_it_is(self, session):
        call, asked = self.text_call(0x12345678)
        with pytest.raises(tiktal.Error) as failure:
            session._text("tiktal_Text", call)
        assert (failure.value.code, failure.value.message) == (0x12345678, "Unknown status value 0x12345678")
        assert asked == [0]
