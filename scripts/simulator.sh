# Sourced by scripts that need the time-service simulator: start_simulator PROGRAM STATE_FILE
# starts it on 127.0.0.2 with a free port and sets sim_pid and sim_address ("127.0.0.2:PORT");
# stop_simulator ends it.
start_simulator() {
  local out
  out=$(mktemp)
  "$1" --listen 127.0.0.2:0 --state "$2" >"$out" 2>&1 &
  sim_pid=$!
  for _ in $(seq 100); do
    grep -q '^listening on' "$out" && break
    sleep 0.1
  done
  sim_address=$(sed -n 's/^listening on //p' "$out")
  [ -n "$sim_address" ] || { cat "$out" >&2; rm -f "$out"; echo "the time-service simulator did not start" >&2; return 1; }
  rm -f "$out"
}

stop_simulator() {
  [ -z "${sim_pid:-}" ] || { kill "$sim_pid" 2>/dev/null; wait "$sim_pid" 2>/dev/null; } || true
  sim_pid=
}
