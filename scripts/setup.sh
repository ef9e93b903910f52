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

missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done

if [ ${#missing[@]} -gt 0 ]; then
  echo "setup: installing ${missing[*]}"
  sudo_cmd=()
  [ "$(id -u)" -eq 0 ] || sudo_cmd=(sudo)
  "${sudo_cmd[@]}" apt-get update -qq
  DEBIAN_FRONTEND=noninteractive "${sudo_cmd[@]}" apt-get install -y -qq "${missing[@]}" >/dev/null
fi
