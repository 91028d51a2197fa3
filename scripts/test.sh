#!/usr/bin/env bash
# Installs what is needed, builds everything and runs every test. Arguments go to ctest: scripts/test.sh -R tool
source "$(dirname "${BASH_SOURCE[0]}")/common.sh"

scripts/install_packages.sh build test

say "Building"
cmake --preset release
cmake --build --preset release -j "$(jobs)"

say "Testing"
ctest --preset release --no-tests=error "$@"
