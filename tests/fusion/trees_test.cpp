// A fused picture is the picture of the same filters run one after another; what cannot be fused is refused.
#include "fixture.h"

#include <cmath>

namespace apitest {
namespace {

namespace fs = std::filesystem;

// A fused build lacks the relaxed arithmetic of single kernels, which changes the last bits; the filters' own slopes
// (the gamma of a dark pixel, a quotient of small numbers) enlarge them.
constexpr double kTolerance = 2e-5;

const Matrix kCamera = {1, 0.1f, 0, 0.2f, 0.1f, 1, 0, 0.1f, 0, 0, 1, 0, 0.1f, 0.2f, 0.3f, 2};
const std::vector<float> kWeights = {0.3f, 0.6f};

// All that can be fused, with parameters under which they change a picture.
struct Fusable {
    uint32_t type;
    Parameters parameters;
};
const std::vector<Fusable> kFusable = {
    {TOV_IMAGE_FILTER_COLOR_SPACE, {{"dstColorSpace", uint32_t{TOV_COLOR_SPACE_REC2020}}}},
    {TOV_IMAGE_FILTER_NORMALIZATION, {}},
    {TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}}},
    {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, {{"cExposure", 0.5f}, {"cApplyToneMap", 1u}}},
    {TOV_IMAGE_FILTER_REINHARD_TONEMAP, {{"cKey", 0.8f}}},
    {TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, {{"cExposure", 1.5f}}},
    {TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 0.7f}}},
    {TOV_IMAGE_FILTER_DRAGO_TONEMAP, {{"cBias", 0.85f}, {"avLum", 0.5f}, {"maxLum", 2.0f}}},
    {TOV_IMAGE_FILTER_SOBEL, {}},
    {TOV_IMAGE_FILTER_SHADOW_CATCHER, {}},
    {TOV_IMAGE_FILTER_WEIGHTED_SUM, {{"weights", kWeights}, {"inputsNum", 2u}}},
    {TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", 2u}}},
    {TOV_IMAGE_FILTER_MOTION_BUFFER, {{"viewProjMatrix", kCamera}}},
    {TOV_IMAGE_FILTER_RESAMPLE, {{"interpOperator", uint32_t{TOV_INTERPOLATION_BICUBIC}}}},
};

// Values away from 0, so that no quotient blows rounding up.
Picture testPicture(Layout layout = kFloat4) {
    return mapped(noise(21, 13, layout), layout, [](Rgba p) {
        for (double& value : p) value = 0.2 + 0.7 * value;
        return p;
    });
}

class FusedPictures : public DeviceTest {
 protected:
    // The picture after a chain of filters, in one fused run or each on its own through float images. Sums and products
    // take what precedes as their first input, and the picture itself as their second.
    static Picture chained(const std::vector<Fusable>& chain, const Picture& input, Layout output, bool fused) {
        const Handle picture = newImage(input);
        const Handle queue = newQueue();
        std::vector<Handle> owners;
        std::vector<std::array<tov_image, 2>> arrays(chain.size());  // by address, so they live as long as the filters
        tov_image source = picture;
        for (size_t i = 0; i < chain.size(); ++i) {
            const auto& [type, parameters] = chain[i];
            const bool isLast = i + 1 == chain.size();
            const bool isArray = type == TOV_IMAGE_FILTER_WEIGHTED_SUM || type == TOV_IMAGE_FILTER_MULTIPLY;
            tov_image_filter filter = owners.emplace_back(newFilter(type, parameters));
            arrays[i] = {source, picture};
            if (isArray) tovImageFilterSetParameterImageArray(filter, "inputs", arrays[i].data(), 2);
            const tov_image attached = isArray ? tov_image{picture} : source;
            EXPECT_EQ(tovImageFilterSetParameterImage(filter, "srcBuffer", attached), TOV_SUCCESS);
            source = filter;
            // Only a resampling filter that feeds another one needs to be told its size.
            if (type == TOV_IMAGE_FILTER_RESAMPLE)
                tovImageFilterSetParameter2u(filter, "dstRec", input.width, input.height);
            if (fused && !isLast) continue;
            source = owners.emplace_back(newImage(Picture(input.width, input.height, isLast ? output : kFloat4)));
            EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, filter, attached, source), TOV_SUCCESS);
        }
        EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS);
        return read(source, Picture(input.width, input.height, output));
    }

    static void expectEqual(const std::vector<Fusable>& chain, Layout input = kFloat4, Layout output = kFloat4) {
        const Picture expected = chained(chain, testPicture(input), output, false);
        // An 8-bit result may round to the neighbouring byte where the two differ by a hair at a half.
        const double tolerance = output.type == TOV_COMPONENT_TYPE_UINT8 ? 1.0 : kTolerance;
        EXPECT_LE(maxRelativeDifference(chained(chain, testPicture(input), output, true), expected), tolerance)
            << "types " << chain[0].type << ", " << chain[1].type;
    }
    void expectResult(tov_image_filter filter, tov_image input, const Picture& expected) {
        const Handle result = newImage(expected.desc());
        ASSERT_EQ(execute(filter, input, result), TOV_SUCCESS);
        EXPECT_LE(maxRelativeDifference(read(result, expected), expected), kTolerance);
    }

    const Picture picture_ = testPicture();
    const Handle handle_ = newImage(picture_);
    const tov_image image_ = handle_;
    const Handle result_ = newImage(picture_);
};

TEST_F(FusedPictures, OfEveryPairEqualThoseOfTheTwoFilters) {
    for (const Fusable& inner : kFusable)
        for (const Fusable& outer : kFusable) expectEqual({inner, outer});
}

TEST_F(FusedPictures, OfTriplesAndLongChainsEqualThoseOfTheirFiltersInSeveralLayouts) {
    constexpr Layout kHalf3 = {3, TOV_COMPONENT_TYPE_FLOAT16};
    const std::pair<Layout, Layout> layouts[] = {
        {kByte4, kFloat4}, {kHalf3, {3, TOV_COMPONENT_TYPE_FLOAT32}}, {{1, TOV_COMPONENT_TYPE_FLOAT32}, kByte4}};
    // Every filter once in every place, with neighbours that differ from row to row.
    for (size_t i = 0; i < kFusable.size(); ++i) {
        const auto next = [&](size_t steps) { return kFusable[(i + steps) % kFusable.size()]; };
        expectEqual({next(0), next(5), next(9)}, layouts[i % 3].first, layouts[i % 3].second);
    }
    expectEqual({kFusable.begin(), kFusable.begin() + 6});
    expectEqual({kFusable.begin() + 6, kFusable.end()});
}

TEST_F(FusedPictures, OfAProductOfTwoSumsMixFiltersImagesAndGapsAndTellTheirKernelsApart) {
    const Handle half = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 0.5f}, {"srcBuffer", image_}});
    const auto sumOf = [&](tov_image a, tov_image b) {
        return Parameters{{"srcBuffer", image_},
                          {"inputs", std::vector{a, b, tov_image{}}},
                          {"weights", std::vector<float>{1.0f, 0.25f, 100.0f}},
                          {"inputsNum", 3u}};
    };
    const Parameters left = sumOf(image_, half);   // Its second input and the first of the other sum would both be
    const Parameters right = sumOf(half, image_);  // kernel 21.
    const Handle first = newFilter(TOV_IMAGE_FILTER_WEIGHTED_SUM, left);
    const Handle second = newFilter(TOV_IMAGE_FILTER_WEIGHTED_SUM, right);
    const Parameters both = {{"inputs", std::vector<tov_image>{first, second}}, {"inputsNum", 2u}};
    expectResult(newFilter(TOV_IMAGE_FILTER_MULTIPLY, both), image_, mapped(picture_, kFloat4, [](const Rgba& p) {
                     const auto product = [](double v) { return 1.125 * v * 0.75 * v; };
                     return Rgba{product(p[0]), product(p[1]), product(p[2]), 1.25 * 1.25 * p[3] * p[3]};
                 }));
}

TEST_F(FusedPictures, OfAResamplingRootTakeTheSourceSizeFromTheTree) {
    const Picture between = run(TOV_IMAGE_FILTER_GAMMA_CORRECTION, picture_, {{"cGamma", 2.2f}});
    for (const uint32_t operation : {0u, 1u, 2u}) {
        const Parameters parameters = {{"interpOperator", operation}};
        const Handle gamma = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}, {"srcBuffer", image_}});
        expectResult(newFilter(TOV_IMAGE_FILTER_RESAMPLE, parameters), gamma,
                     run(TOV_IMAGE_FILTER_RESAMPLE, between, parameters, Picture(8, 6)));
    }
}

TEST_F(FusedPictures, InPlaceEqualThoseOutOfPlace) {
    for (const size_t i : {8u, 6u}) {  // one that reads its neighbours, one that does not
        const std::vector<Fusable> chain = {kFusable[i], kFusable[2]};
        const Handle image = newImage(picture_);
        const Handle inner = newFilter(chain[0].type, chain[0].parameters);
        const Handle outer = newFilter(chain[1].type, chain[1].parameters);
        ASSERT_EQ(setParameter(inner, {"srcBuffer", tov_image{image}}), TOV_SUCCESS);
        ASSERT_EQ(execute(outer, inner, image), TOV_SUCCESS);
        EXPECT_EQ(maxDifference(read(image, picture_), chained(chain, picture_, kFloat4, true)), 0.0);
    }
}

TEST_F(FusedPictures, FollowTheCameraOfAnInnerMotionFilter) {
    const Handle alone = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER);
    const Handle inner = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER, {{"srcBuffer", image_}});
    const Handle outer = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    const Handle expected = newImage(picture_.desc());
    for (const float shift : {0.0f, 0.25f, 0.5f}) {
        Matrix camera = kCamera;
        camera[3] += shift;
        setParameter(alone, {"viewProjMatrix", camera});
        setParameter(inner, {"viewProjMatrix", camera});
        ASSERT_EQ(execute(alone, image_, expected), TOV_SUCCESS);
        expectResult(outer, inner, read(expected, picture_));
    }
}

TEST_F(FusedPictures, ComeFromTheCacheUnlessTheSharedTextOnDiskIsNewer) {
    const fs::path before = fs::current_path();
    const fs::path text = cacheDirectory() / "Tovkit/Impl/CL/common.cl";
    fs::create_directories(text.parent_path());
    fs::create_directories(cacheDirectory() / "work");
    fs::current_path(cacheDirectory() / "work");
    const auto compiles = [&] {  // in a context of its own, which has no kernels in memory yet
        const Handle owner = newContext();
        const Handle image = newImage(picture_, owner);
        const Handle result = newImage(picture_, owner);
        const Parameters parameters = {{"cKey", 1.25f}, {"srcBuffer", tov_image{image}}};
        const Handle inner = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, parameters, owner);
        const Handle outer = newFilter(TOV_IMAGE_FILTER_NORMALIZATION, {}, owner);
        const Handle queue = newQueue(owner);
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, outer, inner, result), TOV_SUCCESS);
        const auto execute = [&] { EXPECT_EQ(tovContextExecuteCommandQueue(owner, queue, nullptr, nullptr), 0); };
        return printedBy(execute).find("Cached file created") != std::string::npos;
    };
    compiles();
    EXPECT_FALSE(compiles());
    fs::copy_file(TOV_COMMON_KERNEL_TEXT, text);
    fs::last_write_time(text, fs::file_time_type::clock::now() + std::chrono::hours(1));
    EXPECT_TRUE(compiles());
    fs::current_path(before);
}

using FusionRefusals = FusedPictures;

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
    Handle small = newImage(Picture(20, 13));
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
