#!/usr/bin/env bash
# Installs what a Debian 12 machine needs: install_packages.sh build|test|check [build|test|check ...]
# Packages that are there already are left alone; when none is missing, nothing is fetched.
source "$(dirname "${BASH_SOURCE[0]}")/common.sh"

# One OpenCL device is needed to run anything: PoCL makes one of the processor.
build=(g++ cmake ninja-build pkg-config opencl-headers ocl-icd-libopencl1 pocl-opencl-icd libcli11-dev libopenimageio-dev)
test=(libgtest-dev libbenchmark-dev oclgrind locales libegl-dev libgl-dev libgl1-mesa-dri libegl1)
check=(clang clang-format clang-tidy)

wanted=()
for group in "$@"; do
    case $group in
        build) wanted+=("${build[@]}") ;;
        test) wanted+=("${test[@]}") ;;
        check) wanted+=("${check[@]}") ;;
        *) echo "usage: $0 build|test|check ..." >&2; exit 2 ;;
    esac
done

missing=()
for package in "${wanted[@]}"; do
    status=$(dpkg-query --show --showformat='${db:Status-Status}' "$package" 2>/dev/null || true)
    [[ $status == installed ]] || missing+=("$package")
done
if ((${#missing[@]} == 0)); then
    exit 0
fi

say "Installing ${missing[*]}"
root=()
if ((EUID != 0)); then
    command -v sudo >/dev/null || { echo "Run this as root, or install: ${missing[*]}" >&2; exit 1; }
    root=(sudo)
fi
"${root[@]}" env DEBIAN_FRONTEND=noninteractive apt-get update --quiet
"${root[@]}" env DEBIAN_FRONTEND=noninteractive apt-get install --yes --quiet --no-install-recommends "${missing[@]}"
