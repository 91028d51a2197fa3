// Numbers through from_chars and to_chars; nearest names by edit distance.
#include "text.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <numeric>
#include <system_error>

#include "failure.h"

namespace tool {

namespace {

std::string quoted(std::string_view text) {
    return "\"" + std::string(text) + "\"";
}

// Reads one float at the start of `rest` and removes it from there; `text` is what messages quote.
float takeFloat(std::string_view& rest, std::string_view text, const std::string& what) {
    float value = 0.0f;
    const auto [end, error] = std::from_chars(rest.data(), rest.data() + rest.size(), value);
    if (error == std::errc::result_out_of_range) {
        throw usageFailure(what + ": " + quoted(text) + " does not fit a 32-bit float");
    }
    if (error != std::errc{}) throw usageFailure(what + ": " + quoted(text) + " is not a number");
    if (!std::isfinite(value)) throw usageFailure(what + ": " + quoted(text) + " is not a finite number");
    rest.remove_prefix(static_cast<size_t>(end - rest.data()));
    return value;
}

// Insertions, deletions and replacements that turn one text into the other, letter case ignored.
size_t editDistance(std::string_view a, std::string_view b) {
    std::vector<size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), size_t{0});
    for (size_t i = 0; i < a.size(); ++i) {
        size_t diagonal = row[0];
        row[0] = i + 1;
        for (size_t j = 0; j < b.size(); ++j) {
            const size_t replaced = diagonal + (lower(a[i]) == lower(b[j]) ? 0 : 1);
            diagonal = row[j + 1];
            row[j + 1] = std::min({replaced, row[j] + 1, diagonal + 1});
        }
    }
    return row[b.size()];
}

}  // namespace

uint32_t parseUint(std::string_view text, const std::string& what) {
    uint32_t value = 0;
    const char* const last = text.data() + text.size();
    const auto [end, error] = std::from_chars(text.data(), last, value);
    if (error == std::errc::result_out_of_range) {
        throw usageFailure(what + ": " + quoted(text) + " is out of range (0 ... 4294967295)");
    }
    if (error != std::errc{} || end != last) {
        throw usageFailure(what + ": " + quoted(text) + " is not a whole number from 0 on");
    }
    return value;
}

float parseFloat(std::string_view text, const std::string& what) {
    std::string_view rest = text;
    const float value = takeFloat(rest, text, what);
    if (!rest.empty()) throw usageFailure(what + ": " + quoted(text) + " is not a number");
    return value;
}

std::vector<float> parseFloatList(std::string_view text, const std::string& what) {
    std::vector<float> values;
    std::string_view rest = text;
    for (;;) {
        values.push_back(takeFloat(rest, text, what));
        if (rest.empty()) return values;
        if (rest.front() != '+') throw usageFailure(what + ": " + quoted(text) + " is not a list of numbers like 1+2");
        rest.remove_prefix(1);
    }
}

std::string formatFloat(float value) {
    std::array<char, 32> buffer{};
    const auto [end, error] = std::to_chars(buffer.data(), buffer.data() + buffer.size(), value);
    return {buffer.data(), error == std::errc{} ? end : buffer.data()};
}

std::string formatTenths(double value) {
    std::array<char, 400> buffer{};  // the largest double has 309 digits before the point
    const auto [end, error] =
        std::to_chars(buffer.data(), buffer.data() + buffer.size(), value, std::chars_format::fixed, 1);
    return {buffer.data(), error == std::errc{} ? end : buffer.data()};
}

std::vector<std::string_view> split(std::string_view text, char separator) {
    std::vector<std::string_view> parts;
    for (;;) {
        const size_t end = text.find(separator);
        parts.push_back(text.substr(0, end));
        if (end == std::string_view::npos) return parts;
        text.remove_prefix(end + 1);
    }
}

std::string join(const std::vector<std::string>& parts, std::string_view separator) {
    std::string text;
    for (const std::string& part : parts) {
        if (!text.empty()) text += separator;
        text += part;
    }
    return text;
}

char lower(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

std::string suggestion(std::string_view typed, const std::vector<std::string>& candidates) {
    const auto distance = [&](const std::string& name) { return editDistance(typed, name); };
    const auto nearest = std::ranges::min_element(candidates, {}, distance);
    const bool near = nearest != candidates.end() && distance(*nearest) <= std::max<size_t>(2, nearest->size() / 3) &&
                      distance(*nearest) < nearest->size();
    return near ? " (did you mean " + *nearest + "?)" : "";
}

}  // namespace tool
