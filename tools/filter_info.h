// What the library says about a filter: its description, parameters, types and current values.
#ifndef TOV_TOOLS_FILTER_INFO_H
#define TOV_TOOLS_FILTER_INFO_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "handle.h"

namespace tool {

inline constexpr size_t kMatrixFloats = 16;  // of TOV_PARAMETER_TYPE_FLOAT16, row after row

struct ParameterInfo {
    std::string name;
    uint32_t type;  // TOV_PARAMETER_TYPE_...
    std::string description;
    const void* value;  // inside the filter
};

struct FilterInfo {
    std::string description;
    std::vector<ParameterInfo> parameters;
};

Handle createFilter(tov_context context, std::string_view name);

// Valid while the filter lives.
FilterInfo readFilterInfo(tov_image_filter filter);

// "float", "unsigned integer", "image" ...
std::string typeName(uint32_t parameterType);

// The current value: a number, "1 (srgb)", "none", "identity" or a list.
std::string valueText(const ParameterInfo& parameter);

}  // namespace tool

#endif
