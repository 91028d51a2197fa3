// Resampling against its three formulas in double.
#include <gmock/gmock.h>

#include <algorithm>
#include <cmath>

#include "fixture.h"

namespace {

using namespace apitest;

struct Sides {
    uint32_t width, height;
};

// The source position of an output column or row, and the distance to the next pixel.
struct Position {
    int64_t whole;
    double t;
};
Position positionOf(uint32_t place, uint32_t source, uint32_t destination) {
    const double exact = destination > 1 ? static_cast<double>(place) * (source - 1.0) / (destination - 1.0) : 0.0;
    // What is a whole number up to rounding may fall on either side of it, with the same result.
    const auto whole = static_cast<int64_t>(exact + 1e-9);
    return {whole, exact - static_cast<double>(whole)};
}

double catmullRom(const std::array<double, 4>& p, double t) {
    const double a = 1.5 * (p[1] - p[2]) + 0.5 * (p[3] - p[0]);
    const double b = p[0] - 2.5 * p[1] + 2.0 * p[2] - 0.5 * p[3];
    return ((a * t + b) * t + 0.5 * (p[2] - p[0])) * t + p[1];
}

Rgba at(const Picture& picture, int64_t x, int64_t y) {
    return picture.at(static_cast<uint32_t>(std::clamp<int64_t>(x, 0, int64_t{picture.width} - 1)),
                      static_cast<uint32_t>(std::clamp<int64_t>(y, 0, int64_t{picture.height} - 1)));
}

Rgba bicubic(const Picture& input, const Position& x, const Position& y) {
    Rgba result{};
    for (size_t c = 0; c < 4; ++c) {
        std::array<double, 4> rows{};
        for (int64_t j = 0; j < 4; ++j) {
            std::array<double, 4> points{};
            for (int64_t i = 0; i < 4; ++i)
                points[static_cast<size_t>(i)] = at(input, x.whole + i - 1, y.whole + j - 1)[c];
            rows[static_cast<size_t>(j)] = catmullRom(points, x.t);
        }
        result[c] = catmullRom(rows, y.t);
    }
    return result;
}

Rgba bilinear(const Picture& input, const Position& x, const Position& y) {
    Rgba result{};
    for (size_t c = 0; c < 4; ++c) {
        const auto across = [&](int64_t row) {
            return at(input, x.whole, row)[c] * (1 - x.t) + at(input, x.whole + 1, row)[c] * x.t;
        };
        result[c] = across(y.whole) * (1 - y.t) + across(y.whole + 1) * y.t;
    }
    return result;
}

Rgba boxAverage(const Picture& input, uint32_t x, uint32_t y, Sides ratio) {
    Rgba sum{};
    double count = 0.0;
    for (uint32_t j = y * ratio.height; j < std::min((y + 1) * ratio.height, input.height); ++j)
        for (uint32_t i = x * ratio.width; i < std::min((x + 1) * ratio.width, input.width); ++i) {
            for (size_t c = 0; c < 4; ++c) sum[c] += input.at(i, j)[c];
            ++count;
        }
    if (count == 0.0) return {0, 0, 0, 1};
    for (double& component : sum) component /= count;
    return sum;
}

Picture resampled(const Picture& input, const Picture& like, uint32_t operation) {
    const Sides ratio = {input.width / like.width, input.height / like.height};
    return painted(like.width, like.height, like.layout, [&](uint32_t x, uint32_t y) {
        if (operation == TOV_INTERPOLATION_DOWNSAMPLE) return boxAverage(input, x, y, ratio);
        const Position px = positionOf(x, input.width, like.width);
        const Position py = positionOf(y, input.height, like.height);
        return operation == TOV_INTERPOLATION_BILINEAR ? bilinear(input, px, py) : bicubic(input, px, py);
    });
}

class Resampling : public DeviceTest {
 protected:
    static Picture resample(const Picture& input, const Picture& like, uint32_t operation) {
        return run(TOV_IMAGE_FILTER_RESAMPLE, input, {{"interpOperator", operation}}, like);
    }
};

}  // namespace

// Positions are computed in floats: at 41 columns they err by 2e-6 of a pixel, and noise changes by up to 1 in one.
TEST_F(Resampling, AllOperatorsMatchTheirFormulasForLargerAndSmallerPictures) {
    const Sides sizes[] = {{41, 19}, {5, 3}, {13, 1}, {1, 7}};
    for (const Sides& size : sizes) {
        for (const uint32_t operation : {0u, 1u, 2u}) {
            const Picture input = noise(13, 7);
            const Picture like(size.width, size.height);
            EXPECT_LT(maxDifference(resample(input, like, operation), resampled(input, like, operation)), 2e-5)
                << size.width << " x " << size.height << ", operator " << operation;
        }
    }
}

TEST_F(Resampling, ReadsAndWritesEveryKindOfPicture) {
    const Picture input = noise(17, 9, {3, TOV_COMPONENT_TYPE_UINT8});
    const Picture like(29, 21, {2, TOV_COMPONENT_TYPE_FLOAT16});
    for (const uint32_t operation : {1u, 2u})
        EXPECT_LT(maxDifference(resample(input, like, operation), resampled(input, like, operation)), 2e-3)
            << "halves have eleven digits, operator " << operation;
}

TEST_F(Resampling, TwoByTwoBecomesThreeByThreeWithItsCornersUnchanged) {
    const Picture input = noise(2, 2);
    const Picture output = resample(input, Picture(3, 3), TOV_INTERPOLATION_BILINEAR);
    for (const uint32_t x : {0u, 1u})
        for (const uint32_t y : {0u, 1u}) EXPECT_EQ(output.at(2 * x, 2 * y), input.at(x, y));
    const double mean = (input.at(0, 0)[0] + input.at(1, 0)[0] + input.at(0, 1)[0] + input.at(1, 1)[0]) / 4;
    EXPECT_NEAR(output.at(1, 1)[0], mean, 1e-6);
}

TEST_F(Resampling, BoxAveragesIgnoreWhatIsBehindTheLastWholeBlock) {
    const Picture input = noise(5, 4);
    const Picture output = resample(input, Picture(2, 2), TOV_INTERPOLATION_DOWNSAMPLE);
    EXPECT_LT(maxDifference(output, resampled(input, Picture(2, 2), TOV_INTERPOLATION_DOWNSAMPLE)), 1e-6);
    const Picture enlarged = resample(noise(2, 2), Picture(4, 4), TOV_INTERPOLATION_DOWNSAMPLE);
    EXPECT_EQ(enlarged.at(3, 1), (Rgba{0, 0, 0, 1}));
}

TEST_F(Resampling, OnePixelTakesTheFirstOfTheSource) {
    const Picture input = noise(6, 5);
    for (const uint32_t operation : {1u, 2u})
        EXPECT_EQ(resample(input, Picture(1, 1), operation).at(0, 0), input.at(0, 0)) << "operator " << operation;
}

// Whatever sizes the host claims, all reads and writes stay inside the images.
TEST_F(Resampling, ClaimedSizesNeverLeadOutsideTheImages) {
    const Picture flat = painted(6, 5, kFloat4, [](uint32_t, uint32_t) { return Rgba{0.5, 0.5, 0.5, 0.5}; });
    const Handle input = newImage(flat);
    struct Case {
        const char* name;
        uint32_t width, height;
    };
    for (const Case& c : {Case{"srcRec", 4000, 3}, Case{"srcRec", 4000000000u, 4000000000u}, Case{"dstRec", 5000, 2}}) {
        for (const uint32_t operation : {0u, 1u, 2u}) {
            const Picture like(4, 4);
            const Handle output = newImage(like);
            const Handle filter = newFilter(TOV_IMAGE_FILTER_RESAMPLE, {{"interpOperator", operation}});
            const Handle queue = newQueue();
            ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
            ASSERT_EQ(tovImageFilterSetParameter2u(filter, c.name, c.width, c.height), TOV_SUCCESS);
            EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS);
            for (const float value : read(output, like).values)
                EXPECT_TRUE(value == 0.0f || value == 1.0f || std::abs(value - 0.5f) < 1e-6f)
                    << value << " with " << c.name << " " << c.width << ", operator " << operation;
        }
    }
}

TEST_F(Resampling, AnUnknownOperatorIsRefusedWithALine) {
    const Handle input = newImage(noise(4, 4));
    const Handle output = newImage(noise(3, 3));
    const Handle filter = newFilter(TOV_IMAGE_FILTER_RESAMPLE, {{"interpOperator", 3u}});
    const std::string printed =
        printedBy([&] { EXPECT_EQ(execute(filter, input, output), TOV_ERROR_INVALID_PARAMETER); });
    EXPECT_THAT(printed, testing::HasSubstr("interpOperator is 3"));
    const Handle valid = newFilter(TOV_IMAGE_FILTER_RESAMPLE);
    EXPECT_EQ(execute(valid, input, output), TOV_SUCCESS);
}
