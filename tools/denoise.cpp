// Both methods are one stage of the pipeline, fed with pictures made in memory.
#include "denoise.h"

#include <array>
#include <cmath>
#include <limits>
#include <span>
#include <string_view>
#include <vector>

#include "auxiliary_images.h"
#include "denoise_defaults.h"
#include "failure.h"
#include "picture_channels.h"
#include "picture_reader.h"
#include "pipeline.h"
#include "text.h"
#include "variance_estimate.h"

namespace tool {

namespace {

using Names = std::span<const std::string_view>;

// What common renderers call their layers, the best suited first. A picture that is denoised already is not.
constexpr std::array<std::string_view, 4> kColorLayers = {"Noisy Image", kBeautyLayers[0], kBeautyLayers[1],
                                                          kBeautyLayers[2]};
constexpr std::array<std::string_view, 4> kAlbedoLayers = {"Denoising Albedo", "Albedo", "DiffCol", "diffuse_albedo"};
constexpr std::array<std::string_view, 4> kNormalLayers = {"Denoising Normal", "Normal", "Normals", "N"};
constexpr std::array<std::string_view, 3> kDepthLayers = {"Depth", "Z", "Denoising Depth"};
constexpr std::array<std::string_view, 1> kVarianceLayers = {"Variance"};

// Under these the pictures are bound to the filter's parameters.
constexpr const char* kAlbedo = "@albedo";
constexpr const char* kNormal = "@normal";
constexpr const char* kDepth = "@depth";
constexpr const char* kVariance = "@variance";

PixelSize sizeOf(const Picture& picture) {
    return {picture.width, picture.height};
}

// The given source, else the layer of the picture's own file.
std::optional<Picture> readFeature(const std::string& given, const std::string& input, const PixelSize& size,
                                   Names names, std::string& found) {
    std::optional<Picture> picture;
    if (!given.empty()) {
        picture = readFileOrLayer(given, names);
        refuseOtherSize(given, sizeOf(*picture), input, size);
    } else if (const auto layer = isPictureFile(input) ? firstLayer(input, names) : std::nullopt) {
        picture = readLayer(input, *layer);
        refuseOtherSize(input + ":" + *layer, sizeOf(*picture), input, size);
        found += ", " + *layer;
    }
    return picture;
}

// Applies `change` to the red, green and blue of every pixel and sets alpha.
template <class Change>
void changeColors(Picture& picture, float alpha, const Change& change) {
    for (size_t i = 0; i < picture.pixels.size(); ++i) {
        picture.pixels[i] = i % kComponents == 3 ? alpha : change(picture.pixels[i]);
    }
}

void scaleColors(std::optional<Picture>& picture, float factor, float alpha) {
    if (picture) changeColors(*picture, alpha, [factor](float value) { return value * factor; });
}

// Filters would mistake infinite features for surfaces.
void cleanFeature(std::optional<Picture>& picture, float limit, float alpha) {
    if (!picture) return;
    changeColors(*picture, alpha,
                 [limit](float value) { return std::isfinite(value) && std::abs(value) < limit ? value : 0.0f; });
}

std::span<const float> pixelsOf(const std::optional<Picture>& picture) {
    return picture ? std::span<const float>(picture->pixels) : std::span<const float>();
}

void estimateMissingVariance(DenoiseInputs& inputs) {
    if (inputs.variance) return;
    const Picture& color = inputs.color;
    Picture& variance = inputs.variance.emplace();
    variance.width = color.width;
    variance.height = color.height;
    variance.pixels = estimateVariance({color.width, color.height, color.pixels, pixelsOf(inputs.albedo),
                                        pixelsOf(inputs.normal), pixelsOf(inputs.depth)});
    note("no variance is given: it is estimated from the picture");
}

// Adds what there is of the features to the stage, under the parameters' names, and to the pictures to be bound.
void assignImages(Stage& stage, AuxiliaryImages& auxiliary, const DenoiseInputs& inputs,
                  const char* varianceParameter) {
    const auto assign = [&](const char* parameter, const char* name, const std::optional<Picture>& picture) {
        if (!picture) return;
        auxiliary.add(name, *picture);
        stage.assignments.push_back({parameter, name});
    };
    assign("transImg", kAlbedo, inputs.albedo);
    assign("normalsImg", kNormal, inputs.normal);
    assign("depthImg", kDepth, inputs.depth);
    assign(varianceParameter, kVariance, inputs.variance);
}

Stage waveletStage(float noise, bool hasFeatures) {
    const WaveletSettings settings = waveletSettings(noise, hasFeatures);
    return {"eaw_denoise",
            {{"colorSigma", formatFloat(settings.colorSigma)},
             {"normalSigma", formatFloat(settings.normalSigma)},
             {"depthSigma", formatFloat(settings.depthSigma)},
             {"transSigma", formatFloat(settings.transSigma)}}};
}

Stage regressionStage(const RegressionSettings& settings) {
    return {"lwr_denoise",
            {{"samples", std::to_string(settings.samples)},
             {"halfWindow", std::to_string(settings.halfWindow)},
             {"bandwidth", formatFloat(settings.bandwidth)}}};
}

void runStage(Streams& streams, tov_context context, Stage stage, DenoiseInputs& inputs,
              const char* varianceParameter) {
    AuxiliaryImages auxiliary(streams, context);
    if (streams.verbose()) {
        std::vector<std::string> texts;
        for (const Assignment& assignment : stage.assignments) {
            texts.push_back(assignment.parameter + "=" + assignment.value);
        }
        note(stage.filter + ": " + join(texts, ", "));
    }
    assignImages(stage, auxiliary, inputs, varianceParameter);
    std::vector<PreparedStage> stages = prepareStages(context, {stage});
    readImages(stages, auxiliary, sizeOf(inputs.color), "the picture");
    runStages(streams, context, stages, false, inputs.color);
}

// The regression works on sums over the samples.
void runRegression(Streams& streams, tov_context context, DenoiseInputs& inputs, const RegressionSettings& settings) {
    const auto samples = static_cast<float>(settings.samples);
    changeColors(inputs.color, 1.0f, [samples](float value) { return value * samples; });
    for (auto* const feature : {&inputs.albedo, &inputs.normal, &inputs.depth}) scaleColors(*feature, samples, 1.0f);
    scaleColors(inputs.variance, samples * (samples - 1.0f), 0.0f);
    runStage(streams, context, regressionStage(settings), inputs, "vColorImg");
    changeColors(inputs.color, 1.0f, [samples](float value) { return value / samples; });
}

std::vector<float> takeAlpha(Picture& picture) {
    std::vector<float> alpha;
    for (size_t i = 3; i < picture.pixels.size(); i += kComponents) {
        alpha.push_back(picture.pixels[i]);
        picture.pixels[i] = 1.0f;  // filters would divide colours by it
    }
    return alpha;
}

}  // namespace

DenoiseInputs readDenoiseInputs(const std::string& input, const DenoiseOptions& options) {
    DenoiseInputs inputs{.color = readFileOrLayer(input, kColorLayers)};
    const PixelSize size = sizeOf(inputs.color);
    std::string found;
    inputs.albedo = readFeature(options.albedo, input, size, kAlbedoLayers, found);
    inputs.normal = readFeature(options.normal, input, size, kNormalLayers, found);
    inputs.depth = readFeature(options.depth, input, size, kDepthLayers, found);
    inputs.variance = readFeature(options.variance, input, size, kVarianceLayers, found);
    if (!found.empty()) note(input + ": its layers are used: " + found.substr(2));
    constexpr float kNoLimit = std::numeric_limits<float>::infinity();
    constexpr float kSkyDepth = 1e9f;  // renderers store 1e10 and more where nothing is hit
    cleanFeature(inputs.albedo, kNoLimit, 1.0f);
    cleanFeature(inputs.normal, kNoLimit, 1.0f);
    cleanFeature(inputs.depth, kSkyDepth, 1.0f);
    cleanFeature(inputs.variance, kNoLimit, 0.0f);
    return inputs;
}

void denoise(Streams& streams, tov_context context, DenoiseInputs& inputs, const DenoiseOptions& options) {
    const std::vector<float> alpha = takeAlpha(inputs.color);
    estimateMissingVariance(inputs);
    const bool hasFeatures = inputs.albedo || inputs.normal || inputs.depth;
    const float noise = noiseLevel(inputs.color.pixels, inputs.variance->pixels);
    if (options.method == DenoiseMethod::kWavelet) {
        runStage(streams, context, waveletStage(noise, hasFeatures), inputs, "colorVar");
    } else {
        RegressionSettings settings = regressionSettings(hasFeatures);
        settings.samples = options.samples.value_or(settings.samples);
        runRegression(streams, context, inputs, settings);
    }
    for (size_t i = 0; i < alpha.size(); ++i) inputs.color.pixels[i * kComponents + 3] = alpha[i];
}

}  // namespace tool
