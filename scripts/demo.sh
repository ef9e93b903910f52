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

workdir=$(mktemp -d)
sim_pid=
cleanup() {
  [ -z "$sim_pid" ] || kill "$sim_pid" 2>/dev/null || true
  [ -z "$sim_pid" ] || wait "$sim_pid" 2>/dev/null || true
  rm -rf "$workdir"
}
trap cleanup EXIT

build/sim/timeservice/timeservice_sim --listen 127.0.0.2:0 --state "$workdir/state.json" >"$workdir/sim.out" 2>&1 &
sim_pid=$!
for _ in $(seq 100); do
  grep -q '^listening on' "$workdir/sim.out" && break
  sleep 0.1
done
address=$(sed -n 's/^listening on //p' "$workdir/sim.out")
[ -n "$address" ] || { cat "$workdir/sim.out"; echo "the time-service simulator did not start" >&2; exit 1; }

echo "== a time service: the simulator listens on $address"
echo
ZRSHAREDDIR="$PWD/build/shared" build/examples/time_references "sync://$address/system"
