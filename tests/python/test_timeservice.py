"""Time-service sessions on the simulator: the values of the simulator's default state read through
every kind of property, writes that change its state, enumerations both ways, the time references
as a repeated capability, errors and warnings, the size query, and threads."""
import datetime
import json
import threading
import warnings

import pytest

import tiktal
from conftest import REFERENCE_NAMES

TYPE_MISMATCH = 0xBFFA4065 - (1 << 32)
NOT_FOUND_ON_DEVICE = 0xBFFA406C - (1 << 32)
IN_PROGRESS = 0x3FFA4064
IN_PROGRESS_MESSAGE = ("The request has been accepted by the remote device but processing has not been completed. "
                       "Wait and attempt to query the property again.")


@pytest.fixture
def session(sim):
    with tiktal.Session(sim.resource) as s:
        yield s


class TestReading:
    def test_attributes_of_the_session(self, session):
        assert session.selected_time_reference == "PTP1"
        assert session.selected_time_reference_type == "IEEE 1588-2008"
        assert session.selected_time_reference_offset == 1.5
        assert session.selected_time_reference_offset_ns == 1.5e9

    def test_every_kind_of_property_of_a_time_reference(self, session):
        ptp1 = session.time_references["PTP1"]
        assert ptp1.time_reference_type == "IEEE 1588-2008"
        assert ptp1.time_reference_enabled is True
        assert ptp1.time_reference_selected is True
        assert ptp1.ptp_priority1 == 128 and type(ptp1.ptp_priority1) is int
        assert ptp1.ptp_log_sync_interval == -3
        assert ptp1.ptp_mean_path_delay == 1234.5 and type(ptp1.ptp_mean_path_delay) is float
        assert ptp1.ptp_clock_id == "00:80:2F:FF:FE:12:34:56"
        assert ptp1.ptp_gm_ip_address == "192.0.2.10"
        as1 = session.time_references["AS1"]
        assert as1.gptp_as_capable is True
        assert as1.gptp_neighbor_prop_delay_threshold == 800
        assert as1.gptp_interface == "eth1"
        assert session.time_references["TAB1"].time_reference_enabled is False
        assert session.time_references["BC1"].time_reference_selected is False
        assert session.time_references["BC1"].ptp_priority2 == 248

    def test_enumerated_attributes_read_as_members(self, session):
        refs = session.time_references
        cases = [  # reference, property, member (the state's text or number in the comment)
            ("PTP1", "ptp_port_state", tiktal.PtpPortState.SLAVE),  # PTP_SLAVE
            ("AS1", "gptp_port_state", tiktal.GptpPortState.MASTER),  # PTP_MASTER
            ("PTP1", "ptp_bmca_mode", tiktal.BmcaMode.MASTER_SLAVE),  # masterslave
            ("PTP1", "ptp_clock_accuracy", tiktal.PtpClockAccuracy.WITHIN_1US),  # WITHIN_1US
            ("PTP1", "ptp_gm_clock_accuracy", tiktal.PtpClockAccuracy.WITHIN_100NS),  # WITHIN_100NS
            ("BC1", "ptp_gm_clock_accuracy", tiktal.PtpClockAccuracy.WITHIN_25NS),  # WITHIN_25NS
            ("AS1", "gptp_clock_accuracy", tiktal.GptpClockAccuracy.WITHIN_1US),  # WITHIN_1US
            ("AS1", "gptp_gm_clock_accuracy", tiktal.GptpClockAccuracy.WITHIN_100NS),  # 33
            ("TAB1", "gptp_clock_accuracy", tiktal.GptpClockAccuracy.UNKNOWN),  # 254
        ]
        for name, prop, member in cases:
            value = getattr(refs[name], prop)
            assert value is member, (name, prop, value)

    def test_the_other_port_states_and_numbers_no_member_has(self, sim, session):
        sim.control("state", {"timeReferences": {"AS1": {"portState": "PTP_LISTENING", "gmClockAccuracy": 77},
                                                 "PTP1": {"portState": "PTP_PRE_MASTER", "localAccuracy": "WITHIN_3S"}}})
        as1, ptp1 = session.time_references["AS1"], session.time_references["PTP1"]
        assert as1.gptp_port_state is tiktal.GptpPortState.OTHER
        assert ptp1.ptp_port_state is tiktal.PtpPortState.PRE_MASTER
        assert ptp1.ptp_clock_accuracy is tiktal.PtpClockAccuracy.UNKNOWN
        accuracy = as1.gptp_gm_clock_accuracy
        assert accuracy == 77 and type(accuracy) is int

    def test_the_time(self, sim, session):
        for seconds, nanoseconds, utc in [
                (0, 0, datetime.datetime(1970, 1, 1, tzinfo=datetime.timezone.utc)),
                (1700000000, 123456789, datetime.datetime(2023, 11, 14, 22, 13, 20, 123456, datetime.timezone.utc)),
                (4294967295, 999999999, datetime.datetime(2106, 2, 7, 6, 28, 15, 999999, datetime.timezone.utc))]:
            sim.control("state", {"epochOffsetInNsec": str(seconds * 10**9 + nanoseconds)})
            assert session.get_time() == tiktal.Time(seconds, nanoseconds, utc)
        assert session.get_time().utc.tzinfo is datetime.timezone.utc


class TestWriting:
    def test_writes_reach_the_state_and_read_back(self, sim, session):
        cases = [  # reference, property, value, member of the state, stored value
            ("PTP1", "ptp_priority1", 2147483647, "priority1", 2147483647),
            ("PTP1", "ptp_priority1", -2147483648, "priority1", -2147483648),
            ("AS1", "gptp_log_sync_interval", -4, "logSyncInterval", -4),
            ("TAB1", "time_reference_enabled", True, "isEnabled", True),
            ("TAB1", "time_reference_enabled", False, "isEnabled", False),
            ("PTP1", "ptp_interface", 'eth "9"/b, ü', "interface", 'eth "9"/b, ü'),
            ("AS1", "gptp_interface", "", "interface", ""),
        ]
        for name, prop, value, member, stored in cases:
            setattr(session.time_references[name], prop, value)
            assert sim.control("last")["method"] == "PUT"
            assert sim.reference(name)[member] == stored
            assert getattr(session.time_references[name], prop) == value

    def test_enumerations_both_ways(self, sim, session):
        ptp1 = session.time_references["PTP1"]
        for member, text in [(tiktal.BmcaMode.MASTER_ONLY, "masteronly"), (tiktal.BmcaMode.SLAVE_ONLY, "slaveonly"),
                             (1, "masterslave")]:
            ptp1.ptp_bmca_mode = member
            assert sim.reference("PTP1")["bmcaMode"] == text
            assert ptp1.ptp_bmca_mode is tiktal.BmcaMode(member)
        # A number with no mode is the library's to refuse: nothing is stored.
        with pytest.raises(tiktal.Error) as failure:
            ptp1.ptp_bmca_mode = 3
        assert (failure.value.code, failure.value.function) == (0xBFFF0078 - (1 << 32), "tiktal_SetAttributeViInt32")
        assert sim.reference("PTP1")["bmcaMode"] == "masterslave"

    def test_refused_writes_send_nothing(self, sim, session):
        ptp1 = session.time_references["PTP1"]
        served = sim.served()
        for prop, value, error in [("ptp_priority1", 2147483648, ValueError), ("ptp_priority1", "1", TypeError),
                                   ("ptp_port_state", tiktal.PtpPortState.MASTER, AttributeError),
                                   ("ptp_gm_priority1", 1, AttributeError), ("ptp_interface", "a\0b", ValueError),
                                   ("ptp_bmca_mode", tiktal.GptpPortState.SLAVE, TypeError)]:
            with pytest.raises(error):
                setattr(ptp1, prop, value)
        assert sim.served() == served
        assert sim.reference("PTP1")["priority1"] == 128

    def test_persist_config_rewrites_the_state_file(self, sim, session):
        sim.control("state", {"timeReferences": {"BC1": {"priority2": 77}}})
        session.persist_config()
        assert sim.control("last")["path"].endswith("/persist")
        with open(sim.state_file, encoding="utf-8") as file:
            assert json.load(file)["timeReferences"]["BC1"]["priority2"] == 77


class TestTimeReferences:
    def test_names_iteration_and_membership(self, session):
        assert session.time_reference_names == REFERENCE_NAMES
        references = list(session.time_references)
        assert [r.name for r in references] == REFERENCE_NAMES
        assert all(isinstance(r, tiktal.TimeReference) and r.session is session for r in references)
        assert [r.time_reference_type for r in session.time_references] == [
            "IEEE 1588-2008", "IEEE 1588-2008 BC", "IEEE 802.1AS-2011", "IEEE 802.1AS-2011 TAB"]
        assert "AS1" in session.time_references and "AS2" not in session.time_references
        assert session.time_references["BC1"] == references[1]

    def test_indexing_sends_nothing_until_an_attribute_is_read(self, sim, session):
        served = sim.served()
        missing = session.time_references["NOPE"]
        assert sim.served() == served
        with pytest.raises(tiktal.Error) as failure:
            missing.ptp_priority1
        assert (failure.value.code, failure.value.function) == (NOT_FOUND_ON_DEVICE, "tiktal_GetAttributeViInt32")

    def test_names_that_are_not_plain_reach_the_service_whole(self, sim, session):
        state = sim.state()
        state["timeReferences"]["a/b?c PTP"] = dict(state["timeReferences"]["PTP1"], priority1=17)
        sim.control("state", state, method="PUT")
        assert session.time_reference_names == REFERENCE_NAMES + ["a/b?c PTP"]
        assert session.time_references["a/b?c PTP"].ptp_priority1 == 17

    def test_many_long_names_come_whole_through_the_size_query(self, sim, session):
        state = sim.state()
        template = state["timeReferences"]["BC1"]
        names = [f"reference-{i:05d}-" + "x" * 40 for i in range(3000)]  # some 170 kB of names
        state["timeReferences"] = {name: template for name in names}
        state["selectedTrId"] = names[0]
        sim.control("state", state, method="PUT")
        assert session.time_reference_names == names
        assert [r.name for r in session.time_references][-1] == names[-1]


class TestErrorsAndWarnings:
    def test_an_error_carries_code_message_and_function(self, session):
        with pytest.raises(tiktal.Error) as failure:
            session.time_references["PTP1"].gptp_priority1
        error = failure.value
        assert (error.code, error.function) == (TYPE_MISMATCH, "tiktal_GetAttributeViInt32")
        assert error.message == "The requested property is not supported by the time reference specified on the Active Item."
        assert str(error) == f"tiktal_GetAttributeViInt32: 0xBFFA4065 {error.message}"
        with pytest.raises(tiktal.Error) as failure:
            session.time_references["BC1"].gptp_clock_id
        assert (failure.value.code, failure.value.function) == (TYPE_MISMATCH, "tiktal_GetAttributeViString")

    def test_failing_opens_and_functions_a_service_lacks(self, sim):
        with pytest.raises(tiktal.Error) as failure:
            tiktal.Session("sync://localhost/system")
        assert (failure.value.code, failure.value.function) == (0xBFFA4016 - (1 << 32), "tiktal_init")
        with pytest.raises(tiktal.Error) as failure:
            tiktal.Session(sim.resource, reset=True)
        assert (failure.value.code, failure.value.message) == (0xBFFA4007 - (1 << 32), "This device does not support Reset.")
        with tiktal.Session(sim.resource) as session:
            with pytest.raises(tiktal.Error) as failure:
                session.reset()
            assert (failure.value.code, failure.value.function) == (0xBFFA4003 - (1 << 32), "tiktal_reset")
            # A time service has no Real64 attribute to write.
            with pytest.raises(tiktal.Error) as failure:
                session.terminal_58_value = 1.0
            assert (failure.value.code, failure.value.function) == (0xBFFF001D - (1 << 32), "tiktal_SetAttributeViReal64")

    def test_a_service_that_answers_with_an_error(self, sim, session):
        sim.control("next", {"status": 404})
        with pytest.raises(tiktal.Error) as failure:
            session.time_reference_names
        assert (failure.value.code, failure.value.function) == (NOT_FOUND_ON_DEVICE, "tiktal_GetTimeReferenceNames")

    def test_a_warning_is_emitted_and_the_call_returns(self, sim, session):
        ptp1 = session.time_references["PTP1"]
        sim.control("next", {"count": 1})  # the type request passes
        sim.control("next", {"status": 202})  # the value request is accepted, not answered
        with pytest.warns(tiktal.Warning) as caught:
            value = ptp1.ptp_priority1
        assert value == 0  # the library gave no value
        [warning] = caught
        assert (warning.message.code, warning.message.message, warning.message.function) == (
            IN_PROGRESS, IN_PROGRESS_MESSAGE, "tiktal_GetAttributeViInt32")
        assert str(warning.message) == f"tiktal_GetAttributeViInt32: 0x3FFA4064 {IN_PROGRESS_MESSAGE}"
        assert warning.filename == __file__  # reported at the caller's line
        assert ptp1.ptp_priority1 == 128

    def test_a_warning_can_be_made_an_error(self, sim, session):
        sim.control("next", {"count": 1})
        sim.control("next", {"status": 202})
        with warnings.catch_warnings():
            warnings.simplefilter("error", tiktal.Warning)
            with pytest.raises(tiktal.Warning) as raised:
                session.time_references["PTP1"].ptp_priority2
        assert raised.value.code == IN_PROGRESS

    def test_a_warning_answering_the_size_query_is_no_size(self, sim, session):
        ptp1 = session.time_references["PTP1"]
        sim.control("next", {"count": 1})
        sim.control("next", {"status": 202})
        served = sim.served()
        with pytest.warns(tiktal.Warning) as caught:
            text = ptp1.ptp_clock_id
        # No buffer of 0x3FFA4064 bytes was asked for: the text is empty, and no second call went out.
        assert text == ""
        assert [w.message.code for w in caught] == [IN_PROGRESS]
        assert [w.message.function for w in caught] == ["tiktal_GetAttributeViString"]
        assert sim.served() == served + 2
        assert ptp1.ptp_clock_id == "00:80:2F:FF:FE:12:34:56"

    def test_a_closed_session_sends_nothing(self, sim):
        session = tiktal.Session(sim.resource)
        reference = session.time_references["PTP1"]
        session.close()
        served = sim.served()
        for use in (lambda: reference.ptp_priority1, lambda: session.selected_time_reference,
                    lambda: session.get_time(), lambda: session.time_reference_names,
                    lambda: setattr(reference, "ptp_priority1", 1), lambda: session.persist_config()):
            with pytest.raises(tiktal.Error) as failure:
                use()
            assert failure.value.code == 0xBFFF000E - (1 << 32)
        session.close()
        assert sim.served() == served


class TestThreads:
    def test_threads_on_one_session(self, session):
        expected = {("PTP1", "ptp_priority2"): 128, ("BC1", "ptp_priority2"): 248, ("AS1", "gptp_priority1"): 246,
                    ("TAB1", "gptp_clock_id"): "00:80:2F:FF:FE:12:34:59"}
        results, failures = [], []

        def read(name, prop):
            try:
                for _ in range(15):
                    results.append(((name, prop), getattr(session.time_references[name], prop)))
            except Exception as error:  # reported below
                failures.append(error)

        threads = [threading.Thread(target=read, args=key) for key in expected]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        assert failures == []
        assert len(results) == 60
        assert all(value == expected[key] for key, value in results)

    def test_threads_on_sessions_of_their_own(self, sim):
        failures = []

        def write_and_read(name, first):
            try:
                with tiktal.Session(sim.resource) as session:
                    reference = session.time_references[name]
                    for value in range(first, first + 10):
                        reference.ptp_priority1 = value
                        assert reference.ptp_priority1 == value
            except Exception as error:  # reported below
                failures.append(error)

        threads = [threading.Thread(target=write_and_read, args=(name, first))
                   for name, first in [("PTP1", 10), ("BC1", 40)]]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        assert failures == []
        assert (sim.reference("PTP1")["priority1"], sim.reference("BC1")["priority1"]) == (19, 49)

    def test_closing_while_other_threads_call(self, sim):
        session = tiktal.Session(sim.resource)
        outcomes, started = [], threading.Barrier(3)

        def read():
            started.wait()
            try:
                for _ in range(50):
                    session.time_references["AS1"].gptp_priority2
                outcomes.append("done")
            except tiktal.Error as error:
                outcomes.append(error.code)

        threads = [threading.Thread(target=read) for _ in range(2)]
        for thread in threads:
            thread.start()
        started.wait()
        session.close()
        for thread in threads:
            thread.join()
        # Each reader either finished or was told the session is gone; nothing else.
        assert set(outcomes) <= {"done", 0xBFFF000E - (1 << 32)} and len(outcomes) == 2
        assert session.closed
