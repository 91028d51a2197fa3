// The Gaussian blur against a separable sum in double.
#include "fixture.h"
#include "vectors.h"

namespace {

using namespace apitest;

// Reflected about the borders, the edge pixels repeated, as often as it takes.
int64_t mirrored(int64_t place, int64_t size) {
    while (place < 0 || place >= size) place = place < 0 ? -place - 1 : 2 * size - place - 1;
    return place;
}

// Along x for (dx, dy) = (1, 0), along y for (0, 1).
Picture blurredAlong(const Picture& input, Layout layout, int radius, double sigma, int dx, int dy) {
    return painted(input.width, input.height, layout, [&](int64_t x, int64_t y) {
        Rgba sum{};
        double weights = 0.0;
        for (int i = -radius; i <= radius; ++i) {
            const double weight = std::exp(-i * i / (2 * sigma * sigma));
            sum = sum + nearest(input, mirrored(x + i * dx, input.width), mirrored(y + i * dy, input.height)) * weight;
            weights += weight;
        }
        return sum * (1 / weights);
    });
}

using GaussianBlur = DeviceTest;

}  // namespace

TEST_F(GaussianBlur, PlainAndTiledMatchASeparableSumForAllSizesRadiiAndLayouts) {
    // Coefficients have six digits after the point, a byte may round to its neighbour, a half has eleven digits.
    const struct {
        uint32_t width, height, radius;
        float sigma;
        Layout layout;
        double tolerance;
    } cases[] = {{37, 23, 3, 1.5f, kFloat4, 8e-6},
                 {5, 3, 40, 9.0f, kFloat4, 8e-5},
                 {70, 31, 33, 10.0f, kFloat4, 6.8e-5},
                 {3, 65, 32, 8.0f, kFloat4, 6.6e-5},
                 {3, 2, 4096, 5.0f, kFloat4, 8e-5},
                 {45, 14, 4, 2.0f, {3, TOV_COMPONENT_TYPE_UINT8}, 1.0},
                 {45, 14, 4, 2.0f, {4, TOV_COMPONENT_TYPE_FLOAT16}, 1.0 / 1024}};
    for (const auto& [width, height, radius, sigma, layout, tolerance] : cases) {
        const Picture input = noise(width, height, layout);
        const int reach = std::min(static_cast<int>(radius), 60);  // farther weights have no digit left
        const Picture rows = blurredAlong(input, kFloat4, reach, double{sigma}, 1, 0);
        const Picture expected = blurredAlong(rows, layout, reach, double{sigma}, 0, 1);
        for (const uint32_t tiling : {0u, 1u})
            EXPECT_LE(maxDifference(run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, input,
                                        {{"radius", radius}, {"sigma", sigma}, {"tiling", tiling}}),
                                    expected),
                      tolerance)
                << width << " x " << height << ", radius " << radius << ", tiling " << tiling;
    }
}

TEST_F(GaussianBlur, NotANumberStaysWithinTheRadius) {
    Picture input = noise(40, 20);
    input.set(20, 10, Rgba{1, 1, 1, 1} * std::nan(""));
    const Picture output = run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, input, {{"radius", 3u}, {"sigma", 1.0f}});
    for (int y = 0; y < 20; ++y)
        for (int x = 0; x < 40; ++x)
            EXPECT_EQ(std::isnan(nearest(output, x, y)[0]), std::abs(x - 20) <= 3 && std::abs(y - 10) <= 3)
                << x << ", " << y;
}
