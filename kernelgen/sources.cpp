#include "kernelgen/sources.h"

#include <map>

extern const char kFiltersSource[];
extern const char kBilateralDenoiserSource[];
extern const char kResampleSource[];
extern const char kGaussBlurSource[];
extern const char kLWRDenoiserSource[];
extern const char kEAWDenoiserSource[];
extern const char kMathSource[];
extern const char kMLAASource[];
extern const char kTemporalAccumulationSource[];
extern const char kCommonSource[];

const std::string_view kKernelDirectory = "../Tovkit/Impl/CL/";

namespace {

const std::map<std::string_view, std::string_view> kernelSources = {
    {"Filters", kFiltersSource},
    {"BilateralDenoiser", kBilateralDenoiserSource},
    {"Resample", kResampleSource},
    {"GaussBlur", kGaussBlurSource},
    {"LWRDenoiser", kLWRDenoiserSource},
    {"EAWDenoiser", kEAWDenoiserSource},
    {"Math", kMathSource},
    {"MLAA", kMLAASource},
    {"TemporalAccumulation", kTemporalAccumulationSource},
};

}  // namespace

std::string_view findKernelSource(std::string_view sourceName) noexcept {
    const auto source = kernelSources.find(sourceName);
    return source == kernelSources.end() ? std::string_view{} : source->second;
}

std::string_view commonKernelSource() noexcept {
    return kCommonSource;
}
