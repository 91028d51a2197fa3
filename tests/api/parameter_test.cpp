// Parameters: every setter against every parameter type, names, arrays, and filters as inputs.
#include <cstring>
#include <functional>
#include <memory>

#include "fixture.h"

namespace apitest {
namespace {

class ParameterSetting : public DeviceTest {
 protected:
    template <class Result>
    static Result info(tov_image_filter filter, uint32_t index, uint32_t key) {
        Result result{};
        uint64_t written = 0;
        EXPECT_EQ(tovParameterGetInfo(filter, index, key, sizeof result, &result, &written), TOV_SUCCESS);
        EXPECT_EQ(written, sizeof result);
        return result;
    }
    static uint32_t parameterCount(tov_image_filter filter) {
        uint32_t count = 0;
        uint64_t written = 0;
        EXPECT_EQ(tovImageFilterGetInfo(filter, TOV_IMAGE_FILTER_PARAMETER_COUNT, 4, &count, &written), TOV_SUCCESS);
        return count;
    }
    static size_t valueBytes(uint32_t type) {
        switch (type) {
            case TOV_PARAMETER_TYPE_FLOAT1:
            case TOV_PARAMETER_TYPE_UINT1:
                return 4;
            case TOV_PARAMETER_TYPE_FLOAT16:
                return 64;
            default:
                return 8;
        }
    }
    static std::string valueOf(tov_image_filter filter, uint32_t index) {
        const auto* bytes = info<const char*>(filter, index, TOV_PARAMETER_VALUE);
        return {bytes, valueBytes(info<uint32_t>(filter, index, TOV_PARAMETER_TYPE))};
    }
};

struct Setter {
    const char* what;
    uint32_t type;  // the one that it takes
    std::function<int32_t(tov_image_filter, const char*)> set;
};

std::vector<Setter> allSetters(tov_image image, tov_image_filter other) {
    static const std::array<float, 16> floats = {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16};
    static tov_image images[1];
    images[0] = image;
    return {
        {"1u", TOV_PARAMETER_TYPE_UINT1, [](auto f, auto n) { return tovImageFilterSetParameter1u(f, n, 3); }},
        {"2u", TOV_PARAMETER_TYPE_UINT2, [](auto f, auto n) { return tovImageFilterSetParameter2u(f, n, 3, 4); }},
        {"1f", TOV_PARAMETER_TYPE_FLOAT1, [](auto f, auto n) { return tovImageFilterSetParameter1f(f, n, 0.5f); }},
        {"3f", TOV_PARAMETER_TYPE_FLOAT3, [](auto f, auto n) { return tovImageFilterSetParameter3f(f, n, 1, 2, 3); }},
        {"4f", TOV_PARAMETER_TYPE_FLOAT4,
         [](auto f, auto n) { return tovImageFilterSetParameter4f(f, n, 1, 2, 3, 4); }},
        {"16f", TOV_PARAMETER_TYPE_FLOAT16,
         [](auto f, auto n) { return tovImageFilterSetParameter16f(f, n, floats.data()); }},
        {"floats", TOV_PARAMETER_TYPE_FLOAT_ARRAY,
         [](auto f, auto n) { return tovImageFilterSetParameterFloatArray(f, n, floats.data(), 3); }},
        {"images", TOV_PARAMETER_TYPE_IMAGE_ARRAY,
         [](auto f, auto n) { return tovImageFilterSetParameterImageArray(f, n, images, 1); }},
        {"image", TOV_PARAMETER_TYPE_IMAGE,
         [image](auto f, auto n) { return tovImageFilterSetParameterImage(f, n, image); }},
        {"filter", TOV_PARAMETER_TYPE_IMAGE,
         [other](auto f, auto n) { return tovImageFilterSetParameterImage(f, n, other); }},
    };
}

TEST_F(ParameterSetting, EachSetterTakesItsOwnTypeAndLeavesEveryOtherAlone) {
    const Handle image = newImage(noise(7, 5));
    const Handle other = newFilter(TOV_IMAGE_FILTER_SOBEL);
    // Between them these have a parameter of each type that the catalogue knows.
    for (const uint32_t type : {TOV_IMAGE_FILTER_BILATERAL_DENOISE, TOV_IMAGE_FILTER_LWR_DENOISE,
                                TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, TOV_IMAGE_FILTER_SIMPLE_TONEMAP}) {
        for (const Setter& setter : allSetters(image, other)) {
            const Handle filter = newFilter(type);
            for (uint32_t i = 0; i < parameterCount(filter); ++i) {
                const auto* name = info<const char*>(filter, i, TOV_PARAMETER_NAME);
                const bool fits = info<uint32_t>(filter, i, TOV_PARAMETER_TYPE) == setter.type;
                const std::string before = valueOf(filter, i);
                EXPECT_EQ(setter.set(filter, name), fits ? TOV_SUCCESS : TOV_ERROR_UNSUPPORTED)
                    << setter.what << " on " << name;
                EXPECT_EQ(valueOf(filter, i) != before, fits) << setter.what << " on " << name;
            }
        }
    }
}

TEST_F(ParameterSetting, NamesAreExactAndBuiltInSizesHaveNone) {
    const Handle image = newImage(noise(7, 5));
    const Handle other = newFilter(TOV_IMAGE_FILTER_SOBEL);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION);
    for (const Setter& setter : allSetters(image, other)) {
        EXPECT_EQ(setter.set(filter, nullptr), TOV_ERROR_INVALID_PARAMETER_NAME) << setter.what;
        for (const char* name : {"", "cgamma", "cGamma ", "cGamm", "srcBufferSize", "dstBufferSize", "SRCREC"})
            EXPECT_EQ(setter.set(filter, name), TOV_ERROR_INVALID_PARAMETER_NAME) << setter.what << " " << name;
        const bool takesSizes = setter.type == TOV_PARAMETER_TYPE_UINT2;
        EXPECT_EQ(setter.set(filter, "srcRec"), takesSizes ? TOV_SUCCESS : TOV_ERROR_INVALID_PARAMETER_NAME);
        EXPECT_EQ(setter.set(filter, "dstRec"), takesSizes ? TOV_SUCCESS : TOV_ERROR_INVALID_PARAMETER_NAME);
        const bool takesImages = setter.type == TOV_PARAMETER_TYPE_IMAGE;
        EXPECT_EQ(setter.set(filter, "srcBuffer"), takesImages ? TOV_SUCCESS : TOV_ERROR_INVALID_PARAMETER_NAME)
            << setter.what;
    }
}

TEST_F(ParameterSetting, AMatrixIsCopiedAndArraysAreTheCallers) {
    const Handle motion = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER);
    Matrix matrix{};
    matrix[7] = 42.0f;
    ASSERT_EQ(setParameter(motion, {"viewProjMatrix", matrix}), TOV_SUCCESS);
    matrix[7] = 0.0f;
    EXPECT_EQ(info<const float*>(motion, 0, TOV_PARAMETER_VALUE)[7], 42.0f);
    EXPECT_EQ(tovImageFilterSetParameter16f(motion, "viewProjMatrix", nullptr), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(info<const float*>(motion, 0, TOV_PARAMETER_VALUE)[7], 42.0f);

    const Handle sum = newFilter(TOV_IMAGE_FILTER_WEIGHTED_SUM);
    const std::array<float, 2> weights = {1, 2};
    ASSERT_EQ(tovImageFilterSetParameterFloatArray(sum, "weights", weights.data(), 2), TOV_SUCCESS);
    EXPECT_EQ(*info<const float* const*>(sum, 1, TOV_PARAMETER_VALUE), weights.data());
    EXPECT_EQ(tovImageFilterSetParameterFloatArray(sum, "weights", nullptr, 1), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(*info<const float* const*>(sum, 1, TOV_PARAMETER_VALUE), weights.data());
    EXPECT_EQ(tovImageFilterSetParameterFloatArray(sum, "weights", nullptr, 0), TOV_SUCCESS);
}

TEST_F(ParameterSetting, ImageArraysHoldLiveImagesFiltersAndGapsOnly) {
    const Handle image = newImage(noise(7, 5));
    const Handle queue = newQueue();
    Handle gone = newImage(noise(7, 5));
    const tov_object deleted = gone.remove();
    const Handle sum = newFilter(TOV_IMAGE_FILTER_WEIGHTED_SUM);
    const Handle other = newFilter(TOV_IMAGE_FILTER_SOBEL);
    std::array<tov_image, 3> good = {image, nullptr, other};
    ASSERT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", good.data(), 3), TOV_SUCCESS);
    int foreign = 0;
    for (tov_object element : {tov_object{queue}, deleted, tov_object{context()}, tov_object{&foreign}}) {
        std::array<tov_image, 2> bad = {image, element};
        EXPECT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", bad.data(), 2), TOV_ERROR_INVALID_PARAMETER);
    }
    EXPECT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", nullptr, 2), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(*info<tov_image* const*>(sum, 0, TOV_PARAMETER_VALUE), good.data()) << "a refused array was kept";
    EXPECT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", nullptr, 0), TOV_SUCCESS);
}

TEST_F(ParameterSetting, AnImageParameterTakesImagesAndFiltersOnly) {
    const Handle image = newImage(noise(7, 5));
    const Handle queue = newQueue();
    const Handle other = newFilter(TOV_IMAGE_FILTER_SOBEL);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MLAA);
    int foreign = 0;
    for (tov_object value : {tov_object{nullptr}, tov_object{queue}, tov_object{context()}, tov_object{&foreign}}) {
        EXPECT_EQ(tovImageFilterSetParameterImage(filter, "depthImg", value), TOV_ERROR_INVALID_IMAGE);
        EXPECT_EQ(tovImageFilterSetParameterImage(filter, "no such name", value), TOV_ERROR_INVALID_IMAGE)
            << "the handle is looked at before the name";
    }
    EXPECT_EQ(tovImageFilterSetParameterImage(filter, "dstBuffer", other), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageFilterSetParameterImage(filter, "dstBuffer", image), TOV_SUCCESS);
    EXPECT_EQ(tovImageFilterSetParameterImage(filter, "depthImg", other), TOV_SUCCESS);
}

TEST_F(ParameterSetting, NoFilterFeedsItselfDirectlyOrThroughOthers) {
    const Handle image = newImage(noise(7, 5));
    const Handle a = newFilter(TOV_IMAGE_FILTER_WEIGHTED_SUM);
    const Handle b = newFilter(TOV_IMAGE_FILTER_MLAA);
    const Handle c = newFilter(TOV_IMAGE_FILTER_SOBEL);
    auto toC = std::make_unique<std::array<tov_image, 2>>(std::array<tov_image, 2>{image, c});
    std::array<tov_image, 1> itself = {a};
    EXPECT_EQ(tovImageFilterSetParameterImage(a, "srcBuffer", a), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageFilterSetParameterImageArray(a, "inputs", itself.data(), 1), TOV_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(tovImageFilterSetParameterImage(b, "depthImg", a), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImage(c, "srcBuffer", b), TOV_SUCCESS);
    EXPECT_EQ(tovImageFilterSetParameterImage(a, "srcBuffer", c), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageFilterSetParameterImageArray(a, "inputs", toC->data(), 2), TOV_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(tovImageFilterSetParameterImage(c, "srcBuffer", image), TOV_SUCCESS);
    EXPECT_EQ(tovImageFilterSetParameterImageArray(a, "inputs", toC->data(), 2), TOV_SUCCESS) << "the loop is open";
    toC.reset();  // as hosts may where the filter no longer runs
    EXPECT_EQ(tovImageFilterSetParameterImage(c, "srcBuffer", b), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageFilterSetParameterImage(a, "inputsNum", a), TOV_ERROR_UNSUPPORTED) << "which binds nothing";
}

TEST_F(ParameterSetting, ALongChainOfFiltersIsCheckedWithoutEnd) {
    std::vector<Handle> chain;
    chain.push_back(newFilter(TOV_IMAGE_FILTER_MULTIPLY));
    std::vector<std::array<tov_image, 2>> inputs(40);
    for (size_t i = 0; i < inputs.size(); ++i) {
        inputs[i] = {chain.back(), chain.back()};  // two edges each: 2^40 paths
        chain.push_back(newFilter(TOV_IMAGE_FILTER_MULTIPLY));
        ASSERT_EQ(tovImageFilterSetParameterImageArray(chain.back(), "inputs", inputs[i].data(), 2), TOV_SUCCESS);
    }
    EXPECT_EQ(tovImageFilterSetParameterImage(chain.front(), "srcBuffer", chain.back()), TOV_ERROR_INVALID_PARAMETER);
}

}  // namespace
}  // namespace apitest
