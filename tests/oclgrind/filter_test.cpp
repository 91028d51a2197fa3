// Every kernel under Oclgrind: small pictures whose sides no group size divides, single pixels, results in place of the
// input, absent images. Nothing is compared here but the log, which must stay empty; a kernel that is wrong on purpose
// shows that this means something.
#include <gmock/gmock.h>

#include <fstream>

#include "../api/fixture.h"
#include "zor/kernel.h"

namespace apitest {
namespace {

constexpr Matrix kStillView = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0.1f, 1};
constexpr Matrix kMovedView = {1, 0, 0, 0.1f, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0.1f, 1};

std::string oclgrindLog() {
    std::ifstream log(std::getenv("OCLGRIND_LOG"));
    return log ? std::string(std::istreambuf_iterator<char>(log), {}) : "there is no log";
}

TEST(WrongKernel, IsFoundToWriteBehindItsBufferToRaceAndToUseWhatNobodyWrote) {
    const std::unique_ptr<zor::Device, void (*)(zor::Device*)> device(
        zor::createDevice(zor::DEVICE_KIND_CL, {.deviceType = TOV_DEVICE_TYPE_GPU}), zor::destroyDevice);
    const std::string_view source =
        "__kernel void Wrong(__global float* data) {"
        "    data[get_global_id(0)] = data[1] > 0.5f ? 1.0f : 2.0f; data[0] = (float)get_global_id(0); }";
    zor::Kernel* const kernel = device->getKernel({.kernelName = "Wrong", .sources = {&source, 1}});
    ASSERT_NE(kernel, nullptr);
    const zor::Buffer<float> fourFloats(*device, 4 * sizeof(float), zor::BUFFER_DEFAULT);
    zor::Launcher launcher(*device, *kernel);
    launcher.arg(fourFloats);
    launcher.launch1D(8, 8);
    for (const char* finding : {"Invalid write", "data race", "ninitialized"})
        EXPECT_THAT(oclgrindLog(), testing::HasSubstr(finding));
}

class Oclgrind : public DeviceTest {
 protected:
    void SetUp() override {
        uint32_t type = 0;
        std::array<std::array<char, 128>, 2> texts = {};  // name and vendor
        ASSERT_EQ(tovContextGetDeviceInfo(context(), &type, texts[0].data(), 0, texts[1].data()), TOV_SUCCESS);
        ASSERT_THAT(texts[0].data(), testing::HasSubstr("Oclgrind"));
    }
    void TearDown() override { EXPECT_EQ(oclgrindLog(), ""); }

    static void runBothWays(uint32_t type, const Picture& picture, const Parameters& parameters = {}) {
        run(type, picture, parameters);
        runInPlace(type, picture, parameters);
    }
    // One picture for all of the parameters.
    Parameters bound(const Picture& picture, const std::vector<const char*>& names) {
        images_.push_back(newImage(picture));
        Parameters parameters;
        for (const char* name : names) parameters.push_back({name, tov_image{images_.back()}});
        return parameters;
    }

    std::vector<Handle> images_;
};

TEST_F(Oclgrind, PerPixelFiltersInEveryPacking) {
    const Picture picture = noise(11, 9);
    for (const uint32_t type : {TOV_IMAGE_FILTER_NORMALIZATION, TOV_IMAGE_FILTER_COLOR_SPACE, TOV_IMAGE_FILTER_SOBEL,
                                TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, TOV_IMAGE_FILTER_SHADOW_CATCHER})
        runBothWays(type, picture);
    runBothWays(TOV_IMAGE_FILTER_GAMMA_CORRECTION, picture, {{"cGamma", 2.2f}});
    runBothWays(TOV_IMAGE_FILTER_SIMPLE_TONEMAP, picture, {{"cApplyToneMap", 1u}});
    runBothWays(TOV_IMAGE_FILTER_REINHARD_TONEMAP, picture, {{"cWPoint", 2.0f}});
    runBothWays(TOV_IMAGE_FILTER_DRAGO_TONEMAP, picture, {{"cBias", 0.85f}, {"avLum", 0.5f}, {"maxLum", 1.0f}});
    runBothWays(TOV_IMAGE_FILTER_MOTION_BUFFER, picture, {{"viewProjMatrix", kMovedView}});
    for (const Layout layout : allLayouts()) runBothWays(TOV_IMAGE_FILTER_LINEAR_TONEMAP, noise(5, 3, layout));
}

TEST_F(Oclgrind, SumsAndProductsOfImagesAndOfNoneAndTheSelfTest) {
    runBothWays(TOV_IMAGE_FILTER_MATH_TEST, noise(9, 3));
    const Handle first = newImage(noise(11, 9));
    const Handle second = newImage(noise(11, 9, {3, TOV_COMPONENT_TYPE_UINT8}));
    Parameters three = {{"inputs", std::vector<tov_image>{first, nullptr, second}}, {"inputsNum", 3u}};
    runInPlace(TOV_IMAGE_FILTER_MULTIPLY, noise(11, 9), three);
    three.push_back({"weights", std::vector<float>{0.5f, 0.25f, 2.0f}});
    run(TOV_IMAGE_FILTER_WEIGHTED_SUM, noise(11, 9), three);
    run(TOV_IMAGE_FILTER_WEIGHTED_SUM, noise(1, 1));
}

TEST_F(Oclgrind, BlurPlainAndTiledWithRadiiBeyondThePicture) {
    for (const auto& [radius, tiling] :
         {std::pair{2u, 0u}, std::pair{13u, 0u}, std::pair{2u, 1u}, std::pair{13u, 1u}}) {
        const Parameters parameters = {{"radius", radius}, {"sigma", 1.5f}, {"tiling", tiling}};
        run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, noise(11, 7), parameters);
        runInPlace(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, noise(1, 3, {3, TOV_COMPONENT_TYPE_UINT8}), parameters);
    }
}

TEST_F(Oclgrind, BilateralWithAndWithoutAuxiliaryImages) {
    const Handle guide = newImage(noise(11, 9, {3, TOV_COMPONENT_TYPE_FLOAT16}));
    run(TOV_IMAGE_FILTER_BILATERAL_DENOISE, noise(11, 9),
        {{"inputs", std::vector<tov_image>{guide, nullptr}},
         {"sigmas", std::vector<float>{0.5f, 0.1f}},
         {"inputsNum", 2u},
         {"radius", 2u}});
    runInPlace(TOV_IMAGE_FILTER_BILATERAL_DENOISE, noise(3, 1), {{"radius", 4u}});
}

TEST_F(Oclgrind, ResamplingToLargerSmallerAndSinglePixels) {
    for (const uint32_t operation : {0u, 1u, 2u}) {
        const Parameters parameters = {{"interpOperator", operation}};
        run(TOV_IMAGE_FILTER_RESAMPLE, noise(9, 7), parameters, Picture(13, 5));
        run(TOV_IMAGE_FILTER_RESAMPLE, noise(9, 7), parameters, Picture(1, 1));
        run(TOV_IMAGE_FILTER_RESAMPLE, noise(1, 1), parameters, Picture(3, 2));
    }
}

TEST_F(Oclgrind, WaveletDenoising) {
    runBothWays(TOV_IMAGE_FILTER_EAW_DENOISE, noise(1, 1));
    const Parameters features = bound(noise(9, 5), {"normalsImg", "depthImg", "transImg", "colorVar"});
    runInPlace(TOV_IMAGE_FILTER_EAW_DENOISE, noise(9, 5), features);
}

TEST_F(Oclgrind, RegressionInTwoGroupsThatThePictureCutsAndInAllNineDirections) {
    Parameters parameters = {{"halfWindow", 2u}};
    run(TOV_IMAGE_FILTER_LWR_DENOISE, noise(1, 1), parameters);
    for (uint32_t seed = 2; const char* name : {"vColorImg", "transImg", "normalsImg", "depthImg"})
        parameters.push_back(bound(noise(9, 3, kFloat4, 1.0, seed++), {name})[0]);
    run(TOV_IMAGE_FILTER_LWR_DENOISE, noise(9, 3), parameters);  // few pixels, for it is slow to simulate
}

TEST_F(Oclgrind, Antialiasing) {
    run(TOV_IMAGE_FILTER_MLAA, noise(11, 9));
    runInPlace(TOV_IMAGE_FILTER_MLAA, noise(11, 9), bound(noise(11, 9), {"meshIDImg", "normalsImg", "depthImg"}));
    run(TOV_IMAGE_FILTER_MLAA, noise(1, 1));
}

TEST_F(Oclgrind, AccumulationOfSeveralFramesOfAMovingCamera) {
    Parameters parameters = bound(noise(9, 4), {"positionsImg", "normalsImg"});
    runInPlace(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, noise(9, 4), {parameters[0]});
    parameters.push_back(bound(noise(9, 4, {1, TOV_COMPONENT_TYPE_FLOAT32}), {"meshIdsImg"})[0]);
    parameters.push_back(bound(Picture(9, 4, {1, TOV_COMPONENT_TYPE_FLOAT32}), {"outVarianceImg"})[0]);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, parameters);
    for (const Matrix& view : {kStillView, kStillView, kMovedView}) {
        EXPECT_EQ(setParameter(filter, {"viewProjMatrix", view}), TOV_SUCCESS);
        EXPECT_EQ(execute(filter, newImage(noise(9, 4)), newImage(Picture(9, 4))), TOV_SUCCESS);
    }
}

}  // namespace
}  // namespace apitest
