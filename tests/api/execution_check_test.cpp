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
    const Handle queue_ = newQueue();

    void TearDown() override {
        EXPECT_EQ(maxDifference(read(output_, picture_), picture_), 0.0) << "a refused run wrote pixels";
    }
    int32_t codeOf(uint32_t type, const Parameters& parameters) {
        return execute(newFilter(type, parameters), input_, output_);
    }
    int32_t executeQueue() { return tovContextExecuteCommandQueue(context(), queue_, nullptr, nullptr); }
};

TEST_F(ExecutionChecks, ValuesWithWhichNoPixelCanBeComputedAreNamed) {
    using Images = std::vector<tov_image>;
    const tov_image image = input_;
    const Parameter two = {"inputs", Images{image, image}};
    const Parameter zeros = {"sigmas", std::vector<float>{1, 0}};
    const Parameter infinite = {"weights", std::vector<float>{1, HUGE_VALF}};
    const struct {
        uint32_t type;
        const char* named;
        Parameters parameters;
        int32_t code = TOV_ERROR_INVALID_PARAMETER;
    } rows[] = {
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, "cGamma", {{"cGamma", -0.0f}}},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, "cGamma", {{"cGamma", std::nanf("")}}},
        {TOV_IMAGE_FILTER_MOTION_BUFFER, "viewProjMatrix", {{"viewProjMatrix", Matrix{0, 0, HUGE_VALF}}}},
        {TOV_IMAGE_FILTER_DRAGO_TONEMAP, "avLum", {}},  // its default is 0
        {TOV_IMAGE_FILTER_DRAGO_TONEMAP, "maxLum", {{"avLum", 1.0f}, {"maxLum", 0.0f}}},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, "sigma", {{"sigma", 1e-30f}}},  // whose square is 0
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, "4096", {{"sigma", 1.0f}, {"radius", 4097u}}},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, "256", {{"radius", 257u}}},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, "sigmas", {two, {"inputsNum", 2u}, zeros}},
        {TOV_IMAGE_FILTER_EAW_DENOISE, "transSigma", {{"transSigma", 0.0f}}},
        {TOV_IMAGE_FILTER_WEIGHTED_SUM, "weights", {two, {"inputsNum", 2u}, infinite}},
        {TOV_IMAGE_FILTER_WEIGHTED_SUM, "inputs", {two, {"inputsNum", 1u}}},
        {TOV_IMAGE_FILTER_MULTIPLY, "inputsNum", {two, {"inputsNum", UINT32_MAX}}},
        {TOV_IMAGE_FILTER_MULTIPLY, "", {{"inputs", Images(7, image)}, {"inputsNum", 7u}}, TOV_ERROR_INTERNAL_ERROR},
        {TOV_IMAGE_FILTER_COLOR_SPACE, "srcColorSpace", {{"srcColorSpace", 0u}}},
        {TOV_IMAGE_FILTER_COLOR_SPACE, "dstColorSpace", {{"dstColorSpace", 5u}}},
        {TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, "positionsImg", {}, TOV_ERROR_INVALID_OPERATION},
        {TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, "", {{"positionsImg", image}, {"outVarianceImg", tov_image{output_}}}},
    };
    for (const auto& row : rows) {
        int32_t code = TOV_SUCCESS;
        EXPECT_THAT(printedBy([&] { code = codeOf(row.type, row.parameters); }), testing::HasSubstr(row.named));
        EXPECT_EQ(code, row.code) << row.type << " " << row.named;
    }
}

TEST_F(ExecutionChecks, ImagesOfEveryKindMustHoldThePixelsThatAreAddressed) {
    const Handle otherContext = newContext();
    const Handle bad[] = {
        newImage(noise(7, 4)),
        newImage(tov_image_desc{7, 5, 1, 3, 0, 4, TOV_COMPONENT_TYPE_UINT8}),
        newImage(tov_image_desc{7, 5, 1, 0, 0, 4, 9}),
        newImage(tov_image_desc{7, 5, 1, 0, 0, 5, TOV_COMPONENT_TYPE_UINT8}),
        newImage(tov_image_desc{0x40000000, 0x10000, 1, 0, 0, 4, 0}),  // storage that the device refused
        newImage(picture_, otherContext),
    };
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue_, filter, input_, output_), TOV_SUCCESS);
    for (const tov_image image : bad) {
        const Parameters array = {{"inputs", std::vector<tov_image>{image}}, {"inputsNum", 1u}};
        const Parameters second = {{"positionsImg", tov_image{input_}}, {"outVarianceImg", image}};
        EXPECT_EQ(execute(filter, input_, image), TOV_ERROR_INVALID_OPERATION);
        EXPECT_EQ(execute(filter, image, output_), TOV_ERROR_INVALID_OPERATION);
        EXPECT_EQ(executeQueue(), TOV_ERROR_INVALID_OPERATION) << "what attachment refused stays bound";
        EXPECT_EQ(codeOf(TOV_IMAGE_FILTER_MULTIPLY, array), TOV_ERROR_INVALID_OPERATION);
        EXPECT_EQ(codeOf(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, second), TOV_ERROR_INVALID_OPERATION);
        for (const char* name : {"normalsImg", "depthImg", "transImg", "colorVar"})
            EXPECT_EQ(codeOf(TOV_IMAGE_FILTER_EAW_DENOISE, {{name, image}}), TOV_ERROR_INVALID_OPERATION) << name;
    }
}

TEST_F(ExecutionChecks, AuxiliaryImagesMayBeLargerAndAreReadAtTheCoordinatesOfTheOutput) {
    const auto halves = [](uint32_t x, uint32_t) { return x < 3 ? Rgba{1, 0, 0, 1} : Rgba{0, 1, 0, 1}; };
    const Handle fitting = newImage(painted(7, 5, kFloat4, halves));
    const Handle larger = newImage(painted(11, 9, kFloat4, halves));
    for (const uint32_t type : {TOV_IMAGE_FILTER_EAW_DENOISE, TOV_IMAGE_FILTER_LWR_DENOISE, TOV_IMAGE_FILTER_MLAA}) {
        const Picture expected = run(type, picture_, {{"normalsImg", tov_image{fitting}}});
        EXPECT_EQ(maxDifference(run(type, picture_, {{"normalsImg", tov_image{larger}}}), expected), 0.0) << type;
    }
}

TEST_F(ExecutionChecks, ZeroSizesAreRefusedAlsoThroughTheRectangles) {
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    for (const auto& [width, height] : {std::pair{0u, 5u}, std::pair{7u, 0u}}) {
        const Handle empty = newImage(tov_image_desc{width, height, 1, 8, 0, 4, TOV_COMPONENT_TYPE_FLOAT32});
        EXPECT_EQ(execute(filter, empty, empty), TOV_ERROR_INVALID_PARAMETER);
        tovCommandQueueAttachImageFilter(queue_, filter, input_, output_);  // from the second time on only binds
        ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", width, height), TOV_SUCCESS);
        EXPECT_EQ(executeQueue(), TOV_ERROR_INVALID_PARAMETER);
    }
    // The width of 0 is hidden from the sizes of the filter that reads it, and its pitch gives it storage.
    const Handle empty = newImage(tov_image_desc{0, 4, 1, 8, 0, 4, TOV_COMPONENT_TYPE_FLOAT32});
    const Handle inner = newFilter(TOV_IMAGE_FILTER_RESAMPLE, {{"srcBuffer", tov_image{empty}}});
    ASSERT_EQ(tovImageFilterSetParameter2u(inner, "srcRec", 1000000000, 4), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImage(filter, "srcBuffer", inner), TOV_SUCCESS);
    EXPECT_EQ(executeQueue(), TOV_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(tovCommandQueueDetachImageFilter(queue_, filter), TOV_SUCCESS);
    const Handle blur = newFilter(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"sigma", 1.0f}});
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue_, blur, input_, output_), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(blur, "dstRec", 7, 4), TOV_SUCCESS);
    EXPECT_EQ(executeQueue(), TOV_ERROR_INVALID_PARAMETER) << "its second pass reads what the first left out";
    const Handle small = newImage(Picture(19, 1, {1, TOV_COMPONENT_TYPE_UINT8}));
    EXPECT_EQ(execute(newFilter(TOV_IMAGE_FILTER_MATH_TEST), small, small), TOV_ERROR_INVALID_PARAMETER) << "20 bytes";
}

}  // namespace
}  // namespace apitest
