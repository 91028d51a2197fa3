// Tables of names.
#include "filter_names.h"

#include <algorithm>
#include <array>
#include <vector>

#include "failure.h"
#include "text.h"
#include "tov/tov.h"

namespace tool {

namespace {

constexpr std::array kFilters = {
    NamedValue{"math_test", TOV_IMAGE_FILTER_MATH_TEST},
    NamedValue{"color_space", TOV_IMAGE_FILTER_COLOR_SPACE},
    NamedValue{"normalization", TOV_IMAGE_FILTER_NORMALIZATION},
    NamedValue{"gamma_correction", TOV_IMAGE_FILTER_GAMMA_CORRECTION},
    NamedValue{"resample", TOV_IMAGE_FILTER_RESAMPLE},
    NamedValue{"gaussian_blur", TOV_IMAGE_FILTER_GAUSSIAN_BLUR},
    NamedValue{"simple_tonemap", TOV_IMAGE_FILTER_SIMPLE_TONEMAP},
    NamedValue{"reinhard_tonemap", TOV_IMAGE_FILTER_REINHARD_TONEMAP},
    NamedValue{"exponential_tonemap", TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP},
    NamedValue{"linear_tonemap", TOV_IMAGE_FILTER_LINEAR_TONEMAP},
    NamedValue{"drago_tonemap", TOV_IMAGE_FILTER_DRAGO_TONEMAP},
    NamedValue{"bilateral_denoise", TOV_IMAGE_FILTER_BILATERAL_DENOISE},
    NamedValue{"lwr_denoise", TOV_IMAGE_FILTER_LWR_DENOISE},
    NamedValue{"eaw_denoise", TOV_IMAGE_FILTER_EAW_DENOISE},
    NamedValue{"sobel", TOV_IMAGE_FILTER_SOBEL},
    NamedValue{"weighted_sum", TOV_IMAGE_FILTER_WEIGHTED_SUM},
    NamedValue{"multiply", TOV_IMAGE_FILTER_MULTIPLY},
    NamedValue{"mlaa", TOV_IMAGE_FILTER_MLAA},
    NamedValue{"motion_buffer", TOV_IMAGE_FILTER_MOTION_BUFFER},
    NamedValue{"temporal_accumulation", TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION},
    NamedValue{"shadow_catcher", TOV_IMAGE_FILTER_SHADOW_CATCHER},
};

constexpr std::array kColorSpaces = {
    NamedValue{"srgb", TOV_COLOR_SPACE_SRGB},
    NamedValue{"adobe_rgb", TOV_COLOR_SPACE_ADOBE_RGB},
    NamedValue{"rec2020", TOV_COLOR_SPACE_REC2020},
    NamedValue{"dcip3", TOV_COLOR_SPACE_DCIP3},
};

constexpr std::array kInterpolations = {
    NamedValue{"box", TOV_INTERPOLATION_DOWNSAMPLE},
    NamedValue{"bilinear", TOV_INTERPOLATION_BILINEAR},
    NamedValue{"bicubic", TOV_INTERPOLATION_BICUBIC},
};

struct ParameterValues {
    const char* parameter;
    std::span<const NamedValue> values;
};

constexpr std::array kParameterValues = {
    ParameterValues{"srcColorSpace", kColorSpaces},
    ParameterValues{"dstColorSpace", kColorSpaces},
    ParameterValues{"interpOperator", kInterpolations},
};

}  // namespace

std::span<const NamedValue> filterNames() noexcept {
    return kFilters;
}

uint32_t filterType(std::string_view name) {
    const auto* const found = std::ranges::find(kFilters, name, &NamedValue::name);
    if (found != kFilters.end()) return found->value;
    std::vector<std::string> names;
    for (const NamedValue& filter : kFilters) names.emplace_back(filter.name);
    throw usageFailure("there is no filter \"" + std::string(name) + "\"" + suggestion(name, names) +
                       "; the filters are " + join(names, ", "));
}

std::span<const NamedValue> namedValues(std::string_view parameter) noexcept {
    const auto* const found = std::ranges::find(kParameterValues, parameter, &ParameterValues::parameter);
    return found == kParameterValues.end() ? std::span<const NamedValue>() : found->values;
}

}  // namespace tool
