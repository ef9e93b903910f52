"""The installed package: what it holds, its properties and enumerations by name, and where it
finds libtiktal.so (each search in a fresh interpreter, as a process loads the library once)."""
import os
import shutil
import subprocess
import sys
import sysconfig

import pytest

import tiktal

SESSION_ATTRIBUTES = {
    "selected_time_reference_offset", "selected_time_reference_offset_ns", "selected_time_reference_type",
    "selected_time_reference", "serial_number", "device_id", "terminal_58_value", "terminal_65_value",
    "terminal_72_value", "terminal_79_value", "terminal_86_value", "terminal_93_value",
}
TIME_REFERENCE_ATTRIBUTES = {
    "ptp_port_state", "ptp_steps_removed", "ptp_clock_id", "ptp_clock_class", "ptp_clock_accuracy",
    "ptp_priority1", "ptp_priority2", "ptp_gm_clock_id", "ptp_gm_clock_class", "ptp_gm_clock_accuracy",
    "ptp_gm_priority1", "ptp_gm_priority2", "ptp_log_sync_interval", "ptp_mean_path_delay", "ptp_gm_ip_address",
    "ptp_bmca_mode", "ptp_interface", "time_reference_type", "time_reference_enabled", "time_reference_selected",
    "gptp_port_state", "gptp_clock_id", "gptp_clock_class", "gptp_clock_accuracy", "gptp_priority1",
    "gptp_priority2", "gptp_gm_clock_id", "gptp_gm_clock_class", "gptp_gm_clock_accuracy", "gptp_gm_priority1",
    "gptp_gm_priority2", "gptp_log_sync_interval", "gptp_log_announce_interval", "gptp_interface",
    "gptp_neighbor_prop_delay_threshold", "gptp_as_capable",
}


def attributes_of(cls):
    return {name for name in dir(cls) if isinstance(getattr(cls, name), tiktal.attributes.Attribute)}


class TestInstalledPackage:
    def test_it_is_the_installed_copy_with_its_generated_attributes_and_type_marker(self):
        folder = os.path.dirname(tiktal.__file__)
        assert folder == os.path.join(sysconfig.get_paths()["purelib"], "tiktal")
        assert os.path.isfile(os.path.join(folder, "_attributes.py"))
        assert os.path.isfile(os.path.join(folder, "py.typed"))

    def test_every_attribute_has_its_property_where_it_belongs(self):
        assert attributes_of(tiktal.Session) == SESSION_ATTRIBUTES
        assert attributes_of(tiktal.TimeReference) == TIME_REFERENCE_ATTRIBUTES

    def test_properties_know_their_constant_type_and_access(self):
        cases = [  # property, constant, identifier, accessor type, writable
            (tiktal.TimeReference.ptp_priority1, "TIKTAL_ATTR_1588_PRIORITY1", 1150732, "Int32", True),
            (tiktal.TimeReference.gptp_as_capable, "TIKTAL_ATTR_8021AS_AS_CAPABLE", 1151115, "Boolean", False),
            (tiktal.TimeReference.ptp_mean_path_delay, "TIKTAL_ATTR_1588_MEAN_PATH_DELAY", 1150740, "Real64", False),
            (tiktal.TimeReference.gptp_interface, "TIKTAL_ATTR_8021AS_INTERFACE", 1151113, "String", True),
            (tiktal.Session.selected_time_reference_offset, "TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET", 1150802,
             "Real64", False),
            (tiktal.Session.terminal_58_value, "TIKTAL_ATTR_TERMINAL_58_VALUE", 1150100, "Real64", True),
            (tiktal.Session.serial_number, "TIKTAL_ATTR_SERIAL_NUMBER", 1150001, "Int32", False),
        ]
        for prop, constant, identifier, type_name, writable in cases:
            assert (prop.constant, prop.id, prop.type_name, prop.writable) == (constant, identifier, type_name, writable)
            assert constant in prop.__doc__

    def test_enumerations_hold_the_numbers_of_the_c_interface(self):
        assert {m.name: m.value for m in tiktal.PtpPortState} == {
            "INITIALIZING": 0, "FAULTY": 1, "DISABLED": 2, "LISTENING": 3, "PRE_MASTER": 4, "MASTER": 5,
            "PASSIVE": 6, "UNCALIBRATED": 7, "SLAVE": 8}
        assert {m.name: m.value for m in tiktal.GptpPortState} == {"OTHER": 3, "MASTER": 6, "SLAVE": 9}
        assert {m.name: m.value for m in tiktal.BmcaMode} == {"SLAVE_ONLY": 0, "MASTER_SLAVE": 1, "MASTER_ONLY": 2}
        assert len(tiktal.PtpClockAccuracy) == 19 and len(tiktal.GptpClockAccuracy) == 19
        assert (tiktal.PtpClockAccuracy.UNKNOWN, tiktal.PtpClockAccuracy.WITHIN_25NS,
                tiktal.PtpClockAccuracy.WITHIN_2_5US, tiktal.PtpClockAccuracy.GREATER_THAN_10S) == (0, 1, 5, 18)
        assert (tiktal.GptpClockAccuracy.WITHIN_25NS, tiktal.GptpClockAccuracy.WITHIN_2_5US,
                tiktal.GptpClockAccuracy.GREATER_THAN_10S, tiktal.GptpClockAccuracy.UNKNOWN) == (0x20, 0x24, 0x31, 0xFE)
        for enumeration in (tiktal.PtpPortState, tiktal.GptpPortState, tiktal.BmcaMode, tiktal.PtpClockAccuracy,
                            tiktal.GptpClockAccuracy):
            assert issubclass(enumeration, __import__("enum").IntEnum)
        assert tiktal.TimeReference.ptp_port_state.enumeration is tiktal.PtpPortState
        assert tiktal.TimeReference.gptp_gm_clock_accuracy.enumeration is tiktal.GptpClockAccuracy
        assert tiktal.TimeReference.ptp_gm_clock_accuracy.enumeration is tiktal.PtpClockAccuracy


def run_python(code, env_changes, cwd=None):
    """Runs `code` in a fresh interpreter of this environment; (exit status, stdout, stderr)."""
    env = dict(os.environ)
    for name, value in env_changes.items():
        if value is None:
            env.pop(name, None)
        else:
            env[name] = value
    done = subprocess.run([sys.executable, "-c", code], env=env, capture_output=True, text=True, timeout=120,
                          cwd=cwd)
    return done.returncode, done.stdout, done.stderr


OPEN_TRACE = "import tiktal\nwith tiktal.Session('SyncTestInternal___') as s: print(s.self_test().message)\n" \
             "print(tiktal.library_path())"
REPORT_FAILURE = "import tiktal\ntry:\n    tiktal.Session('SyncTestInternal___')\n" \
                 "except tiktal.LibraryError as e:\n    print(e)\n    print(len(e.looked))"


class TestLibrarySearch:
    def test_the_path_in_tiktal_library_comes_first(self):
        status, out, err = run_python(OPEN_TRACE, {})
        assert status == 0, err
        assert out == f"Self test passed\n{os.environ['TIKTAL_LIBRARY']}\n"

    def test_a_wrong_tiktal_library_is_reported_and_nothing_else_is_tried(self, tmp_path):
        missing = str(tmp_path / "libtiktal.so")
        status, out, err = run_python(REPORT_FAILURE, {"TIKTAL_LIBRARY": missing})
        assert status == 0, err
        assert out.startswith(f"libtiktal could not be loaded from TIKTAL_LIBRARY={missing}: ")
        assert out.endswith("\n1\n")

    def test_a_library_lacking_a_function_is_refused(self, tmp_path):
        # The routing stand-in is a shared library, but no libtiktal.
        other = os.path.join(os.environ["LD_LIBRARY_PATH"].split(":")[0], "libzrrocoapi.so")
        status, out, err = run_python(REPORT_FAILURE, {"TIKTAL_LIBRARY": other})
        assert status == 0, err
        assert out == (f"libtiktal could not be loaded from TIKTAL_LIBRARY={other}: {other} lacks tiktal_init: "
                       "it is no libtiktal this package can use\n1\n")

    def test_without_tiktal_library_the_system_loader_finds_it(self):
        status, out, err = run_python(OPEN_TRACE, {
            "TIKTAL_LIBRARY": None,
            "LD_LIBRARY_PATH": os.environ["TIKTAL_BUILD_LIBRARY_DIR"] + ":" + os.environ["LD_LIBRARY_PATH"]})
        assert status == 0, err
        assert out == "Self test passed\nlibtiktal.so.0\n"

    def test_the_library_installed_beside_the_package_comes_before_the_system_loader(self, tmp_path):
        # A prefix as cmake --install lays it out: the package in lib/pythonX.Y/site-packages, the
        # library in lib.
        packages = tmp_path / "lib" / f"python{sys.version_info[0]}.{sys.version_info[1]}" / "site-packages"
        shutil.copytree(os.path.dirname(tiktal.__file__), packages / "tiktal")
        library = tmp_path / "lib" / "libtiktal.so.0"
        shutil.copy(os.path.realpath(os.environ["TIKTAL_LIBRARY"]), library)
        status, out, err = run_python(OPEN_TRACE, {
            "TIKTAL_LIBRARY": None, "PYTHONPATH": str(packages),
            "LD_LIBRARY_PATH": os.environ["TIKTAL_BUILD_LIBRARY_DIR"] + ":" + os.environ["LD_LIBRARY_PATH"]})
        assert status == 0, err
        assert out == f"Self test passed\n{library}\n"

    def test_a_missing_library_says_where_it_looked(self):
        status, out, err = run_python(REPORT_FAILURE, {"TIKTAL_LIBRARY": None})
        assert status == 0, err
        lines = out.splitlines()
        assert lines[0] == "libtiktal was not found; looked at:"
        assert lines[1] == "  TIKTAL_LIBRARY (not set)"
        package = os.path.dirname(tiktal.__file__)
        # This environment's prefix has no library in its library folders.
        prefix = os.path.dirname(os.path.dirname(os.path.dirname(os.path.dirname(package))))
        assert f"  {prefix}/lib/libtiktal.so.0 (no such file)" in lines
        assert f"  {prefix}/lib64/libtiktal.so (no such file)" in lines
        assert lines[-2].startswith("  the system loader for libtiktal.so (")
        assert any(line.startswith("  the system loader for libtiktal.so.0 (") for line in lines)
        assert lines[-1] == str(len(lines) - 2)

    def test_the_enumerations_need_no_library(self):
        status, out, err = run_python("import tiktal; print(int(tiktal.BmcaMode.MASTER_ONLY))",
                                      {"TIKTAL_LIBRARY": "/nonexistent/libtiktal.so"})
        assert (status, out) == (0, "2\n"), err
