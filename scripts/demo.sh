#!/usr/bin/env bash
# Builds the library, then shows it at work on the simulated machine: the call-tracing session,
# and a session on the time-service simulator (started here on 127.0.0.2, stopped at the end).
set -euo pipefail
cd "$(dirname "$0")/.."

scripts/setup.sh
cmake -S . -B build -G Ninja >/dev/null
cmake --build build --target size_query time_references timeservice_sim tiktal_zrsslinit tiktal_curlimpl >/dev/null

echo "== the call-tracing session \"SyncTestInternal___\""
echo "   (lines in [brackets] are its trace; the others are what each call returned)"
echo
build/examples/size_query "SyncTestInternal___" 2>&1
echo

. scripts/simulator.sh
workdir=$(mktemp -d)
trap 'stop_simulator; rm -rf "$workdir"' EXIT
start_simulator build/sim/timeservice/timeservice_sim "$workdir/state.json"
address=$sim_address

echo "== a time service: the simulator listens on $address"
echo
ZRSHAREDDIR="$PWD/build/shared" build/examples/time_references "sync://$address/system"
