// Every filter type: it is listed in full, it runs, and it runs in place with the same result.
#include <gmock/gmock.h>

#include <string_view>

#include "fixture.h"

namespace apitest {
namespace {

using testing::HasSubstr;
using testing::StrEq;

constexpr uint32_t kTypes = 21;

class Catalogue : public DeviceTest {
 protected:
    template <class Result>
    static Result info(tov_image_filter filter, uint32_t index, uint32_t key) {
        Result result{};
        uint64_t written = 0;
        EXPECT_EQ(tovParameterGetInfo(filter, index, key, sizeof result, &result, &written), TOV_SUCCESS);
        return result;
    }
    template <class Result>
    static Result info(tov_image_filter filter, uint32_t key) {
        Result result{};
        uint64_t written = 0;
        EXPECT_EQ(tovImageFilterGetInfo(filter, key, sizeof result, &result, &written), TOV_SUCCESS);
        return result;
    }
    static uint32_t countOf(tov_image_filter filter) {
        return info<uint32_t>(filter, TOV_IMAGE_FILTER_PARAMETER_COUNT);
    }
};

TEST_F(Catalogue, EveryTypeAnswersEveryQueryOfEveryParameter) {
    constexpr std::array<uint32_t, kTypes> kParameters = {0, 2,  0, 1, 1, 3, 3, 3, 2, 1, 3,
                                                          4, 10, 8, 0, 3, 2, 6, 1, 5, 0};
    for (uint32_t type = 0; type < kTypes; ++type) {
        const Handle filter = newFilter(type);
        EXPECT_EQ(info<uint32_t>(filter, TOV_IMAGE_FILTER_TYPE), type);
        ASSERT_NE(info<const char*>(filter, TOV_IMAGE_FILTER_DESCRIPTION), nullptr) << type;
        const bool undescribed = type == 0 || type == 16 || type == 18 || type == 20;
        EXPECT_EQ(*info<const char*>(filter, TOV_IMAGE_FILTER_DESCRIPTION) == '\0', undescribed) << type;
        EXPECT_EQ(countOf(filter), kParameters[type]) << type;
        for (uint32_t i = 0; i < countOf(filter); ++i) {
            const auto* name = info<const char*>(filter, i, TOV_PARAMETER_NAME);
            ASSERT_NE(name, nullptr);
            EXPECT_NE(info<uint32_t>(filter, i, TOV_PARAMETER_TYPE), 0u) << name;
            ASSERT_NE(info<const void*>(filter, i, TOV_PARAMETER_VALUE), nullptr) << name;
            EXPECT_EQ(tovImageFilterSetParameter2u(filter, name, 1, 1), TOV_ERROR_UNSUPPORTED)
                << name << " is listed but not found";
            const std::string_view text = name;
            const bool hasText = text != "inputs" && text != "sigmas" && text != "weights" && text != "inputsNum";
            EXPECT_EQ(info<const char*>(filter, i, TOV_PARAMETER_DESCRIPTION) != nullptr, hasText) << name;
        }
    }
}

TEST_F(Catalogue, DefaultsAndTextsAreTheDocumentedOnes) {
    const Handle regression = newFilter(TOV_IMAGE_FILTER_LWR_DENOISE);
    EXPECT_EQ(*info<const uint32_t*>(regression, 8, TOV_PARAMETER_VALUE), 4u);
    EXPECT_THAT(info<const char*>(regression, 9, TOV_PARAMETER_DESCRIPTION), HasSubstr("lessnoise in the output"));
    const Handle drago = newFilter(TOV_IMAGE_FILTER_DRAGO_TONEMAP);
    EXPECT_EQ(*info<const float*>(drago, 1, TOV_PARAMETER_VALUE), 0.0f);
    EXPECT_EQ(*info<const float*>(drago, 2, TOV_PARAMETER_VALUE), 0.1f);
    const Handle antialiasing = newFilter(TOV_IMAGE_FILTER_MLAA);
    EXPECT_THAT(info<const char*>(antialiasing, 4, TOV_PARAMETER_NAME), StrEq("normalTreshold"));
    EXPECT_EQ(*info<const float*>(antialiasing, 4, TOV_PARAMETER_VALUE), 0.92387953f);
    EXPECT_EQ(*info<void* const*>(antialiasing, 0, TOV_PARAMETER_VALUE), nullptr);
    const Handle wavelets = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE);
    EXPECT_THAT(info<const char*>(wavelets, TOV_IMAGE_FILTER_DESCRIPTION),
                StrEq("Edge avoided `A-Trous wavelet denoiser."));
    EXPECT_THAT(info<const char*>(wavelets, 3, TOV_PARAMETER_DESCRIPTION),
                StrEq(info<const char*>(wavelets, 0, TOV_PARAMETER_DESCRIPTION)));
    const Handle bilateral = newFilter(TOV_IMAGE_FILTER_BILATERAL_DENOISE);
    EXPECT_THAT(info<const char*>(bilateral, TOV_IMAGE_FILTER_DESCRIPTION), testing::EndsWith("nearby pixels. "));
    for (const uint32_t type : {TOV_IMAGE_FILTER_MOTION_BUFFER, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION}) {
        const Handle filter = newFilter(type);
        const auto* matrix =
            info<const float*>(filter, type == TOV_IMAGE_FILTER_MOTION_BUFFER ? 0 : 4, TOV_PARAMETER_VALUE);
        for (uint32_t i = 0; i < 16; ++i) EXPECT_EQ(matrix[i], i % 5 == 0 ? 1.0f : 0.0f) << i;
    }
}

// Values with which each filter can run, where its defaults cannot; images are bound beside them.
Parameters workableParameters(uint32_t type, tov_image image) {
    const std::vector<tov_image> images = {image, image};
    const std::vector<float> floats = {0.5f, 0.25f};
    switch (type) {
        case TOV_IMAGE_FILTER_GAMMA_CORRECTION:
            return {{"cGamma", 2.2f}};
        case TOV_IMAGE_FILTER_GAUSSIAN_BLUR:
            return {{"sigma", 1.0f}, {"radius", 2u}};
        case TOV_IMAGE_FILTER_DRAGO_TONEMAP:
            return {{"avLum", 0.5f}, {"maxLum", 2.0f}};
        case TOV_IMAGE_FILTER_BILATERAL_DENOISE:
            return {{"inputs", images}, {"sigmas", floats}, {"inputsNum", 2u}, {"radius", 2u}};
        case TOV_IMAGE_FILTER_LWR_DENOISE:
            return {{"halfWindow", 2u}, {"normalsImg", image}, {"depthImg", image}};
        case TOV_IMAGE_FILTER_EAW_DENOISE:
            return {{"normalsImg", image}, {"transImg", image}};
        case TOV_IMAGE_FILTER_WEIGHTED_SUM:
            return {{"inputs", images}, {"weights", floats}, {"inputsNum", 2u}};
        case TOV_IMAGE_FILTER_MULTIPLY:
            return {{"inputs", images}, {"inputsNum", 2u}};
        case TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION:
            return {{"positionsImg", image}, {"normalsImg", image}};
        default:
            return {};
    }
}

class EveryFilter : public Catalogue, public testing::WithParamInterface<uint32_t> {};

TEST_P(EveryFilter, RunsOnASmallPictureAndInPlaceWithTheSameResult) {
    const uint32_t type = GetParam();
    const Picture picture = noise(13, 11);
    const Handle auxiliary = newImage(picture);
    const Parameters parameters = workableParameters(type, auxiliary);
    const Picture apart = run(type, picture, parameters);
    EXPECT_TRUE(isFinite(apart));
    if (type == TOV_IMAGE_FILTER_RESAMPLE) return;  // refuses to be attached in place
    const Picture inPlace = runInPlace(type, picture, parameters);
    if (type == TOV_IMAGE_FILTER_MATH_TEST) {
        for (size_t i = 0; i < 5; ++i) EXPECT_EQ(inPlace.values[i], apart.values[i]) << i;
        return;
    }
    EXPECT_EQ(maxDifference(inPlace, apart), 0.0);
}

INSTANTIATE_TEST_SUITE_P(All, EveryFilter, testing::Range(0u, kTypes));

TEST_F(Catalogue, AnAuxiliaryImageThatIsTheOutputIsReadAsItWasBefore) {
    const Picture picture = noise(13, 11);
    const Picture other = noise(13, 11, kFloat4, 1.0, 9);
    for (const uint32_t type : {TOV_IMAGE_FILTER_WEIGHTED_SUM, TOV_IMAGE_FILTER_BILATERAL_DENOISE,
                                TOV_IMAGE_FILTER_EAW_DENOISE, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION}) {
        const Handle input = newImage(picture);
        const Handle auxiliary = newImage(other);
        const Handle apart = newImage(picture);
        const Handle separate = newFilter(type);
        const Parameters withAuxiliary = workableParameters(type, auxiliary);
        for (const Parameter& parameter : withAuxiliary) ASSERT_EQ(setParameter(separate, parameter), TOV_SUCCESS);
        ASSERT_EQ(execute(separate, input, apart), TOV_SUCCESS);
        const Handle shared = newFilter(type);
        for (const Parameter& parameter : withAuxiliary) ASSERT_EQ(setParameter(shared, parameter), TOV_SUCCESS);
        ASSERT_EQ(execute(shared, input, auxiliary), TOV_SUCCESS);
        EXPECT_EQ(maxDifference(read(auxiliary, other), read(apart, other)), 0.0) << "type " << type;
    }
}

}  // namespace
}  // namespace apitest
