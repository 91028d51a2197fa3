#include "core/exception.h"

#include <cstdio>

void refuse(int32_t code, const std::string& line) {
    std::printf("%s\n", line.c_str());
    throw TovException{code};
}
