#!/usr/bin/env bash
# The Python package as a user installs it: a fresh virtual environment of the system Python
# (with its site packages, for Debian's pytest) under BUILD_DIR/python-tests, the package installed
# offline from python/, and the pytest suite of this folder against BUILD_DIR's libtiktal.so, the
# time-service simulator and a simulated machine, each a separate process.
# Usage: run_tests.sh BUILD_DIR SOURCE_DIR [pytest arguments...]
# The programs may be named by TIKTAL_LIBRARY, TIMESERVICE_SIM, TIKTAL_DEVD (as ctest does);
# otherwise they are taken from their places in BUILD_DIR.
set -euo pipefail
build=$(cd "$1" && pwd)
source=$(cd "$2" && pwd)
shift 2
python=${TIKTAL_SYSTEM_PYTHON:-/usr/bin/python3}
work=$build/python-tests

rm -rf "$work"
mkdir -p "$work"
"$python" -m venv --system-site-packages "$work/venv"
"$work/venv/bin/python" -m pip install --quiet --disable-pip-version-check --no-build-isolation --no-index \
  "$source/python"

export TIKTAL_LIBRARY=${TIKTAL_LIBRARY:-$build/libtiktal.so}
export TIMESERVICE_SIM=${TIMESERVICE_SIM:-$build/sim/timeservice/timeservice_sim}
export TIKTAL_DEVD=${TIKTAL_DEVD:-$build/sim/devd/tiktal_devd}
export TIKTAL_MACHINE=$source/tools/machine/tiktal-machine
export TIKTAL_SOURCE_DIR=$source
export TIKTAL_BUILD_LIBRARY_DIR=$(dirname "$TIKTAL_LIBRARY")
export ZRSHAREDDIR=$build/shared
# The routing and chassis-query stand-ins, found by the library's loader (and by the tests, which
# read back the routes from the same copy of the routing stand-in).
export LD_LIBRARY_PATH=$build/roco:$build/qpxi
# The simulated machine of the tests; nothing reaches the real machine's configuration.
export TIKTAL_SYSROOT=$work/machine

cd "$work"
exec "$work/venv/bin/python" -m pytest -p no:cacheprovider -q "$source/tests/python" "$@"
