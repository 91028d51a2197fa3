// Broken invariants of the device layer: an OpenCL call failed that must not, or a fixed limit was exceeded. They are
// printed where they happen, as one line, and thrown; whoever faces the host turns them into its own error code.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>

namespace zor {

class Error : public std::runtime_error {
 public:
    using std::runtime_error::runtime_error;
};

// Prints "<where>: <what>\n" and throws Error.
[[noreturn]] void breakInvariant(const std::string& where, const std::string& what);

// Nothing for status 0; otherwise prints "<call>: <openCLErrorString> (<status>)\n" and throws Error.
void check(int32_t status, const char* call);

// Nothing when condition holds; otherwise breakInvariant(where, what).
void require(bool condition, const char* where, const char* what);

}  // namespace zor
