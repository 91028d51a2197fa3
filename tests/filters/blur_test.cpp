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

Picture blurred(const Picture& input, int radius, double sigma) {
    return painted(input.width, input.height, input.layout, [&](int64_t x, int64_t y) {
        Rgba sum{};
        double weights = 0.0;
        for (int j = -radius; j <= radius; ++j)
            for (int i = -radius; i <= radius; ++i) {
                const double weight = std::exp(-(i * i + j * j) / (2 * sigma * sigma));
                sum = sum + nearest(input, mirrored(x + i, input.width), mirrored(y + j, input.height)) * weight;
                weights += weight;
            }
        return sum * (1 / weights);
    });
}

using GaussianBlur = DeviceTest;

}  // namespace

TEST_F(GaussianBlur, PlainAndTiledMatchASumOverTheWindowForAllSizesRadiiAndLayoutsAndKeepNaNWithinIt) {
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
        Picture input = noise(width, height, layout);
        if (radius == 3) input.set(20, 10, gray(std::nan("")));
        const int reach = std::min(static_cast<int>(radius), 60);  // farther weights have no digit left
        const Picture expected = blurred(input, reach, double{sigma});
        for (const uint32_t tiling : {0u, 1u}) {
            const Parameters parameters = {{"radius", radius}, {"sigma", sigma}, {"tiling", tiling}};
            EXPECT_LE(maxDifference(run(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, input, parameters), expected), tolerance)
                << width << " x " << height << ", radius " << radius << ", tiling " << tiling;
        }
    }
}
