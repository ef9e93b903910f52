#!/usr/bin/env bash
# Builds the library and opens the call-tracing session: every call made on it is printed as
# trace lines (on standard error), followed by the status the call returned and its message.
set -euo pipefail
cd "$(dirname "$0")/.."

scripts/setup.sh
cmake -S . -B build -G Ninja >/dev/null
cmake --build build --target first_calls >/dev/null

echo "== tiktal: opening \"SyncTestInternal___\", the call-tracing session"
echo "   (lines in [brackets] are the session's trace; the others are what each call returned)"
echo
build/examples/first_calls "SyncTestInternal___" 2>&1
echo
echo "== an unknown resource name"
build/examples/first_calls "PXI9::1::INSTR" 2>&1 || true
