// The names by which the command line knows filters and the values of some of their parameters.
#ifndef TOV_TOOLS_FILTER_NAMES_H
#define TOV_TOOLS_FILTER_NAMES_H

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

namespace tool {

struct NamedValue {
    const char* name;
    uint32_t value;
};

// All filters in the order of their types.
std::span<const NamedValue> filterNames() noexcept;

// The type of a name; throws a usage failure that lists the valid ones.
uint32_t filterType(std::string_view name);

// The only values of a parameter, where they have names; otherwise empty.
std::span<const NamedValue> namedValues(std::string_view parameter) noexcept;

}  // namespace tool

#endif
