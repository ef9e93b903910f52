#!/usr/bin/env bash
# Installs the build into a temporary prefix: no stand-in by default, each in a folder of its own
# off the loader's path with the component "simulators". Builds the examples against it with
# pkg-config and with the CMake package, and runs them against the installed time-service
# simulator; so does the Python package installed with them, with the Python the build was
# configured with. The installed machine command and tiktal command find the installed stand-ins.
# Usage: install_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
build=$1
source=$2
work=$(mktemp -d)
. "$source/scripts/simulator.sh"
machine=$work/machine
trap 'stop_simulator; [ ! -d "$machine" ] || "$prefix/libexec/tiktal/tiktal-machine" stop-daemons "$machine"; rm -rf "$work"' EXIT
fail() { echo "FAIL: $*" >&2; exit 1; }
expect() {  # expect FILE TEXT: the output holds the text
  grep -qF -- "$2" "$1" || { cat "$1" >&2; fail "$1 lacks: $2"; }
}

prefix=$work/prefix
cmake --install "$build" --prefix "$prefix" >"$work/install.log"
libdir=$(dirname "$(find "$prefix" -name 'libtiktal.so' | head -n 1)")
[ -f "$libdir/pkgconfig/tiktal.pc" ] || fail "no pkg-config file"
[ -f "$libdir/cmake/tiktal/tiktalConfig.cmake" ] || fail "no CMake package"
for runtime in zrssl/libzrsslinit.so zrcurl/libcurlimpl.so; do
  [ -f "$libdir/tiktal/$runtime" ] || fail "run-time library $runtime not installed"
done
[ -f "$prefix/include/tiktal/tiktal.h" ] && [ -x "$prefix/bin/tiktal" ] || fail "no header or no tiktal command"

# The stand-ins carry the real libraries' names: none by default, and with the component only
# these, where no loader looks by default (nothing of them in lib/, lib/<multiarch>, lib64, bin/).
stand_ins() {
  find "$prefix" \( -name 'libzrrocoapi*' -o -name 'libzrqpxi*' -o -name 'libgrrt*' -o -name 'libgrffrt*' \
    -o -name timeservice_sim -o -name tiktal_devd -o -name tiktal-machine \) -printf '%P\n' | LC_ALL=C sort
}
[ -z "$(stand_ins)" ] || fail "stand-ins installed by default: $(stand_ins)"
cmake --install "$build" --prefix "$prefix" --component simulators >/dev/null
sim=${libdir#"$prefix"/}/tiktal/sim
expected=$(printf '%s\n' "$sim/libzrrocoapi.so" "$sim/libzrqpxi.so" "$sim/graviton/libgrrt.so" \
  "$sim/graviton/libgrffrt.so" libexec/tiktal/timeservice_sim libexec/tiktal/tiktal_devd \
  libexec/tiktal/tiktal-machine | LC_ALL=C sort)
[ "$(stand_ins)" = "$expected" ] || fail "stand-ins installed as: $(stand_ins)"

# pkg-config
export PKG_CONFIG_PATH=$libdir/pkgconfig
mkdir "$work/pc"
for program in time_references size_query; do
  cc -std=c99 -Wall -Werror "$source/examples/$program.c" $(pkg-config --cflags --libs tiktal) \
    -Wl,-rpath,"$libdir" -o "$work/pc/$program"
done
cc "$source/tests/install/app/cjson_through_tiktal.c" $(pkg-config --cflags --libs tiktal) \
  -Wl,-rpath,"$libdir" -o "$work/pc/cjson_through_tiktal"

# CMake package
cmake -S "$source/tests/install/app" -B "$work/cmake" -DCMAKE_PREFIX_PATH="$prefix" \
  -DCMAKE_BUILD_RPATH="$libdir" >/dev/null
cmake --build "$work/cmake" >/dev/null

# The installed simulator, and the examples of both builds against it.
start_simulator "$prefix/libexec/tiktal/timeservice_sim" "$work/state.json"
address=$sim_address
export ZRSHAREDDIR=$libdir/tiktal

for dir in "$work/pc" "$work/cmake"; do
  "$dir/time_references" "sync://$address/system" >"$work/out" 2>&1 || { cat "$work/out"; fail "$dir/time_references"; }
  expect "$work/out" "time: "
  expect "$work/out" "PTP1"
  expect "$work/out" "IEEE 802.1AS-2011 TAB"
  "$dir/size_query" "sync://$address/sync_1" >"$work/out" 2>&1 || fail "$dir/size_query"
  expect "$work/out" 'time references: "PTP1,BC1,AS1,TAB1"'
  expect "$work/out" "size query                                   status 18 "
  expect "$work/out" "0xBFFF000E): The given session or object reference is invalid."
  "$dir/cjson_through_tiktal" >"$work/out" || fail "$dir/cjson_through_tiktal"
  expect "$work/out" '{"references":["PTP1","AS1"],"count":2}'
done
"$prefix/bin/tiktal" refs "sync://$address/system" >"$work/out" 2>&1 || { cat "$work/out"; fail "tiktal refs"; }
expect "$work/out" "TAB1  IEEE 802.1AS-2011 TAB"
"$work/pc/time_references" "sync://localhost/system" >"$work/out" 2>&1 && fail "localhost was accepted"
expect "$work/out" "tiktal_init failed: 0xBFFA4016 The specified device was not found."

# A simulated machine from the installed tree: the machine command starts the daemon beside it, and
# the library reaches the chassis query and routing stand-ins through LD_LIBRARY_PATH.
env -u TIKTAL_DEVD "$prefix/libexec/tiktal/tiktal-machine" create "$machine" '{"chassis":[{"number":1,"slots":{"2":{}}}]}'
env -u TIKTAL_DEVD "$prefix/libexec/tiktal/tiktal-machine" start-daemons "$machine"
TIKTAL_SYSROOT=$machine LD_LIBRARY_PATH=$libdir/tiktal/sim "$prefix/bin/tiktal" route PXI1Slot2 PFI0 PXI_Trig3 \
  >"$work/out" 2>&1 || { cat "$work/out"; fail "tiktal route on the installed stand-ins"; }
echo "install test passed"

# The Python package: the install says where it went (a temporary prefix is on no Python's path),
# and the package finds the library installed beside it, with no variable naming it.
python=$(sed -n 's/^TIKTAL_PYTHON:FILEPATH=//p' "$build/CMakeCache.txt")
pythonpath=$(sed -n 's/.*does not search: export PYTHONPATH=//p' "$work/install.log")
[ -f "$pythonpath/tiktal/_attributes.py" ] || { cat "$work/install.log"; fail "the Python package is not where the install says"; }
[ -f "$pythonpath/tiktal/py.typed" ] || fail "the Python package lacks py.typed"
run_python() {
  env -u TIKTAL_LIBRARY -u LD_LIBRARY_PATH PYTHONPATH="$pythonpath" "$python" "$@"
}
run_python -c 'import tiktal; print(tiktal.library_path())' >"$work/out" 2>&1 || { cat "$work/out"; fail "import tiktal"; }
[ "$(cat "$work/out")" = "$libdir/libtiktal.so.0" ] || { cat "$work/out"; fail "the package did not load the library beside it"; }
run_python "$source/examples/python/time_references.py" "sync://$address/system" >"$work/out" 2>&1 ||
  { cat "$work/out"; fail "examples/python/time_references.py"; }
expect "$work/out" "selected  PTP1 (IEEE 1588-2008), offset 1.5 s"
expect "$work/out" "AS1   IEEE 802.1AS-2011      yes      no        MASTER (6)  246"
