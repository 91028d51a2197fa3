#!/bin/sh
# The dynamic symbol table of the library $1 defines 27 functions of the interface's names, the one with a C++ symbol
# under that, and nothing else (that it has each of them shows when the host in C99 links); its own name is as it should
# be, and OpenCL and OpenGL are opened at run time rather than linked.
nm -D --defined-only --format=posix "$1"
known=$(nm -D --defined-only --format=posix "$1" |
    grep -cE '^(tov[A-Z][A-Za-z0-9]+|_Z38tovContextCreateImageFromOpenGlTexturePvjijPS_) T ')
test "$known of $(nm -D --defined-only "$1" | wc -l)" = "27 of 27" &&
    readelf -dW "$1" | grep 'SONAME.*\[libtov\.so\.1\]' && ! readelf -dW "$1" | grep -E 'NEEDED.*(OpenCL|libGL)'
