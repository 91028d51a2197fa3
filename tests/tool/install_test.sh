#!/usr/bin/env bash
# Installs, moves it all, since nothing may remember where it was, and builds a host with find_package and pkg-config.
set -euxo pipefail
cmake=$1 build=$2 compiler=$3 flags=$4
root=$(realpath "$(dirname "$0")/../..")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
"$cmake" --install "$build" --prefix "$work/first" >"$work/log"
prefix=$work/moved
mv "$work/first" "$prefix"
LD_LIBRARY_PATH=$(dirname "$(find "$prefix" -name libtov.so.1)")
export PKG_CONFIG_PATH=$LD_LIBRARY_PATH/pkgconfig

"$cmake" -S "$root/tests/tool/consumer" -B "$work/build" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_C_COMPILER="$compiler" \
    -DCMAKE_C_FLAGS="$flags"
"$cmake" --build "$work/build"
# shellcheck disable=SC2046,SC2086  # flags are words
"$compiler" -std=c99 $flags "$root/examples/first_light.c" -o "$work/plain" $(pkg-config --cflags --libs tov)
export LD_LIBRARY_PATH
cd "$work"
build/consumer "$root/data/sample/render.pfm" first.ppm
./plain "$root/data/sample/render.pfm" second.ppm
cmp first.ppm second.ppm
env -u LD_LIBRARY_PATH "$prefix/bin/tov" --version
