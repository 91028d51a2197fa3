// Every kernel under Oclgrind: small pictures whose sides no group size divides, single pixels, results in place of the
// input, absent images. Nothing is compared here but the log, which must stay empty; a kernel that is wrong on purpose
// shows that this means something.
#include <gmock/gmock.h>

#include <fstream>

#include "fixture.h"
#include "zor/kernel.h"

namespace apitest {
namespace {

std::string oclgrindLog() {
    std::ifstream log(std::getenv("OCLGRIND_LOG"));
    return log ? std::string(std::istreambuf_iterator<char>(log), {}) : "there is no log";
}

TEST(WrongKernel, IsFoundToWriteBehindItsBufferToRaceAndToUseWhatNobodyWrote) {
    const std::unique_ptr<zor::Device, void (*)(zor::Device*)> device(
        zor::createDevice(zor::DEVICE_KIND_CL, {.deviceType = TOV_DEVICE_TYPE_GPU}), zor::destroyDevice);
    const std::string_view source =
        "__kernel void Wrong(__global float* d) { d[get_global_id(0)] = d[1] > 0 ? 1 : 2; d[0] = get_global_id(0); }";
    const zor::Buffer<float> fourFloats(*device, 4 * sizeof(float), zor::BUFFER_DEFAULT);
    zor::Launcher launcher(*device, *device->getKernel({.kernelName = "Wrong", .sources = {&source, 1}}));
    launcher.arg(fourFloats);
    launcher.launch1D(8, 8);
    for (const char* finding : {"Invalid write", "data race", "ninitialized"})
        EXPECT_THAT(oclgrindLog(), testing::HasSubstr(finding));
}

class Oclgrind : public DeviceTest {
 protected:
    void TearDown() override { EXPECT_EQ(oclgrindLog(), ""); }

    static void runInPlace(uint32_t type, const Picture& picture, const Parameters& parameters = {}) {
        const Handle image = newImage(picture);
        EXPECT_EQ(execute(newFilter(type, parameters), image, image), TOV_SUCCESS) << "filter type " << type;
    }
    static void runBothWays(uint32_t type, const Picture& picture, const Parameters& parameters = {}) {
        run(type, picture, parameters);
        runInPlace(type, picture, parameters);
    }
    // Claims sides beyond the images, few enough pixels that reading them would soon be seen.
    static void resampleClaiming(const char* name, uint32_t operation) {
        const Handle filter = newFilter(TOV_IMAGE_FILTER_RESAMPLE, {{"interpOperator", operation}});
        const Handle queue = newQueue();
        const Handle input = newImage(noise(6, 5)), output = newImage(Picture(4, 4));
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
        EXPECT_EQ(tovImageFilterSetParameter2u(filter, name, 40, 30), TOV_SUCCESS);
        EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS);
    }
    // An image of its own for each of the parameters.
    Parameters bound(uint32_t w, uint32_t h, const std::vector<const char*>& names) {
        Parameters parameters;
        for (uint32_t seed = 2; const char* name : names)
            parameters.push_back({name, tov_image{images_.emplace_back(newImage(noise(w, h, {}, 1, seed++)))}});
        return parameters;
    }

    std::vector<Handle> images_;
};

TEST_F(Oclgrind, PerPixelFiltersInEveryPackingWithSeveralImagesAndNone) {
    const Picture picture = noise(11, 9);
    const Handle bytes = newImage(noise(11, 9, {3, TOV_COMPONENT_TYPE_UINT8}));
    const Parameters two = {{"inputs", std::vector<tov_image>{bytes, nullptr}}, {"inputsNum", 2u}};
    const std::vector<float> factors = {0.5f, 0.25f};
    for (const uint32_t type :
         {TOV_IMAGE_FILTER_COLOR_SPACE, TOV_IMAGE_FILTER_NORMALIZATION, TOV_IMAGE_FILTER_SOBEL,
          TOV_IMAGE_FILTER_GAMMA_CORRECTION, TOV_IMAGE_FILTER_REINHARD_TONEMAP, TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP,
          TOV_IMAGE_FILTER_WEIGHTED_SUM, TOV_IMAGE_FILTER_MOTION_BUFFER, TOV_IMAGE_FILTER_SHADOW_CATCHER,
          TOV_IMAGE_FILTER_MATH_TEST})
        runBothWays(type, picture);
    runBothWays(TOV_IMAGE_FILTER_SIMPLE_TONEMAP, picture, {{"cApplyToneMap", 1u}});
    runBothWays(TOV_IMAGE_FILTER_DRAGO_TONEMAP, picture, {{"avLum", 0.5f}, {"maxLum", 1.0f}});
    runBothWays(TOV_IMAGE_FILTER_MULTIPLY, picture, two);
    runBothWays(TOV_IMAGE_FILTER_WEIGHTED_SUM, picture, {two[0], two[1], {"weights", factors}});
    runBothWays(TOV_IMAGE_FILTER_BILATERAL_DENOISE, picture, {two[0], two[1], {"sigmas", factors}, {"radius", 2u}});
    runBothWays(TOV_IMAGE_FILTER_BILATERAL_DENOISE, noise(3, 1), {{"radius", 4u}});
    for (const Layout layout : allLayouts()) runBothWays(TOV_IMAGE_FILTER_LINEAR_TONEMAP, noise(5, 3, layout));
}

TEST_F(Oclgrind, BlurAndResamplingBeyondThePictureAndOfSinglePixels) {
    for (const auto& [radius, tiling] : {std::pair{2u, 0u}, {13u, 0u}, {2u, 1u}, {13u, 1u}}) {
        const Parameters parameters = {{"radius", radius}, {"sigma", 1.5f}, {"tiling", tiling}};
        run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, noise(11, 7), parameters);
        runInPlace(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, noise(1, 3, {3, TOV_COMPONENT_TYPE_UINT8}), parameters);
    }
    for (const uint32_t operation : {0u, 1u, 2u}) {
        const Parameters parameters = {{"interpOperator", operation}};
        run(TOV_IMAGE_FILTER_RESAMPLE, noise(9, 7), parameters, Picture(13, 5));
        run(TOV_IMAGE_FILTER_RESAMPLE, noise(9, 7), parameters, Picture(1, 1));
        run(TOV_IMAGE_FILTER_RESAMPLE, noise(1, 1), parameters, Picture(3, 2));
        for (const char* const claimed : {"srcRec", "dstRec"}) resampleClaiming(claimed, operation);
    }
}

TEST_F(Oclgrind, WaveletDenoising) {
    runBothWays(TOV_IMAGE_FILTER_EAW_DENOISE, noise(1, 1));
    runInPlace(TOV_IMAGE_FILTER_EAW_DENOISE, noise(9, 5),
               bound(9, 5, {"normalsImg", "depthImg", "transImg", "colorVar"}));
}

TEST_F(Oclgrind, RegressionInTwoGroupsThatThePictureCutsAndInAllNineDirections) {
    run(TOV_IMAGE_FILTER_LWR_DENOISE, noise(1, 1), {{"halfWindow", 2u}});
    Parameters parameters = bound(9, 3, {"vColorImg", "transImg", "normalsImg", "depthImg"});
    parameters.push_back({"halfWindow", 2u});
    run(TOV_IMAGE_FILTER_LWR_DENOISE, noise(9, 3), parameters);  // few pixels, for it is slow to simulate
}

TEST_F(Oclgrind, AntialiasingAndAccumulationOfSeveralFramesOfAMovingCamera) {
    run(TOV_IMAGE_FILTER_MLAA, noise(11, 9));
    runInPlace(TOV_IMAGE_FILTER_MLAA, noise(11, 9), bound(11, 9, {"meshIDImg", "normalsImg", "depthImg"}));
    run(TOV_IMAGE_FILTER_MLAA, noise(1, 1));
    const Parameters parameters = bound(9, 4, {"positionsImg", "normalsImg", "meshIdsImg", "outVarianceImg"});
    runInPlace(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, noise(9, 4), {parameters[0]});
    const Handle filter = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, parameters);
    for (const float shift : {0.0f, 0.0f, 0.1f}) {
        const Matrix view = {1, 0, 0, shift, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0.1f, 1};
        EXPECT_EQ(setParameter(filter, {"viewProjMatrix", view}), TOV_SUCCESS);
        EXPECT_EQ(execute(filter, newImage(noise(9, 4)), newImage(Picture(9, 4))), TOV_SUCCESS);
    }
}

}  // namespace
}  // namespace apitest
