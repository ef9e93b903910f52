#!/usr/bin/env bash
# Builds the library and runs every test: a normal build, then the Python package's tests (ctest's
# python.package, run here on their own), a build under AddressSanitizer and
# UndefinedBehaviorSanitizer, the concurrency tests under ThreadSanitizer, a short run of every
# fuzz target on its seed corpus, and the Windows build with its tests under Wine (scripts/windows.sh).
set -euo pipefail
cd "$(dirname "$0")/.."

scripts/setup.sh

jobs=$(nproc)
build() {
  local dir=$1
  shift
  cmake -S . -B "$dir" -G Ninja "$@" >/dev/null
  cmake --build "$dir" -j "$jobs"
}
clang=(-DCMAKE_C_COMPILER=clang -DCMAKE_CXX_COMPILER=clang++ -DTIKTAL_BENCH=OFF)

echo "== build and test"
build build
ctest --test-dir build --output-on-failure -j "$jobs" -E '^python\.package$'

echo "== Python package (installed offline into a fresh virtual environment, tested with pytest)"
tests/python/run_tests.sh build .

echo "== AddressSanitizer + UndefinedBehaviorSanitizer"
build build-asan "${clang[@]}" -DTIKTAL_SANITIZE=address,undefined
ctest --test-dir build-asan --output-on-failure -j "$jobs"

echo "== ThreadSanitizer (concurrency tests)"
build build-tsan "${clang[@]}" -DTIKTAL_SANITIZE=thread
TSAN_OPTIONS="halt_on_error=1" ctest --test-dir build-tsan -L concurrency --output-on-failure

echo "== fuzz targets (20000 inputs each)"
scripts/fuzz.sh --runs 20000

echo "== Windows: cross-built with mingw-w64, tested under Wine"
scripts/windows.sh
