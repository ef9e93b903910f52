#!/usr/bin/env bash
# deps.sh ARCH PREFIX: cross-builds the libraries the Windows build needs, for ARCH (i686 or
# x86_64), from Debian's source packages, and installs them into PREFIX (include/, lib/, bin/):
#   cJSON    a static library (tiktal.dll links it in and exports its functions);
#   libcurl  a DLL over Schannel, Windows' own TLS (bin/libcurl-4.dll, lib/libcurl.dll.a).
# Boost and CLI11 are used for their headers only; PREFIX leads to the host's.
#
# The sources come through a private apt folder (SOURCES/apt, SOURCES defaults to the folder
# beside PREFIX named "sources") with deb-src entries made from the system's deb entries; the
# system's own lists are never touched. When PREFIX holds a build of the same source versions
# already (PREFIX/deps.stamp names them), nothing is done.
set -euo pipefail
[ $# -eq 2 ] || { echo "usage: $0 i686|x86_64 PREFIX" >&2; exit 2; }
arch=$1
case $arch in i686 | x86_64) ;; *) echo "deps: unknown architecture $arch" >&2; exit 2 ;; esac
host=$arch-w64-mingw32
root=$(cd "$(dirname "$0")/../.." && pwd)
mkdir -p "$2"
prefix=$(cd "$2" && pwd)
sources=${TIKTAL_WINDOWS_SOURCES:-$(dirname "$prefix")/sources}
mkdir -p "$sources"
sources=$(cd "$sources" && pwd)
packages=(cjson curl)

# The private apt folder: deb-src twins of the system's deb entries, lists and caches of its own.
apt_dir=$sources/apt
apt_opts=(-o Dir::Etc::sourcelist=/dev/null -o Dir::Etc::sourceparts="$apt_dir/sources.list.d"
          -o Dir::State::Lists="$apt_dir/lists" -o Dir::Cache="$apt_dir/cache"
          -o APT::Sandbox::User="$(id -un)")
if [ ! -e "$apt_dir/lists-read" ]; then
  rm -rf "$apt_dir"
  mkdir -p "$apt_dir/sources.list.d" "$apt_dir/lists/partial" "$apt_dir/cache/archives/partial"
  for f in /etc/apt/sources.list.d/*.sources; do
    [ -e "$f" ] && sed 's/^Types:.*/Types: deb-src/' "$f" >"$apt_dir/sources.list.d/$(basename "$f")"
  done
  if [ -f /etc/apt/sources.list ]; then
    sed -n 's/^[[:space:]]*deb[[:space:]]/deb-src /p' /etc/apt/sources.list >"$apt_dir/sources.list.d/system.list"
  fi
  echo "deps: reading Debian's source lists"
  apt-get "${apt_opts[@]}" -qq update
  touch "$apt_dir/lists-read"
fi

# Header-only libraries serve any target: Boost and CLI11 (with its CMake package) are the host's,
# reached through links.
for f in /usr/include/boost/version.hpp /usr/include/CLI/CLI.hpp /usr/share/cmake/CLI11/CLI11Config.cmake; do
  [ -f "$f" ] || { echo "deps: $f is missing (scripts/setup.sh installs it)" >&2; exit 1; }
done
mkdir -p "$prefix/include" "$prefix/share/cmake"
ln -sfn /usr/include/boost "$prefix/include/boost"
ln -sfn /usr/include/CLI "$prefix/include/CLI"
ln -sfn /usr/share/cmake/CLI11 "$prefix/share/cmake/CLI11"

# The source versions now available, e.g. "cjson 1.7.15-1+deb12u4 curl 7.88.1-10+deb12u15".
versions=()
for p in "${packages[@]}"; do
  v=$(apt-cache "${apt_opts[@]}" showsrc "$p" | sed -n 's/^Version: //p' | sort -V | tail -n 1)
  [ -n "$v" ] || { echo "deps: no source package $p" >&2; exit 1; }
  versions+=("$p $v")
done
# A change to how they are built below changes the recipe, so that an older build is done again.
recipe="recipe 2"
stamp="$host ${versions[*]} $recipe"
if [ "$(cat "$prefix/deps.stamp" 2>/dev/null)" = "$stamp" ]; then
  exit 0
fi
echo "deps: building ${versions[*]} for $host into $prefix"
rm -f "$prefix/deps.stamp"

# Runs a build step with its output in a log; shows the log's end when it fails.
logged() {
  local log=$1
  shift
  "$@" >"$log" 2>&1 || { tail -n 40 "$log" >&2; echo "deps: failed, see $log" >&2; exit 1; }
}

# Fetches and unpacks one source package (name and version) into $sources/<name>-<version>.
unpack() {
  local name=$1 version=$2 dir=$sources/$1-$2
  if [ ! -d "$dir" ]; then
    # The files were checked against the signed source index; dpkg-source's own check of the
    # .dsc signature needs the maintainers' keys, which are not on the machine.
    rm -rf "$dir.partial"
    (cd "$sources" && logged "$sources/$name-fetch.log" apt-get "${apt_opts[@]}" -qq source --download-only "$name=$version" &&
       logged "$sources/$name-unpack.log" dpkg-source -x "${name}_${version#*:}.dsc" "$dir.partial" && mv "$dir.partial" "$dir")
  fi
  echo "$dir"
}

build=$sources/build-$host
rm -rf "$build"
mkdir -p "$build"
read -r _ cjson_version <<<"${versions[0]}"
read -r _ curl_version <<<"${versions[1]}"

# cJSON, static; built so, its functions are not marked for export: every DLL that links it exports
# only its own functions (the driver library's module definition names the cJSON ones it exports).
cjson_src=$(unpack cjson "$cjson_version")
logged "$build/cjson.log" cmake -S "$cjson_src" -B "$build/cjson" -G Ninja \
  -DCMAKE_TOOLCHAIN_FILE="$root/cmake/toolchains/$host.cmake" -DCMAKE_BUILD_TYPE=Release \
  -DCMAKE_INSTALL_PREFIX="$prefix" -DBUILD_SHARED_LIBS=OFF -DENABLE_CJSON_TEST=OFF -DENABLE_CJSON_UTILS=OFF \
  -DENABLE_CUSTOM_COMPILER_FLAGS=OFF \
  -DENABLE_PUBLIC_SYMBOLS=OFF -DENABLE_HIDDEN_SYMBOLS=ON
logged "$build/cjson-build.log" cmake --build "$build/cjson" --target install

# libcurl: HTTP and HTTPS only, TLS through Schannel, no other optional library; Windows' own
# threads for the resolver and libgcc linked in, so that it needs no mingw DLL.
curl_src=$(unpack curl "$curl_version")
mkdir -p "$build/curl"
(cd "$build/curl" && logged "$build/curl.log" "$curl_src/configure" --host="$host" --prefix="$prefix" \
  --with-schannel --without-openssl --without-libpsl --without-brotli --without-zstd --without-nghttp2 \
  --without-libidn2 --without-librtmp --without-libssh2 --disable-ldap --disable-manual \
  --disable-dict --disable-file --disable-ftp --disable-gopher --disable-imap --disable-mqtt --disable-pop3 \
  --disable-rtsp --disable-smb --disable-smtp --disable-telnet --disable-tftp --disable-pthreads \
  --enable-shared --disable-static LDFLAGS=-static-libgcc)
logged "$build/curl-build.log" make -C "$build/curl/lib" -j "$(nproc)" install
logged "$build/curl-headers.log" make -C "$build/curl/include" install
logged "$build/curl-pc.log" make -C "$build/curl" install-pkgconfigDATA

echo "$stamp" >"$prefix/deps.stamp"
rm -rf "$build"
