// Numbers and lists as text, the same in every locale, and the search for the name that was meant.
#ifndef TOV_TOOLS_TEXT_H
#define TOV_TOOLS_TEXT_H

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace tool {

// A decimal whole number 0 ... 4294967295. Throws a usage failure that begins with `what`.
uint32_t parseUint(std::string_view text, const std::string& what);

// A finite decimal number that a 32-bit float can hold. Throws likewise.
float parseFloat(std::string_view text, const std::string& what);

// Numbers joined by '+'; a '+' directly after an exponent's e belongs to the number.
std::vector<float> parseFloatList(std::string_view text, const std::string& what);

// The shortest text that reads back as the same float.
std::string formatFloat(float value);

// With one decimal, for times and sizes that people read.
std::string formatTenths(double value);

std::vector<std::string_view> split(std::string_view text, char separator);
std::string join(const std::vector<std::string>& parts, std::string_view separator);

// Of the letters A ... Z alone.
char lower(char c);

// " (did you mean NAME?)" for the candidate nearest to what was typed, or "" when none is near.
std::string suggestion(std::string_view typed, const std::vector<std::string>& candidates);

}  // namespace tool

#endif
