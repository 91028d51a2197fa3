#!/bin/sh
# Reads the #include lines of the library's headers: each room may include its own headers and those of rooms in front
# of it in the order below, and zor nothing of the others at all. Prints what breaks the order; exit status 1 then.
set -eu
cd "$(dirname "$0")/.."

# The order of headers, by the words that a path begins with.
rank() {
    case $1 in
        zor/*) echo 1 ;;
        api/tov/types.h | types.h) echo 2 ;;
        core/exception.h | core/object.h | core/registry.h | core/context.h | core/image.h | core/opengl.h | \
            core/image_checks.h) echo 3 ;;
        kernelgen/sources.h | kernelgen/kernel_code.h | kernelgen/option_text.h) echo 4 ;;
        filters/*) echo 5 ;;
        kernelgen/*) echo 6 ;;
        core/*) echo 7 ;;
        api/*) echo 8 ;;
        *) echo 0 ;;
    esac
}

status=0
for header in zor/*.h core/*.h kernelgen/*.h filters/*.h; do
    own=$(rank "$header")
    for included in $(sed -n 's/^#include "\(.*\)"$/\1/p' "$header"); do
        if [ "$(rank "$included")" -gt "$own" ]; then
            echo "$header includes $included, which belongs to a later room"
            status=1
        fi
    done
done
for source in zor/*.h zor/*.cpp zor/*.def; do
    for included in $(sed -n 's/^#include "\(.*\)"$/\1/p' "$source"); do
        case $included in
            zor/*) ;;
            *) echo "$source includes $included: zor stands alone"; status=1 ;;
        esac
    done
done
for source in tools/*.cpp tools/*.h bench/*.cpp bench/*.h examples/*.c examples/*.cpp; do
    [ -e "$source" ] || continue
    for included in $(sed -n 's/^#include "\(.*\)"$/\1/p' "$source"); do
        case $included in
            zor/* | core/* | filters/* | kernelgen/* | api/*)
                echo "$source includes $included: hosts see tov/tov.h only"; status=1 ;;
        esac
    done
done
exit $status
