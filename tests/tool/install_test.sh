#!/usr/bin/env bash
# Installs into a fresh prefix and builds a host against it, once with find_package and once with pkg-config; then moves
# the prefix and does both again, since nothing in an installed tree may remember where it was built.
# install_test.sh CMAKE BUILD_DIR SOURCE_DIR C_COMPILER LINK_FLAGS
set -euo pipefail
cmake=$1 build=$2 here=$3 compiler=$4 flags=$5
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

fail() { echo "FAILED: $*" >&2; exit 1; }

use() { # PREFIX
    local prefix=$1 libraries out
    libraries=$(dirname "$(find "$prefix" -name libtov.so)")
    out=$(mktemp -d -p "$work")
    "$cmake" -S "$here/consumer" -B "$out" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_C_COMPILER="$compiler" \
        -DCMAKE_C_FLAGS="$flags" >"$out.log" || { cat "$out.log"; fail "find_package in $prefix"; }
    "$cmake" --build "$out" >"$out.log" || { cat "$out.log"; fail "building with find_package"; }
    LD_LIBRARY_PATH=$libraries "$out/consumer" || fail "running what find_package built"

    export PKG_CONFIG_PATH=$libraries/pkgconfig
    [[ $(pkg-config --modversion tov) == "$(sed -n 's/^#define TOV_VERSION_STRING "\(.*\)"/\1/p' "$prefix/include/tov/types.h")" ]] ||
        fail "the version that pkg-config tells"
    # shellcheck disable=SC2046,SC2086  # flags are words
    "$compiler" -std=c99 -pedantic -Wall -Werror $flags "$here/consumer/consumer.c" -o "$out/plain" $(pkg-config --cflags --libs tov)
    LD_LIBRARY_PATH=$libraries "$out/plain" || fail "running what pkg-config built"
}

"$cmake" --install "$build" --prefix "$work/prefix" >"$work/install.log"
use "$work/prefix"
find "$work/prefix" -name 'libtov.so.1' | grep -q . || fail "libtov.so.1 is missing"
find "$work/prefix" -name LICENSE | grep -q . || fail "the licence is missing"
mv "$work/prefix" "$work/moved"
use "$work/moved"
"$work/moved/bin/tov" --version || fail "the installed tool does not find its library"
echo "installed, used, moved and used again"
