// The estimate of a picture's variance, and the denoisers' parameters chosen from it.
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>
#include <vector>

#include "denoise_defaults.h"
#include "variance_estimate.h"

namespace {

constexpr uint32_t kSide = 40;
constexpr size_t kSize = size_t{kSide} * kSide * 4;

// Left half 0.2, right half 1, under normal noise of the given deviation; alpha 1.
std::vector<float> halves(float deviation) {
    std::mt19937 generator(5);
    std::normal_distribution<float> noise(0.0f, deviation);
    std::vector<float> color(kSize, 1.0f);
    for (size_t i = 0; i < kSize; ++i)
        if (i % 4 != 3)
            color[i] = (i / 4 % kSide < kSide / 2 ? 0.2f : 1.0f) + (deviation > 0.0f ? noise(generator) : 0.0f);
    return color;
}

// A feature that is 0 on the left and 1 on the right.
std::vector<float> edge() {
    std::vector<float> feature(kSize);
    for (size_t i = 0; i < kSize; ++i) feature[i] = i / 4 % kSide < kSide / 2 ? 0.0f : 1.0f;
    return feature;
}

float at(const std::vector<float>& picture, uint32_t x, uint32_t y) {
    return picture[(size_t{y} * kSide + x) * 4];
}

double mean(const std::vector<float>& variance) {
    double sum = 0.0;
    for (size_t i = 0; i < variance.size(); i += 4) sum += variance[i];
    return sum / static_cast<double>(variance.size() / 4);
}

TEST(VarianceEstimate, FindsTheVarianceOfNoiseWhereFeaturesShowTheEdges) {
    const std::vector<float> color = halves(0.1f);
    const std::vector<float> feature = edge();
    for (int which = 0; which < 3; ++which) {
        tool::NoisyPicture picture{kSide, kSide, color, {}, {}, {}};
        (which == 0 ? picture.albedo : which == 1 ? picture.normal : picture.depth) = feature;
        const std::vector<float> variance = tool::estimateVariance(picture);
        EXPECT_NEAR(mean(variance), 0.01, 0.001);  // 1600 pixels, windows of some 25 independent values
        EXPECT_LT(at(variance, kSide / 2, 10), 0.03f);
    }
}

TEST(VarianceEstimate, TakesAnEdgeForNoiseWithoutFeaturesButStaysNearIt) {
    const std::vector<float> color = halves(0.0f);
    const std::vector<float> variance = tool::estimateVariance({kSide, kSide, color, {}, {}, {}});
    EXPECT_GT(at(variance, kSide / 2, 10), 0.05f);
    EXPECT_EQ(at(variance, kSide / 2 - 6, 10), 0.0f);
    EXPECT_EQ(at(variance, kSide / 2 + 6, 10), 0.0f);
    for (size_t i = 3; i < kSize; i += 4) ASSERT_EQ(variance[i], 0.0f) << "alpha must not add to lengths";
}

TEST(VarianceEstimate, ValuesThatAreNotFiniteTakeNoPart) {
    const float unusable[] = {std::numeric_limits<float>::quiet_NaN(), std::numeric_limits<float>::infinity(), 3e38f};
    for (const float value : unusable) {
        std::vector<float> color = halves(0.1f);
        std::vector<float> depth = edge();
        for (size_t i = 0; i < 4; ++i) color[(10 * kSide + 10) * 4 + i] = value;
        for (size_t i = 0; i < 4; ++i) depth[(20 * kSide + 10) * 4 + i] = value;
        const std::vector<float> variance = tool::estimateVariance({kSide, kSide, color, {}, {}, depth});
        for (const float v : variance) ASSERT_TRUE(std::isfinite(v) && v >= 0.0f) << value;
        EXPECT_NEAR(at(variance, 30, 30), 0.01f, 0.01f);
    }
}

TEST(VarianceEstimate, RefusesSpansOfAnotherSize) {
    const std::vector<float> color = halves(0.1f);
    const std::vector<float> half(kSize / 2);
    EXPECT_THROW(tool::estimateVariance({kSide, kSide + 1, color, {}, {}, {}}), std::invalid_argument);
    EXPECT_THROW(tool::estimateVariance({kSide, kSide, color, half, {}, {}}), std::invalid_argument);
    EXPECT_TRUE(tool::estimateVariance({0, 0, {}, {}, {}, {}}).empty());
}

TEST(DenoiseDefaults, NoiseIsBoundedAndKnowsNoExposure) {
    const std::vector<float> variance(kSize, 0.01f);
    const std::vector<float> color = halves(0.0f);
    const float noise = tool::noiseLevel(color, variance);
    EXPECT_NEAR(noise, 0.5 * (0.1 / 0.3 + 0.1 / 1.1), 1e-4);
    std::vector<float> brighter = color;
    for (float& value : brighter) value *= 8.0f;
    EXPECT_NEAR(tool::noiseLevel(brighter, std::vector<float>(kSize, 0.64f)), noise, 1e-4);
    EXPECT_EQ(tool::noiseLevel(color, std::vector<float>(kSize, 0.0f)), 0.0f);
    EXPECT_EQ(tool::noiseLevel({}, {}), 0.0f);
    std::vector<float> broken = color;
    broken[0] = std::numeric_limits<float>::infinity();
    EXPECT_NEAR(tool::noiseLevel(broken, variance), noise, 1e-3);
}

TEST(DenoiseDefaults, CleanerRendersGetASmallerColourSigma) {
    for (const bool features : {false, true}) {
        float last = 0.0f;
        for (const float noise : {0.0f, 0.15f, 0.3f, 0.5f, 0.7f, 1.0f}) {
            const tool::WaveletSettings settings = tool::waveletSettings(noise, features);
            EXPECT_GE(settings.colorSigma, last);
            EXPECT_GT(settings.colorSigma, 0.0f);
            last = settings.colorSigma;
        }
    }
    EXPECT_LT(tool::waveletSettings(0.3f, true).colorSigma, tool::waveletSettings(0.5f, true).colorSigma);
    EXPECT_LT(tool::waveletSettings(0.5f, false).colorSigma, tool::waveletSettings(0.5f, true).colorSigma);
}

}  // namespace
