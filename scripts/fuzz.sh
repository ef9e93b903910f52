#!/usr/bin/env bash
# Builds the fuzz targets of fuzz/ (clang, libFuzzer, AddressSanitizer and
# UndefinedBehaviorSanitizer) in build-fuzz/ and runs each one on a copy of its seed corpus.
#
#   scripts/fuzz.sh [SECONDS] [TARGET...]       each target for SECONDS (default 60), all by default
#   scripts/fuzz.sh --runs N [TARGET...]        each target for N inputs (what scripts/test.sh does)
#
# A run works in build-fuzz/runs/TARGET/: corpus/ starts as a copy of fuzz/corpus/TARGET and
# keeps what the run adds, so the tree's corpus stays small; a fault leaves its input there as
# crash-*, leak-*, timeout-* or oom-*. The exit status is 1 when any target found a fault.
set -euo pipefail
cd "$(dirname "$0")/.."

limit=(-max_total_time=60)
if [ "${1:-}" = "--runs" ]; then
  limit=(-runs="$2")
  shift 2
elif [[ "${1:-}" =~ ^[0-9]+$ ]]; then
  limit=(-max_total_time="$1")
  shift
fi
if [ $# -gt 0 ]; then
  targets=("$@")
else
  targets=()
  for source in fuzz/*.cpp; do targets+=("$(basename "$source" .cpp)"); done
fi
for target in "${targets[@]}"; do
  [ -f "fuzz/$target.cpp" ] || { echo "fuzz: no target $target (fuzz/$target.cpp)" >&2; exit 2; }
done

scripts/setup.sh
build=build-fuzz
cmake -S . -B "$build" -G Ninja -DCMAKE_C_COMPILER=clang -DCMAKE_CXX_COMPILER=clang++ \
  -DTIKTAL_FUZZ=ON -DTIKTAL_TESTS=OFF -DTIKTAL_BENCH=OFF >/dev/null
cmake --build "$build" -j "$(nproc)" --target "${targets[@]/#/fuzz_}"

# A reproducer as C-escaped bytes, short enough to paste into a report or a unit test.
escaped() {
  python3 -c 'import sys; d = open(sys.argv[1], "rb").read(); print("".join(chr(b) if 32 <= b < 127 and b not in b"\"\\" else "\\x%02x" % b for b in d[:512]) + (" ..." if len(d) > 512 else ""))' "$1"
}

failed=()
for target in "${targets[@]}"; do
  work=$build/runs/$target
  rm -rf "$work"
  mkdir -p "$work"
  cp -r "fuzz/corpus/$target" "$work/corpus"
  options=("${limit[@]}" -timeout=10 -rss_limit_mb=2048 -print_final_stats=1 -artifact_prefix="$work/")
  [ -f "fuzz/$target.dict" ] && options+=(-dict="fuzz/$target.dict")
  echo "== fuzz $target (${limit[*]})"
  if "$build/fuzz/fuzz_$target" "${options[@]}" "$work/corpus" >"$work/log" 2>&1; then
    echo "fuzz $target: no fault ($(grep -o 'stat::number_of_executed_units: *[0-9]*' "$work/log" | grep -o '[0-9]*$') runs)"
  else
    failed+=("$target")
    grep -E 'property does not hold|ERROR: (AddressSanitizer|libFuzzer|LeakSanitizer)|runtime error|terminate called|SUMMARY' "$work/log" | head -n 5 ||
      tail -n 5 "$work/log"
    for found in "$work"/crash-* "$work"/leak-* "$work"/timeout-* "$work"/oom-*; do
      if [ -f "$found" ]; then echo "fuzz $target: FAULT, input $found: \"$(escaped "$found")\""; fi
    done
    echo "fuzz $target: the whole output is in $work/log"
  fi
done

[ ${#failed[@]} -eq 0 ] || echo "fuzz: faults found by ${failed[*]}"
echo "fuzz: $((${#targets[@]} - ${#failed[@]})) passed, ${#failed[@]} failed"
[ ${#failed[@]} -eq 0 ]
