#!/usr/bin/env bash
# Formatting of every C and C++ source, then clang-tidy on all that the asan or release preset compiles.
source "$(dirname "${BASH_SOURCE[0]}")/common.sh"

git ls-files '*.c' '*.cpp' '*.h' | xargs clang-format --dry-run -Werror

# clang reads the compile commands of gcc; generated sources are left out.
cmake --preset dev >/dev/null
cmake --build --preset dev --target help | sed -n 's/^\(.*Source\.cpp\): .*/\1/p' | xargs -r cmake --build --preset dev --target
run-clang-tidy -p out/dev -quiet -j "$(jobs)" "$PWD/(api|core|filters|kernelgen|zor|tools|tests|bench|examples)/.*" >out/tidy.log 2>&1 ||
    { grep -E 'error:|warning:' -A 5 out/tidy.log; echo "clang-tidy has complaints" >&2; exit 1; }
