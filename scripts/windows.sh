#!/usr/bin/env bash
# Cross-builds the library for Windows with mingw-w64: installs what is missing
# (scripts/setup.sh), builds the dependencies once per source version (build-win-deps/, see
# scripts/windows/deps.sh), then everything into build-win32/ (32-bit) and build-win64/ (64-bit).
# Afterwards it runs the Windows tests of each build folder that has them (windows-tests.sh).
set -euo pipefail
cd "$(dirname "$0")/.."

scripts/setup.sh

jobs=$(nproc)
builds=(i686:build-win32 x86_64:build-win64)
for build in "${builds[@]}"; do
  arch=${build%%:*} dir=${build#*:}
  deps=$PWD/build-win-deps/$arch
  echo "== $dir ($arch-w64-mingw32)"
  scripts/windows/deps.sh "$arch" "$deps"
  cmake -S . -B "$dir" -G Ninja -DCMAKE_TOOLCHAIN_FILE="cmake/toolchains/$arch-w64-mingw32.cmake" \
    -DTIKTAL_WINDOWS_DEPS="$deps" -DTIKTAL_BENCH=OFF >/dev/null
  cmake --build "$dir" -j "$jobs"
done

for build in "${builds[@]}"; do
  dir=${build#*:}
  if [ -f "$dir/windows-tests.sh" ]; then
    echo "== Windows tests of $dir"
    bash "$dir/windows-tests.sh" || [ $? -eq 77 ]  # 77: Wine cannot run this architecture here
  fi
done
