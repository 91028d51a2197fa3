// Straight lines through the settings that gave the best pictures on renders of 4 and of 16 samples.
#include "denoise_defaults.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <stdexcept>

#include "picture.h"

namespace tool {
namespace {

float luminance(const float* rgb) {
    return 0.2126f * rgb[0] + 0.7152f * rgb[1] + 0.0722f * rgb[2];
}

}  // namespace

float noiseLevel(std::span<const float> color, std::span<const float> variance) {
    if (color.size() != variance.size()) throw std::invalid_argument("colours and variance of different sizes");
    double sum = 0.0;
    size_t count = 0;
    for (size_t i = 0; i + kComponents <= color.size(); i += kComponents) {
        const float deviation = std::sqrt(std::max(luminance(&variance[i]), 0.0f));
        const float magnitude = std::abs(luminance(&color[i]));
        if (!std::isfinite(deviation) || !std::isfinite(magnitude)) continue;
        sum += deviation > 0.0f ? double{deviation} / (double{deviation} + magnitude) : 0.0;
        ++count;
    }
    return count > 0 ? static_cast<float>(sum / static_cast<double>(count)) : 0.0f;
}

WaveletSettings waveletSettings(float noise, bool hasFeatures) {
    const float strength = hasFeatures ? 12.0f : 5.0f;
    return {std::clamp(strength * noise, 0.5f, 8.0f), 0.1f, 1.0f, 0.2f};
}

RegressionSettings regressionSettings(bool hasFeatures) {
    // Without features nothing but the fit itself keeps edges: wide windows blur.
    return hasFeatures ? RegressionSettings{4, 8, 2.0f} : RegressionSettings{4, 4, 0.8f};
}

}  // namespace tool
