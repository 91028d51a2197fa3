#include "zor/error.h"

#include <cstdio>

#include "zor/opencl.h"

namespace zor {

void breakInvariant(const std::string& where, const std::string& what) {
    const std::string line = where + ": " + what;
    std::printf("%s\n", line.c_str());
    std::fflush(stdout);
    throw Error(line);
}

void check(int32_t status, const char* call) {
    if (status == CL_SUCCESS) return;
    breakInvariant(call, std::string(openCLErrorString(status)) + " (" + std::to_string(status) + ")");
}

void require(bool condition, const char* where, const char* what) {
    if (!condition) breakInvariant(where, what);
}

}  // namespace zor
