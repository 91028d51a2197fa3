// What both denoisers and the accumulation do with unusable pixels, and what they refuse.
#include "scenes.h"

namespace {

using namespace apitest;

using EdgeCases = SceneTest;

TEST_F(EdgeCases, UnusablePixelsAreFilledAndSpreadNowhere) {
    Scene clean = makeScene(45, 37);
    for (float& value : clean.color.values) value = std::max(value, 0.2f);
    Scene bad = clean;
    Picture* const spoiled[] = {&bad.color,    &bad.normal, &bad.depth,   &bad.transition,
                                &bad.variance, &bad.meshId, &bad.position};
    for (uint32_t x = 2; Picture * picture : spoiled) {
        for (uint32_t y = 3; const float value : {kNaN, kInfinity, -kInfinity, 3e38f})
            picture->set(x, y += 7, gray(value));
        x += 6;
    }
    for (size_t i = 11; i < bad.color.values.size(); i += 52) bad.color.values[i] = 0.0f;
    for (size_t i = 3; i < bad.transition.values.size(); i += 20) bad.transition.values[i] = 0.0f;
    std::fill_n(bad.variance.values.begin(), bad.variance.values.size() / 2, 0.0f);
    for (const auto& [type, darkest] : {std::pair{TOV_IMAGE_FILTER_EAW_DENOISE, 0.19f},
                                        {TOV_IMAGE_FILTER_LWR_DENOISE, 0.1f},
                                        {TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, 0.15f}}) {
        const Handle filter = newFilter(type);
        for (uint32_t frame = 0; frame < 6; ++frame) {
            ASSERT_EQ(execute(filter, frame == 1 ? bad : clean), TOV_SUCCESS);
            EXPECT_TRUE(isFinite(color_) && isFinite(variance_)) << "type " << type << ", frame " << frame;
            EXPECT_GE(*std::min_element(color_.values.begin(), color_.values.end()), darkest) << type << ' ' << frame;
        }
    }
}

TEST_F(EdgeCases, FlatAreasStayAsTheyAreHolesAreFilledAndInfiniteFeaturesMatchEachOtherOnly) {
    Scene scene = makeScene(45, 37);
    scene.color = painted(45, 37, kFloat4, [&](uint32_t x, uint32_t y) {
        scene.variance.set(x, y, gray(100));  // in the wavelet filter colour stops nothing
        if (x >= 24) scene.depth.set(x, y, gray(kInfinity));
        return x < 24 ? Rgba{0, 0, 0, 1} : Rgba{2, 1, 4, 1};
    });
    Scene holed = scene;
    for (uint32_t y = 10; y < 24; ++y)  // larger than the first level's window
        for (uint32_t x = 27; x < 41; ++x) holed.color.set(x, y, gray(kNaN));
    ASSERT_EQ(execute(newFilter(TOV_IMAGE_FILTER_EAW_DENOISE), holed), TOV_SUCCESS);
    EXPECT_LT(maxDifference(color_, scene.color), 1e-4);
    scene.variance = {};  // in the regression nothing beyond 0.005 of the centre counts
    ASSERT_EQ(execute(newFilter(TOV_IMAGE_FILTER_LWR_DENOISE), scene), TOV_SUCCESS);
    // The ridges of the systems draw fits towards zero: by 1e-4 of a weight that is small among many features.
    EXPECT_LT(maxDifference(color_, scene.color), 0.02);
}

TEST_F(EdgeCases, WhatWouldDivideByZeroNeverEndOrMixFormatsIsRefused) {
    const Handle image = newImage(Picture(21, 13));
    const Handle bytes = newImage(Picture(21, 13, kByte4));
    const Handle wavelet = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE);
    EXPECT_EQ(DeviceTest::execute(wavelet, image, bytes), TOV_ERROR_INVALID_OPERATION);
    for (const auto& [name, value] : {std::pair{"samples", 1u}, {"halfWindow", 0u}, {"halfWindow", 257u}}) {
        const Handle regression = newFilter(TOV_IMAGE_FILTER_LWR_DENOISE, {{name, value}});
        EXPECT_EQ(DeviceTest::execute(regression, image, image), TOV_ERROR_INVALID_PARAMETER) << name << value;
    }
}

}  // namespace
