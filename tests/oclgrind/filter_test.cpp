// Every kernel under Oclgrind: small pictures whose sides no group size divides, single pixels, results in place of the
// input, absent images. Nothing is compared here but the log, which must stay empty.
#include <tov/tov.h>

#include <array>
#include <string>
#include <vector>

#include "fixture.h"
#include "oclgrind_log.h"

namespace {

using apitest::Handle;
using apitest::kFloat4;
using apitest::Layout;
using apitest::noise;
using apitest::Parameters;
using apitest::Picture;

constexpr Layout kByte3 = {3, TOV_COMPONENT_TYPE_UINT8};
constexpr Layout kHalf4 = {4, TOV_COMPONENT_TYPE_FLOAT16};
constexpr Layout kFloat1 = {1, TOV_COMPONENT_TYPE_FLOAT32};

class Oclgrind : public apitest::DeviceTest {
 protected:
    void SetUp() override {
        DeviceTest::SetUp();
        uint32_t type = 0;
        std::array<char, 128> name = {};
        std::array<char, 128> vendor = {};
        ASSERT_EQ(tovContextGetDeviceInfo(context(), &type, name.data(), 0, vendor.data()), TOV_SUCCESS);
        ASSERT_NE(std::string(name.data()).find("Oclgrind"), std::string::npos)
            << "not under Oclgrind: " << name.data();
        before_ = oclgrindLog();
    }
    void TearDown() override { EXPECT_EQ(oclgrindLog(), before_); }

    // Out of place and in place on an odd size, and on one pixel of bytes.
    static void runAll(uint32_t type, const Parameters& parameters = {}) {
        SCOPED_TRACE("filter type " + std::to_string(type));
        const std::string before = oclgrindLog();
        const Picture picture = noise(11, 9);
        run(type, picture, parameters);
        runInPlace(type, picture, parameters);
        run(type, noise(1, 1, kByte3), parameters);
        EXPECT_EQ(oclgrindLog(), before);
    }

 private:
    std::string before_;  // what an earlier test has left
};

struct Case {
    uint32_t type;
    Parameters parameters;
};

const apitest::Matrix kShiftedView = {1.0f, 0.0f, 0.0f, 0.1f, 0.0f, 1.0f, 0.0f, 0.0f,
                                      0.0f, 0.0f, 1.0f, 0.0f, 0.0f, 0.0f, 0.1f, 1.0f};

}  // namespace

TEST_F(Oclgrind, ToneMappersAndColourFilters) {
    const std::vector<Case> cases = {
        {TOV_IMAGE_FILTER_NORMALIZATION, {}},
        {TOV_IMAGE_FILTER_COLOR_SPACE, {{"dstColorSpace", uint32_t{TOV_COLOR_SPACE_REC2020}}}},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}}},
        {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, {{"cApplyToneMap", 1u}}},
        {TOV_IMAGE_FILTER_REINHARD_TONEMAP, {{"cWPoint", 2.0f}}},
        {TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, {}},
        {TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 2.0f}}},
        {TOV_IMAGE_FILTER_DRAGO_TONEMAP, {{"cBias", 0.85f}, {"avLum", 0.5f}, {"maxLum", 1.0f}}},
        {TOV_IMAGE_FILTER_SHADOW_CATCHER, {}}};
    for (const Case& filter : cases) runAll(filter.type, filter.parameters);
}

TEST_F(Oclgrind, PackedLayoutsReadAndWriteInsideTheirBuffers) {
    for (const Layout layout : {kByte3, Layout{2, TOV_COMPONENT_TYPE_FLOAT16}, Layout{3, TOV_COMPONENT_TYPE_FLOAT16},
                                Layout{3, TOV_COMPONENT_TYPE_FLOAT32}}) {
        run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, noise(5, 3, layout));
    }
}

TEST_F(Oclgrind, Sobel) {
    runAll(TOV_IMAGE_FILTER_SOBEL);
}

TEST_F(Oclgrind, TheSelfTestDoesNotRaceInPlace) {
    Picture numbers = noise(9, 3, kFloat1);
    for (float& value : numbers.values) value += 1.0f;
    run(TOV_IMAGE_FILTER_MATH_TEST, numbers);
    runInPlace(TOV_IMAGE_FILTER_MATH_TEST, numbers);
}

TEST_F(Oclgrind, SumAndProductOfImagesAndOfNone) {
    const Handle first = newImage(noise(11, 9));
    const Handle second = newImage(noise(11, 9, kByte3));
    const std::vector<tov_image> images = {first, nullptr, second};
    const Parameters three = {
        {"inputs", images}, {"weights", std::vector<float>{0.5f, 0.25f, 2.0f}}, {"inputsNum", 3u}};
    run(TOV_IMAGE_FILTER_WEIGHTED_SUM, noise(11, 9), three);
    run(TOV_IMAGE_FILTER_WEIGHTED_SUM, noise(1, 1));
    const Parameters product = {{"inputs", images}, {"inputsNum", 3u}};
    runInPlace(TOV_IMAGE_FILTER_MULTIPLY, noise(11, 9), product);
    run(TOV_IMAGE_FILTER_MULTIPLY, noise(1, 1));
}

TEST_F(Oclgrind, BlurPlainAndTiledWithRadiiBeyondThePicture) {
    for (const uint32_t tiling : {0u, 1u}) {
        for (const uint32_t radius : {2u, 13u}) {
            const Parameters parameters = {{"radius", radius}, {"sigma", 1.5f}, {"tiling", tiling}};
            run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, noise(11, 7), parameters);
            runInPlace(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, noise(1, 3, kByte3), parameters);
        }
    }
}

TEST_F(Oclgrind, BilateralWithAndWithoutAuxiliaryImages) {
    const Picture picture = noise(11, 9);
    const Handle guide = newImage(noise(11, 9, kHalf4));
    const Parameters parameters = {{"inputs", std::vector<tov_image>{guide, nullptr}},
                                   {"sigmas", std::vector<float>{0.5f, 0.1f}},
                                   {"inputsNum", 2u},
                                   {"radius", 2u}};
    run(TOV_IMAGE_FILTER_BILATERAL_DENOISE, picture, parameters);
    runInPlace(TOV_IMAGE_FILTER_BILATERAL_DENOISE, noise(3, 1), {{"radius", 4u}});
}

TEST_F(Oclgrind, ResamplingToLargerSmallerAndSinglePixels) {
    for (const uint32_t operation : {0u, 1u, 2u}) {
        const Parameters parameters = {{"interpOperator", operation}};
        const Picture picture = noise(9, 7);
        run(TOV_IMAGE_FILTER_RESAMPLE, picture, parameters, Picture(13, 5));
        run(TOV_IMAGE_FILTER_RESAMPLE, picture, parameters, Picture(1, 1));
        run(TOV_IMAGE_FILTER_RESAMPLE, noise(1, 1), parameters, Picture(3, 2));
    }
}

TEST_F(Oclgrind, TheWaveletDenoiser) {
    const Handle features = newImage(noise(9, 5));
    run(TOV_IMAGE_FILTER_EAW_DENOISE, noise(9, 5));
    runInPlace(TOV_IMAGE_FILTER_EAW_DENOISE, noise(9, 5),
               {{"normalsImg", tov_image{features}},
                {"depthImg", tov_image{features}},
                {"transImg", tov_image{features}},
                {"colorVar", tov_image{features}}});
    run(TOV_IMAGE_FILTER_EAW_DENOISE, noise(1, 1));
}

TEST_F(Oclgrind, TheRegressionDenoiser) {
    // Few pixels, for it is slow to simulate: two work groups, both cut by the picture's sides.
    const Handle features = newImage(noise(9, 1));
    run(TOV_IMAGE_FILTER_LWR_DENOISE, noise(9, 1),
        {{"halfWindow", 1u},
         {"vColorImg", tov_image{features}},
         {"transImg", tov_image{features}},
         {"normalsImg", tov_image{features}},
         {"depthImg", tov_image{features}}});
    run(TOV_IMAGE_FILTER_LWR_DENOISE, noise(1, 1), {{"halfWindow", 3u}});
    // All nine directions in use: random features in windows of 15 to 25 pixels.
    const Handle depth = newImage(noise(5, 5, kFloat4, 1.0, 2));
    const Handle normals = newImage(noise(5, 5, kFloat4, 1.0, 3));
    const Handle transition = newImage(noise(5, 5, kFloat4, 1.0, 4));
    run(TOV_IMAGE_FILTER_LWR_DENOISE, noise(5, 5),
        {{"halfWindow", 2u},
         {"transImg", tov_image{transition}},
         {"normalsImg", tov_image{normals}},
         {"depthImg", tov_image{depth}}});
}

TEST_F(Oclgrind, Antialiasing) {
    const Handle features = newImage(noise(11, 9));
    run(TOV_IMAGE_FILTER_MLAA, noise(11, 9));
    runInPlace(
        TOV_IMAGE_FILTER_MLAA, noise(11, 9, kHalf4),
        {{"meshIDImg", tov_image{features}}, {"normalsImg", tov_image{features}}, {"depthImg", tov_image{features}}});
    run(TOV_IMAGE_FILTER_MLAA, noise(1, 1));
}

TEST_F(Oclgrind, MotionBuffers) {
    run(TOV_IMAGE_FILTER_MOTION_BUFFER, noise(11, 9), {{"viewProjMatrix", kShiftedView}});
    runInPlace(TOV_IMAGE_FILTER_MOTION_BUFFER, noise(1, 1));
}

TEST_F(Oclgrind, AccumulationOverSeveralFramesOfAMovingCamera) {
    const Handle positions = newImage(noise(9, 4));
    const Handle normals = newImage(noise(9, 4));
    const Handle ids = newImage(noise(9, 4, kFloat1));
    const Handle input = newImage(noise(9, 4));
    const Handle output = newImage(Picture(9, 4));
    const Handle variance = newImage(Picture(9, 4, kFloat1));
    const Handle filter = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, {{"positionsImg", tov_image{positions}},
                                                                             {"normalsImg", tov_image{normals}},
                                                                             {"meshIdsImg", tov_image{ids}},
                                                                             {"outVarianceImg", tov_image{variance}}});
    EXPECT_EQ(execute(filter, input, output), TOV_SUCCESS);
    EXPECT_EQ(execute(filter, input, output), TOV_SUCCESS);
    EXPECT_EQ(apitest::setParameter(filter, {"viewProjMatrix", kShiftedView}), TOV_SUCCESS);
    EXPECT_EQ(execute(filter, input, output), TOV_SUCCESS);
}

TEST_F(Oclgrind, AccumulationInPlaceWithPositionsAlone) {
    const Handle positions = newImage(noise(3, 2));
    runInPlace(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, noise(3, 2), {{"positionsImg", tov_image{positions}}});
}
