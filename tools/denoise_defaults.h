// Parameters of the denoisers that suit a picture, from its noise alone.
#ifndef TOV_TOOLS_DENOISE_DEFAULTS_H
#define TOV_TOOLS_DENOISE_DEFAULTS_H

#include <cstdint>
#include <span>

namespace tool {

// How noisy a picture is: the mean of s / (s + l) over the pixels, with s the deviation and l the magnitude of its
// luminance; 0 (clean) to 1. Independent of exposure, and bright lights count no more than other pixels. Both spans
// hold four floats per pixel, `variance` as estimateVariance gives it or from the renderer. Pixels that are not finite
// do not count.
float noiseLevel(std::span<const float> color, std::span<const float> variance);

// Parameters of the a-trous filter, by name.
struct WaveletSettings {
    float colorSigma;
    float normalSigma;
    float depthSigma;
    float transSigma;
};

// `hasFeatures`: albedo, normals or depth are given. Then colour needs to stop less, for they stop most; noisier
// pictures need wider colour weights, as the first level's estimate of a colour is that noisy.
WaveletSettings waveletSettings(float noise, bool hasFeatures);

// Parameters of the regression filter, by name. Its input images are sums over `samples` samples: multiply the colour
// and the features of a render by `samples`, all variances of means by samples * (samples - 1), and divide the output
// by `samples`. The result hardly depends on `samples`, so that a render whose count is not known needs no other value.
// More than kMostSamples scale variances towards 1e15, from which on the filter takes them for unusable and gives the
// pixels back as they are.
inline constexpr uint32_t kFewestSamples = 2;
inline constexpr uint32_t kMostSamples = 65536;
struct RegressionSettings {
    uint32_t samples;
    uint32_t halfWindow;
    float bandwidth;
};

RegressionSettings regressionSettings(bool hasFeatures);

}  // namespace tool

#endif
