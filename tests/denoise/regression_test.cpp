// The local weighted regression filter: against a full reference, flat and black areas, unusable pixels, errors.
#include <gmock/gmock.h>

#include <algorithm>
#include <cmath>
#include <limits>

#include "fixture.h"
#include "regression_reference.h"
#include "scenes.h"

namespace denoisetest {

namespace {

using apitest::Handle;
using apitest::Parameters;

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr double kSamples = 4.0;
constexpr uint32_t kWidth = 21;  // three groups across, the last not full
constexpr uint32_t kHeight = 13;

// The scene as sums over the samples.
Scene sums(Scene scene) {
    scene.color = scaled(scene.color, kSamples);
    scene.normal = scaled(scene.normal, kSamples);
    scene.depth = scaled(scene.depth, kSamples);
    scene.transition = scaled(scene.transition, kSamples);
    scene.variance = scaled(scene.variance, kSamples * (kSamples - 1.0));
    return scene;
}

class RegressionDenoiser : public apitest::DeviceTest {
 protected:
    static Picture filtered(const Picture& color, const RegressionInputs& inputs) {
        Parameters parameters = {{"samples", inputs.samples},
                                 {"halfWindow", inputs.halfWindow},
                                 {"bandwidth", static_cast<float>(inputs.bandwidth)}};
        std::vector<Handle> images;
        const auto bind = [&](const char* name, const Picture* picture) {
            if (picture == nullptr) return;
            images.push_back(newImage(*picture));
            parameters.push_back({name, static_cast<tov_image>(images.back())});
        };
        bind("vColorImg", inputs.variance);
        bind("transImg", inputs.transition);
        bind("vTransImg", inputs.transitionVariance);
        bind("normalsImg", inputs.normal);
        bind("vNormalsImg", inputs.normalVariance);
        bind("depthImg", inputs.depth);
        bind("vDepthImg", inputs.depthVariance);
        return run(TOV_IMAGE_FILTER_LWR_DENOISE, color, parameters);
    }
    static RegressionInputs allOf(const Scene& scene) {
        return {.variance = &scene.variance,
                .transition = &scene.transition,
                .normal = &scene.normal,
                .depth = &scene.depth,
                .halfWindow = 3};
    }

    // Rotations, thresholds and outliers are decided in float on the device: a pixel of which one is decided the other
    // way may differ, all others agree closely.
    static void expectLikeReference(const Picture& color, const RegressionInputs& inputs) {
        const Picture result = filtered(color, inputs);
        const Picture expected = regressionReference(color, inputs);
        size_t different = 0;
        for (size_t i = 0; i < result.values.size(); i += 4) {
            double worst = 0.0;
            for (size_t k = 0; k < 3; ++k) {
                const double difference = std::abs(double{result.values[i + k]} - expected.values[i + k]);
                worst = std::isnan(difference) ? kInfinity : std::max(worst, difference);
            }
            different += worst > 0.01 * kSamples ? 1 : 0;
        }
        EXPECT_LE(different, result.pixelCount() / 50);
        EXPECT_GT(apitest::maxDifference(expected, color), 0.05) << "the reference must change the picture";
    }
};

TEST_F(RegressionDenoiser, MatchesTheReferenceWithAllFeatures) {
    const Scene scene = sums(makeScene(kWidth, kHeight));
    expectLikeReference(scene.color, allOf(scene));
}

TEST_F(RegressionDenoiser, MatchesTheReferenceWithColourAndVarianceAlone) {
    const Scene scene = sums(makeScene(kWidth, kHeight));
    RegressionInputs inputs = {.variance = &scene.variance};
    inputs.bandwidth = 2.0;
    expectLikeReference(scene.color, inputs);
}

TEST_F(RegressionDenoiser, NoisyFeaturesAreReducedAway) {
    const Scene scene = sums(makeScene(kWidth, kHeight));
    const Picture noise = apitest::painted(kWidth, kHeight, apitest::kFloat4, [](uint32_t x, uint32_t) {
        const double value = x < kWidth / 2 ? 0.05 : 20.0;
        return Rgba{value, value, value, 0.0};
    });
    RegressionInputs inputs = allOf(scene);
    inputs.depth = nullptr;
    inputs.normalVariance = &noise;
    inputs.transitionVariance = &noise;
    expectLikeReference(scene.color, inputs);
}

TEST_F(RegressionDenoiser, FitsThatTurnNegativeFallBackToPositiveWeights) {
    Scene scene = makeScene(kWidth, kHeight);
    for (uint32_t y = 0; y < kHeight; ++y)  // a black rim, over which fits run on below zero
        for (uint32_t x = 0; x < kWidth; ++x) {
            const double value = x < 3 ? 0.0 : 0.5;
            scene.color.set(x, y, {value, 0.5 * value, 0.9 * value, 1.0});
        }
    scene.variance = scaled(scene.variance, 20.0);
    scene = sums(scene);
    RegressionInputs inputs = {.variance = &scene.variance};
    uint32_t fallbacks = 0;
    regressionReference(scene.color, inputs, &fallbacks);
    EXPECT_GT(fallbacks, 5u);
    const Picture result = filtered(scene.color, inputs);
    EXPECT_LT(apitest::maxDifference(result, regressionReference(scene.color, inputs)), 0.02 * kSamples);
    for (const float value : result.values) ASSERT_GE(value, 0.0f);
}

TEST_F(RegressionDenoiser, FlatAndBlackAreasStayAsTheyAre) {
    const Scene scene = sums(makeScene(kWidth, kHeight));
    const Picture halves = apitest::painted(kWidth, kHeight, apitest::kFloat4, [](uint32_t x, uint32_t) {
        return x < 10 ? Rgba{0, 0, 0, 1} : Rgba{2.0, 1.0, 4.0, 1.0};
    });
    RegressionInputs inputs = allOf(scene);
    inputs.variance = nullptr;  // nothing beyond 0.005 of the centre counts
    // The ridges of the systems draw fits towards zero: by 1e-4 of a weight that is small among many features.
    EXPECT_LT(apitest::maxDifference(filtered(halves, inputs), halves), 0.02);
    EXPECT_LT(apitest::maxDifference(filtered(halves, {.halfWindow = 3}), halves), 0.02);
}

TEST_F(RegressionDenoiser, TinyPicturesAndWideWindowsStayInside) {
    const Scene scene = sums(makeScene(3, 2));
    RegressionInputs inputs = allOf(scene);
    inputs.halfWindow = 256;
    EXPECT_TRUE(apitest::isFinite(filtered(scene.color, inputs)));
}

TEST_F(RegressionDenoiser, UnusablePixelsAreFilledAndSpreadNowhere) {
    Scene scene = sums(makeScene(kWidth, kHeight));
    for (float& value : scene.color.values) value = std::max(value, 1.0f);
    fillPixel(scene.color, 4, 4, kNaN);
    fillPixel(scene.color, 12, 6, kInfinity);
    fillPixel(scene.normal, 7, 9, kNaN);
    fillPixel(scene.transition, 15, 3, -kInfinity);
    fillPixel(scene.variance, 18, 11, kNaN);
    for (uint32_t y = 0; y < 3; ++y) fillPixel(scene.depth, 20, y, kInfinity);
    const Picture result = filtered(scene.color, allOf(scene));
    EXPECT_TRUE(apitest::isFinite(result));
    for (const float value : result.values) ASSERT_GT(value, 0.5f) << "no black pixels, either";
}

TEST_F(RegressionDenoiser, RefusesWhatItWouldDivideByZero) {
    const Handle input = newImage(Picture(kWidth, kHeight));
    const Handle output = newImage(Picture(kWidth, kHeight));
    const std::pair<const char*, apitest::Value> refused[] = {
        {"samples", 0u}, {"samples", 1u}, {"halfWindow", 0u}, {"halfWindow", 257u}, {"bandwidth", 0.0f}};
    for (const auto& [name, value] : refused) {
        const Handle filter = newFilter(TOV_IMAGE_FILTER_LWR_DENOISE, {{name, value}});
        const std::string line = apitest::printedBy([&, parameter = name] {
            EXPECT_EQ(execute(filter, input, output), TOV_ERROR_INVALID_PARAMETER) << parameter;
        });
        EXPECT_THAT(line, testing::HasSubstr(name));
    }
}

}  // namespace

}  // namespace denoisetest
