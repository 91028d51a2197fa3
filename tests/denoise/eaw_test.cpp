// The edge-avoiding a-trous filter: its five levels tap by tap in double, unusable pixels, errors.
#include <gmock/gmock.h>

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

Rgba divided(const Rgba& c) {
    return c[3] != 0.0 ? c * (1 / c[3]) : c;
}

// Of the tap (i, j) pixels from (x, y).
double featureWeight(const Scene& s, int64_t x, int64_t y, int i, int j) {
    const auto slope = [&](int dx, int dy) {
        double sum = 0.0;
        for (int k = -1; k <= 1; ++k)
            sum += (2 - k * k) * (at(s.depth, x - dx + k * dy, y - dy + k * dx)[0] -
                                  at(s.depth, x + dx + k * dy, y + dy + k * dx)[0]);
        return sum;
    };
    const Rgba a = at(s.normal, x + i, y + j) + Rgba{0.01, 0.01, 0.01, 0};
    const Rgba b = at(s.normal, x, y) + Rgba{0.01, 0.01, 0.01, 0};
    const double step = std::abs(at(s.depth, x + i, y + j)[0] - at(s.depth, x, y)[0]);
    const double change = length(divided(at(s.transition, x + i, y + j)) - divided(at(s.transition, x, y)));
    return std::pow(std::max(dot(a, b) / (length(a) * length(b)), 0.0), 1 / kNormalSigma) *
           std::exp(-step / (kDepthSigma * std::abs(slope(1, 0) * i + slope(0, 1) * j) + 0.001)) *
           std::exp(-change / kTransitionSigma);
}

// The colour of a pixel after a level; its variance takes the place of alpha.
Rgba levelPixel(const Scene& s, const Picture& color, const Picture& centreVariance, const Picture& tapVariance,
                int64_t x, int64_t y, int spacing) {
    constexpr double kSpline[] = {3.0 / 8, 1.0 / 4, 1.0 / 16};
    const double scale = kColorSigma * std::sqrt(at(centreVariance, x, y)[0]) + 0.00001;
    Rgba sum{};
    double variance = 0.0;
    double weights = 0.0;
    for (int i = -2; i <= 2; ++i)
        for (int j = -2; j <= 2; ++j) {
            const int dx = i * spacing;
            const int dy = j * spacing;
            const Rgba c = divided(at(color, x + dx, y + dy));
            const double weight = kSpline[std::abs(i)] * kSpline[std::abs(j)] * featureWeight(s, x, y, dx, dy) *
                                  std::exp(-length(c - divided(at(color, x, y))) / scale);
            sum = sum + c * weight;
            variance += at(tapVariance, x + dx, y + dy)[0] * weight * weight;
            weights += weight;
        }
    return {sum[0] / weights, sum[1] / weights, sum[2] / weights, variance / (weights * weights)};
}

// What a level writes is rounded to the input's layout, as on the device.
Picture waveletReference(const Scene& s) {
    const auto perPixel = [&](Layout layout, const auto& value) {
        return painted(s.color.width, s.color.height, layout, value);
    };
    Picture centreVariance = perPixel(kFloat1, [&](int64_t x, int64_t y) {
        constexpr double kGauss[] = {0.195346, 0.123317, 0.077847};  // by the number of steps from the centre
        Rgba sum{};
        for (int i = -1; i <= 1; ++i)
            for (int j = -1; j <= 1; ++j) sum = sum + at(s.variance, x + i, y + j) * kGauss[i * i + j * j];
        return Rgba{1, 1, 1, 1} * length(sum);
    });
    Picture tapVariance = perPixel(kFloat1, [&](int64_t x, int64_t y) {
        return Rgba{1, 1, 1, 1} * std::hypot(length(at(s.variance, x, y)), at(s.variance, x, y)[3]);
    });
    Picture color = s.color;
    for (int spacing = 1; spacing <= 16; spacing *= 2) {
        const auto level = [&](int64_t x, int64_t y) {
            return levelPixel(s, color, centreVariance, tapVariance, x, y, spacing);
        };
        const Picture next = perPixel(color.layout, [&](int64_t x, int64_t y) {
            const Rgba p = level(x, y);
            return Rgba{p[0], p[1], p[2], 1};
        });
        centreVariance = tapVariance = perPixel(kFloat1, [&](int64_t x, int64_t y) {
            return Rgba{1, 1, 1, 1} * level(x, y)[3];
        });
        color = next;
    }
    return color;
}

class WaveletDenoiser : public SceneTest {
 protected:
    static Picture filtered(const Scene& scene) {
        const Parameters sigmas = {{"colorSigma", kColorSigma},
                                   {"normalSigma", kNormalSigma},
                                   {"depthSigma", kDepthSigma},
                                   {"transSigma", kTransitionSigma}};
        return runWith(TOV_IMAGE_FILTER_EAW_DENOISE, scene.color, sigmas,
                       {{"normalsImg", &scene.normal},
                        {"depthImg", &scene.depth},
                        {"transImg", &scene.transition},
                        {"colorVar", &scene.variance}});
    }
};

TEST_F(WaveletDenoiser, MatchesTheReferenceForAllSizesAndLayoutsAndWithFeaturesMissing) {
    std::vector<Scene> scenes(5, makeScene(45, 37));
    ASSERT_GT(maxDifference(waveletReference(scenes[0]), scenes[0].color), 0.05)
        << "the filter must change the picture";
    scenes[1].normal = scenes[1].transition = {};
    scenes[2].depth = {};
    scenes[3].normal = scenes[3].depth = scenes[3].transition = {};
    scenes[4].variance = {};
    scenes.push_back(makeScene(3, 31));
    scenes.push_back(makeScene(1, 1));
    Scene& other = scenes.emplace_back(makeScene(45, 37));
    const auto convert = [](Picture& picture, Layout layout) {
        picture = mapped(picture, layout, [](const Rgba& c) { return c; });
    };
    convert(other.color, {4, TOV_COMPONENT_TYPE_FLOAT16});
    convert(other.normal, {3, TOV_COMPONENT_TYPE_FLOAT32});
    convert(other.transition, {3, TOV_COMPONENT_TYPE_UINT8});
    convert(other.variance, {4, TOV_COMPONENT_TYPE_FLOAT16});
    for (uint32_t x = 0; x < 45; x += 2) other.color.set(x, 20, other.color.at(x, 20) * 0.5);  // alpha divides
    for (const Scene& scene : scenes)
        // A half has eleven digits, and a level that rounds the other way moves the next ones' weights.
        EXPECT_LT(maxDifference(filtered(scene), waveletReference(scene)),
                  scene.color.layout == kFloat4 ? kTolerance : 3e-3)
            << "scene " << &scene - scenes.data();
}

TEST_F(WaveletDenoiser, FillsUnusablePixelsAndWholeHolesFromTheirNeighbours) {
    Scene scene = makeScene(45, 37);
    for (float& value : scene.color.values) value = std::max(value, 0.2f);
    fillPixel(scene.color, 5, 5, kNaN);
    fillPixel(scene.color, 6, 30, kInfinity);
    fillPixel(scene.color, 44, 36, -kInfinity);
    fillPixel(scene.color, 3, 20, 3e38f);  // whose sums are infinite
    for (uint32_t y = 18; y < 32; ++y)     // larger than the first level's window
        for (uint32_t x = 18; x < 32; ++x) fillPixel(scene.color, x, y, kNaN);
    for (size_t i = 3; i < scene.color.values.size(); i += 52) scene.color.values[i] = 0.0f;
    for (size_t i = 3; i < scene.transition.values.size(); i += 20) scene.transition.values[i] = 0.0f;
    std::fill_n(scene.variance.values.begin(), scene.variance.values.size() / 2, 0.0f);
    expectFilled(filtered(scene), 0.19);
}

TEST_F(WaveletDenoiser, UnusableFeaturesMatchEachOtherOnly) {
    Scene scene = makeScene(45, 37);
    for (float& value : scene.variance.values) value = 100.0f;  // colour stops nothing
    scene.color = painted(45, 37, kFloat4, [&](uint32_t x, uint32_t y) {
        if (x >= 24) fillPixel(scene.depth, x, y, kInfinity);
        return x < 24 ? Rgba{0.2, 0.2, 0.2, 1} : Rgba{0.9, 0.9, 0.9, 1};
    });
    fillPixel(scene.normal, 3, 3, kNaN);
    fillPixel(scene.transition, 40, 30, kInfinity);
    fillPixel(scene.variance, 10, 10, kNaN);
    EXPECT_LT(maxDifference(filtered(scene), scene.color), 1e-4) << "something crossed the edge of the finite depths";
}

TEST_F(WaveletDenoiser, RefusesAnOutputOfAnotherFormat) {
    const Handle input = newImage(Picture(45, 37));
    const Handle bytes = newImage(Picture(45, 37, kByte4));
    const Handle filter = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE);
    const std::string line = printedBy([&] { EXPECT_NE(execute(filter, input, bytes), TOV_SUCCESS); });
    EXPECT_THAT(line, testing::HasSubstr("one component type"));
}

}  // namespace
