// A fused picture is the picture of the same filters run one after another.
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "trees.h"

namespace fusiontest {
namespace {

namespace fs = std::filesystem;

// A fused build lacks the relaxed arithmetic of single kernels, which changes the last bits; the filters' own slopes
// (the gamma of a dark pixel, a quotient of small numbers) enlarge them.
constexpr double kTolerance = 2e-5;

// Values away from 0, so that no quotient blows rounding up.
Picture testPicture(uint32_t width = 21, uint32_t height = 13, Layout layout = kFloat4) {
    return mapped(noise(width, height, layout), layout, [](const Rgba& pixel) {
        Rgba result;
        for (size_t i = 0; i < 4; ++i) result[i] = 0.2 + 0.7 * pixel[i];
        return result;
    });
}

std::string namesOf(const std::vector<uint32_t>& types) {
    std::string names;
    for (const uint32_t type : types) names += std::string(names.empty() ? "" : " -> ") + fusable(type).name;
    return names;
}

class FusedPictures : public FusionTest {
 protected:
    static void expectEqual(const std::vector<uint32_t>& types, Layout input = kFloat4, Layout output = kFloat4) {
        SCOPED_TRACE(namesOf(types));
        const Picture picture = testPicture(21, 13, input);
        const Picture expected = runOneByOne(types, picture, output);
        const Picture fused = runFused(types, picture, output);
        // An 8-bit result may round to the neighbouring byte where the two differ by a hair at a half.
        const double tolerance = output.type == TOV_COMPONENT_TYPE_UINT8 ? 1.0 : kTolerance;
        EXPECT_LE(maxRelativeDifference(fused, expected), tolerance);
    }
};

TEST_F(FusedPictures, OfEveryPairEqualThoseOfTheTwoFilters) {
    for (const Fusable& inner : fusableFilters())
        for (const Fusable& outer : fusableFilters()) expectEqual({inner.type, outer.type});
}

TEST_F(FusedPictures, OfTriplesEqualThoseOfTheThreeFiltersInSeveralLayouts) {
    const std::vector<Fusable>& all = fusableFilters();
    const std::vector<std::pair<Layout, Layout>> layouts = {
        {{4, TOV_COMPONENT_TYPE_UINT8}, {4, TOV_COMPONENT_TYPE_FLOAT32}},
        {{3, TOV_COMPONENT_TYPE_FLOAT16}, {3, TOV_COMPONENT_TYPE_FLOAT32}},
        {{1, TOV_COMPONENT_TYPE_FLOAT32}, {4, TOV_COMPONENT_TYPE_UINT8}},
    };
    // Every filter once in every place, with neighbours that differ from row to row.
    for (size_t i = 0; i < all.size(); ++i) {
        const size_t n = all.size();
        const auto& [input, output] = layouts[i % layouts.size()];
        expectEqual({all[i].type, all[(i + 5) % n].type, all[(i + 9) % n].type}, input, output);
    }
}

TEST_F(FusedPictures, OfALongChainEqualThoseOfItsFilters) {
    expectEqual({TOV_IMAGE_FILTER_LINEAR_TONEMAP, TOV_IMAGE_FILTER_COLOR_SPACE, TOV_IMAGE_FILTER_REINHARD_TONEMAP,
                 TOV_IMAGE_FILTER_MULTIPLY, TOV_IMAGE_FILTER_GAMMA_CORRECTION, TOV_IMAGE_FILTER_SOBEL,
                 TOV_IMAGE_FILTER_WEIGHTED_SUM, TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP});
}

TEST_F(FusedPictures, OfArraysMixFiltersImagesAndAbsentOnes) {
    const Picture picture = testPicture();
    const Handle image = newImage(picture);
    const Handle result = newImage(Picture(21, 13));
    const Handle twice = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 2.0f}});
    const Handle thrice = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 3.0f}});
    for (tov_image_filter filter : {tov_object{twice}, tov_object{thrice}})
        ASSERT_EQ(tovImageFilterSetParameterImage(filter, "srcBuffer", image), TOV_SUCCESS);
    std::vector<tov_image> inputs = {twice, image, nullptr, thrice};
    const std::vector<float> weights = {1.0f, 0.5f, 100.0f, 0.25f};
    const Handle sum = newFilter(TOV_IMAGE_FILTER_WEIGHTED_SUM, {{"weights", weights}, {"inputsNum", uint32_t{4}}});
    ASSERT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", inputs.data(), 4), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterFloatArray(sum, "weights", weights.data(), 4), TOV_SUCCESS);
    ASSERT_EQ(execute(sum, image, result), TOV_SUCCESS);
    const Picture expected = mapped(picture, kFloat4, [](const Rgba& p) {
        Rgba pixel;
        for (size_t i = 0; i < 3; ++i) pixel[i] = p[i] * (2.0 + 0.5 + 0.75);
        pixel[3] = p[3] * 1.75;  // alpha is not scaled by the linear filters
        return pixel;
    });
    EXPECT_LE(maxRelativeDifference(read(result, Picture(21, 13)), expected), kTolerance);
}

TEST_F(FusedPictures, OfAProductOfTwoProductsTellTheirKernelsApart) {
    const Picture picture = testPicture();
    const Handle image = newImage(picture);
    const Handle result = newImage(Picture(21, 13));
    const Handle linear = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 0.5f}});
    ASSERT_EQ(tovImageFilterSetParameterImage(linear, "srcBuffer", image), TOV_SUCCESS);
    std::vector<tov_image> left = {linear, image};
    std::vector<tov_image> right = {image, linear};
    const Handle first = newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", uint32_t{2}}});
    const Handle second = newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", uint32_t{2}}});
    std::vector<tov_image> both = {first, second};
    const Handle product = newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", uint32_t{2}}});
    for (tov_image_filter filter : {tov_object{first}, tov_object{second}})
        ASSERT_EQ(tovImageFilterSetParameterImage(filter, "srcBuffer", image), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImageArray(first, "inputs", left.data(), 2), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImageArray(second, "inputs", right.data(), 2), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImageArray(product, "inputs", both.data(), 2), TOV_SUCCESS);
    ASSERT_EQ(execute(product, image, result), TOV_SUCCESS);
    const Picture expected = mapped(picture, kFloat4, [](const Rgba& p) {
        Rgba pixel;
        for (size_t i = 0; i < 4; ++i) pixel[i] = p[i] * p[i] * p[i] * p[i] * (i < 3 ? 0.25 : 1.0);
        return pixel;
    });
    EXPECT_LE(maxRelativeDifference(read(result, Picture(21, 13)), expected), kTolerance);
}

TEST_F(FusedPictures, OfAResamplingRootTakeTheSourceSizeFromTheTree) {
    const Picture picture = testPicture(16, 12);
    for (const uint32_t op : {TOV_INTERPOLATION_DOWNSAMPLE, TOV_INTERPOLATION_BILINEAR, TOV_INTERPOLATION_BICUBIC}) {
        const Parameters parameters = {{"interpOperator", op}};
        const Handle image = newImage(picture);
        const Handle between = newImage(Picture(16, 12));
        const Handle expected = newImage(Picture(8, 6));
        const Handle fused = newImage(Picture(8, 6));
        const Handle gamma = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}});
        const Handle resample = newFilter(TOV_IMAGE_FILTER_RESAMPLE, parameters);
        ASSERT_EQ(execute(gamma, image, between), TOV_SUCCESS);
        ASSERT_EQ(execute(resample, between, expected), TOV_SUCCESS);
        ASSERT_EQ(execute(resample, gamma, fused), TOV_SUCCESS);
        EXPECT_LE(maxRelativeDifference(read(fused, Picture(8, 6)), read(expected, Picture(8, 6))), kTolerance) << op;
    }
}

TEST_F(FusedPictures, InPlaceEqualThoseOutOfPlace) {
    const Picture picture = testPicture();
    for (const uint32_t innerType : {TOV_IMAGE_FILTER_SOBEL, TOV_IMAGE_FILTER_LINEAR_TONEMAP}) {
        const Picture expected = runFused({innerType, TOV_IMAGE_FILTER_GAMMA_CORRECTION}, picture, kFloat4);
        const Handle image = newImage(picture);
        const Handle inner = newFilter(innerType, fusable(innerType).parameters);
        const Handle outer = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}});
        ASSERT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", image), TOV_SUCCESS);
        ASSERT_EQ(execute(outer, inner, image), TOV_SUCCESS);
        EXPECT_EQ(maxDifference(read(image, Picture(21, 13)), expected), 0.0) << fusable(innerType).name;
    }
}

TEST_F(FusedPictures, FollowTheCameraOfAnInnerMotionFilter) {
    const Handle image = newImage(testPicture());
    const Handle expected = newImage(Picture(21, 13));
    const Handle fused = newImage(Picture(21, 13));
    const Parameters first = fusable(TOV_IMAGE_FILTER_MOTION_BUFFER).parameters;
    const Handle alone = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER, first);
    const Handle inner = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER, first);
    const Handle outer = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    ASSERT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", image), TOV_SUCCESS);
    for (int frame = 0; frame < 3; ++frame) {
        Matrix camera = std::get<Matrix>(first[0].value);
        camera[3] += 0.25f * static_cast<float>(frame);
        for (tov_image_filter filter : {tov_object{alone}, tov_object{inner}})
            ASSERT_EQ(tovImageFilterSetParameter16f(filter, "viewProjMatrix", camera.data()), TOV_SUCCESS);
        ASSERT_EQ(execute(alone, image, expected), TOV_SUCCESS);
        ASSERT_EQ(execute(outer, inner, fused), TOV_SUCCESS);
        EXPECT_LE(maxRelativeDifference(read(fused, Picture(21, 13)), read(expected, Picture(21, 13))), kTolerance);
    }
}

TEST_F(FusedPictures, ComeFromTheCacheUnlessTheSharedTextOnDiskIsNewer) {
    const fs::path before = fs::current_path();
    const fs::path root = fs::temp_directory_path() / ("tov-fusion-" + std::to_string(getpid()));
    fs::create_directories(root / "work");
    fs::current_path(root / "work");
    // A run in a context of its own, which has no kernels in memory yet.
    const auto printed = [&] {
        const Handle owner = newContext();
        const Handle image = newImage(testPicture(), owner);
        const Handle result = newImage(Picture(21, 13), owner);
        const Handle inner = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 1.25f}}, owner);
        const Handle outer = newFilter(TOV_IMAGE_FILTER_NORMALIZATION, {}, owner);
        const Handle queue = newQueue(owner);
        EXPECT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", image), TOV_SUCCESS);
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, outer, inner, result), TOV_SUCCESS);
        return printedBy(
            [&] { EXPECT_EQ(tovContextExecuteCommandQueue(owner, queue, nullptr, nullptr), TOV_SUCCESS); });
    };
    printed();
    EXPECT_EQ(printed().find("Cached file created"), std::string::npos);
    fs::create_directories(root / "Tovkit/Impl/CL");
    fs::copy_file(TOV_COMMON_KERNEL_TEXT, root / "Tovkit/Impl/CL/common.cl");
    fs::last_write_time(root / "Tovkit/Impl/CL/common.cl", fs::file_time_type::clock::now() + std::chrono::hours(1));
    EXPECT_NE(printed().find("Cached file created"), std::string::npos);
    fs::current_path(before);
    fs::remove_all(root);
}

}  // namespace
}  // namespace fusiontest
