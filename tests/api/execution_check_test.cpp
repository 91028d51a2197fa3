// What is refused when a filter runs: values, array counts, sizes and images. Nothing is launched then.
#include <gmock/gmock.h>

#include <cmath>
#include <limits>

#include "fixture.h"

namespace apitest {
namespace {

using testing::HasSubstr;

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
constexpr float kInf = std::numeric_limits<float>::infinity();

struct Refusal {
    int32_t code = TOV_SUCCESS;
    std::string printed;
};

class ExecutionChecks : public DeviceTest {
 protected:
    const Picture picture_ = noise(7, 5);
    Handle input_ = newImage(picture_);
    Handle output_ = newImage(picture_);

    Refusal attempt(tov_image_filter filter, tov_image input, tov_image output) {
        Refusal refusal;
        refusal.printed = printedBy([&] { refusal.code = execute(filter, input, output); });
        return refusal;
    }
    Refusal attempt(uint32_t type, const Parameters& parameters) {
        return attempt(newFilter(type, parameters), input_, output_);
    }
    void TearDown() override {
        EXPECT_EQ(maxDifference(read(output_, picture_), picture_), 0.0) << "a refused run wrote pixels";
    }
};

TEST_F(ExecutionChecks, ValuesThatNoPixelCanBeComputedWithAreNamed) {
    struct Row {
        uint32_t type;
        Parameters parameters;
        const char* named;
    };
    const tov_image image = input_;
    const std::vector<tov_image> images = {image};
    const Row rows[] = {
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 0.0f}}, "cGamma"},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", -0.0f}}, "cGamma"},
        {TOV_IMAGE_FILTER_DRAGO_TONEMAP, {}, "avLum"},  // its default is 0
        {TOV_IMAGE_FILTER_DRAGO_TONEMAP, {{"avLum", 1.0f}, {"maxLum", 0.0f}}, "maxLum"},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {}, "sigma"},                   // its default is 0
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"sigma", 1e-30f}}, "sigma"},  // whose square is 0
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"sigma", 1.0f}, {"radius", 4097u}}, "4096"},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"sigma", 1.0f}, {"radius", 0xffffffffu}}, "radius"},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE,
         {{"inputs", images}, {"sigmas", std::vector<float>{0.0f}}, {"inputsNum", 1u}},
         "sigmas"},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE,
         {{"inputs", images}, {"sigmas", std::vector<float>{kNan}}, {"inputsNum", 1u}},
         "sigmas"},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, {{"radius", 257u}}, "256"},
        {TOV_IMAGE_FILTER_LWR_DENOISE, {{"bandwidth", 0.0f}}, "bandwidth"},
        {TOV_IMAGE_FILTER_EAW_DENOISE, {{"colorSigma", 0.0f}}, "colorSigma"},
        {TOV_IMAGE_FILTER_EAW_DENOISE, {{"normalSigma", 0.0f}}, "normalSigma"},
        {TOV_IMAGE_FILTER_EAW_DENOISE, {{"depthSigma", 0.0f}}, "depthSigma"},
        {TOV_IMAGE_FILTER_EAW_DENOISE, {{"transSigma", 0.0f}}, "transSigma"},
        {TOV_IMAGE_FILTER_WEIGHTED_SUM,
         {{"inputs", images}, {"weights", std::vector<float>{kInf}}, {"inputsNum", 1u}},
         "weights"},
        {TOV_IMAGE_FILTER_COLOR_SPACE, {{"srcColorSpace", 0u}}, "srcColorSpace"},
        {TOV_IMAGE_FILTER_COLOR_SPACE, {{"srcColorSpace", 5u}}, "srcColorSpace"},
        {TOV_IMAGE_FILTER_COLOR_SPACE, {{"dstColorSpace", 0xffffffffu}}, "dstColorSpace"},
    };
    for (const Row& row : rows) {
        const Refusal refusal = attempt(row.type, row.parameters);
        EXPECT_EQ(refusal.code, TOV_ERROR_INVALID_PARAMETER) << "type " << row.type << ", " << row.named;
        EXPECT_THAT(refusal.printed, HasSubstr(row.named)) << "type " << row.type;
    }
}

TEST_F(ExecutionChecks, NoFilterRunsWithAFloatThatIsNotFinite) {
    for (uint32_t type = 0; type <= TOV_IMAGE_FILTER_SHADOW_CATCHER; ++type) {
        const Handle filter = newFilter(type);
        uint32_t count = 0;
        uint64_t written = 0;
        ASSERT_EQ(tovImageFilterGetInfo(filter, TOV_IMAGE_FILTER_PARAMETER_COUNT, 4, &count, &written), TOV_SUCCESS);
        for (uint32_t i = 0; i < count; ++i) {
            const char* name = nullptr;
            uint32_t parameterType = 0;
            tovParameterGetInfo(filter, i, TOV_PARAMETER_NAME, 8, &name, &written);
            tovParameterGetInfo(filter, i, TOV_PARAMETER_TYPE, 4, &parameterType, &written);
            for (const float value : {kNan, kInf, -kInf}) {
                Parameter parameter = {name, value};
                if (parameterType == TOV_PARAMETER_TYPE_FLOAT16) {
                    Matrix matrix{};
                    matrix[13] = value;
                    parameter.value = matrix;
                } else if (parameterType != TOV_PARAMETER_TYPE_FLOAT1) {
                    continue;
                }
                const Refusal refusal = attempt(type, {parameter});
                EXPECT_EQ(refusal.code, TOV_ERROR_INVALID_PARAMETER) << "type " << type << ", " << name;
                EXPECT_THAT(refusal.printed, HasSubstr(name)) << "type " << type;
            }
        }
    }
}

TEST_F(ExecutionChecks, ArrayCountsMustMatchInputsNum) {
    const tov_image image = input_;
    const std::vector<tov_image> two = {image, image};
    const std::vector<float> weights = {1, 1};
    const std::vector<float> oneWeight = {1};
    struct Row {
        uint32_t type;
        Parameters parameters;
    };
    const Row rows[] = {
        {TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", 1u}}},
        {TOV_IMAGE_FILTER_MULTIPLY, {{"inputs", two}, {"inputsNum", 1u}}},
        {TOV_IMAGE_FILTER_MULTIPLY, {{"inputs", two}, {"inputsNum", 3u}}},
        {TOV_IMAGE_FILTER_MULTIPLY, {{"inputs", two}, {"inputsNum", 0xffffffffu}}},
        {TOV_IMAGE_FILTER_WEIGHTED_SUM, {{"inputs", two}, {"weights", oneWeight}, {"inputsNum", 2u}}},
        {TOV_IMAGE_FILTER_WEIGHTED_SUM, {{"inputs", two}, {"weights", weights}, {"inputsNum", 1u}}},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, {{"inputs", two}, {"sigmas", oneWeight}, {"inputsNum", 2u}}},
    };
    for (const Row& row : rows) {
        const Refusal refusal = attempt(row.type, row.parameters);
        EXPECT_EQ(refusal.code, TOV_ERROR_INVALID_PARAMETER) << "type " << row.type;
        EXPECT_THAT(refusal.printed, HasSubstr("inputsNum")) << "type " << row.type;
    }
}

TEST_F(ExecutionChecks, ImagesOfEveryKindMustHoldThePixelsThatAreAddressed) {
    const Handle small = newImage(noise(6, 5));
    const Handle low = newImage(noise(7, 4));
    tov_image_desc narrowPitch = picture_.desc();
    narrowPitch.image_row_pitch = 3;
    const Handle shortStorage = newImage(narrowPitch);
    const Handle unknownType = newImage(tov_image_desc{7, 5, 1, 0, 0, 4, 9});
    const Handle fiveComponents = newImage(tov_image_desc{7, 5, 1, 0, 0, 5, TOV_COMPONENT_TYPE_UINT8});
    const Handle noComponents = newImage(tov_image_desc{7, 5, 1, 0, 0, 0, TOV_COMPONENT_TYPE_UINT8});
    const Handle otherContext = newContext();
    const Handle foreign = newImage(picture_, otherContext);
    for (const Handle* bad : {&small, &low, &shortStorage, &unknownType, &fiveComponents, &noComponents, &foreign}) {
        const tov_image image = *bad;
        const auto what = testing::Message() << "image " << (bad - &small);
        const Parameters element = {{"inputs", std::vector<tov_image>{image}}, {"inputsNum", 1u}};
        EXPECT_EQ(attempt(TOV_IMAGE_FILTER_MULTIPLY, element).code, TOV_ERROR_INVALID_OPERATION) << what;
        for (const char* name : {"normalsImg", "depthImg", "transImg", "colorVar"})
            EXPECT_EQ(attempt(TOV_IMAGE_FILTER_EAW_DENOISE, {{name, image}}).code, TOV_ERROR_INVALID_OPERATION)
                << name << ", " << what;
        const Parameters variance = {{"positionsImg", tov_image{input_}}, {"outVarianceImg", image}};
        EXPECT_EQ(attempt(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, variance).code, TOV_ERROR_INVALID_OPERATION) << what;
        const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
        EXPECT_EQ(attempt(filter, image, output_).code, TOV_ERROR_INVALID_OPERATION) << what;
        EXPECT_EQ(attempt(filter, input_, image).code, TOV_ERROR_INVALID_OPERATION) << what;
    }
}

TEST_F(ExecutionChecks, ARequiredImageThatIsMissingIsRefused) {
    const Refusal refusal = attempt(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, {});
    EXPECT_EQ(refusal.code, TOV_ERROR_INVALID_OPERATION);
    EXPECT_THAT(refusal.printed, HasSubstr("positionsImg"));
}

TEST_F(ExecutionChecks, StorageThatTheDeviceRefusedIsNotRunOn) {
    const tov_image_desc huge = {0x40000000, 0x10000, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    const Handle image = newImage(huge);
    const Handle imageToo = newImage(huge);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    EXPECT_EQ(attempt(filter, image, imageToo).code, TOV_ERROR_INVALID_OPERATION);
}

TEST_F(ExecutionChecks, ZeroSizesAreRefusedAlsoThroughTheRectangles) {
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    for (const tov_image_desc& desc : {tov_image_desc{0, 5, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32},
                                       tov_image_desc{7, 0, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32},
                                       tov_image_desc{0, 2, 1, 8, 0, 4, TOV_COMPONENT_TYPE_FLOAT32}}) {
        const Handle empty = newImage(desc);
        const Handle emptyToo = newImage(desc);
        EXPECT_EQ(attempt(filter, empty, emptyToo).code, TOV_ERROR_INVALID_PARAMETER);
    }
    const Handle queue = newQueue();
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input_, output_), TOV_SUCCESS);
    for (const auto& [width, height] : {std::pair{0u, 5u}, std::pair{7u, 0u}}) {
        ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", width, height), TOV_SUCCESS);
        EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_ERROR_INVALID_PARAMETER);
    }
}

TEST_F(ExecutionChecks, AFailedAttachmentLeavesBindingsThatAreCheckedAgain) {
    const Handle small = newImage(noise(3, 3));
    const Handle filter = newFilter(TOV_IMAGE_FILTER_SOBEL);
    const Handle queue = newQueue();
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input_, output_), TOV_SUCCESS);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, small, output_), TOV_ERROR_INVALID_OPERATION);
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_ERROR_INVALID_OPERATION);
    ASSERT_EQ(tovImageFilterSetParameterImage(filter, "srcBuffer", output_), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImage(filter, "dstBuffer", small), TOV_SUCCESS);
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS)
        << "an input that covers the output is enough";
}

TEST_F(ExecutionChecks, TwoOutputsOnOneImageAreRefused) {
    const Parameters parameters = {{"positionsImg", tov_image{input_}}, {"outVarianceImg", tov_image{output_}}};
    EXPECT_EQ(attempt(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, parameters).code, TOV_ERROR_INVALID_PARAMETER);
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
