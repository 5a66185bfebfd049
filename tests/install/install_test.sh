#!/usr/bin/env bash
# Installs the build tree into a temporary prefix and uses it the way an outside project does:
# a consumer built with find_package(trelm) and one built with pkg-config must compile, link and
# load the plug-in from the installed plug-in folder; the installed trelm-host must find that
# folder by itself and run its demo tour against its embedded emulator.
#
# Usage: install_test.sh BUILD-DIR CONSUMER-SOURCE-DIR CXX GENERATOR [SANITIZER-FLAGS]
set -euo pipefail
build=$1 consumer=$2 cxx=$3 generator=$4 sanitize=${5:-}

work=$(mktemp -d "${TMPDIR:-/tmp}/trelm-install-test.XXXXXX")
trap 'rm -rf "$work"' EXIT
prefix=$work/prefix
fail() { echo "FAIL: $*" >&2; exit 1; }

cmake --install "$build" --prefix "$prefix" >"$work/install.log" ||
  { cat "$work/install.log" >&2; fail "cmake --install"; }

# The framework carries its ABI version in its SONAME, the development link points at it.
soname=$(readelf -d "$prefix/lib/libtrelm.so" | sed -n 's/.*(SONAME).*\[\(.*\)\]/\1/p')
[[ $soname =~ ^libtrelm\.so\.[0-9]+$ ]] || fail "libtrelm SONAME is '$soname'"
[ -e "$prefix/lib/$soname" ] || fail "$soname not installed"

expect_components() {  # NAME OUTPUT-FILE
  grep -q '^component ' "$2" || fail "$1 listed no component: $(cat "$2")"
  grep -q '^builtin RuntimeConfiguration$' "$2" || fail "$1 made no built-in component"
}

# find_package: a relocated prefix is found through CMAKE_PREFIX_PATH only.
cmake -S "$consumer" -B "$work/cmake-consumer" -G "$generator" -DCMAKE_CXX_COMPILER="$cxx" \
  -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_FLAGS="$sanitize" -DCMAKE_EXE_LINKER_FLAGS="$sanitize" \
  >"$work/consumer.log" 2>&1 || { cat "$work/consumer.log" >&2; fail "configuring the find_package consumer"; }
cmake --build "$work/cmake-consumer" >>"$work/consumer.log" 2>&1 ||
  { cat "$work/consumer.log" >&2; fail "building the find_package consumer"; }
"$work/cmake-consumer/trelm_consumer" >"$work/cmake-consumer.out" || fail "find_package consumer exited $?"
expect_components find_package "$work/cmake-consumer.out"

# pkg-config: flags, library folder and plug-in folder all from trelm.pc.
export PKG_CONFIG_PATH=$prefix/lib/pkgconfig
plugindir=$(pkg-config --variable=plugindir trelm)
[ "$plugindir" = "$prefix/lib/trelm/plugins" ] || fail "plugindir is '$plugindir'"
# shellcheck disable=SC2046,SC2086
"$cxx" -std=c++20 $sanitize -o "$work/pc-consumer" "$consumer/main.cpp" \
  -DTRELM_PLUGIN_DIR="\"$plugindir\"" $(pkg-config --cflags --libs trelm) \
  -Wl,-rpath,"$(pkg-config --variable=libdir trelm)" -ldl || fail "building the pkg-config consumer"
"$work/pc-consumer" >"$work/pc-consumer.out" || fail "pkg-config consumer exited $?"
expect_components pkg-config "$work/pc-consumer.out"

# The installed host: no --plugin, so it must take the plug-in from the installed folder.
host_out=$work/host.out
"$prefix/bin/trelm-host" --config "$prefix/share/trelm/demo.json" --state-dir "$work/state" \
  --format json demo >"$host_out" 2>"$work/host.err" ||
  { cat "$host_out" "$work/host.err" >&2; fail "installed trelm-host demo exited $?"; }
grep -q "\"type\":\"plugin\".*$prefix/lib/trelm/plugins/libtrelmfacebook.so" "$host_out" ||
  { cat "$host_out" >&2; fail "trelm-host did not load the installed plug-in"; }
grep -q '"type":"login".*"code":"0x00000000"' "$host_out" ||
  { cat "$host_out" >&2; fail "trelm-host did not sign in"; }
if grep '"type":"check"' "$host_out" | grep -q '"ok":false'; then
  cat "$host_out" >&2; fail "a demo check failed"
fi
echo "install test: ok ($prefix)"
