// Motion and temporal accumulation over several executions: against the formulas in double with a still and a moving
// camera, and what is kept when sizes change or an execution fails.
#include <optional>

#include "scenes.h"

namespace {

using namespace apitest;

constexpr double kTolerance = 2e-5;  // sums of four products of values near 1, some frames long
constexpr uint32_t kWidth = 29;
constexpr uint32_t kHeight = 21;

// Not finite for a point in the plane of a camera.
Rgba motionOf(const Rgba& position, const Matrix& before, const Matrix& now) {
    const Rgba p = position * (1 / std::max(1.0, position[3]));
    if (length(p) == 0.0) return {0, 0, 0, 1};
    const auto clip = [&](const Matrix& m, size_t row) {
        return dot(p, {m[4 * row], m[4 * row + 1], m[4 * row + 2], 0}) + double{m[4 * row + 3]};
    };
    const auto step = [&](size_t row) { return clip(before, row) / clip(before, 3) - clip(now, row) / clip(now, 3); };
    return {0.5 * step(0), -0.5 * step(1), 0, 1};
}

double gradient(const Picture& p, int64_t x, int64_t y) {
    const Rgba dx = slope(p, x, y, 1, 0);
    const Rgba dy = slope(p, x, y, 0, 1);
    return (std::hypot(length(dx), dx[3]) + std::hypot(length(dy), dy[3])) / 4;
}

double spatialVariance(const Scene& s, int64_t x, int64_t y) {
    const auto change = [&](const Picture& p, int64_t u, int64_t v) {
        return length(nearest(p, u, v) - nearest(p, x, y));
    };
    const auto squared = [](const Rgba& c) { return Rgba{c[0] * c[0], c[1] * c[1], c[2] * c[2], 0}; };
    Rgba sum{}, squares{};  // the first one's alpha is the sum of the weights
    for (int64_t v = std::max<int64_t>(y - 3, 0); v <= std::min<int64_t>(y + 3, s.color.height - 1); ++v)
        for (int64_t u = std::max<int64_t>(x - 3, 0); u <= std::min<int64_t>(x + 3, s.color.width - 1); ++u) {
            const double apart = std::hypot(change(s.position, u, v), change(s.normal, u, v)) / 0.1;
            const Rgba c = nearest(s.color, u, v);
            sum = sum + c * std::exp(-0.5 * apart * apart);
            squares = squares + squared(c) * std::exp(-0.5 * apart * apart);
        }
    return dot(squares * (1 / sum[3]) - squared(sum * (1 / sum[3])), kLuminance);
}

struct Accumulated {
    Picture color, variance, moments;
    Scene frame;  // the last one

    void add(const Scene& next) {
        Accumulated result{next.color, next.color, next.color, next};
        for (uint32_t y = 0; y < next.color.height; ++y)
            for (uint32_t x = 0; x < next.color.width; ++x) {
                const Rgba now = next.color.at(x, y);
                const double light = dot(now, kLuminance);
                const auto place = reprojected(next, x, y);
                const Rgba m = place ? bilinear(moments, (*place)[0], (*place)[1]) : Rgba{light, 0, 0, 0};
                const Rgba before = place ? historyColor(next, x, y, (*place)[0], (*place)[1]) : now;
                const double temporal = 0.8 * m[1] + 0.2 * std::pow(light - m[0], 2);
                const double spread = m[3] > 3 ? temporal : spatialVariance(next, x, y);
                result.color.set(x, y, before * 0.8 + now * 0.2);
                result.variance.set(x, y, gray(std::clamp(spread, 0.0, 1000.0)));
                result.moments.set(x, y, {0.8 * m[0] + 0.2 * light, temporal, 0, m[3] + 1});
            }
        *this = result;
    }

    // The pixel's place in the last frame, unless it starts afresh.
    std::optional<std::array<double, 2>> reprojected(const Scene& next, uint32_t x, uint32_t y) const {
        const Rgba now = next.position.at(x, y);
        const Rgba motion = motionOf(now, frame.camera, next.camera);
        if (color.values.empty() || !std::isfinite(motion[0] + motion[1])) return {};
        const auto placed = [](double value, uint32_t size) {
            value = std::clamp(value, -0.5, size - 0.5);
            return std::abs(value - std::rint(value)) < 0.001 ? std::rint(value) : value;
        };
        const double u = placed(x + motion[0] * color.width, color.width);
        const double v = placed(y + motion[1] * color.height, color.height);
        const Rgba before = bilinear(frame.position, u, v);
        if (length(before - now) >= 4 * gradient(next.position, x, y)) return {};
        if (length(before) == 0.0 || length(now) == 0.0 || !matches(next, x, y, u, v)) return {};
        return std::array{u, v};
    }
    bool matches(const Scene& next, uint32_t x, uint32_t y, double u, double v) const {
        return std::rint(bilinear(frame.meshId, u, v)[0]) == std::rint(nearest(next.meshId, x, y)[0]) &&
               (next.normal.values.empty() || dot(bilinear(frame.normal, u, v), next.normal.at(x, y)) > std::sqrt(0.5));
    }
    // Bilinear where all taps with a weight match, else the mean of those that do, else the new colour.
    Rgba historyColor(const Scene& next, uint32_t x, uint32_t y, double u, double v) const {
        Rgba sum{};
        double matching = 0.0;
        for (const double tapV : {std::floor(v), std::ceil(v)})
            for (const double tapU : {std::floor(u), std::ceil(u)}) {  // twice the same where u or v is whole
                if (!matches(next, x, y, tapU, tapV)) continue;
                sum = sum + bilinear(color, tapU, tapV);
                matching += 1;
            }
        if (matching == 0.0) return next.color.at(x, y);
        return matching == 4.0 ? bilinear(color, u, v) : sum * (1 / matching);
    }
};

class TemporalAccumulation : public SceneTest {
 protected:
    void expectLikeReference(const Scene& frame) {
        ASSERT_EQ(execute(filter_, frame), TOV_SUCCESS);
        reference_.add(frame);
        EXPECT_LT(maxDifference(color_, reference_.color), kTolerance);
        EXPECT_LT(maxDifference(variance_, reference_.variance), kTolerance);
    }

    Handle filter_ = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION);
    Accumulated reference_;
};

TEST_F(TemporalAccumulation, MatchesTheFormulasUnderAStillAndAMovingCameraAndAFailureMovesNothingOn) {
    const double path[] = {0, 0, 0, 0, 0, 0, 0.031, 0.07, 0.07, -0.1, 0.4};
    for (const bool withFeatures : {true, false}) {
        filter_ = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION);
        reference_ = {};
        for (uint32_t i = 0; i < std::size(path); ++i) {
            SCOPED_TRACE(testing::Message() << "frame " << i << ", features " << withFeatures);
            Scene frame = makeScene(kWidth, kHeight, path[i], i + 1);
            if (i == 5) {  // what starts a pixel afresh, and what does not
                frame.meshId.set(4, 4, gray(12));
                frame.normal.set(6, 4, {0.8, -0.6, 0, 1});  // 53 degrees
                frame.normal.set(8, 4, {0.6, -0.8, 0, 1});  // 37 degrees
                frame.position.set(12, 12, {});
                frame.position.set(3, 12, {1, 0, 0.5, 1});  // in the plane of the camera
            }
            if (!withFeatures) frame.normal = frame.meshId = {};
            expectLikeReference(frame);
            frame.position = Picture(kWidth + 1, kHeight);
            frame.camera = cameraAt(0.3);
            EXPECT_EQ(execute(filter_, frame), TOV_ERROR_INVALID_OPERATION);
        }
    }
}

TEST_F(TemporalAccumulation, GrowingStartsAfreshAndShrinkingKeepsTheBuffer) {
    expectLikeReference(makeScene(11, 7));
    reference_ = {};
    for (uint32_t i = 2; i < 4; ++i) expectLikeReference(makeScene(kWidth, kHeight, 0.0, i));
    for (const uint32_t height : {7u, 8u, 7u, kHeight}) {  // whatever the buffer held before
        ASSERT_EQ(execute(filter_, makeScene(kWidth, height, 0.0, 4)), TOV_SUCCESS);
        EXPECT_TRUE(isFinite(color_) && isFinite(variance_));
    }
}

TEST_F(TemporalAccumulation, MotionIsAShiftFromTheCurrentToThePreviousCamera) {
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER);
    Scene scene;
    scene.color = makeScene(kWidth, kHeight).position;  // which this filter takes as its source
    scene.color.set(2, 2, {});
    scene.color.set(5, 5, {2, 8, 2, 2});  // a weight above 1 divides
    Matrix before = cameraAt(0.0);
    for (const Matrix& camera : {before, cameraAt(0.2, 0.1), cameraAt(0.2, 0.1), cameraAt(-0.3, 0.4)}) {
        scene.camera = camera;
        ASSERT_EQ(execute(filter, scene), TOV_SUCCESS);
        const auto moved = [&](const Rgba& p) { return motionOf(p, before, camera); };
        EXPECT_LT(maxDifference(color_, mapped(scene.color, kFloat4, moved)), 1e-5);
        before = camera;
    }
}

}  // namespace
