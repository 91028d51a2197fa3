#include "kernelgen/sources.h"

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

struct KernelSource {
    std::string_view name;
    const char* text;
};
constexpr KernelSource kKernelSources[] = {
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
    for (const KernelSource& source : kKernelSources)
        if (source.name == sourceName) return source.text;
    return {};
}

std::string_view commonKernelSource() noexcept {
    return kCommonSource;
}
