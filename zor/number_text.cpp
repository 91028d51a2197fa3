#include "zor/number_text.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <limits>

namespace zor {

std::string twoDecimals(double value) {
    // Sign, the digits of the largest number, the point and the decimals.
    std::array<char, std::numeric_limits<double>::max_exponent10 + 8> text{};
    const auto result = std::to_chars(text.data(), text.data() + text.size(), value, std::chars_format::fixed, 2);
    return {text.data(), result.ptr};
}

std::string hexadecimal(uint64_t value, uint32_t digits) {
    std::array<char, 16> text{};
    const auto result = std::to_chars(text.data(), text.data() + text.size(), value, 16);
    const auto length = static_cast<size_t>(result.ptr - text.data());
    return std::string(digits - std::min<size_t>(length, digits), '0').append(text.data(), length);
}

}  // namespace zor
