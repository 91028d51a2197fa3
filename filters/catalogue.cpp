#include "filters/catalogue.h"

#include "core/exception.h"
#include "filters/area_table.h"
#include "filters/descriptions.h"
#include "filters/value_checks.h"
#include "zor/freed_at_unload.h"

namespace {

constexpr const char* kNoText = nullptr;
constexpr float kCosPiOver8 = 0.92387953f;

// ---- Words of the table ----

ParameterSpec uintParameter(const char* name, uint32_t value, const char* text) {
    return {name, TOV_PARAMETER_TYPE_UINT1, text, 0.0f, value};
}
ParameterSpec floatParameter(const char* name, float value, const char* text) {
    return {name, TOV_PARAMETER_TYPE_FLOAT1, text, value};
}
ParameterSpec imageParameter(const char* name, const char* text) {
    return {name, TOV_PARAMETER_TYPE_IMAGE, text};
}
ParameterSpec matrixParameter(const char* name, const char* text) {
    return {name, TOV_PARAMETER_TYPE_FLOAT16, text};
}
ParameterSpec imageArray(const char* name) {
    return {name, TOV_PARAMETER_TYPE_IMAGE_ARRAY, kNoText};
}
ParameterSpec floatArray(const char* name) {
    return {name, TOV_PARAMETER_TYPE_FLOAT_ARRAY, kNoText};
}

PassItem arg(const char* parameter) {
    return {PassItemKind::Argument, parameter};
}
PassItem readBack(const char* parameter) {
    return {PassItemKind::ReadBack, parameter};
}
PassItem ownParameters() {
    return {PassItemKind::OwnParameters};
}
PassItem scratch() {
    return {PassItemKind::Scratch};
}
PassItem state() {
    return {PassItemKind::State};
}
PassItem define(const char* name, const char* parameter) {
    return {PassItemKind::Define, name, parameter};
}
PassItem flag(const char* text) {
    return {PassItemKind::BuildOption, text};
}
PassItem toXyz(const char* colorSpace) {
    return {PassItemKind::ToXyz, colorSpace};
}
PassItem fromXyz(const char* colorSpace) {
    return {PassItemKind::FromXyz, colorSpace};
}
PassItem viewProjectionPair(const char* matrix) {
    return {PassItemKind::ViewProjectionPair, matrix};
}

ValueRule nonZero(const char* parameter) {
    return {parameter, ValueRule::NonZero};
}
ValueRule positive(const char* parameter) {
    return {parameter, ValueRule::Positive};
}
ValueRule range(const char* parameter, uint32_t least, uint32_t most) {
    return {parameter, ValueRule::Range, least, most};
}

// A pass of "Filters" that reads and writes one pixel per item, with the filter's parameters as further arguments.
PassSpec pixelPass(const char* kernel) {
    return {.program = "Filters", .kernel = kernel, .items = {arg("srcBuffer"), arg("dstBuffer"), ownParameters()}};
}

// One level of the edge-avoiding wavelets. The first reads the input; the others alternate between the scratch and the
// output, so that the last one ends in the output.
PassSpec waveletLevel(uint32_t level, const char* offset) {
    PassSpec pass{.program = "EAWDenoiser", .kernel = "EAWDenoiserKernel"};
    const bool toScratch = level % 2 == 0;
    pass.items = {define("srcBuffer", "srcBuffer"), define("dstBuffer", "srcBuffer"), flag(offset)};
    const PassItem source = level == 1 ? arg("srcBuffer") : toScratch ? arg("dstBuffer") : scratch();
    pass.items.insert(pass.items.end(), {source, ownParameters(), toScratch ? scratch() : arg("dstBuffer")});
    if (level == 1) pass.items.push_back(flag("FIRST_LEVEL"));
    if (toScratch) pass.items.push_back(flag("ODD"));
    pass.items.push_back(scratch());
    return pass;
}

// ---- The table ----

using Catalogue = std::array<FilterSpec, kFilterTypes>;

Catalogue makeCatalogue() {
    return {{
        {.type = TOV_IMAGE_FILTER_MATH_TEST,
         .sizeRule = SizeRule::Unchecked,
         .check = checkMathTestBuffers,
         .passes = {{.program = "Filters", .kernel = "MathTestKernel", .items = {arg("srcBuffer"), arg("dstBuffer")}}}},

        {.type = TOV_IMAGE_FILTER_COLOR_SPACE,
         .description = "Image color space changing.",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {uintParameter("srcColorSpace", TOV_COLOR_SPACE_SRGB, kSrcColorSpaceText),
                        uintParameter("dstColorSpace", TOV_COLOR_SPACE_SRGB, kDstColorSpaceText)},
         .passes = {{.program = "Filters",
                     .kernel = "ColorSpaceKernel",
                     .items = {arg("srcBuffer"), arg("dstBuffer"), toXyz("srcColorSpace"), fromXyz("dstColorSpace")}}}},

        {.type = TOV_IMAGE_FILTER_NORMALIZATION,
         .description = "Divide all color component by alpha value",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .passes = {pixelPass("NormalizationKernel")}},

        {.type = TOV_IMAGE_FILTER_GAMMA_CORRECTION,
         .description = "Performs gamma correction for input image.",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {floatParameter("cGamma", 1.0f, "gamma correction coefficient")},
         .rules = {nonZero("cGamma")},
         .passes = {pixelPass("GammaCorrectionKernel")}},

        {.type = TOV_IMAGE_FILTER_RESAMPLE,
         .description = "Image resampling.",
         .inPlaceAllowed = false,
         .anySizeAllowed = true,
         .sizeRule = SizeRule::AnyInput,
         .fusable = true,
         .parameters = {uintParameter("interpOperator", TOV_INTERPOLATION_BILINEAR, "")},
         .rules = {range("interpOperator", TOV_INTERPOLATION_DOWNSAMPLE, TOV_INTERPOLATION_BICUBIC)},
         .passes = {{.program = "Resample",
                     .kernel = "ResampleKernel",
                     .items = {arg("srcBuffer"),
                               arg("dstBuffer"),
                               arg("srcBufferSize"),
                               arg("dstBufferSize"),
                               {PassItemKind::Ratio},
                               {PassItemKind::RatioDefines},
                               define("INTERPOLATION_OPERATOR", "interpOperator")}}}},

        {.type = TOV_IMAGE_FILTER_GAUSSIAN_BLUR,
         .description = kGaussianBlurText,
         .scratchBytesPerPixel = 16,  // one four-float intermediate pixel
         .parameters = {uintParameter("radius", 1, kBlurRadiusText), floatParameter("sigma", 0.0f, "Blur parameter."),
                        uintParameter("tiling", 0, kTilingText)},
         .rules = {nonZero("sigma"), range("radius", 0, kMaxBlurRadius)},
         .check = checkBlurSigma,
         .passes = {{.program = "GaussBlur",
                     .kernel = "GaussBlurHorKernel",
                     .grid2D = false,
                     .localSize = {32, 1},
                     .items = {arg("srcBuffer"),
                               scratch(),
                               define("cRadius", "radius"),
                               {PassItemKind::GaussianCoefficients},
                               define("TILED", "tiling"),
                               define("dstBuffer", "dstBuffer")}},
                    {.program = "GaussBlur",
                     .kernel = "GaussBlurVertKernel",
                     .grid2D = false,
                     .localSize = {32, 1},
                     .items = {scratch(),
                               arg("dstBuffer"),
                               define("cRadius", "radius"),
                               {PassItemKind::GaussianCoefficients},
                               define("TILED", "tiling"),
                               define("srcBuffer", "dstBuffer")}}}},

        {.type = TOV_IMAGE_FILTER_SIMPLE_TONEMAP,
         .description = "Filmic tone mapping",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {floatParameter("cExposure", 0.0f, ""), floatParameter("cContrast", 1.0f, ""),
                        uintParameter("cApplyToneMap", 0, "")},
         .passes = {pixelPass("SimpleToneMappingKernel")}},

        {.type = TOV_IMAGE_FILTER_REINHARD_TONEMAP,
         .description = "Reinhard02 tone mapping",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {floatParameter("cKey", 1.0f, ""), floatParameter("cWPoint", 0.0f, ""),
                        floatParameter("cBurn", 0.1f, "")},
         .passes = {pixelPass("ReinhardToneMappingKernel")}},

        {.type = TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP,
         .description = "Exponential tone mapping",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {floatParameter("cExposure", 1.0f, ""), floatParameter("cIntensity", 1.0f, "")},
         .passes = {pixelPass("ExponentialToneMappingKernel")}},

        {.type = TOV_IMAGE_FILTER_LINEAR_TONEMAP,
         .description = "Linear tone mapping",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {floatParameter("cKey", 1.0f, kLinearKeyText)},
         .passes = {pixelPass("LinearToneMappingKernel")}},

        {.type = TOV_IMAGE_FILTER_DRAGO_TONEMAP,
         .description = "Drago tone mapping",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {floatParameter("cBias", 1.0f, ""), floatParameter("avLum", 0.0f, "Average image luminance."),
                        floatParameter("maxLum", 0.1f, "Maximum image luminance.")},
         .rules = {positive("cBias"), positive("avLum"), positive("maxLum")},
         .check = checkDragoLuminances,
         .passes = {pixelPass("DragoToneMappingKernel")}},

        {.type = TOV_IMAGE_FILTER_BILATERAL_DENOISE,
         .description = kBilateralText,
         .parameters = {imageArray("inputs"), floatArray("sigmas"), uintParameter("radius", 5, ""),
                        uintParameter("inputsNum", 0, kNoText)},
         .rules = {positive("sigmas"), range("radius", 0, kMaxBilateralRadius)},
         .passes = {{.program = "BilateralDenoiser",
                     .kernel = "BilateralFilterKernel",
                     .items = {arg("srcBuffer"), arg("dstBuffer"), arg("inputs"), arg("sigmas"),
                               define("radius", "radius"), define("INPUTS_NUM", "inputsNum")}}}},

        {.type = TOV_IMAGE_FILTER_LWR_DENOISE,
         .description = kRegressionText,
         .parameters = {imageParameter("vColorImg", "The image which contains input color temporal variance."),
                        imageParameter("transImg", kTransitionText),
                        imageParameter("vTransImg", "The image which contains transition colors temporal variance."),
                        imageParameter("normalsImg", kRegressionNormalsText),
                        imageParameter("vNormalsImg", "The image which contains normals vector temporal variance."),
                        imageParameter("depthImg", kRegressionDepthText),
                        imageParameter("vDepthImg", "The image which contains depth temporal variance."),
                        uintParameter("samples", 4, "The number of samples per pixel used for image rendering."),
                        uintParameter("halfWindow", 4,
                                      "The size of the region which used for output pixel computation"),
                        floatParameter("bandwidth", 1.0f, kBandwidthText)},
         .rules = {range("samples", 2, UINT32_MAX), range("halfWindow", 1, kMaxRegressionHalfWindow),
                   positive("bandwidth")},
         .check = checkRegressionGroup,
         .passes = {{.program = "LWRDenoiser",
                     .kernel = "LWRDenoiserFirstPass",
                     .items = {arg("srcBuffer"), ownParameters(), arg("dstBuffer")}}}},

        {.type = TOV_IMAGE_FILTER_EAW_DENOISE,
         .description = "Edge avoided `A-Trous wavelet denoiser.",
         .scratchBytesPerPixel = 24,  // a four-float colour image, then a two-float variance pair per pixel
         .sizeRule = SizeRule::EqualInput,
         .parameters = {imageParameter("normalsImg", kWaveletNormalsText),
                        imageParameter("depthImg", kWaveletNormalsText), imageParameter("transImg", kTransitionText),
                        imageParameter("colorVar", kWaveletNormalsText),
                        floatParameter("colorSigma", 0.1f, "Detection Threshold for color values"),
                        floatParameter("normalSigma", 0.1f, "Detection Threshold for normal vectors values"),
                        floatParameter("depthSigma", 0.1f, "Detection Threshold for depth"),
                        floatParameter("transSigma", 0.1f, "Detection Threshold for transition color values")},
         .rules = {positive("colorSigma"), positive("normalSigma"), positive("depthSigma"), positive("transSigma")},
         .check = checkWaveletImages,
         .passes = {waveletLevel(1, "offset=1"), waveletLevel(2, "offset=2"), waveletLevel(3, "offset=4"),
                    waveletLevel(4, "offset=8"), waveletLevel(5, "offset=16")}},

        {.type = TOV_IMAGE_FILTER_SOBEL,
         .description = kSobelText,
         .fusable = true,
         .passes = {pixelPass("SobelOperatorKernel")}},

        {.type = TOV_IMAGE_FILTER_WEIGHTED_SUM,
         .description = "Calculates weighted sum of the images.",
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {imageArray("inputs"), floatArray("weights"), uintParameter("inputsNum", 0, kNoText)},
         .passes = {{.program = "Math",
                     .kernel = "WeightedSumKernel",
                     .items = {arg("srcBuffer"), arg("dstBuffer"), arg("inputs"), arg("weights"),
                               define("INPUTS_NUM", "inputsNum")}}}},

        {.type = TOV_IMAGE_FILTER_MULTIPLY,
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .parameters = {imageArray("inputs"), uintParameter("inputsNum", 0, kNoText)},
         .passes = {{.program = "Math",
                     .kernel = "MultiplicationKernel",
                     .items = {arg("srcBuffer"), arg("dstBuffer"), arg("inputs"), define("INPUTS_NUM", "inputsNum")}}}},

        {.type = TOV_IMAGE_FILTER_MLAA,
         .description = kAntialiasingText,
         .scratchBytesPerPixel = 32,  // four-float edges, then four-float weights
         .hasState = true,
         .stateContents = areaTable,
         .sizeRule = SizeRule::EqualInput,
         .parameters = {imageParameter("meshIDImg", kAntialiasingMeshText),
                        imageParameter("normalsImg", kAntialiasingNormalsText),
                        imageParameter("depthImg", kAntialiasingDepthText),
                        floatParameter("colorTreshold", 0.05f, kColorThresholdText),
                        floatParameter("normalTreshold", kCosPiOver8, kNormalThresholdText),
                        floatParameter("depthTreshold", 0.1f, kDepthThresholdText)},
         .check = checkAntialiasingImages,
         .passes = {{.program = "MLAA",
                     .kernel = "EdgeDetectionMLAA",
                     .items = {arg("srcBuffer"), arg("meshIDImg"), arg("normalsImg"), arg("depthImg"), scratch(),
                               arg("colorTreshold"), arg("normalTreshold"), arg("depthTreshold"),
                               flag("EDGE_DETECTION")}},
                    {.program = "MLAA",
                     .kernel = "BlendingWeightCalculationMLAA",
                     .items = {scratch(), state(), arg("srcBufferSize"), scratch(), flag("WEIGH_CALC")}},
                    {.program = "MLAA",
                     .kernel = "NeighborhoodBlendingMLAA",
                     .items = {arg("srcBuffer"), arg("dstBuffer"), scratch(), flag("BLENDING")}}}},

        {.type = TOV_IMAGE_FILTER_MOTION_BUFFER,
         .inPlace = InPlace::PerPixel,
         .sizeRule = SizeRule::EqualOutput,
         .fusable = true,
         .parameters = {matrixParameter("viewProjMatrix", "")},
         .passes = {{.program = "TemporalAccumulation",
                     .kernel = "GenerateMotionBuffer",
                     .items = {arg("srcBuffer"), arg("dstBuffer"), viewProjectionPair("viewProjMatrix"),
                               flag("MOTION_BUFFER")}}}},

        {.type = TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION,
         .description = kAccumulationText,
         .stateBytesPerPixel = 112,  // seven four-float slices
         .hasState = true,
         .sizeRule = SizeRule::EqualOutput,
         .readsOutputBack = true,
         .required = {"positionsImg"},
         .outputs = {"outVarianceImg"},
         .parameters = {imageParameter("positionsImg", kPositionsText),
                        imageParameter("normalsImg", kAccumulationNormalsText),
                        imageParameter("meshIdsImg", kMeshIdsText), imageParameter("outVarianceImg", kOutVarianceText),
                        matrixParameter("viewProjMatrix", kViewProjectionText)},
         .passes = {{.program = "TemporalAccumulation",
                     .kernel = "GenerateMotionBuffer",
                     .items = {arg("positionsImg"), readBack("dstBuffer"), viewProjectionPair("viewProjMatrix"),
                               flag("MOTION_BUFFER")}},
                    {.program = "TemporalAccumulation",
                     .kernel = "TemporalAccumulation",
                     .items = {arg("srcBuffer"), arg("positionsImg"), arg("normalsImg"), arg("meshIdsImg"),
                               readBack("dstBuffer"), arg("outVarianceImg"), arg("dstBuffer"), state(),
                               flag("TEMPORAL_ACCUMULATION")}},
                    {.program = "TemporalAccumulation",
                     .kernel = "SwapOutToIn",
                     .items = {arg("positionsImg"), arg("normalsImg"), arg("meshIdsImg"), state(), flag("COPY")}}}},

        {.type = TOV_IMAGE_FILTER_SHADOW_CATCHER,
         .inPlace = InPlace::PerPixel,
         .fusable = true,
         .passes = {pixelPass("ShadowCatcherKernel")}},
    }};
}

Catalogue* catalogue = nullptr;
const FreedAtUnload<Catalogue> catalogueOwner{catalogue};

}  // namespace

const FilterSpec& filterSpec(uint32_t type) {
    if (type >= kFilterTypes) throw TovException{TOV_ERROR_INVALID_OPERATION};
    if (catalogue == nullptr) catalogue = new Catalogue(makeCatalogue());
    return (*catalogue)[type];
}
