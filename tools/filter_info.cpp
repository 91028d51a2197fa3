// Information queries, typed.
#include "filter_info.h"

#include <algorithm>
#include <array>
#include <cstring>

#include "failure.h"
#include "filter_names.h"
#include "text.h"

namespace tool {

namespace {

template <class Value>
Value filterValue(tov_image_filter filter, uint32_t key) {
    Value value{};
    uint64_t size = 0;
    check(tovImageFilterGetInfo(filter, key, sizeof value, &value, &size), "describing a filter");
    return value;
}

template <class Value>
Value parameterValue(tov_image_filter filter, uint32_t index, uint32_t key) {
    Value value{};
    uint64_t size = 0;
    check(tovParameterGetInfo(filter, index, key, sizeof value, &value, &size), "describing a parameter");
    return value;
}

std::string textOrEmpty(const char* text) {
    return text == nullptr ? "" : text;
}

struct TypeRow {
    uint32_t type;
    const char* name;
    size_t floats;  // 0: not made of floats
};

constexpr std::array kTypes = {
    TypeRow{TOV_PARAMETER_TYPE_FLOAT1, "float", 1},
    TypeRow{TOV_PARAMETER_TYPE_FLOAT2, "2 floats", 2},
    TypeRow{TOV_PARAMETER_TYPE_FLOAT3, "3 floats", 3},
    TypeRow{TOV_PARAMETER_TYPE_FLOAT4, "4 floats", 4},
    TypeRow{TOV_PARAMETER_TYPE_FLOAT16, "4 x 4 matrix", kMatrixFloats},
    TypeRow{TOV_PARAMETER_TYPE_UINT1, "unsigned integer", 0},
    TypeRow{TOV_PARAMETER_TYPE_UINT2, "2 unsigned integers", 0},
    TypeRow{TOV_PARAMETER_TYPE_IMAGE, "image", 0},
    TypeRow{TOV_PARAMETER_TYPE_FLOAT_ARRAY, "list of floats", 0},
    TypeRow{TOV_PARAMETER_TYPE_IMAGE_ARRAY, "list of images", 0},
};

const TypeRow* findType(uint32_t type) {
    const auto* const found = std::ranges::find(kTypes, type, &TypeRow::type);
    return found == kTypes.end() ? nullptr : found;
}

bool isIdentity(const std::vector<float>& values) {
    constexpr size_t kDiagonalStep = 5;
    for (size_t i = 0; i < values.size(); ++i) {
        if (values[i] != (i % kDiagonalStep == 0 ? 1.0f : 0.0f)) return false;
    }
    return values.size() == kMatrixFloats;
}

std::string floatsText(const void* address, size_t count) {
    std::vector<float> values(count);
    std::memcpy(values.data(), address, count * sizeof(float));
    if (isIdentity(values)) return "identity";
    std::vector<std::string> texts(count);
    std::ranges::transform(values, texts.begin(), formatFloat);
    return join(texts, "+");
}

std::string uintText(const ParameterInfo& parameter) {
    uint32_t value = 0;
    std::memcpy(&value, parameter.value, sizeof value);
    for (const NamedValue& named : namedValues(parameter.name)) {
        if (named.value == value) return std::to_string(value) + " (" + named.name + ")";
    }
    return std::to_string(value);
}

}  // namespace

Handle createFilter(tov_context context, std::string_view name) {
    tov_image_filter filter = nullptr;
    check(tovContextCreateImageFilter(context, filterType(name), &filter), "creating " + std::string(name));
    return Handle(filter);
}

FilterInfo readFilterInfo(tov_image_filter filter) {
    FilterInfo info{textOrEmpty(filterValue<const char*>(filter, TOV_IMAGE_FILTER_DESCRIPTION)), {}};
    const auto count = filterValue<uint32_t>(filter, TOV_IMAGE_FILTER_PARAMETER_COUNT);
    for (uint32_t i = 0; i < count; ++i) {
        info.parameters.push_back({textOrEmpty(parameterValue<const char*>(filter, i, TOV_PARAMETER_NAME)),
                                   parameterValue<uint32_t>(filter, i, TOV_PARAMETER_TYPE),
                                   textOrEmpty(parameterValue<const char*>(filter, i, TOV_PARAMETER_DESCRIPTION)),
                                   parameterValue<const void*>(filter, i, TOV_PARAMETER_VALUE)});
    }
    return info;
}

std::string typeName(uint32_t parameterType) {
    const TypeRow* const row = findType(parameterType);
    return row == nullptr ? "type " + std::to_string(parameterType) : row->name;
}

std::string valueText(const ParameterInfo& parameter) {
    const TypeRow* const row = findType(parameter.type);
    if (row == nullptr || parameter.value == nullptr) return "none";
    if (row->floats > 0) return floatsText(parameter.value, row->floats);
    return parameter.type == TOV_PARAMETER_TYPE_UINT1 ? uintText(parameter) : "none";
}

}  // namespace tool
