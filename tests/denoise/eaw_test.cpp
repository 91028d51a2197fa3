// The edge-avoiding a-trous filter: its five levels against the reference, small pictures, unusable pixels, errors.
#include <gmock/gmock.h>

#include <cmath>
#include <limits>

#include "eaw_reference.h"
#include "fixture.h"
#include "scenes.h"

namespace denoisetest {

namespace {

using apitest::Handle;
using apitest::Parameters;

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();
// Weights are products of exponentials of relative error 1e-6, and errors of the variance feed the next level's.
constexpr double kTolerance = 2e-4;

class WaveletDenoiser : public apitest::DeviceTest {
 protected:
    // Runs with the features that `inputs` points at.
    static Picture filtered(const Picture& color, const WaveletInputs& inputs) {
        Parameters parameters = {{"colorSigma", static_cast<float>(inputs.colorSigma)},
                                 {"normalSigma", static_cast<float>(inputs.normalSigma)},
                                 {"depthSigma", static_cast<float>(inputs.depthSigma)},
                                 {"transSigma", static_cast<float>(inputs.transSigma)}};
        std::vector<Handle> images;
        const auto bind = [&](const char* name, const Picture* picture) {
            if (picture == nullptr) return;
            images.push_back(newImage(*picture));
            parameters.push_back({name, static_cast<tov_image>(images.back())});
        };
        bind("normalsImg", inputs.normal);
        bind("depthImg", inputs.depth);
        bind("transImg", inputs.transition);
        bind("colorVar", inputs.variance);
        return run(TOV_IMAGE_FILTER_EAW_DENOISE, color, parameters);
    }
    static WaveletInputs allOf(const Scene& scene) {
        return {.normal = &scene.normal,
                .depth = &scene.depth,
                .transition = &scene.transition,
                .variance = &scene.variance,
                .colorSigma = 3.0,
                .depthSigma = 1.0};
    }
    static void expectLikeReference(const Picture& color, const WaveletInputs& inputs) {
        const Picture expected = waveletReference(color, inputs);
        EXPECT_GT(apitest::maxDifference(expected, color), 0.05) << "the reference must change the picture";
        EXPECT_LT(apitest::maxDifference(filtered(color, inputs), expected), kTolerance);
    }
};

TEST_F(WaveletDenoiser, MatchesTheReferenceWithAllFeaturesOnAPictureNoGroupSizeDivides) {
    const Scene scene = makeScene(45, 37);
    expectLikeReference(scene.color, allOf(scene));
}

TEST_F(WaveletDenoiser, MatchesTheReferenceWithFeaturesMissing) {
    const Scene scene = makeScene(45, 37);
    for (unsigned present = 0; present < 8; present += 3) {  // none; normals, depth; depth with transition
        SCOPED_TRACE(present);
        WaveletInputs inputs = allOf(scene);
        if ((present & 1) == 0) inputs.normal = nullptr;
        if ((present & 2) == 0) inputs.depth = nullptr;
        if ((present & 4) == 0) inputs.transition = nullptr;
        expectLikeReference(scene.color, inputs);
    }
}

TEST_F(WaveletDenoiser, WithoutAVarianceKeepsAllButEqualColours) {
    const Scene scene = makeScene(45, 37);
    WaveletInputs inputs = allOf(scene);
    inputs.variance = nullptr;
    EXPECT_LT(apitest::maxDifference(filtered(scene.color, inputs), scene.color), kTolerance);
}

TEST_F(WaveletDenoiser, ReadsOtherLayoutsAndDividesByAlpha) {
    const Scene scene = makeScene(45, 37);
    Picture color = converted(scene.color, {4, TOV_COMPONENT_TYPE_FLOAT16});
    for (size_t i = 0; i < color.values.size(); i += 8)  // every second pixel with alpha 1/2
        for (size_t k = 0; k < 4; ++k) color.values[i + k] *= 0.5f;
    const Picture normal = converted(scene.normal, {3, TOV_COMPONENT_TYPE_FLOAT32});
    const Picture transition = converted(scene.transition, {3, TOV_COMPONENT_TYPE_UINT8});
    const Picture variance = converted(scene.variance, {4, TOV_COMPONENT_TYPE_FLOAT16});
    WaveletInputs inputs = allOf(scene);
    inputs.normal = &normal;
    inputs.transition = &transition;
    inputs.variance = &variance;
    // A half has eleven digits, and a level that rounds the other way moves the next ones' weights.
    EXPECT_LT(apitest::maxDifference(filtered(color, inputs), waveletReference(color, inputs)), 3e-3);
}

TEST_F(WaveletDenoiser, StaysInsidePicturesBelowThirtyTwoPixels) {
    for (const auto& [width, height] : {std::pair{1u, 1u}, {3u, 31u}}) {
        SCOPED_TRACE(testing::Message() << width << " x " << height);
        const Scene scene = makeScene(width, height);
        EXPECT_LT(
            apitest::maxDifference(filtered(scene.color, allOf(scene)), waveletReference(scene.color, allOf(scene))),
            kTolerance);
    }
}

TEST_F(WaveletDenoiser, AFlatPictureStaysFlatWhateverTheFeatures) {
    const Scene scene = makeScene(45, 37);
    const Picture flat = apitest::painted(45, 37, apitest::kFloat4, [](uint32_t, uint32_t) {
        return Rgba{0.25, 0.5, 4.0, 1.0};
    });
    EXPECT_LT(apitest::maxDifference(filtered(flat, allOf(scene)), flat), 1e-5);  // rounding of 25-term sums, 5 times
}

// ---- Unusable pixels ----

// Every pixel finite, none darker than the darkest usable pixel of the input.
void expectFilled(const Picture& result, double darkest) {
    for (uint32_t y = 0; y < result.height; ++y)
        for (uint32_t x = 0; x < result.width; ++x)
            for (size_t i = 0; i < 3; ++i) {
                const double value = result.at(x, y)[i];
                ASSERT_TRUE(std::isfinite(value)) << x << ", " << y;
                ASSERT_GE(value, darkest) << x << ", " << y;
            }
}

TEST_F(WaveletDenoiser, FillsUnusablePixelsAndWholeHolesFromTheirNeighbours) {
    Scene scene = makeScene(45, 37);
    for (float& value : scene.color.values) value = std::max(value, 0.2f);
    const Picture clean = scene.color;
    fillPixel(scene.color, 5, 5, kNaN);
    fillPixel(scene.color, 6, 30, kInfinity);
    fillPixel(scene.color, 44, 36, -kInfinity);
    for (uint32_t y = 18; y < 32; ++y)  // larger than the first level's window
        for (uint32_t x = 18; x < 32; ++x) fillPixel(scene.color, x, y, kNaN);
    const Picture result = filtered(scene.color, allOf(scene));
    expectFilled(result, 0.19);
    // Far from any of them nothing changes but what the fill adds to the sums of wide levels.
    const Picture undisturbed = filtered(clean, allOf(scene));
    EXPECT_NEAR(result.at(42, 1)[0], undisturbed.at(42, 1)[0], 0.05);
}

TEST_F(WaveletDenoiser, UnusableFeaturesMatchEachOtherOnly) {
    Scene scene = makeScene(45, 37);
    for (uint32_t y = 0; y < 37; ++y)
        for (uint32_t x = 0; x < 45; ++x)
            scene.color.set(x, y, x < 24 ? Rgba{0.2, 0.2, 0.2, 1} : Rgba{0.9, 0.9, 0.9, 1});
    for (float& value : scene.variance.values) value = 100.0f;  // colour stops nothing
    for (uint32_t y = 0; y < 37; ++y)
        for (uint32_t x = 24; x < 45; ++x) fillPixel(scene.depth, x, y, kInfinity);
    fillPixel(scene.normal, 3, 3, kNaN);
    fillPixel(scene.transition, 40, 30, kInfinity);
    fillPixel(scene.variance, 10, 10, kNaN);
    const Picture result = filtered(scene.color, allOf(scene));
    expectFilled(result, 0.2 - 1e-5);
    EXPECT_LT(apitest::maxDifference(result, scene.color), 1e-4);  // nothing crosses the edge of the finite depths
}

TEST_F(WaveletDenoiser, AlphaZeroAndAVarianceOfZeroGiveFinitePixels) {
    Scene scene = makeScene(45, 37);
    for (size_t i = 3; i < scene.color.values.size(); i += 12) scene.color.values[i] = 0.0f;
    for (size_t i = 3; i < scene.transition.values.size(); i += 20) scene.transition.values[i] = 0.0f;
    for (size_t i = 0; i < scene.variance.values.size() / 2; ++i) scene.variance.values[i] = 0.0f;
    EXPECT_TRUE(apitest::isFinite(filtered(scene.color, allOf(scene))));
    for (float& value : scene.color.values) value = 3e38f;  // usable neither
    EXPECT_TRUE(apitest::isFinite(filtered(scene.color, allOf(scene))));
}

// ---- Refusals ----

TEST_F(WaveletDenoiser, RefusesAnOutputOfAnotherFormatAndSigmasThatDivideByZero) {
    const Picture color = makeScene(45, 37).color;
    const Handle input = newImage(color);
    const Handle bytes = newImage(Picture(45, 37, apitest::kByte4));
    const Handle smaller = newImage(Picture(44, 37));
    const Handle output = newImage(Picture(45, 37));
    const Handle filter = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE);
    const std::string line = apitest::printedBy([&] { EXPECT_NE(execute(filter, input, bytes), TOV_SUCCESS); });
    EXPECT_THAT(line, testing::HasSubstr("one component type"));
    EXPECT_NE(execute(filter, input, smaller), TOV_SUCCESS);
    for (const char* name : {"colorSigma", "normalSigma", "depthSigma", "transSigma"}) {
        const Handle zero = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE, {{name, 0.0f}});
        const std::string why =
            apitest::printedBy([&] { EXPECT_EQ(execute(zero, input, output), TOV_ERROR_INVALID_PARAMETER) << name; });
        EXPECT_THAT(why, testing::HasSubstr(name));
    }
    EXPECT_EQ(execute(filter, input, output), TOV_SUCCESS);
}

}  // namespace

}  // namespace denoisetest
