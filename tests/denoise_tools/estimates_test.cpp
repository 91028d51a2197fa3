// The estimate of a picture's variance, and the denoisers' parameters chosen from it.
#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "../../tools/denoise_defaults.h"
#include "../../tools/variance_estimate.h"

namespace {

constexpr uint32_t kSide = 40;

// Left half dark, right half bright, under normal noise; alpha 1.
std::vector<float> halves(float left, float right, float deviation = 0.0f) {
    std::mt19937 generator(5);
    std::normal_distribution<float> noise;
    std::vector<float> pixels(size_t{kSide} * kSide * 4, 1.0f);
    for (size_t i = 0; i < pixels.size(); ++i)
        if (i % 4 != 3) pixels[i] = (i / 4 % kSide < kSide / 2 ? left : right) + deviation * noise(generator);
    return pixels;
}

TEST(VarianceEstimate, FindsTheVarianceOfNoiseWhereAnyFeatureShowsTheEdgesAndNoValueSpreads) {
    std::vector<float> color = halves(0.2f, 1.0f, 0.1f);
    color[1640] = NAN;
    color[3280] = INFINITY;
    const std::vector<float> edges = halves(0.0f, 1.0f);
    for (const auto feature : {&tool::NoisyPicture::albedo, &tool::NoisyPicture::normal, &tool::NoisyPicture::depth}) {
        tool::NoisyPicture picture{kSide, kSide, color, {}, {}, {}};
        picture.*feature = edges;
        double sum = 0.0;
        for (const float variance : tool::estimateVariance(picture)) sum += variance;
        EXPECT_NEAR(sum / (3 * kSide * kSide), 0.01, 0.001);  // windows of some 25 independent values; alpha has none
    }
}

TEST(DenoiseDefaults, CleanerRendersOfAnyExposureGetASmallerColourSigma) {
    const std::vector<float> variance(size_t{kSide} * kSide * 4, 0.01f);
    const float noise = tool::noiseLevel(halves(0.2f, 1.0f), variance);
    EXPECT_NEAR(noise, 0.5 * (0.1 / 0.3 + 0.1 / 1.1), 1e-4);  // deviation / (deviation + value) of both halves
    EXPECT_NEAR(tool::noiseLevel(halves(1.6f, 8.0f), std::vector<float>(variance.size(), 0.64f)), noise, 1e-4);
    EXPECT_LT(tool::waveletSettings(0.3f, true).colorSigma, tool::waveletSettings(0.5f, true).colorSigma);
}

}  // namespace
