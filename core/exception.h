// The one exception that the library raises itself: an error code on its way to the host.
#pragma once

#include <cstdint>
#include <string>

class TovException {
 public:
    explicit TovException(int32_t code) noexcept : code_(code) {}
    int32_t code() const noexcept { return code_; }

 private:
    int32_t code_;
};

// Prints "<line>\n", so that the host's user learns what was wrong, and throws TovException{code}.
[[noreturn]] void refuse(int32_t code, const std::string& line);
