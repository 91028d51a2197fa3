// The Gaussian blur against a separable sum in double.
#include <gmock/gmock.h>

#include <cmath>
#include <limits>
#include <vector>

#include "fixture.h"

namespace {

using namespace apitest;

constexpr Layout kByte3 = {3, TOV_COMPONENT_TYPE_UINT8};
constexpr Layout kHalf4 = {4, TOV_COMPONENT_TYPE_FLOAT16};
constexpr Layout kFloat1 = {1, TOV_COMPONENT_TYPE_FLOAT32};

// Reflected about the borders, the edge pixels repeated, as often as it takes.
uint32_t mirrored(int64_t place, int64_t size) {
    while (place < 0 || place >= size) place = place < 0 ? -place - 1 : 2 * size - place - 1;
    return static_cast<uint32_t>(place);
}

std::vector<double> gaussian(int radius, double sigma) {
    std::vector<double> weights;
    double sum = 0.0;
    for (int i = -radius; i <= radius; ++i) {
        weights.push_back(std::exp(-i * i / (2 * sigma * sigma)));
        sum += weights.back();
    }
    for (double& weight : weights) weight /= sum;
    return weights;
}

Picture blurred(const Picture& input, uint32_t radius, double sigma) {
    const int r = static_cast<int>(radius);
    const std::vector<double> weights = gaussian(r, sigma);
    std::vector<Rgba> rows(input.pixelCount());
    for (uint32_t y = 0; y < input.height; ++y)
        for (uint32_t x = 0; x < input.width; ++x)
            for (int i = -r; i <= r; ++i)
                for (size_t c = 0; c < 4; ++c)
                    rows[size_t{y} * input.width + x][c] +=
                        weights[static_cast<size_t>(i + r)] * input.at(mirrored(int64_t{x} + i, input.width), y)[c];
    return painted(input.width, input.height, input.layout, [&](uint32_t x, uint32_t y) {
        Rgba sum{};
        for (int i = -r; i <= r; ++i)
            for (size_t c = 0; c < 4; ++c)
                sum[c] += weights[static_cast<size_t>(i + r)] *
                          rows[size_t{mirrored(int64_t{y} + i, input.height)} * input.width + x][c];
        return sum;
    });
}

class GaussianBlur : public DeviceTest {
 protected:
    static Parameters values(uint32_t radius, float sigma, uint32_t tiling) {
        return {{"radius", radius}, {"sigma", sigma}, {"tiling", tiling}};
    }
    static Picture blur(const Picture& input, uint32_t radius, float sigma, uint32_t tiling) {
        return run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, input, values(radius, sigma, tiling));
    }
    // Both passes sum 2 radius + 1 coefficients of six digits after the point.
    static double tolerance(uint32_t radius) { return 1e-6 * (2.0 * radius + 1.0) + 1e-6; }
};

}  // namespace

TEST_F(GaussianBlur, PlainAndTiledMatchASeparableSumOnEverySize) {
    struct Case {
        uint32_t width, height, radius;
        float sigma;
    };
    const Case cases[] = {{37, 23, 3, 1.5f}, {1, 1, 2, 1.0f}, {5, 3, 40, 9.0f}, {70, 31, 33, 10.0f}, {3, 65, 32, 8.0f}};
    for (const Case& c : cases) {
        const Picture input = noise(c.width, c.height);
        const Picture expected = blurred(input, c.radius, double{c.sigma});
        for (const uint32_t tiling : {0u, 1u})
            EXPECT_LT(maxDifference(blur(input, c.radius, c.sigma, tiling), expected), tolerance(c.radius))
                << c.width << " x " << c.height << ", radius " << c.radius << ", tiling " << tiling;
    }
}

TEST_F(GaussianBlur, BlursEveryKindOfPicture) {
    for (const Layout layout : {kByte3, kHalf4, kFloat1}) {
        const Picture input = noise(45, 14, layout);
        // A byte may round to its neighbour, a half has eleven digits.
        const double step = layout.type == TOV_COMPONENT_TYPE_UINT8 ? 1.0 : 1.0 / 1024;
        EXPECT_LE(maxDifference(blur(input, 4, 2.0f, 0), blurred(input, 4, 2.0)), step);
    }
}

TEST_F(GaussianBlur, OneWhitePixelSpreadsByTheProductsOfTheWeights) {
    const Picture input = painted(5, 5, kFloat4, [](uint32_t x, uint32_t y) {
        return x == 2 && y == 2 ? Rgba{1, 1, 1, 1} : Rgba{};
    });
    for (const uint32_t tiling : {0u, 1u}) {
        const Picture output = blur(input, 1, 1.0f, tiling);
        EXPECT_NEAR(output.at(2, 2)[0], 0.2042, 1e-4);
        EXPECT_NEAR(output.at(1, 2)[1], 0.1238, 1e-4);
        EXPECT_NEAR(output.at(2, 3)[3], 0.1238, 1e-4);
        EXPECT_EQ(output.at(4, 2)[0], 0.0);
    }
}

TEST_F(GaussianBlur, NotANumberStaysWithinTheRadius) {
    Picture input = noise(40, 20);
    for (size_t c = 0; c < 4; ++c) input.values[(10 * 40 + 20) * 4 + c] = std::numeric_limits<float>::quiet_NaN();
    const Picture output = blur(input, 3, 1.0f, 0);
    for (uint32_t y = 0; y < 20; ++y)
        for (uint32_t x = 0; x < 40; ++x) {
            const bool reached = x >= 17 && x <= 23 && y >= 7 && y <= 13;
            EXPECT_EQ(std::isnan(output.at(x, y)[0]), reached) << x << ", " << y;
        }
}

TEST_F(GaussianBlur, InPlaceGivesTheSamePicture) {
    const Picture input = noise(37, 23);
    EXPECT_EQ(
        maxDifference(runInPlace(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, input, values(3, 1.5f, 1)), blur(input, 3, 1.5f, 1)),
        0.0);
}

TEST_F(GaussianBlur, TheLargestRadiusBuildsAndIsRight) {
    const Picture input = noise(19, 11);
    const Picture expected = blurred(input, 40, 5.0);  // farther weights have no digit left
    EXPECT_LT(maxDifference(blur(input, 4096, 5.0f, 1), expected), tolerance(40));
}

TEST_F(GaussianBlur, ValuesThatCannotBeUsedAreRefusedWithALine) {
    const float infinity = std::numeric_limits<float>::infinity();
    const float nan = std::numeric_limits<float>::quiet_NaN();
    struct Case {
        uint32_t radius;
        float sigma;
        const char* line;
    };
    const Case cases[] = {{1, 0.0f, "sigma"}, {1, 1e-30f, "sigma"}, {1, infinity, "sigma"},
                          {1, nan, "sigma"},  {4097, 1.0f, "4096"}, {UINT32_MAX, 1.0f, "4096"}};
    const Handle input = newImage(noise(4, 4));
    const Handle output = newImage(noise(4, 4));
    for (const Case& c : cases) {
        const Handle filter = newFilter(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, values(c.radius, c.sigma, 0));
        const std::string printed =
            printedBy([&] { EXPECT_EQ(execute(filter, input, output), TOV_ERROR_INVALID_PARAMETER) << c.line; });
        EXPECT_THAT(printed, testing::HasSubstr(c.line));
    }
    const Handle filter = newFilter(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, values(1, 1.0f, 0));
    EXPECT_EQ(execute(filter, input, output), TOV_SUCCESS);
}
