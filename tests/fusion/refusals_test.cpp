// What cannot be fused, and what a tree's objects must be when it runs.
#include <functional>

#include "trees.h"

namespace fusiontest {
namespace {

class FusionRefusals : public FusionTest {
 protected:
    // Code of a run of outer on what inner computes, with everything the types need set.
    static int32_t codeOf(uint32_t outerType, const Parameters& outerParameters, uint32_t innerType,
                          const Parameters& innerParameters) {
        const Handle image = newImage(Picture(16, 16));
        const Handle result = newImage(Picture(16, 16));
        const Handle inner = newFilter(innerType, innerParameters);
        const Handle outer = newFilter(outerType, outerParameters);
        EXPECT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", image), TOV_SUCCESS);
        return execute(outer, inner, result);
    }
};

TEST_F(FusionRefusals, NameFiltersWithSeveralPassesMemoryOrWindows) {
    const struct {
        uint32_t type;
        Parameters parameters;
    } whole[] = {
        {TOV_IMAGE_FILTER_MATH_TEST, {}},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"sigma", 1.0f}}},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, {}},
        {TOV_IMAGE_FILTER_LWR_DENOISE, {}},
        {TOV_IMAGE_FILTER_EAW_DENOISE, {}},
        {TOV_IMAGE_FILTER_MLAA, {}},
        {TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, {}},
    };
    for (const auto& [type, parameters] : whole) {
        int32_t outerCode = 0;
        int32_t innerCode = 0;
        const std::string printed = printedBy([&] {
            outerCode = codeOf(type, parameters, TOV_IMAGE_FILTER_LINEAR_TONEMAP, {});
            innerCode = codeOf(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, type, parameters);
        });
        EXPECT_EQ(outerCode, TOV_ERROR_UNSUPPORTED) << type;
        EXPECT_EQ(innerCode, TOV_ERROR_UNSUPPORTED) << type;
        EXPECT_NE(printed.find("Cannot fuse filters: "), std::string::npos) << type;
        EXPECT_EQ(printed.find("Cached file"), std::string::npos) << "nothing may be built, type " << type;
    }
}

TEST_F(FusionRefusals, EndWhenTheFilterIsReplacedByAnImage) {
    const Picture picture = noise(16, 16);
    const Handle image = newImage(picture);
    const Handle result = newImage(picture);
    const Handle linear = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    ASSERT_EQ(tovImageFilterSetParameterImage(linear, "srcBuffer", image), TOV_SUCCESS);
    const Handle blur = newFilter(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"sigma", 1.0f}});
    EXPECT_EQ(execute(blur, linear, result), TOV_ERROR_UNSUPPORTED);
    EXPECT_EQ(execute(blur, image, result), TOV_SUCCESS);
    EXPECT_EQ(maxDifference(read(result, picture), run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, picture, {{"sigma", 1.0f}})), 0);
}

TEST_F(FusionRefusals, CoverCircles) {
    const Handle image = newImage(Picture(16, 16));
    const Handle result = newImage(Picture(16, 16));
    const Handle a = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    const Handle b = newFilter(TOV_IMAGE_FILTER_NORMALIZATION);
    EXPECT_EQ(tovImageFilterSetParameterImage(a, "srcBuffer", a), TOV_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(tovImageFilterSetParameterImage(b, "srcBuffer", a), TOV_SUCCESS);
    EXPECT_EQ(tovImageFilterSetParameterImage(a, "srcBuffer", b), TOV_ERROR_INVALID_PARAMETER);

    // The array is the caller's: a circle may arise after it was set.
    const Handle product = newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", uint32_t{1}}});
    std::vector<tov_image> inputs = {image};
    ASSERT_EQ(tovImageFilterSetParameterImageArray(product, "inputs", inputs.data(), 1), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImage(a, "srcBuffer", product), TOV_SUCCESS);
    inputs[0] = a;
    EXPECT_EQ(execute(product, image, result), TOV_ERROR_UNSUPPORTED);
}

TEST_F(FusionRefusals, CoverTreesOfMoreThan256PassesOr64Arguments) {
    const Handle image = newImage(Picture(16, 16));
    const Handle result = newImage(Picture(16, 16));
    std::vector<Handle> filters;
    std::vector<std::vector<tov_image>> arrays;
    tov_image source = image;
    for (int depth = 0; depth < 9; ++depth) {  // 2^9 - 1 passes
        arrays.push_back({source, source});
        filters.push_back(newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", uint32_t{2}}}));
        source = filters.back();
        ASSERT_EQ(tovImageFilterSetParameterImage(source, "srcBuffer", image), TOV_SUCCESS);
        ASSERT_EQ(tovImageFilterSetParameterImageArray(source, "inputs", arrays.back().data(), 2), TOV_SUCCESS);
    }
    EXPECT_EQ(execute(filters[8], image, result), TOV_ERROR_UNSUPPORTED);
    EXPECT_EQ(execute(filters[5], image, result), TOV_ERROR_UNSUPPORTED) << "63 passes, but 95 arguments";
    EXPECT_EQ(execute(filters[3], image, result), TOV_SUCCESS);
}

TEST_F(FusionRefusals, GiveTheCodeOfWhatIsDeletedOrDoesNotFit) {
    const Handle result = newImage(Picture(16, 16));
    const struct {
        const char* what;
        std::function<void(Handle& inner, Handle& image)> spoil;
        int32_t code;
    } cases[] = {
        {"nothing", [](Handle&, Handle&) {}, TOV_SUCCESS},
        {"the inner filter is deleted", [](Handle& inner, Handle&) { inner.remove(); }, TOV_ERROR_INVALID_FILTER},
        {"the inner image is deleted", [](Handle&, Handle& image) { image.remove(); }, TOV_ERROR_INVALID_IMAGE},
        {"the inner image is too small",
         [](Handle& inner, Handle& image) {
             image = newImage(Picture(15, 16));
             tovImageFilterSetParameterImage(inner, "srcBuffer", image);
         },
         TOV_ERROR_INVALID_OPERATION},
        {"an inner value is not finite",
         [](Handle& inner, Handle&) { tovImageFilterSetParameter1f(inner, "cKey", 1e38f * 10); },
         TOV_ERROR_INVALID_PARAMETER},
    };
    for (const auto& [what, spoil, code] : cases) {
        Handle image = newImage(Picture(16, 16));
        Handle inner = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
        const Handle outer = newFilter(TOV_IMAGE_FILTER_NORMALIZATION);
        const Handle queue = newQueue();
        ASSERT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", image), TOV_SUCCESS);
        ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, outer, inner, result), TOV_SUCCESS);
        spoil(inner, image);
        EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), code) << what;
    }
}

TEST_F(FusionRefusals, AskForTheSizeOfAResamplingFilterThatFeedsAnother) {
    const Handle image = newImage(Picture(16, 16));
    const Handle result = newImage(Picture(8, 8));
    const Handle inner = newFilter(TOV_IMAGE_FILTER_RESAMPLE);
    const Handle outer = newFilter(TOV_IMAGE_FILTER_RESAMPLE);
    ASSERT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", image), TOV_SUCCESS);
    EXPECT_EQ(execute(outer, inner, result), TOV_ERROR_UNSUPPORTED);
    ASSERT_EQ(tovImageFilterSetParameter2u(inner, "dstRec", 12, 12), TOV_SUCCESS);
    EXPECT_EQ(execute(outer, inner, result), TOV_SUCCESS);
}

}  // namespace
}  // namespace fusiontest
