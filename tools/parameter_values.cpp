// One setter for each parameter type.
#include "parameter_values.h"

#include <algorithm>

#include "failure.h"
#include "filter_info.h"
#include "filter_names.h"
#include "text.h"

namespace tool {

namespace {

constexpr size_t kMaxInputs = 6;
constexpr const char* kInputCount = "inputsNum";
constexpr std::string_view kWrittenImage = "outVarianceImg";

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

std::vector<std::string> imageList(const std::string& text, const std::string& what) {
    std::vector<std::string> sources;
    for (const std::string_view source : split(text, '+')) {
        if (source.empty()) throw usageFailure(what + ": \"" + text + "\" names no file beside a +");
        sources.emplace_back(source);
    }
    if (sources.size() > kMaxInputs) {
        throw usageFailure(what + ": " + std::to_string(sources.size()) + " pictures are given, at most " +
                           std::to_string(kMaxInputs) + " are possible");
    }
    return sources;
}

// One number for each input, if any are given.
void refuseUnequalLists(const Stage& stage, const ParameterData& data) {
    const auto list = std::ranges::find(data.images, true, &ImageAssignment::array);
    if (list == data.images.end()) return;
    for (const std::vector<float>& numbers : data.arrays) {
        if (numbers.size() == list->sources.size()) continue;
        throw usageFailure(stage.filter + ": " + list->parameter + " has " + std::to_string(list->sources.size()) +
                           " pictures, but the list of numbers has " + std::to_string(numbers.size()));
    }
}

void setInputCount(tov_image_filter filter, const Stage& stage, const ParameterData& data) {
    const auto list = std::ranges::find(data.images, true, &ImageAssignment::array);
    if (list == data.images.end() || stage.sets(kInputCount)) return;
    check(tovImageFilterSetParameter1u(filter, kInputCount, static_cast<uint32_t>(list->sources.size())),
          "setting the number of inputs");
}

int32_t setValue(tov_image_filter filter, const ParameterInfo& parameter, const std::string& text,
                 const std::string& what, ParameterData& data) {
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
            const std::vector<float>& values = data.arrays.emplace_back(parseFloatList(text, what));
            return tovImageFilterSetParameterFloatArray(filter, name, values.data(),
                                                        static_cast<uint32_t>(values.size()));
        }
        case TOV_PARAMETER_TYPE_IMAGE:
            if (parameter.name == kWrittenImage) {
                throw usageFailure(what + " is written by the filter, which the command line cannot make use of");
            }
            data.images.push_back({parameter.name, false, {text}});
            return TOV_SUCCESS;
        case TOV_PARAMETER_TYPE_IMAGE_ARRAY:
            data.images.push_back({parameter.name, true, imageList(text, what)});
            return TOV_SUCCESS;
        default:
            throw usageFailure(what + " takes a value of type " + typeName(parameter.type) +
                               ", which the command line cannot give");
    }
}

}  // namespace

ParameterData setParameters(tov_image_filter filter, const Stage& stage) {
    ParameterData data;
    const FilterInfo info = readFilterInfo(filter);
    for (const Assignment& assignment : stage.assignments) {
        const ParameterInfo& parameter = findParameter(info, stage.filter, assignment.parameter);
        const std::string what = stage.filter + ": " + assignment.parameter;
        check(setValue(filter, parameter, assignment.value, what, data), "setting " + what);
    }
    refuseUnequalLists(stage, data);
    setInputCount(filter, stage, data);
    return data;
}

}  // namespace tool
