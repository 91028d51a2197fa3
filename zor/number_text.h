// Numbers as text, independent of the C and C++ locales.
#pragma once

#include <cstdint>
#include <string>

namespace zor {

// With two decimals, like "%3.2f" in the plain locale.
std::string twoDecimals(double value);

// Lower-case hexadecimal digits, filled with zeros to the given count.
std::string hexadecimal(uint64_t value, uint32_t digits);

}  // namespace zor
