// One setter for each parameter type.
#include "parameter_values.h"

#include <algorithm>
#include <charconv>

#include "failure.h"
#include "filter_info.h"
#include "filter_names.h"
#include "text.h"

namespace tool {

namespace {

constexpr size_t kMatrixFloats = 16;

const ParameterInfo& findParameter(const FilterInfo& info, const std::string& filter, const std::string& name) {
    const auto found = std::ranges::find(info.parameters, name, &ParameterInfo::name);
    if (found != info.parameters.end()) return *found;
    std::vector<std::string> names;
    for (const ParameterInfo& parameter : info.parameters) names.push_back(parameter.name);
    const std::string wrong = filter + " has no parameter \"" + name + "\"";
    if (names.empty()) throw usageFailure(wrong + "; it has none at all");
    throw usageFailure(wrong + suggestion(name, names) + "; its parameters are " + join(names, ", "));
}

// A number, or a name where the parameter's values have names; then no other number will do.
uint32_t uintValue(const std::string& parameter, const std::string& text, const std::string& what) {
    const auto values = namedValues(parameter);
    if (values.empty()) return parseUint(text, what);
    std::vector<std::string> names;
    for (const NamedValue& value : values) {
        if (text == value.name || text == std::to_string(value.value)) return value.value;
        names.emplace_back(value.name);
    }
    const std::string hint = suggestion(text, names);
    for (size_t i = 0; i < values.size(); ++i) names[i] += " (" + std::to_string(values[i].value) + ")";
    throw usageFailure(what + ": \"" + text + "\" is not one of its values" + hint + ": " + join(names, ", "));
}

int32_t setValue(tov_image_filter filter, const ParameterInfo& parameter, const std::string& text,
                 const std::string& what, FloatArrays& arrays) {
    const char* const name = parameter.name.c_str();
    switch (parameter.type) {
        case TOV_PARAMETER_TYPE_UINT1:
            return tovImageFilterSetParameter1u(filter, name, uintValue(parameter.name, text, what));
        case TOV_PARAMETER_TYPE_FLOAT1:
            return tovImageFilterSetParameter1f(filter, name, parseFloat(text, what));
        case TOV_PARAMETER_TYPE_FLOAT16: {
            const std::vector<float> matrix = parseFloatList(text, what);
            if (matrix.size() != kMatrixFloats)
                throw usageFailure(what + " needs 16 numbers, row after row: 1+0+0+0+...");
            return tovImageFilterSetParameter16f(filter, name, matrix.data());
        }
        case TOV_PARAMETER_TYPE_FLOAT_ARRAY: {
            const std::vector<float>& values = arrays.emplace_back(parseFloatList(text, what));
            return tovImageFilterSetParameterFloatArray(filter, name, values.data(),
                                                        static_cast<uint32_t>(values.size()));
        }
        default:
            throw usageFailure(what + " takes a value of type " + typeName(parameter.type) +
                               ", which the command line cannot give");
    }
}

}  // namespace

void setParameters(tov_image_filter filter, const Stage& stage, FloatArrays& arrays) {
    const FilterInfo info = readFilterInfo(filter);
    for (const Assignment& assignment : stage.assignments) {
        const ParameterInfo& parameter = findParameter(info, stage.filter, assignment.parameter);
        const std::string what = stage.filter + ": " + assignment.parameter;
        check(setValue(filter, parameter, assignment.value, what, arrays), "setting " + what);
    }
}

}  // namespace tool
