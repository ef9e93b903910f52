#!/usr/bin/env bash
# Builds the library and the tiktal command, then shows them at work on the simulated machine:
# the call-tracing session, and a session on the time-service simulator (started on 127.0.0.2,
# stopped at the end).
set -euo pipefail
cd "$(dirname "$0")/.."

scripts/setup.sh
cmake -S . -B build -G Ninja >/dev/null
cmake --build build >/dev/null

tiktal=build/bin/tiktal
export ZRSHAREDDIR=$PWD/build/shared
run() {  # shows a command line, then runs it; a failing status is part of the walk-through
  echo
  echo "\$ tiktal $*"
  "$tiktal" "$@" || echo "(exit status $?)"
}

echo "== the call-tracing session: lines in [brackets] are its trace on standard error"
run open SyncTestInternal___
run get SyncTestInternal___ 1588_PRIORITY1 --item PTP1 2>&1

. scripts/simulator.sh
workdir=$(mktemp -d)
trap 'stop_simulator; rm -rf "$workdir"' EXIT
start_simulator build/sim/timeservice/timeservice_sim "$workdir/state.json"
service="sync://$sim_address/system"

echo
echo "== a time service: the simulator listens on $sim_address"
run open "$service"
run refs "$service"
run time "$service"
run get "$service" TIKTAL_ATTR_1588_PRIORITY1 --item PTP1
run get "$service" 1588_MEAN_PATH_DELAY --item PTP1
run get "$service" 8021AS_AS_CAPABLE --item AS1
run get "$service" 1588_GM_CLOCK_ID --item BC1
run get "$service" SELECTED_TIME_REFERENCE_OFFSET
run set "$service" 1588_PRIORITY1 100 --item PTP1
run persist "$service"
echo "  (the simulator's state file now holds: $(grep -m1 '"priority1"' "$workdir/state.json" | tr -d '\t'))"
run get "$service" 1588_PRIORITY1 --item PTP1 --json
echo
echo "== refused: an 802.1AS attribute of a 1588 time reference, and a reset of a time service"
run get "$service" 8021AS_PRIORITY1 --item PTP1
run open "$service" --reset
run status 0xBFFA4007
