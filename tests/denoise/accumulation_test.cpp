// Motion and temporal accumulation over several executions: against the reference with a still and a moving camera,
// what starts a pixel afresh, and what is kept when sizes change or an execution fails.
#include <gmock/gmock.h>

#include <cmath>
#include <limits>

#include "accumulation_reference.h"
#include "scenes.h"

namespace denoisetest {

namespace {

using apitest::Handle;
using apitest::Matrix;

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr double kTolerance = 2e-5;  // sums of four products of values near 1, some frames long
constexpr uint32_t kWidth = 29;
constexpr uint32_t kHeight = 21;

// A camera at (shift, 0, 0) that looks along y; width and height of the view are two metres at a distance of one.
Matrix cameraAt(double shift, double turn = 0.0) {
    const auto c = static_cast<float>(std::cos(turn));
    const auto s = static_cast<float>(std::sin(turn));
    const auto x = static_cast<float>(shift);
    return {c, -s, 0, -c * x, 0, 0, 1, 0, 0, 0, 0, 1, s, c, 0, -s * x};
}

// A wall 4 m away with a board 3 m away before its right half, seen from the camera, under grain.
Frame frameFrom(double shift, uint32_t seed, double grain = 0.2, uint32_t width = kWidth, uint32_t height = kHeight) {
    Frame frame;
    const Picture noise = apitest::noise(width, height, apitest::kFloat4, 2.0, seed);
    const auto paint = [&](const auto& color) { return apitest::painted(width, height, apitest::kFloat4, color); };
    const auto across = [&](uint32_t x) { return 2.0 * (x + 0.5) / width - 1.0; };
    const auto onBoard = [&](uint32_t x) { return shift + 3.0 * across(x) > 0.6; };
    frame.position = paint([&](uint32_t x, uint32_t y) {
        const double depth = onBoard(x) ? 3.0 : 4.0;
        return Rgba{shift + depth * across(x), depth, depth * (1.0 - 2.0 * (y + 0.5) / height), 1.0};
    });
    frame.normal = paint([&](uint32_t, uint32_t) { return Rgba{0.0, -1.0, 0.0, 1.0}; });
    frame.meshId = paint([&](uint32_t x, uint32_t) { return Rgba{onBoard(x) ? 7.0 : 3.0, 0, 0, 1.0}; });
    frame.color = paint([&](uint32_t x, uint32_t y) {
        const Rgba p = frame.position.at(x, y);
        const double base = 0.5 + 0.2 * std::sin(2.0 * p[0]) + 0.1 * p[2] / 4.0;
        const Rgba n = noise.at(x, y);
        return Rgba{base + grain * (n[0] - 1.0), base + grain * (n[1] - 1.0), base + grain * (n[2] - 1.0), 1.0};
    });
    frame.camera = cameraAt(shift);
    return frame;
}

// One filter object over many frames.
class Accumulator : public apitest::DeviceTest {
 public:
    void TestBody() override {}
    explicit Accumulator(bool withVariance = true)
        : filter_(newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION)), withVariance_(withVariance) {}

    int32_t tryFrame(const Frame& frame, AccumulationReference::Result* result = nullptr) {
        const Picture blank(frame.color.width, frame.color.height);
        const Handle input = newImage(frame.color);
        const Handle position = newImage(frame.position);
        const Handle normal = frame.normal.values.empty() ? Handle() : newImage(frame.normal);
        const Handle meshId = frame.meshId.values.empty() ? Handle() : newImage(frame.meshId);
        const Handle output = newImage(blank);
        const Handle variance = newImage(blank);
        set("positionsImg", position);
        if (normal != nullptr) set("normalsImg", normal);
        if (meshId != nullptr) set("meshIdsImg", meshId);
        if (withVariance_) set("outVarianceImg", variance);
        EXPECT_EQ(setParameter(filter_, {"viewProjMatrix", frame.camera}), TOV_SUCCESS);
        const int32_t code = execute(filter_, input, output);
        if (result != nullptr && code == TOV_SUCCESS) *result = {read(output, blank), read(variance, blank)};
        return code;
    }
    AccumulationReference::Result frame(const Frame& frame) {
        AccumulationReference::Result result;
        EXPECT_EQ(tryFrame(frame, &result), TOV_SUCCESS);
        return result;
    }

 private:
    void set(const char* name, tov_image image) {
        EXPECT_EQ(apitest::setParameter(filter_, {name, image}), TOV_SUCCESS) << name;
    }
    Handle filter_;
    bool withVariance_;
};

class TemporalAccumulation : public apitest::DeviceTest {
 protected:
    static void expectLikeReference(Accumulator& accumulator, AccumulationReference& reference, const Frame& frame) {
        const AccumulationReference::Result result = accumulator.frame(frame);
        const AccumulationReference::Result expected = reference.accumulate(frame);
        EXPECT_LT(apitest::maxDifference(result.color, expected.color), kTolerance);
        EXPECT_LT(apitest::maxDifference(result.variance, expected.variance), kTolerance);
    }
};

TEST_F(TemporalAccumulation, MatchesTheReferenceUnderAStillAndAMovingCamera) {
    Accumulator accumulator;
    AccumulationReference reference;
    const double path[] = {0, 0, 0, 0, 0, 0, 0.031, 0.07, 0.07, -0.1, 0.4};
    for (uint32_t i = 0; i < std::size(path); ++i) {
        SCOPED_TRACE(i);
        expectLikeReference(accumulator, reference, frameFrom(path[i], i + 1));
    }
}

TEST_F(TemporalAccumulation, MatchesTheReferenceWithoutNormalsAndMeshIds) {
    Accumulator accumulator;
    AccumulationReference reference;
    for (uint32_t i = 0; i < 7; ++i) {
        SCOPED_TRACE(i);
        Frame frame = frameFrom(0.02 * i, i + 1);
        frame.normal = {};
        frame.meshId = {};
        expectLikeReference(accumulator, reference, frame);
    }
}

TEST_F(TemporalAccumulation, ThirtyStillFramesLeaveANinthOfTheNoiseEverywhere) {
    Accumulator accumulator;
    const Frame clean = frameFrom(0.0, 1, 0.0);
    AccumulationReference::Result result;
    for (uint32_t i = 0; i < 30; ++i) result = accumulator.frame(frameFrom(0.0, 100 + i));
    const double single = meanSquare(frameFrom(0.0, 129).color, clean.color);
    EXPECT_LE(meanSquare(result.color, clean.color), 0.12 * single);
    double border = 0.0;
    double borderSingle = 0.0;
    for (uint32_t x = 0; x < kWidth; ++x) {
        for (const uint32_t y : {0u, kHeight - 1}) {
            border += std::pow(result.color.at(x, y)[1] - clean.color.at(x, y)[1], 2);
            borderSingle += std::pow(frameFrom(0.0, 129).color.at(x, y)[1] - clean.color.at(x, y)[1], 2);
        }
    }
    EXPECT_LE(border, 0.16 * borderSingle);  // 58 pixels alone: their own spread is a tenth of the figure
    // The estimate is that of one frame's noise: uniform grain of +-0.2 in three channels.
    const double expected = 0.04 / 3.0 * (0.2126 * 0.2126 + 0.7152 * 0.7152 + 0.0722 * 0.0722);
    double mean = 0.0;
    for (size_t i = 0; i < result.variance.values.size(); ++i) mean += result.variance.values[i];
    EXPECT_NEAR(mean / static_cast<double>(result.variance.values.size()), expected, 0.2 * expected);
}

// ---- What starts a pixel afresh ----

TEST_F(TemporalAccumulation, ChangedMeshIdsTurnedNormalsAndEmptyPositionsStartAfresh) {
    Accumulator accumulator;
    for (uint32_t i = 0; i < 3; ++i) accumulator.frame(frameFrom(0.0, i + 1));
    Frame last = frameFrom(0.0, 9);
    fillPixel(last.meshId, 4, 4, 12.0f);
    last.normal.set(6, 4, {0.8, -0.6, 0.0, 1.0});  // 53 degrees
    last.normal.set(8, 4, {0.6, -0.8, 0.0, 1.0});  // 37 degrees
    fillPixel(last.position, 12, 12, 0.0f);
    const Picture color = accumulator.frame(last).color;
    EXPECT_EQ(color.at(4, 4), last.color.at(4, 4));
    EXPECT_EQ(color.at(6, 4), last.color.at(6, 4));
    EXPECT_NE(color.at(8, 4), last.color.at(8, 4));
    EXPECT_EQ(color.at(12, 12), last.color.at(12, 12));
    EXPECT_NE(color.at(20, 12), last.color.at(20, 12));
}

TEST_F(TemporalAccumulation, UnusablePixelsAreFilledAndSpreadNowhere) {
    Accumulator accumulator;
    for (uint32_t i = 0; i < 6; ++i) {
        Frame frame = frameFrom(0.0, i + 1);
        if (i == 2) {
            fillPixel(frame.color, 5, 5, kNaN);
            fillPixel(frame.color, 9, 9, kInfinity);
            fillPixel(frame.position, 12, 5, kInfinity);
            fillPixel(frame.normal, 15, 5, kNaN);
            fillPixel(frame.meshId, 18, 5, kNaN);
        }
        const AccumulationReference::Result result = accumulator.frame(frame);
        EXPECT_TRUE(apitest::isFinite(result.color));
        EXPECT_TRUE(apitest::isFinite(result.variance));
        for (const float value : result.color.values) ASSERT_GT(value, 0.0f) << "no black pixels, either";
    }
}

TEST_F(TemporalAccumulation, PointsInThePlaneOfTheCameraStartAfresh) {
    Accumulator accumulator;
    Frame frame = frameFrom(0.0, 1);
    frame.position.set(3, 3, {1.0, 0.0, 0.5, 1.0});  // clip w 0
    accumulator.frame(frame);
    Frame next = frameFrom(0.0, 2);
    next.position = frame.position;
    const AccumulationReference::Result result = accumulator.frame(next);
    EXPECT_EQ(result.color.at(3, 3), next.color.at(3, 3));
    EXPECT_TRUE(apitest::isFinite(result.color));
}

// ---- What is kept between executions ----

TEST_F(TemporalAccumulation, GrowingStartsAfreshAndShrinkingKeepsTheBuffer) {
    Accumulator accumulator(false);
    accumulator.frame(frameFrom(0.0, 1, 0.2, 11, 7));
    const Frame larger = frameFrom(0.0, 2);
    EXPECT_LT(apitest::maxDifference(accumulator.frame(larger).color, larger.color), kTolerance);
    const Frame again = frameFrom(0.0, 3);
    EXPECT_GT(apitest::maxDifference(accumulator.frame(again).color, again.color), 0.01);
    const Frame smaller = frameFrom(0.0, 4, 0.2, 11, 7);
    EXPECT_TRUE(apitest::isFinite(accumulator.frame(smaller).color));
    const Frame smallerAgain = frameFrom(0.0, 5, 0.2, 11, 7);
    AccumulationReference reference;  // the second small frame continues the first, whatever the buffer held before
    reference.accumulate(smaller);
    const Picture expected = reference.accumulate(smallerAgain).color;
    EXPECT_LT(apitest::maxDifference(accumulator.frame(smallerAgain).color, expected), 0.5);
    const Frame largest = frameFrom(0.0, 6);
    EXPECT_TRUE(apitest::isFinite(accumulator.frame(largest).color));
}

TEST_F(TemporalAccumulation, AFailedExecutionMovesNothingOn) {
    Accumulator accumulator;
    AccumulationReference reference;
    for (uint32_t i = 0; i < 3; ++i) expectLikeReference(accumulator, reference, frameFrom(0.02 * i, i + 1));
    Frame bad = frameFrom(0.3, 4);
    bad.position = frameFrom(0.3, 4, 0.2, kWidth + 1, kHeight).position;
    const std::string line = apitest::printedBy([&] { EXPECT_NE(accumulator.tryFrame(bad), TOV_SUCCESS); });
    EXPECT_THAT(line, testing::HasSubstr("positionsImg"));
    EXPECT_THAT(line, testing::HasSubstr("equal sizes"));
    for (uint32_t i = 3; i < 6; ++i) expectLikeReference(accumulator, reference, frameFrom(0.02 * i, i + 1));
}

TEST_F(TemporalAccumulation, WithoutPositionsThereIsAnErrorAndALine) {
    const Picture color = frameFrom(0.0, 1).color;
    const Handle input = newImage(color);
    const Handle output = newImage(color);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION);
    const std::string line = apitest::printedBy([&] { EXPECT_NE(execute(filter, input, output), TOV_SUCCESS); });
    EXPECT_THAT(line, testing::HasSubstr("positionsImg"));
}

// ---- Motion alone ----

TEST_F(TemporalAccumulation, TheMotionBufferShiftsFromTheCurrentToThePreviousCamera) {
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER);
    const Matrix cameras[] = {cameraAt(0.0), cameraAt(0.2, 0.1), cameraAt(0.2, 0.1), cameraAt(-0.3, 0.4)};
    Picture position = frameFrom(0.0, 1).position;
    fillPixel(position, 2, 2, 0.0f);
    position.set(5, 5, {2.0, 8.0, 2.0, 2.0});  // a weight above 1 divides
    for (size_t i = 0; i < std::size(cameras); ++i) {
        ASSERT_EQ(apitest::setParameter(filter, {"viewProjMatrix", cameras[i]}), TOV_SUCCESS);
        const Handle input = newImage(position);
        const Handle output = newImage(Picture(kWidth, kHeight));
        ASSERT_EQ(execute(filter, input, output), TOV_SUCCESS);
        const Picture motion = read(output, Picture(kWidth, kHeight));
        const auto expected = motionReference(position, cameras[i > 0 ? i - 1 : 0], cameras[i]);
        for (uint32_t y = 0; y < kHeight; ++y) {
            for (uint32_t x = 0; x < kWidth; ++x) {
                const Rgba m = motion.at(x, y);
                EXPECT_NEAR(m[0], expected[size_t{y} * kWidth + x][0], 1e-5);
                EXPECT_NEAR(m[1], expected[size_t{y} * kWidth + x][1], 1e-5);
                EXPECT_EQ(m[3], 1.0);
            }
        }
    }
}

}  // namespace

}  // namespace denoisetest
