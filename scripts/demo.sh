#!/usr/bin/env bash
# Builds the library and the tiktal command, then shows them at work on the simulated machine:
# the call-tracing session, a session on the time-service simulator (started on 127.0.0.2, stopped
# at the end), and local devices: a simulated machine with two timing modules in a PXI chassis and
# a simulated device, with the stand-ins of the module driver, the routing service and the PXI
# chassis query showing what reached the "hardware".
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
machine_command=tools/machine/tiktal-machine
machine=$workdir/machine
trap 'stop_simulator; [ -d "$machine" ] && "$machine_command" stop-daemons "$machine"; rm -rf "$workdir"' EXIT
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

echo
echo "== local devices: a machine with timing modules in slots 2 and 4 of PXI chassis 1 and a simulated device"
"$machine_command" create "$machine" '{"chassis":[{"number":1,"slots":{"2":{"serial":"1a2b"},"4":{"device":"0x7406"}}}]}'
"$machine_command" fake "$machine" board1 >/dev/null
export TIKTAL_SYSROOT=$machine TIKTAL_DEVD=$PWD/build/sim/devd/tiktal_devd
# The routing service and the PXI chassis query are the stand-in libraries of the build tree;
# the routing stand-in appends each call it gets to a log.
export LD_LIBRARY_PATH=$PWD/build/roco:$PWD/build/qpxi${LD_LIBRARY_PATH:+:$LD_LIBRARY_PATH}
export ZRROCOAPI_SIM_LOG=$workdir/routing.log
"$machine_command" start-daemons "$machine" >/dev/null 2>&1
echo "  (layout, a driver stand-in on each module's interface path, and $TIKTAL_SYSROOT/var/lib/Korvane/tiktal/board1.fake)"
routing_calls() {  # the calls that reached the routing service since the last look
  [ -f "$ZRROCOAPI_SIM_LOG" ] || return 0
  python3 -c 'import json, sys
calls = [json.loads(line) for line in open(sys.argv[1])]
print("  routing service:", ", ".join(c["call"] + ("" if c["code"] == 0 else "=" + str(c["code"])) for c in calls))' "$ZRROCOAPI_SIM_LOG"
  rm -f "$ZRROCOAPI_SIM_LOG"
}
driver_requests() {  # the requests that reached the driver stand-in of module $1
  echo "  driver of $1:"
  "$machine_command" packets "$machine" "$1" | sed 's/^/    /'
}

run devices
echo "  (the list is kept in $TIKTAL_SYSROOT/var/lib/Korvane/tiktal/tiktal.config)"
run open pxi1slot2
run get PXI1Slot2 SERIAL_NUMBER
run get "PXI0::2-4.0::INSTR" DEVICE_ID
rm -f "$ZRROCOAPI_SIM_LOG"
run route PXI1Slot2 PFI0 PXI_Trig3 --invert
routing_calls
run route PXI1Slot2 ClkIn PXI_Clk10 --clock
routing_calls
echo
echo "== refused by the module itself, before the routing service is asked"
run route PXI1Slot2 ClkIn PXI_Trig0
routing_calls
echo
echo "== terminal values and reset"
run set PXI1Slot2 TERMINAL_58_VALUE 2.5
run get "PXI2::2::INSTR" TERMINAL_58_VALUE
rm -f "$ZRROCOAPI_SIM_LOG"
run reset PXI1Slot2
routing_calls
run get PXI1Slot2 TERMINAL_58_VALUE
driver_requests tiktal0
echo
echo "== the simulated device FAKE:TIKTAL:board1 opens as a call-tracing session"
run get Sync1 TERMINAL_58_VALUE 2>&1
run get PXI9Slot9 DEVICE_ID
