// The bilateral filter against its formula in double.
#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <vector>

#include "fixture.h"

namespace {

using namespace apitest;

constexpr Layout kByte3 = {3, TOV_COMPONENT_TYPE_UINT8};
constexpr Layout kHalf2 = {2, TOV_COMPONENT_TYPE_FLOAT16};

std::array<double, 3> colour(const Picture& picture, uint32_t x, uint32_t y) {
    const Rgba p = picture.at(x, y);
    return {p[0] / p[3], p[1] / p[3], p[2] / p[3]};
}

uint32_t clamped(int64_t place, uint32_t size) {
    return static_cast<uint32_t>(std::clamp<int64_t>(place, 0, int64_t{size} - 1));
}

double weightOf(const std::vector<Picture>& guides, const std::vector<float>& sigmas, uint32_t x, uint32_t y,
                uint32_t cx, uint32_t cy) {
    double weight = 1.0;
    for (size_t k = 0; k < guides.size(); ++k) {
        const auto centre = colour(guides[k], x, y);
        const auto other = colour(guides[k], cx, cy);
        double distance = 0.0;
        for (size_t c = 0; c < 3; ++c) distance += (other[c] - centre[c]) * (other[c] - centre[c]);
        weight *= std::exp(-0.5 * distance / double{sigmas[k]});
    }
    return weight;
}

Picture filtered(const Picture& input, const std::vector<Picture>& guides, const std::vector<float>& sigmas, int r) {
    return painted(input.width, input.height, input.layout, [&](uint32_t x, uint32_t y) {
        std::array<double, 3> sum{};
        double weights = 0.0;
        for (int j = -r; j <= r; ++j)
            for (int i = -r; i <= r; ++i) {
                const uint32_t cx = clamped(int64_t{x} + i, input.width);
                const uint32_t cy = clamped(int64_t{y} + j, input.height);
                const double weight = weightOf(guides, sigmas, x, y, cx, cy);
                for (size_t c = 0; c < 3; ++c) sum[c] += weight * colour(input, cx, cy)[c];
                weights += weight;
            }
        return Rgba{sum[0] / weights, sum[1] / weights, sum[2] / weights, 1.0};
    });
}

// Alpha from 1/2 to 1, so that quotients stay small.
Picture translucent(uint32_t width, uint32_t height, uint32_t seed) {
    Picture picture = noise(width, height, kFloat4, 1.0, seed);
    for (size_t i = 3; i < picture.values.size(); i += 4) picture.values[i] = 0.5f + 0.5f * picture.values[i];
    return picture;
}

class Bilateral : public DeviceTest {
 protected:
    static Picture filter(const Picture& input, const std::vector<Picture>& guides, const std::vector<float>& sigmas,
                          uint32_t radius) {
        std::vector<Handle> owners;
        std::vector<tov_image> images;
        for (const Picture& guide : guides) images.push_back(owners.emplace_back(newImage(guide)));
        return run(TOV_IMAGE_FILTER_BILATERAL_DENOISE, input,
                   {{"inputs", images},
                    {"sigmas", sigmas},
                    {"inputsNum", static_cast<uint32_t>(guides.size())},
                    {"radius", radius}});
    }
};

}  // namespace

TEST_F(Bilateral, WithoutAuxiliaryImagesItIsABoxAverageOfTheColourDividedByAlpha) {
    const Picture input = translucent(37, 23, 3);
    EXPECT_LT(maxDifference(filter(input, {}, {}, 1), filtered(input, {}, {}, 1)), 2e-6);  // float sums of nine
}

TEST_F(Bilateral, AuxiliaryImagesOfAnyLayoutWeightTheNeighbours) {
    const Picture input = translucent(21, 18, 1);
    Picture gray = noise(21, 18, kHalf2, 1.0, 5);
    for (size_t i = 1; i < gray.values.size(); i += 2) gray.values[i] = 1.0f;
    const std::vector<Picture> guides = {translucent(21, 18, 2), noise(21, 18, kByte3, 1.0, 4), gray};
    const std::vector<float> sigmas = {0.5f, 0.05f, 0.2f};
    EXPECT_LT(maxRelativeDifference(filter(input, guides, sigmas, 4), filtered(input, guides, sigmas, 4)), 1e-5);
}

TEST_F(Bilateral, SixAuxiliaryImagesAndWindowsBeyondThePicture) {
    const Picture input = translucent(5, 3, 1);
    std::vector<Picture> guides;
    for (uint32_t i = 0; i < 6; ++i) guides.push_back(translucent(5, 3, 10 + i));
    const std::vector<float> sigmas = {0.5f, 0.6f, 0.7f, 0.8f, 0.9f, 1.0f};
    EXPECT_LT(maxRelativeDifference(filter(input, guides, sigmas, 6), filtered(input, guides, sigmas, 6)), 1e-5);
}

TEST_F(Bilateral, NeighboursBehindAnEdgeOfTheGuideTakeNoPart) {
    const Picture guide = painted(16, 4, kFloat4, [](uint32_t x, uint32_t) {
        return x < 8 ? Rgba{0, 0, 0, 1} : Rgba{1, 1, 1, 1};
    });
    const Picture output = filter(guide, {guide}, {0.001f}, 3);
    EXPECT_LT(maxDifference(output, guide), 1e-30);  // exp(-1500) may be the smallest float
}

TEST_F(Bilateral, AlphaZeroTakesTheColourAsItIs) {
    const Picture input = painted(3, 3, kFloat4, [](uint32_t, uint32_t) { return Rgba{0.25, 0.5, 0.75, 0.0}; });
    const Picture output = filter(input, {input}, {0.1f}, 1);
    EXPECT_NEAR(output.at(1, 1)[0], 0.25, 1e-6);
    EXPECT_EQ(output.at(1, 1)[3], 1.0);
}

TEST_F(Bilateral, ValuesThatCannotBeUsedAreRefusedWithALine) {
    const Handle input = newImage(noise(4, 4));
    const Handle output = newImage(noise(4, 4));
    const Handle guide = newImage(noise(4, 4));
    const Handle small = newImage(noise(3, 4));
    struct Case {
        std::vector<tov_image> inputs;
        std::vector<float> sigmas;
        uint32_t inputsNum, radius;
        int32_t code;
        const char* line;
    };
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const std::vector<tov_image> seven(7, static_cast<tov_object>(guide));
    const Case cases[] = {
        {{guide}, {0.1f}, 1, 257, TOV_ERROR_INVALID_PARAMETER, "256"},
        {{guide}, {0.1f}, 2, 1, TOV_ERROR_INVALID_PARAMETER, "inputs"},
        {{guide}, {0.1f, 0.1f}, 1, 1, TOV_ERROR_INVALID_PARAMETER, "sigmas"},
        {{guide}, {0.0f}, 1, 1, TOV_ERROR_INVALID_PARAMETER, "sigmas"},
        {{guide}, {nan}, 1, 1, TOV_ERROR_INVALID_PARAMETER, "sigmas"},
        {{small}, {0.1f}, 1, 1, TOV_ERROR_INVALID_OPERATION, "inputs[0]"},
        {seven, std::vector<float>(7, 0.1f), 7, 1, TOV_ERROR_INTERNAL_ERROR, "too lot of inputs"},
    };
    for (const Case& c : cases) {
        const Parameters parameters = {
            {"inputs", c.inputs}, {"sigmas", c.sigmas}, {"inputsNum", c.inputsNum}, {"radius", c.radius}};
        const Handle filter = newFilter(TOV_IMAGE_FILTER_BILATERAL_DENOISE, parameters);
        const std::string printed = printedBy([&] { EXPECT_EQ(execute(filter, input, output), c.code) << c.line; });
        EXPECT_THAT(printed, testing::HasSubstr(c.line));
    }
    const Handle filter = newFilter(TOV_IMAGE_FILTER_BILATERAL_DENOISE);
    EXPECT_EQ(execute(filter, input, output), TOV_SUCCESS);
}
