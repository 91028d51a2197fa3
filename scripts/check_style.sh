#!/usr/bin/env bash
# Formatting of every C and C++ source, then clang-tidy on what is installed, clang's own warnings included. With "all",
# on tests and benchmarks, too. The packages: install_packages.sh build test check.
source "$(dirname "${BASH_SOURCE[0]}")/common.sh"

git ls-files '*.c' '*.cpp' '*.h' | xargs clang-format --dry-run -Werror

mkdir -p out
bench=OFF
[[ ${1:-} == all ]] && bench=ON
cmake --preset clang -DTOV_BUILD_BENCH=$bench >out/tidy.log
rooms='api|core|filters|kernelgen|zor|tools|examples'
[[ ${1:-} == all ]] && rooms+='|tests|bench'
run-clang-tidy -p out/clang -quiet -j "$(jobs)" "$PWD/($rooms)/.*" \
    >out/tidy.log 2>&1 || { grep -E 'error:|warning:' -A 4 out/tidy.log || cat out/tidy.log; echo "clang-tidy has complaints" >&2; exit 1; }
