#!/usr/bin/env bash
# Installs what is needed, builds the tool and develops the sample render into pictures in demo/.
source "$(dirname "${BASH_SOURCE[0]}")/common.sh"

scripts/install_packages.sh build

say "Building"
mkdir -p out
cmake -S . -B out/demo -G Ninja -DCMAKE_BUILD_TYPE=Release -DTOV_BUILD_TESTS=OFF -DTOV_BUILD_EXAMPLES=OFF >out/demo.log 2>&1 ||
    { cat out/demo.log; exit 1; }
ninja -C out/demo -j "$(jobs)"

say "Developing data/sample/render.exr"
mkdir -p demo
develop() { # OUTPUT STAGE...
    local output=demo/$1 stages=()
    shift
    for stage in "$@"; do stages+=(-f "$stage"); done
    out/demo/bin/tov run data/sample/render.exr "${stages[@]}" -o "$output"
    pictures+=("$PWD/$output")
}
pictures=()
gamma=gamma_correction:cGamma=2.2
develop linear.png "$gamma"
develop reinhard.png reinhard_tonemap "$gamma"
develop drago.png drago_tonemap:cBias=0.85 "$gamma"
develop filmic.png simple_tonemap:cApplyToneMap=1 "$gamma"
develop edges.png reinhard_tonemap "$gamma" sobel

say "Pictures (linear.png is the render as it is, reinhard.png the developed one):"
printf '%s\n' "${pictures[@]}"
