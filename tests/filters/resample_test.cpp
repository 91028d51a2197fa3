// Resampling against its three formulas in double.
#include "fixture.h"
#include "vectors.h"

namespace {

using namespace apitest;

// The place in the source of an output column or row.
double positionOf(uint32_t place, uint32_t source, uint32_t destination) {
    return destination > 1 ? static_cast<double>(place) * (source - 1.0) / (destination - 1.0) : 0.0;
}

// Catmull-Rom through four points, of which a function gives number -1 to 2.
template <class Point>
Rgba cubic(Point&& p, double t) {
    const Rgba a = (p(0) - p(1)) * 1.5 + (p(2) - p(-1)) * 0.5;
    const Rgba b = p(-1) - p(0) * 2.5 + p(1) * 2.0 - p(2) * 0.5;
    return ((a * t + b) * t + (p(1) - p(-1)) * 0.5) * t + p(0);
}

Rgba bicubic(const Picture& input, double x, double y) {
    // What is a whole number up to rounding may fall on either side of it, with the same result.
    const auto left = static_cast<int64_t>(x + 1e-9);
    const auto top = static_cast<int64_t>(y + 1e-9);
    const auto row = [&](int64_t j) {
        return cubic([&](int64_t i) { return nearest(input, left + i, top + j); }, x - static_cast<double>(left));
    };
    return cubic(row, y - static_cast<double>(top));
}

Rgba boxAverage(const Picture& input, uint32_t x, uint32_t y, uint32_t across, uint32_t down) {
    Rgba sum{};
    for (uint32_t j = y * down; j < (y + 1) * down; ++j)
        for (uint32_t i = x * across; i < (x + 1) * across; ++i) sum = sum + input.at(i, j);
    return across * down == 0 ? Rgba{0, 0, 0, 1} : sum * (1.0 / (across * down));
}

Picture resampled(const Picture& input, const Picture& like, uint32_t operation) {
    return painted(like.width, like.height, like.layout, [&](uint32_t x, uint32_t y) {
        if (operation == TOV_INTERPOLATION_DOWNSAMPLE)
            return boxAverage(input, x, y, input.width / like.width, input.height / like.height);
        const double px = positionOf(x, input.width, like.width);
        const double py = positionOf(y, input.height, like.height);
        return operation == TOV_INTERPOLATION_BILINEAR ? bilinear(input, px, py) : bicubic(input, px, py);
    });
}

using Resampling = DeviceTest;

}  // namespace

TEST_F(Resampling, AllOperatorsMatchTheirFormulasForLargerAndSmallerPictures) {
    // Positions are floats: at 41 columns they err by 2e-6 of a pixel, and noise changes by up to 1 in one. A half has
    // eleven digits.
    const struct {
        Picture input, like;
        double tolerance;
    } cases[] = {{noise(13, 7), Picture(41, 19), 2e-5},
                 {noise(13, 7), Picture(5, 3), 2e-5},
                 {noise(13, 7), Picture(13, 1), 2e-5},
                 {noise(13, 7), Picture(1, 7), 2e-5},
                 {noise(17, 9, {3, TOV_COMPONENT_TYPE_UINT8}), Picture(29, 21, {2, TOV_COMPONENT_TYPE_FLOAT16}), 2e-3}};
    for (const auto& [input, like, tolerance] : cases)
        for (const uint32_t operation : {0u, 1u, 2u})
            EXPECT_LT(maxDifference(run(TOV_IMAGE_FILTER_RESAMPLE, input, {{"interpOperator", operation}}, like),
                                    resampled(input, like, operation)),
                      tolerance)
                << like.width << " x " << like.height << ", operator " << operation;
}

// Whatever sizes the host claims, all reads and writes stay inside the images.
TEST_F(Resampling, ClaimedSizesNeverLeadOutsideTheImages) {
    const Handle input = newImage(painted(6, 5, kFloat4, [](uint32_t, uint32_t) { return gray(0.5); }));
    for (const auto& [name, width, height] :
         {std::tuple{"srcRec", 4000u, 3u}, {"srcRec", 4000000000u, 4000000000u}, {"dstRec", 5000u, 2u}})
        for (const uint32_t operation : {0u, 1u, 2u}) {
            const Handle output = newImage(Picture(4, 4));
            const Handle filter = newFilter(TOV_IMAGE_FILTER_RESAMPLE, {{"interpOperator", operation}});
            const Handle queue = newQueue();
            ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
            ASSERT_EQ(tovImageFilterSetParameter2u(filter, name, width, height), TOV_SUCCESS);
            EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS);
            for (const float value : read(output, Picture(4, 4)).values)
                EXPECT_TRUE(value == 0.0f || value == 1.0f || std::abs(value - 0.5f) < 1e-6f)
                    << value << " with " << name << " " << width << ", operator " << operation;
        }
}

TEST_F(Resampling, AnUnknownOperatorIsRefused) {
    const Handle filter = newFilter(TOV_IMAGE_FILTER_RESAMPLE, {{"interpOperator", 3u}});
    EXPECT_EQ(execute(filter, newImage(noise(4, 4)), newImage(noise(3, 3))), TOV_ERROR_INVALID_PARAMETER);
}
