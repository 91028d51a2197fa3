#include "filter_cases.h"

#include <array>
#include <stdexcept>
#include <string>

#include "tov/tov.h"

namespace bench {
namespace {

// Parameters are such that no kernel takes a shortcut: an exposure, a gamma and a white point that do something.
const std::vector<FilterCase>& table() {
    static const std::vector<FilterCase> cases = {
        {.name = "linear_tonemap", .type = TOV_IMAGE_FILTER_LINEAR_TONEMAP, .settings = {{"cKey", 0.5f}}},
        {.name = "normalization", .type = TOV_IMAGE_FILTER_NORMALIZATION},
        {.name = "color_space",
         .type = TOV_IMAGE_FILTER_COLOR_SPACE,
         .settings = {{"srcColorSpace", uint32_t{TOV_COLOR_SPACE_SRGB}},
                      {"dstColorSpace", uint32_t{TOV_COLOR_SPACE_REC2020}}}},
        {.name = "shadow_catcher", .type = TOV_IMAGE_FILTER_SHADOW_CATCHER},
        {.name = "weighted_sum",
         .type = TOV_IMAGE_FILTER_WEIGHTED_SUM,
         .settings = {{"inputsNum", 2u}},
         .arrayInputs = 2,
         .arrayFloats = "weights",
         .readsInput = false},
        {.name = "multiply",
         .type = TOV_IMAGE_FILTER_MULTIPLY,
         .settings = {{"inputsNum", 2u}},
         .arrayInputs = 2,
         .readsInput = false},
        {.name = "reinhard_tonemap", .type = TOV_IMAGE_FILTER_REINHARD_TONEMAP, .settings = {{"cWPoint", 2.0f}}},
        {.name = "sobel", .type = TOV_IMAGE_FILTER_SOBEL},
        {.name = "simple_tonemap",
         .type = TOV_IMAGE_FILTER_SIMPLE_TONEMAP,
         .settings = {{"cExposure", 0.5f}, {"cContrast", 1.1f}}},
        {.name = "simple_tonemap_curve",
         .type = TOV_IMAGE_FILTER_SIMPLE_TONEMAP,
         .settings = {{"cExposure", 0.5f}, {"cContrast", 1.1f}, {"cApplyToneMap", 1u}}},
        {.name = "gamma", .type = TOV_IMAGE_FILTER_GAMMA_CORRECTION, .settings = {{"cGamma", 2.2f}}},
        {.name = "exponential_tonemap",
         .type = TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP,
         .settings = {{"cExposure", 1.5f}}},
        {.name = "drago_tonemap",
         .type = TOV_IMAGE_FILTER_DRAGO_TONEMAP,
         .settings = {{"cBias", 0.85f}, {"avLum", 0.5f}, {"maxLum", 4.0f}}},
        {.name = "motion_buffer", .type = TOV_IMAGE_FILTER_MOTION_BUFFER, .input = Content::Positions, .bytes = false},
        {.name = "resample_bilinear",
         .type = TOV_IMAGE_FILTER_RESAMPLE,
         .settings = {{"interpOperator", uint32_t{TOV_INTERPOLATION_BILINEAR}}},
         .input = Content::HalfSizeColor},
        {.name = "resample_bicubic",
         .type = TOV_IMAGE_FILTER_RESAMPLE,
         .settings = {{"interpOperator", uint32_t{TOV_INTERPOLATION_BICUBIC}}},
         .input = Content::HalfSizeColor},
        {.name = "gaussian_blur_5",
         .type = TOV_IMAGE_FILTER_GAUSSIAN_BLUR,
         .settings = {{"radius", 5u}, {"sigma", 2.0f}},
         .line = true},
        {.name = "bilateral_3",
         .type = TOV_IMAGE_FILTER_BILATERAL_DENOISE,
         .settings = {{"radius", 3u}, {"inputsNum", 1u}},
         .arrayInputs = 1,
         .arrayFloats = "sigmas"},
        {.name = "mlaa",
         .type = TOV_IMAGE_FILTER_MLAA,
         .features = {{"meshIDImg", Content::MeshIds}, {"normalsImg", Content::Normals}, {"depthImg", Content::Depth}},
         .bytes = false},
        {.name = "temporal_accumulation",
         .type = TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION,
         .features = {{"positionsImg", Content::Positions},
                      {"normalsImg", Content::Normals},
                      {"meshIdsImg", Content::MeshIds},
                      {"outVarianceImg", Content::Variance, true}},
         .denoiser = true,
         .bytes = false,
         .settling = 6},
        {.name = "eaw_denoise",
         .type = TOV_IMAGE_FILTER_EAW_DENOISE,
         .settings = {{"colorSigma", 4.0f}, {"depthSigma", 1.0f}},
         .features = {{"normalsImg", Content::Normals},
                      {"depthImg", Content::Depth},
                      {"transImg", Content::Color},
                      {"colorVar", Content::Variance}},
         .denoiser = true},
        {.name = "lwr_denoise",
         .type = TOV_IMAGE_FILTER_LWR_DENOISE,
         .features = {{"vColorImg", Content::Variance},
                      {"transImg", Content::Color},
                      {"vTransImg", Content::Variance},
                      {"normalsImg", Content::Normals},
                      {"vNormalsImg", Content::Variance},
                      {"depthImg", Content::Depth},
                      {"vDepthImg", Content::Variance}},
         .denoiser = true},
    };
    return cases;
}

}  // namespace

std::span<const FilterCase> filterCases() {
    return table();
}

const FilterCase& filterCase(std::string_view name) {
    for (const FilterCase& candidate : table())
        if (candidate.name == name) return candidate;
    throw std::runtime_error("There is no filter case " + std::string(name));
}

}  // namespace bench
