// Motion and temporal accumulation over several executions: against the formulas in double with a still and a moving
// camera, and what is kept when sizes change, pixels are unusable or an execution fails.
#include <gmock/gmock.h>

#include <optional>

#include "scenes.h"

namespace {

using namespace apitest;

constexpr double kTolerance = 2e-5;  // sums of four products of values near 1, some frames long
constexpr uint32_t kWidth = 29;
constexpr uint32_t kHeight = 21;

struct Frame {
    Picture color, position;
    Picture normal, meshId;  // empty where absent; normals have unit length
    Matrix camera;
};

// ---- The formulas ----

Rgba dividedByWeight(const Rgba& v) {
    const double weight = std::max(1.0, v[3]);
    return {v[0] / weight, v[1] / weight, v[2] / weight, 1};
}

// Not finite for a point in the plane of a camera.
Rgba motionOf(const Rgba& position, const Matrix& before, const Matrix& now) {
    const Rgba p = dividedByWeight(position);
    if (length(p) == 0.0) return {0, 0, 0, 1};
    const auto clip = [&](const Matrix& m, size_t row) {
        return m[4 * row] * p[0] + m[4 * row + 1] * p[1] + m[4 * row + 2] * p[2] + double{m[4 * row + 3]};
    };
    return {0.5 * (clip(before, 0) / clip(before, 3) - clip(now, 0) / clip(now, 3)),
            -0.5 * (clip(before, 1) / clip(before, 3) - clip(now, 1) / clip(now, 3)), 0, 1};
}

double gradient(const Picture& p, int64_t x, int64_t y) {
    const auto across = [&](int64_t dy) { return nearest(p, x - 1, y + dy) - nearest(p, x + 1, y + dy); };
    const auto down = [&](int64_t dx) { return nearest(p, x + dx, y - 1) - nearest(p, x + dx, y + 1); };
    const Rgba dx = across(-1) + across(0) * 2 + across(1);
    const Rgba dy = down(-1) + down(0) * 2 + down(1);
    return (std::hypot(length(dx), dx[3]) + std::hypot(length(dy), dy[3])) / 4;
}

double spatialVariance(const Frame& frame, int64_t x, int64_t y) {
    const auto squared = [](const Rgba& c) { return Rgba{c[0] * c[0], c[1] * c[1], c[2] * c[2], 0}; };
    const auto distance = [&](const Picture& picture, int64_t u, int64_t v) {
        return length(dividedByWeight(nearest(picture, u, v)) - dividedByWeight(nearest(picture, x, y)));
    };
    Rgba sum{};  // whose alpha is the sum of the weights
    Rgba squares{};
    for (int64_t v = std::max<int64_t>(y - 3, 0); v <= std::min<int64_t>(y + 3, frame.color.height - 1); ++v)
        for (int64_t u = std::max<int64_t>(x - 3, 0); u <= std::min<int64_t>(x + 3, frame.color.width - 1); ++u) {
            const double apart = std::hypot(distance(frame.position, u, v), distance(frame.normal, u, v)) / 0.1;
            const Rgba c = dividedByWeight(nearest(frame.color, u, v));
            sum = sum + c * std::exp(-0.5 * apart * apart);
            squares = squares + squared(c) * std::exp(-0.5 * apart * apart);
        }
    return dot(squares * (1 / sum[3]) - squared(sum * (1 / sum[3])), kLuminance);
}

class Accumulated {
 public:
    // Keeps the frame; its results are `color` and `variance`.
    void add(const Frame& frame) {
        const auto paint = [&](const auto& value) {
            return painted(frame.color.width, frame.color.height, kFloat4, value);
        };
        const Picture moments = paint([&](uint32_t x, uint32_t y) {
            const double light = dot(frame.color.at(x, y), kLuminance);
            const auto place = reprojected(frame, x, y);
            if (!place) return Rgba{light, 0, 0, 1};
            const Rgba m = bilinear(moments_, place->first, place->second);
            return Rgba{0.8 * m[0] + 0.2 * light, 0.8 * m[1] + 0.2 * std::pow(light - m[0], 2), 0, m[3] + 1};
        });
        color = paint([&](uint32_t x, uint32_t y) {
            const auto place = reprojected(frame, x, y);
            const Rgba now = frame.color.at(x, y);
            return place ? historyColor(frame, x, y, place->first, place->second) * 0.8 + now * 0.2 : now;
        });
        variance = paint([&](uint32_t x, uint32_t y) {
            const Rgba m = moments.at(x, y);
            return Rgba{1, 1, 1, 1} * std::clamp(m[3] > 4 ? m[1] : spatialVariance(frame, x, y), 0.0, 1000.0);
        });
        moments_ = moments;
        previous_ = frame;
    }
    Picture color, variance;

 private:
    // The pixel's place in the previous frame, unless it starts afresh.
    std::optional<std::pair<double, double>> reprojected(const Frame& frame, uint32_t x, uint32_t y) const {
        const Rgba now = frame.position.at(x, y);
        const Rgba motion = motionOf(now, previous_.camera, frame.camera);
        if (color.values.empty() || !std::isfinite(motion[0] + motion[1])) return {};
        const auto placed = [](double value, uint32_t size) {
            value = std::clamp(value, -0.5, size - 0.5);
            return std::abs(value - std::rint(value)) < 0.001 ? std::rint(value) : value;
        };
        const double u = placed(x + motion[0] * frame.color.width, frame.color.width);
        const double v = placed(y + motion[1] * frame.color.height, frame.color.height);
        const Rgba before = bilinear(previous_.position, u, v);
        if (length(before - now) >= 4 * gradient(frame.position, x, y)) return {};
        if (length(before) == 0.0 || length(now) == 0.0) return {};
        if (!matches(frame, x, y, bilinear(previous_.normal, u, v), bilinear(previous_.meshId, u, v))) return {};
        return std::pair{u, v};
    }
    static bool matches(const Frame& frame, uint32_t x, uint32_t y, const Rgba& normal, const Rgba& meshId) {
        return std::rint(meshId[0]) == std::rint(nearest(frame.meshId, x, y)[0]) &&
               (frame.normal.values.empty() || dot(normal, frame.normal.at(x, y)) > std::sqrt(0.5));
    }
    // Bilinear where all taps with a weight match, else the mean of those that do, else the new colour.
    Rgba historyColor(const Frame& frame, uint32_t x, uint32_t y, double u, double v) const {
        Rgba sum{};
        double matching = 0.0;
        for (const double tapV : {std::floor(v), std::ceil(v)})
            for (const double tapU : {std::floor(u), std::ceil(u)}) {  // twice the same where u or v is whole
                const auto tap = [&](const Picture& p) { return bilinear(p, tapU, tapV); };
                if (!matches(frame, x, y, tap(previous_.normal), tap(previous_.meshId))) continue;
                sum = sum + tap(color);
                matching += 1;
            }
        if (matching == 0.0) return frame.color.at(x, y);
        return matching == 4.0 ? bilinear(color, u, v) : sum * (1 / matching);
    }

    Frame previous_;
    Picture moments_;
};

// ---- The filter ----

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
    const Picture noisy = noise(width, height, kFloat4, 2 * grain, seed);
    const auto paint = [&](const auto& color) { return painted(width, height, kFloat4, color); };
    const auto across = [&](uint32_t x) { return 2 * (x + 0.5) / width - 1; };
    const auto onBoard = [&](uint32_t x) { return shift + 3 * across(x) > 0.6; };
    frame.position = paint([&](uint32_t x, uint32_t y) {
        const double depth = onBoard(x) ? 3 : 4;
        return Rgba{shift + depth * across(x), depth, depth * (1 - 2 * (y + 0.5) / height), 1};
    });
    frame.normal = paint([](uint32_t, uint32_t) { return Rgba{0, -1, 0, 1}; });
    frame.meshId = paint([&](uint32_t x, uint32_t) { return Rgba{onBoard(x) ? 7.0 : 3.0, 0, 0, 1}; });
    frame.color = paint([&](uint32_t x, uint32_t y) {
        const Rgba p = frame.position.at(x, y);
        const double base = 0.5 + 0.2 * std::sin(2 * p[0]) + 0.025 * p[2] - grain;
        const Rgba n = noisy.at(x, y);
        return Rgba{base + n[0], base + n[1], base + n[2], 1};
    });
    frame.camera = cameraAt(shift);
    return frame;
}

class TemporalAccumulation : public SceneTest {
 protected:
    int32_t execute(const Frame& frame) {
        const Picture blank(frame.color.width, frame.color.height);
        const Handle output = newImage(blank);
        const Handle variance = newImage(blank);
        std::vector<Handle> images;
        Parameters parameters = {{"outVarianceImg", tov_image{variance}}, {"viewProjMatrix", frame.camera}};
        for (const auto& [name, picture] :
             {std::pair{"positionsImg", &frame.position}, {"normalsImg", &frame.normal}, {"meshIdsImg", &frame.meshId}})
            if (!picture->values.empty())
                parameters.push_back({name, tov_image{images.emplace_back(newImage(*picture))}});
        for (const Parameter& parameter : parameters) EXPECT_EQ(setParameter(filter_, parameter), TOV_SUCCESS);
        const int32_t code = DeviceTest::execute(filter_, newImage(frame.color), output);
        color_ = DeviceTest::read(output, blank);
        variance_ = DeviceTest::read(variance, blank);
        return code;
    }
    void expectLikeReference(const Frame& frame) {
        ASSERT_EQ(execute(frame), TOV_SUCCESS);
        reference_.add(frame);
        EXPECT_LT(maxDifference(color_, reference_.color), kTolerance);
        EXPECT_LT(maxDifference(variance_, reference_.variance), kTolerance);
    }

    Handle filter_ = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION);
    Picture color_, variance_;  // what the last execution gave
    Accumulated reference_;
};

TEST_F(TemporalAccumulation, MatchesTheFormulasUnderAStillAndAMovingCamera) {
    const double path[] = {0, 0, 0, 0, 0, 0, 0.031, 0.07, 0.07, -0.1, 0.4};
    for (const bool withFeatures : {true, false}) {
        filter_ = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION);
        reference_ = {};
        for (uint32_t i = 0; i < std::size(path); ++i) {
            SCOPED_TRACE(testing::Message() << "frame " << i << ", features " << withFeatures);
            Frame frame = frameFrom(path[i], i + 1);
            if (i == 5) {  // what starts a pixel afresh, and what does not
                fillPixel(frame.meshId, 4, 4, 12.0f);
                frame.normal.set(6, 4, {0.8, -0.6, 0, 1});  // 53 degrees
                frame.normal.set(8, 4, {0.6, -0.8, 0, 1});  // 37 degrees
                fillPixel(frame.position, 12, 12, 0.0f);
                frame.position.set(3, 12, {1, 0, 0.5, 1});  // in the plane of the camera
            }
            if (!withFeatures) frame.normal = frame.meshId = {};
            expectLikeReference(frame);
        }
    }
}

TEST_F(TemporalAccumulation, ThirtyStillFramesLeaveANinthOfTheNoiseAlsoOnTheBorder) {
    for (uint32_t i = 0; i < 30; ++i) ASSERT_EQ(execute(frameFrom(0.0, i, 0.2, 200, 2)), TOV_SUCCESS);  // all border
    const auto noiseOf = [clean = frameFrom(0.0, 1, 0.0, 200, 2).color](const Picture& picture) {
        double sum = 0.0;
        for (size_t i = 0; i < clean.values.size(); ++i) sum += std::pow(picture.values[i] - clean.values[i], 2);
        return sum;
    };
    EXPECT_LE(noiseOf(color_), 0.12 * noiseOf(frameFrom(0.0, 29, 0.2, 200, 2).color));
}

TEST_F(TemporalAccumulation, UnusablePixelsAreFilledAndSpreadNowhere) {
    for (uint32_t i = 0; i < 6; ++i) {
        Frame frame = frameFrom(0.0, i + 1);
        if (i == 2) {
            fillPixel(frame.color, 5, 5, kNaN);
            fillPixel(frame.color, 9, 9, kInfinity);
            fillPixel(frame.position, 12, 5, kInfinity);
            fillPixel(frame.normal, 15, 5, kNaN);
            fillPixel(frame.meshId, 18, 5, kNaN);
        }
        ASSERT_EQ(execute(frame), TOV_SUCCESS);
        expectFilled(color_, 1e-3);
        expectFilled(variance_, 0.0);
    }
}

TEST_F(TemporalAccumulation, GrowingStartsAfreshAndShrinkingKeepsTheBuffer) {
    expectLikeReference(frameFrom(0.0, 1, 0.2, 11, 7));
    reference_ = {};
    expectLikeReference(frameFrom(0.0, 2));
    expectLikeReference(frameFrom(0.0, 3));
    for (const uint32_t height : {7u, 8u, 7u, kHeight}) {  // whatever the buffer held before
        ASSERT_EQ(execute(frameFrom(0.0, 4, 0.2, kWidth, height)), TOV_SUCCESS);
        EXPECT_TRUE(isFinite(color_) && isFinite(variance_));
    }
}

TEST_F(TemporalAccumulation, AFailedExecutionMovesNothingOn) {
    for (uint32_t i = 0; i < 3; ++i) expectLikeReference(frameFrom(0.02 * i, i + 1));
    Frame bad = frameFrom(0.3, 4);
    bad.position = frameFrom(0.3, 4, 0.2, kWidth + 1, kHeight).position;
    const std::string line = printedBy([&] { EXPECT_NE(execute(bad), TOV_SUCCESS); });
    EXPECT_THAT(line, testing::AllOf(testing::HasSubstr("positionsImg"), testing::HasSubstr("equal sizes")));
    for (uint32_t i = 3; i < 6; ++i) expectLikeReference(frameFrom(0.02 * i, i + 1));
}

TEST_F(TemporalAccumulation, TheMotionBufferShiftsFromTheCurrentToThePreviousCamera) {
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER);
    Picture position = frameFrom(0.0, 1).position;
    fillPixel(position, 2, 2, 0.0f);
    position.set(5, 5, {2, 8, 2, 2});  // a weight above 1 divides
    const Handle input = newImage(position);
    const Handle output = newImage(position);
    Matrix before = cameraAt(0.0);
    for (const Matrix& camera : {before, cameraAt(0.2, 0.1), cameraAt(0.2, 0.1), cameraAt(-0.3, 0.4)}) {
        ASSERT_EQ(setParameter(filter, {"viewProjMatrix", camera}), TOV_SUCCESS);
        ASSERT_EQ(DeviceTest::execute(filter, input, output), TOV_SUCCESS);
        const Picture expected = mapped(position, kFloat4, [&](const Rgba& p) { return motionOf(p, before, camera); });
        EXPECT_LT(maxDifference(DeviceTest::read(output, position), expected), 1e-5);
        before = camera;
    }
}

}  // namespace
