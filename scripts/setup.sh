#!/usr/bin/env bash
# Installs the Debian packages the build and the tests need, when they are missing.
set -euo pipefail

# libclang-rt-dev: clang's sanitizer and libFuzzer runtimes, which Debian's clang only recommends.
# The Python package is built with Debian's setuptools and wheel and tested with its pytest, in a
# virtual environment of the system Python (python3-venv brings ensurepip's pip).
packages=(
  cmake ninja-build g++ clang libclang-rt-dev pkg-config python3 binutils
  python3-venv python3-pip python3-setuptools python3-wheel python3-pytest
  libgtest-dev libgmock-dev libbenchmark-dev
  libcjson-dev libcurl4-openssl-dev libboost-dev libcpp-httplib-dev libcli11-dev
)
# The Windows build: the mingw-w64 cross compilers, Wine (32-bit from the i386 architecture, and
# 64-bit) to run what they build, and dpkg-dev (apt-get source, dpkg-source) and make to
# cross-build cJSON and libcurl from Debian's source packages. Installed without the recommended
# packages.
windows_packages=(mingw-w64 wine wine32:i386 wine64 dpkg-dev make)

missing() {
  for p in "$@"; do
    dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || echo "$p"
  done
}
mapfile -t missing_packages < <(missing "${packages[@]}")
mapfile -t missing_windows < <(missing "${windows_packages[@]}")

sudo_cmd=()
[ "$(id -u)" -eq 0 ] || sudo_cmd=(sudo)
install() {
  DEBIAN_FRONTEND=noninteractive "${sudo_cmd[@]}" apt-get install -y -qq "$@" >/dev/null
}

if [ ${#missing_packages[@]} -gt 0 ] || [ ${#missing_windows[@]} -gt 0 ]; then
  if [ ${#missing_windows[@]} -gt 0 ] && ! dpkg --print-foreign-architectures | grep -qx i386; then
    echo "setup: adding the i386 architecture"
    "${sudo_cmd[@]}" dpkg --add-architecture i386
  fi
  echo "setup: installing ${missing_packages[*]} ${missing_windows[*]}"
  "${sudo_cmd[@]}" apt-get update -qq
  [ ${#missing_packages[@]} -eq 0 ] || install "${missing_packages[@]}"
  [ ${#missing_windows[@]} -eq 0 ] || install --no-install-recommends "${missing_windows[@]}"
fi
