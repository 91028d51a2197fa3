// The edge-avoiding a-trous filter: its five levels tap by tap in double.
#include "scenes.h"

namespace {

using namespace apitest;

constexpr float kColorSigma = 3.0f, kNormalSigma = 0.2f, kDepthSigma = 1.0f, kTransitionSigma = 0.15f;
// Weights are products of exponentials of relative error 1e-6, and errors of the variance feed the next level's.
constexpr double kTolerance = 2e-4;

// Reflected about the borders, and clamped where that is not enough; zeros of an absent picture.
Rgba at(const Picture& picture, int64_t x, int64_t y) {
    const auto reflected = [](int64_t place, int64_t size) {
        if (place < 0) place = -place - 1;
        return place >= size ? 2 * size - place - 1 : place;
    };
    return nearest(picture, reflected(x, picture.width), reflected(y, picture.height));
}

// Of the tap (i, j) pixels from (x, y).
double featureWeight(const Scene& s, int64_t x, int64_t y, int i, int j) {
    const Rgba a = at(s.normal, x + i, y + j) + Rgba{0.01, 0.01, 0.01, 0};
    const Rgba b = at(s.normal, x, y) + Rgba{0.01, 0.01, 0.01, 0};
    const double step = std::abs(at(s.depth, x + i, y + j)[0] - at(s.depth, x, y)[0]);
    const double change = length(overAlpha(at(s.transition, x + i, y + j)) - overAlpha(at(s.transition, x, y)));
    return std::pow(std::max(dot(a, b) / (length(a) * length(b)), 0.0), 1 / kNormalSigma) *
           std::exp(-step /
                    (kDepthSigma * std::abs(slope(s.depth, x, y, 1, 0)[0] * i + slope(s.depth, x, y, 0, 1)[0] * j) +
                     0.001)) *
           std::exp(-change / kTransitionSigma);
}

// The colour of a pixel after a level, `scale` apart from which colours count; its variance takes the place of alpha.
Rgba levelPixel(const Scene& s, const Picture& color, const Picture& variances, double scale, int64_t x, int64_t y,
                int spacing) {
    constexpr double kSpline[] = {3.0 / 8, 1.0 / 4, 1.0 / 16};
    Rgba sum{};
    double variance = 0.0;
    double weights = 0.0;
    for (int i = -2; i <= 2; ++i)
        for (int j = -2; j <= 2; ++j) {
            const int dx = i * spacing;
            const int dy = j * spacing;
            const Rgba c = overAlpha(at(color, x + dx, y + dy));
            const double weight = kSpline[std::abs(i)] * kSpline[std::abs(j)] * featureWeight(s, x, y, dx, dy) *
                                  std::exp(-length(c - overAlpha(at(color, x, y))) / scale);
            sum = sum + c * weight;
            variance += at(variances, x + dx, y + dy)[0] * weight * weight;
            weights += weight;
        }
    return {sum[0] / weights, sum[1] / weights, sum[2] / weights, variance / (weights * weights)};
}

// The first level's variance of a centre.
double smoothedVariance(const Scene& s, int64_t x, int64_t y) {
    constexpr double kGauss[] = {0.195346, 0.123317, 0.077847};  // by the number of steps from the centre
    Rgba sum{};
    for (int i = -1; i <= 1; ++i)
        for (int j = -1; j <= 1; ++j) sum = sum + at(s.variance, x + i, y + j) * kGauss[i * i + j * j];
    return length(sum);
}

// What a level writes is rounded to the input's layout, as on the device.
Picture waveletReference(const Scene& s) {
    Picture color = s.color;
    Picture variance = painted(color.width, color.height, kFloat1, [&](int64_t x, int64_t y) {
        return gray(std::hypot(length(at(s.variance, x, y)), at(s.variance, x, y)[3]));
    });
    for (int spacing = 1; spacing <= 16; spacing *= 2) {
        Picture nextVariance = variance;
        color = painted(color.width, color.height, color.layout, [&](uint32_t x, uint32_t y) {
            const double own = spacing == 1 ? smoothedVariance(s, x, y) : variance.at(x, y)[0];
            const Rgba p = levelPixel(s, color, variance, kColorSigma * std::sqrt(own) + 0.00001, x, y, spacing);
            nextVariance.set(x, y, gray(p[3]));
            return Rgba{p[0], p[1], p[2], 1};
        });
        variance = nextVariance;
    }
    return color;
}

using WaveletDenoiser = SceneTest;

TEST_F(WaveletDenoiser, MatchesTheReferenceForAllSizesInSeveralLayoutsAndWithFeaturesMissing) {
    std::vector<Scene> scenes(6, makeScene(45, 37));
    ASSERT_GT(maxDifference(waveletReference(scenes[0]), scenes[0].color), 0.05) << "the filter must do something";
    scenes[1].normal = scenes[1].transition = {};
    scenes[2].depth = {};
    scenes[3].normal = scenes[3].depth = scenes[3].transition = {};
    scenes[4].variance = {};
    scenes[5].color = mapped(scenes[5].color, {4, TOV_COMPONENT_TYPE_FLOAT16}, std::identity{});
    scenes[5].transition = mapped(scenes[5].transition, {3, TOV_COMPONENT_TYPE_UINT8}, std::identity{});
    for (uint32_t x = 0; x < 45; x += 2)  // alpha divides
        scenes[5].color.set(x, 20, scenes[5].color.at(x, 20) * 0.5);
    scenes.push_back(makeScene(3, 31));
    scenes.push_back(makeScene(1, 1));
    for (const Scene& scene : scenes) {
        const Handle filter = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE, {{"colorSigma", kColorSigma},
                                                                       {"normalSigma", kNormalSigma},
                                                                       {"depthSigma", kDepthSigma},
                                                                       {"transSigma", kTransitionSigma}});
        ASSERT_EQ(execute(filter, scene), TOV_SUCCESS);
        // A half has eleven digits, and a level that rounds the other way moves the next ones' weights.
        EXPECT_LT(maxDifference(color_, waveletReference(scene)), scene.color.layout == kFloat4 ? kTolerance : 3e-3)
            << "scene " << &scene - scenes.data();
    }
}

}  // namespace
