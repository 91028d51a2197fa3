// What is refused when a filter runs: values, array counts, sizes and images. Nothing is launched then.
#include <gmock/gmock.h>

#include <cmath>

#include "fixture.h"

namespace apitest {
namespace {

class ExecutionChecks : public DeviceTest {
 protected:
    const Picture picture_ = noise(7, 5);
    const Handle input_ = newImage(picture_);
    const Handle output_ = newImage(picture_);

    void TearDown() override {
        EXPECT_EQ(maxDifference(read(output_, picture_), picture_), 0.0) << "a refused run wrote pixels";
    }
    int32_t codeOf(uint32_t type, const Parameters& parameters) {
        return execute(newFilter(type, parameters), input_, output_);
    }
};

TEST_F(ExecutionChecks, ValuesWithWhichNoPixelCanBeComputedAreNamed) {
    using Images = std::vector<tov_image>;
    using Floats = std::vector<float>;
    const tov_image image = input_;
    const Parameter one = {"inputs", Images{image}};
    const Parameter two = {"inputs", Images{image, image}};
    const Parameter number = {"inputsNum", 1u};
    const Parameter sigma = {"sigma", 1.0f};
    const Parameters seven = {{"inputs", Images(7, image)}, {"inputsNum", 7u}};
    const struct {
        const char* named;
        Parameters parameters;
        uint32_t type;
        int32_t code = TOV_ERROR_INVALID_PARAMETER;
    } rows[] = {
        {"cGamma", {{"cGamma", -0.0f}}, TOV_IMAGE_FILTER_GAMMA_CORRECTION},
        {"cGamma", {{"cGamma", std::nanf("")}}, TOV_IMAGE_FILTER_GAMMA_CORRECTION},
        {"viewProjMatrix", {{"viewProjMatrix", Matrix{0, 0, HUGE_VALF}}}, TOV_IMAGE_FILTER_MOTION_BUFFER},
        {"avLum", {}, TOV_IMAGE_FILTER_DRAGO_TONEMAP},  // its default is 0
        {"maxLum", {{"avLum", 1.0f}, {"maxLum", 0.0f}}, TOV_IMAGE_FILTER_DRAGO_TONEMAP},
        {"sigma", {}, TOV_IMAGE_FILTER_GAUSSIAN_BLUR},                   // its default is 0
        {"sigma", {{"sigma", 1e-30f}}, TOV_IMAGE_FILTER_GAUSSIAN_BLUR},  // whose square is 0
        {"4096", {sigma, {"radius", 4097u}}, TOV_IMAGE_FILTER_GAUSSIAN_BLUR},
        {"256", {{"radius", 257u}}, TOV_IMAGE_FILTER_BILATERAL_DENOISE},
        {"sigmas", {one, number, {"sigmas", Floats{0}}}, TOV_IMAGE_FILTER_BILATERAL_DENOISE},
        {"bandwidth", {{"bandwidth", 0.0f}}, TOV_IMAGE_FILTER_LWR_DENOISE},
        {"colorSigma", {{"colorSigma", 0.0f}}, TOV_IMAGE_FILTER_EAW_DENOISE},
        {"normalSigma", {{"normalSigma", 0.0f}}, TOV_IMAGE_FILTER_EAW_DENOISE},
        {"depthSigma", {{"depthSigma", 0.0f}}, TOV_IMAGE_FILTER_EAW_DENOISE},
        {"transSigma", {{"transSigma", 0.0f}}, TOV_IMAGE_FILTER_EAW_DENOISE},
        {"weights", {one, number, {"weights", Floats{HUGE_VALF}}}, TOV_IMAGE_FILTER_WEIGHTED_SUM},
        {"inputs", {two, number, {"weights", Floats{1}}}, TOV_IMAGE_FILTER_WEIGHTED_SUM},
        {"inputs", {number}, TOV_IMAGE_FILTER_MULTIPLY},
        {"inputsNum", {two, {"inputsNum", UINT32_MAX}}, TOV_IMAGE_FILTER_MULTIPLY},
        {"Internal error: too lot of inputs!", seven, TOV_IMAGE_FILTER_MULTIPLY, TOV_ERROR_INTERNAL_ERROR},
        {"srcColorSpace", {{"srcColorSpace", 0u}}, TOV_IMAGE_FILTER_COLOR_SPACE},
        {"dstColorSpace", {{"dstColorSpace", 5u}}, TOV_IMAGE_FILTER_COLOR_SPACE},
        {"positionsImg", {}, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, TOV_ERROR_INVALID_OPERATION},
        {"", {{"positionsImg", image}, {"outVarianceImg", tov_image{output_}}}, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION},
    };
    for (const auto& row : rows) {
        int32_t code = TOV_SUCCESS;
        EXPECT_THAT(printedBy([&] { code = codeOf(row.type, row.parameters); }), testing::HasSubstr(row.named));
        EXPECT_EQ(code, row.code) << row.type << " " << row.named;
    }
    EXPECT_EQ(codeOf(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}), TOV_SUCCESS) << "the device stays usable";
}

TEST_F(ExecutionChecks, ImagesOfEveryKindMustHoldThePixelsThatAreAddressed) {
    constexpr uint32_t kByte = TOV_COMPONENT_TYPE_UINT8;
    const Handle otherContext = newContext();
    const Handle small = newImage(noise(6, 5));
    const Handle bad[] = {
        newImage(noise(7, 4)),
        newImage(tov_image_desc{7, 5, 1, 3, 0, 4, kByte}),
        newImage(tov_image_desc{7, 5, 1, 0, 0, 4, 9}),
        newImage(tov_image_desc{7, 5, 1, 0, 0, 5, kByte}),
        newImage(tov_image_desc{0x40000000, 0x10000, 1, 0, 0, 4, kByte}),  // storage that the device refused
        newImage(picture_, otherContext),
    };
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    for (const tov_image image : bad) {
        const Parameters array = {{"inputs", std::vector<tov_image>{image}}, {"inputsNum", 1u}};
        const Parameters second = {{"positionsImg", tov_image{input_}}, {"outVarianceImg", image}};
        EXPECT_EQ(execute(filter, image, output_), TOV_ERROR_INVALID_OPERATION);
        EXPECT_EQ(execute(filter, input_, image), TOV_ERROR_INVALID_OPERATION);
        EXPECT_EQ(codeOf(TOV_IMAGE_FILTER_MULTIPLY, array), TOV_ERROR_INVALID_OPERATION);
        EXPECT_EQ(codeOf(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, second), TOV_ERROR_INVALID_OPERATION);
        for (const char* name : {"normalsImg", "depthImg", "transImg", "colorVar"})
            EXPECT_EQ(codeOf(TOV_IMAGE_FILTER_EAW_DENOISE, {{name, image}}), TOV_ERROR_INVALID_OPERATION) << name;
    }
    // What attachment refused stays bound, and is refused again.
    const Handle queue = newQueue();
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input_, output_), TOV_SUCCESS);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, small, output_), TOV_ERROR_INVALID_OPERATION);
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_ERROR_INVALID_OPERATION);
}

TEST_F(ExecutionChecks, AuxiliaryImagesMayBeLargerAndAreReadAtTheCoordinatesOfTheOutput) {
    const auto halves = [](uint32_t x, uint32_t) { return x < 3 ? Rgba{1, 0, 0, 1} : Rgba{0, 1, 0, 1}; };
    const Handle fitting = newImage(painted(7, 5, kFloat4, halves));
    const Handle larger = newImage(painted(11, 9, kFloat4, halves));
    for (const uint32_t type : {TOV_IMAGE_FILTER_EAW_DENOISE, TOV_IMAGE_FILTER_LWR_DENOISE, TOV_IMAGE_FILTER_MLAA})
        EXPECT_EQ(maxDifference(run(type, picture_, {{"normalsImg", tov_image{larger}}}),
                                run(type, picture_, {{"normalsImg", tov_image{fitting}}})),
                  0.0)
            << type;
}

TEST_F(ExecutionChecks, ZeroSizesAreRefusedAlsoThroughTheRectangles) {
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    const Handle queue = newQueue();
    for (const auto& [width, height] : {std::pair{0u, 5u}, std::pair{7u, 0u}}) {
        const Handle empty = newImage(tov_image_desc{width, height, 1, 8, 0, 4, TOV_COMPONENT_TYPE_FLOAT32});
        EXPECT_EQ(execute(filter, empty, empty), TOV_ERROR_INVALID_PARAMETER);
        tovCommandQueueAttachImageFilter(queue, filter, input_, output_);  // from the second time on only binds
        ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", width, height), TOV_SUCCESS);
        EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_ERROR_INVALID_PARAMETER);
    }
    const Handle test = newFilter(TOV_IMAGE_FILTER_MATH_TEST);
    const Handle small = newImage(Picture(19, 1, {1, TOV_COMPONENT_TYPE_UINT8}));
    EXPECT_EQ(execute(test, small, small), TOV_ERROR_INVALID_PARAMETER) << "it needs 20 bytes";
}

using LargerAuxiliaryImages = DeviceTest;

TEST_F(LargerAuxiliaryImages, AreReadAtTheCoordinatesOfTheOutput) {
    const auto halves = [](uint32_t x, uint32_t) { return x < 8 ? Rgba{1, 0, 0, 1} : Rgba{0, 1, 0, 1}; };
    const Handle fitting = newImage(painted(16, 9, kFloat4, halves));
    const Handle larger = newImage(painted(21, 13, kFloat4, halves));
    const Picture input = noise(16, 9);
    for (const uint32_t type : {TOV_IMAGE_FILTER_EAW_DENOISE, TOV_IMAGE_FILTER_LWR_DENOISE, TOV_IMAGE_FILTER_MLAA})
        EXPECT_EQ(maxDifference(run(type, input, {{"normalsImg", tov_image{larger}}}),
                                run(type, input, {{"normalsImg", tov_image{fitting}}})),
                  0.0)
            << type;
}

}  // namespace
}  // namespace apitest
