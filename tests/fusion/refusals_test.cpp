// What cannot be fused, and what a tree's objects must be when it runs.
#include <cmath>

#include "fixture.h"

namespace apitest {
namespace {

class FusionRefusals : public DeviceTest {
 protected:
    const Picture picture_ = noise(16, 16);
    const Handle handle_ = newImage(picture_);
    const Handle result_ = newImage(picture_);
    const tov_image image_ = handle_;
};

TEST_F(FusionRefusals, CoverFiltersWithSeveralPassesMemoryOrWindowsBeforeAnythingIsBuilt) {
    for (const uint32_t type :
         {TOV_IMAGE_FILTER_MATH_TEST, TOV_IMAGE_FILTER_GAUSSIAN_BLUR, TOV_IMAGE_FILTER_BILATERAL_DENOISE,
          TOV_IMAGE_FILTER_LWR_DENOISE, TOV_IMAGE_FILTER_EAW_DENOISE, TOV_IMAGE_FILTER_MLAA,
          TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION}) {
        const Handle whole = newFilter(type, {{"srcBuffer", image_}});
        tovImageFilterSetParameter1f(whole, "sigma", 1.0f);  // which the blur alone has
        const Handle single = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"srcBuffer", image_}});
        const std::string printed = printedBy([&] {
            EXPECT_EQ(execute(whole, single, result_), TOV_ERROR_UNSUPPORTED) << type;
            ASSERT_EQ(setParameter(whole, {"srcBuffer", image_}), TOV_SUCCESS);
            EXPECT_EQ(execute(single, whole, result_), TOV_ERROR_UNSUPPORTED) << type;
        });
        EXPECT_EQ(printed.find("Cached file"), std::string::npos) << type;
    }
}

TEST_F(FusionRefusals, EndWhenTheFilterIsReplacedByAnImage) {
    const Parameters parameters = {{"sigma", 1.0f}};
    const Handle linear = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"srcBuffer", image_}});
    const Handle blur = newFilter(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, parameters);
    EXPECT_EQ(execute(blur, linear, result_), TOV_ERROR_UNSUPPORTED);
    EXPECT_EQ(execute(blur, image_, result_), TOV_SUCCESS);
    EXPECT_EQ(maxDifference(read(result_, picture_), run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, picture_, parameters)), 0);
}

TEST_F(FusionRefusals, CoverACircleThatArisesInTheCallersArray) {
    tov_image input = image_;
    const Handle product = newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", 1u}});
    ASSERT_EQ(tovImageFilterSetParameterImageArray(product, "inputs", &input, 1), TOV_SUCCESS);
    const Handle linear = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"srcBuffer", tov_image{product}}});
    input = linear;
    EXPECT_EQ(execute(product, image_, result_), TOV_ERROR_UNSUPPORTED);
}

TEST_F(FusionRefusals, CoverTreesOfMoreThan256PassesOr64Arguments) {
    std::vector<Handle> filters;
    std::vector<std::vector<tov_image>> arrays;
    tov_image source = image_;
    for (int depth = 0; depth < 9; ++depth) {  // 2^9 - 1 passes
        arrays.push_back({source, source});
        source = filters.emplace_back(newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", 2u}, {"srcBuffer", image_}}));
        ASSERT_EQ(tovImageFilterSetParameterImageArray(source, "inputs", arrays.back().data(), 2), TOV_SUCCESS);
    }
    EXPECT_EQ(execute(filters[8], image_, result_), TOV_ERROR_UNSUPPORTED);
    EXPECT_EQ(execute(filters[5], image_, result_), TOV_ERROR_UNSUPPORTED) << "63 passes, but 95 arguments";
    EXPECT_EQ(execute(filters[3], image_, result_), TOV_SUCCESS);
}

TEST_F(FusionRefusals, GiveTheCodeOfWhatIsNotFiniteDoesNotFitOrIsDeletedInside) {
    Handle small = newImage(Picture(15, 16));
    Handle inner = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"srcBuffer", image_}});
    const Handle outer = newFilter(TOV_IMAGE_FILTER_NORMALIZATION);
    const Handle queue = newQueue();
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, outer, inner, result_), TOV_SUCCESS);
    const auto code = [&] { return tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr); };
    EXPECT_EQ(code(), TOV_SUCCESS);
    tovImageFilterSetParameter1f(inner, "cKey", HUGE_VALF);
    EXPECT_EQ(code(), TOV_ERROR_INVALID_PARAMETER);
    tovImageFilterSetParameter1f(inner, "cKey", 1.0f);
    tovImageFilterSetParameterImage(inner, "srcBuffer", small);
    EXPECT_EQ(code(), TOV_ERROR_INVALID_OPERATION);
    small.remove();
    EXPECT_EQ(code(), TOV_ERROR_INVALID_IMAGE);
    inner.remove();
    EXPECT_EQ(code(), TOV_ERROR_INVALID_FILTER);
}

TEST_F(FusionRefusals, AskForTheSizeOfAResamplingFilterThatFeedsAnother) {
    const Handle inner = newFilter(TOV_IMAGE_FILTER_RESAMPLE, {{"srcBuffer", image_}});
    const Handle outer = newFilter(TOV_IMAGE_FILTER_RESAMPLE);
    const Handle smaller = newImage(Picture(8, 8));
    EXPECT_EQ(execute(outer, inner, smaller), TOV_ERROR_UNSUPPORTED);
    ASSERT_EQ(tovImageFilterSetParameter2u(inner, "dstRec", 12, 12), TOV_SUCCESS);
    EXPECT_EQ(execute(outer, inner, smaller), TOV_SUCCESS);
}

}  // namespace
}  // namespace apitest
