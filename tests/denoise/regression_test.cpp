// The local weighted regression filter: walk by walk in double, flat and black areas, unusable pixels, errors.
#include <gmock/gmock.h>

#include <valarray>

#include "scenes.h"

namespace {

using namespace apitest;

constexpr double kSamples = 4.0;
constexpr uint32_t kWidth = 21;  // three groups across, the last not full
constexpr uint32_t kHeight = 13;

struct Settings {
    uint32_t halfWindow = 4;
    double bandwidth = 1.0;
};

using Vector = std::valarray<double>;
using SquareMatrix = std::vector<Vector>;

SquareMatrix diagonal(size_t n, double value) {
    SquareMatrix a(n, Vector(0.0, n));
    for (size_t i = 0; i < n; ++i) a[i][i] = value;
    return a;
}

void addOuterProduct(SquareMatrix& a, const Vector& v, double weight) {
    for (size_t i = 0; i < v.size(); ++i) a[i] += weight * v[i] * v;
}

// Gauss and Jordan's elimination.
Vector solved(SquareMatrix a, Vector b) {
    for (size_t i = 0; i < b.size(); ++i)
        for (size_t r = 0; r < b.size(); ++r) {
            if (r == i) continue;
            const double factor = a[r][i] / a[i][i];
            a[r] -= factor * a[i];
            b[r] -= factor * b[i];
        }
    for (size_t i = 0; i < b.size(); ++i) b[i] /= a[i][i];
    return b;
}

// Singular values of a symmetric matrix by one-sided Jacobi rotations of its columns, after J. C. Nash: gives the rank,
// the squared values and the vectors.
double decompose(SquareMatrix columns, Vector& squares, SquareMatrix& vectors) {
    size_t rank = columns.size();
    bool rotated = true;
    for (int sweep = 0; rotated && sweep <= 6; ++sweep) {
        rotated = false;
        for (size_t j = 0; j < rank; ++j)
            for (size_t k = j + 1; k < rank; ++k) {
                const double p = (columns[j] * columns[k]).sum();
                const double q = squares[j] = (columns[j] * columns[j]).sum();
                const double r = squares[k] = (columns[k] * columns[k]).sum();
                if (q >= r && (q <= 9e-13 * squares[0] || std::abs(p) <= 1e-8 * q)) continue;
                rotated = true;
                const double angle = 0.5 * std::atan2(2 * p, q - r);
                for (SquareMatrix* matrix : {&columns, &vectors}) {
                    const Vector before = (*matrix)[j];
                    (*matrix)[j] = std::cos(angle) * before + std::sin(angle) * (*matrix)[k];
                    (*matrix)[k] = std::cos(angle) * (*matrix)[k] - std::sin(angle) * before;
                }
            }
        while (rank >= 3 && squares[rank - 1] <= squares[0] * 1e-8 + 1e-16) --rank;
    }
    return static_cast<double>(rank);
}

class PixelFit {
 public:
    PixelFit(const Scene& scene, const Settings& settings, uint32_t x, uint32_t y)
        : s_(scene), x_(x), y_(y), own_(tapAt(x, y)) {
        const uint32_t h = settings.halfWindow;
        for (uint32_t v = y - std::min(y, h); v <= std::min(y + h, scene.color.height - 1); ++v)
            for (uint32_t u = x - std::min(x, h); u <= std::min(x + h, scene.color.width - 1); ++u)
                taps_.push_back(tapAt(u, v));
        reduceFeatures(h);
        estimateBandwidths(settings.bandwidth);
        std::erase_if(taps_, [&](const Tap& tap) {  // outliers
            const double limit = 3 * (std::sqrt(own_.variance) + std::sqrt(tap.variance)) + 0.005;
            return std::abs(tap.color.sum() - own_.color.sum()) / 3 > limit;
        });
    }

    // The bandwidths' factor that balances bias and variance, which are modelled over five candidates.
    double optimalScale() const {
        const auto rank = static_cast<double>(bandwidths_.size());
        Vector bias(5), spread(5), squares(5), powers(5);
        for (size_t g = 0; g < 5; ++g) {
            const double scale = static_cast<double>(g + 1) / 5;
            double variance = 0.0;
            bias[g] = Vector(value(scale, variance) - own_.color).sum() / 3;
            spread[g] = kSamples * variance;
            squares[g] = scale * scale;
            powers[g] = std::pow(scale, -rank);
        }
        const auto slope = [](const Vector& t, const Vector& v) {
            return (5 * (t * v).sum() - t.sum() * v.sum()) / (5 * (t * t).sum() - t.sum() * t.sum() + 0.0001);
        };
        const double denominator = 4 * kSamples * std::pow(slope(squares, bias), 2);
        if (denominator < 1e-20) return 1.0;
        return std::clamp(std::pow(rank * std::abs(slope(powers, spread)) / denominator, 1 / (4 + rank)), 0.2, 1.0);
    }

    // The fit at the pixel with all bandwidths times `scale`, and the variance of that.
    Vector value(double scale, double& variance) const {
        SquareMatrix a = diagonal(bandwidths_.size() + 1, 0.0001);
        for (const Tap& tap : taps_) addOuterProduct(a, tap.entries, weightOf(tap, scale));
        Vector unit(0.0, a.size());
        unit[0] = 1.0;
        const Vector row = solved(a, unit);
        double weights = 0.0;
        const auto summed = [&](bool onlyPositive) {
            Vector sum(0.0, 3);
            weights = variance = 0.0;
            for (const Tap& tap : taps_) {
                const double weight = weightOf(tap, scale) * (row * tap.entries).sum();
                if (onlyPositive && weight <= 0.0) continue;
                sum += weight * tap.color;
                variance += weight * weight * tap.variance;
                weights += weight;
            }
            return sum;
        };
        const Vector fit = summed(false);
        if (fit.min() >= 0.0) return fit;
        const Vector positive = summed(true);
        weights = std::max(weights, 0.001);
        variance /= weights * weights;
        return positive / weights;
    }

 private:
    struct Tap {
        Vector features;  // steps across and down, depth, normal, transition
        Vector noise;     // their variances
        Vector color;
        double variance = 0.0;
        Vector entries = {};  // 1 and the reduced coordinates
    };

    Tap tapAt(uint32_t u, uint32_t v) const {
        const auto joined = [&](double dx, double dy, const Picture& depth, const Picture& normal,
                                const Picture& transition, double divisor) {
            const Rgba n = nearest(normal, u, v) * (1 / divisor);
            const Rgba t = nearest(transition, u, v) * (1 / divisor);
            return Vector{dx, dy, nearest(depth, u, v)[1] / divisor, n[0], n[1], n[2], t[0], t[1], t[2]};
        };
        const Rgba c = s_.color.at(u, v) * (1 / kSamples);
        return {joined(double(u) - x_, double(v) - y_, s_.depth, s_.normal, s_.transition, kSamples),
                joined(0, 0, s_.depthVariance, s_.normalVariance, s_.transitionVariance, kSamples - 1),
                {c[0], c[1], c[2]},
                dot(nearest(s_.variance, u, v), {1, 1, 1, 0}) / (3 * kSamples * (kSamples - 1))};
    }

    // Entries are the directions in which the features of the window vary more than their noise.
    void reduceFeatures(double halfWindow) {
        Vector mean(0.0, 9);
        for (const Tap& tap : taps_) mean += tap.features / static_cast<double>(taps_.size());
        mean[0] = mean[1] = 0.0;
        Vector extent(0.01, 9);
        for (const Tap& tap : taps_) {
            const Vector d = tap.features - mean;
            const double normal = std::hypot(d[3], d[4], d[5]);
            const double transition = std::hypot(d[6], d[7], d[8]);
            for (size_t i = 2; i < 9; ++i)
                extent[i] = std::max(extent[i], i == 2 ? std::abs(d[2]) : i < 6 ? normal : transition);
        }
        extent[0] = extent[1] = halfWindow;
        const Vector scales = 1.0 / extent;
        SquareMatrix matrix = diagonal(9, 0.0);
        double noise = 0.0;
        for (const Tap& tap : taps_) {
            addOuterProduct(matrix, (tap.features - mean) * scales, 1.0);
            for (size_t i = 2; i < 9; ++i)
                noise += scales[i] * scales[i] * std::clamp(tap.noise[i], 0.0, 1.0) / kSamples;
        }
        Vector squares(0.0, 9);
        SquareMatrix vectors = diagonal(9, 1.0);
        const double estimatedRank = decompose(matrix, squares, vectors);
        const double threshold = 0.01 + 4 * std::sqrt(noise / estimatedRank);
        SquareMatrix directions;
        for (size_t i = 0; i < 9; ++i)  // those of the position always count
            if (i < 2 || std::pow(squares[i], 0.25) > threshold) directions.emplace_back(vectors[i] * scales);
        bandwidths_ = Vector(1.0, directions.size());
        for (Tap& tap : taps_) {
            tap.entries = Vector(1.0, directions.size() + 1);
            for (size_t i = 0; i < directions.size(); ++i)
                tap.entries[i + 1] = (directions[i] * (tap.features - own_.features)).sum();
        }
    }

    // From the curvature of a fit with squares over the whole window.
    void estimateBandwidths(double factor) {
        const size_t rank = bandwidths_.size();
        SquareMatrix a = diagonal(2 * rank + 1, 0.001);
        std::array<Vector, 3> colors;
        colors.fill(Vector(0.0, 2 * rank + 1));
        for (const Tap& tap : taps_) {
            Vector entries(2 * rank + 1);
            for (size_t i = 0; i <= rank; ++i) entries[i + rank] = tap.entries[i] * tap.entries[i];
            for (size_t i = 0; i <= rank; ++i) entries[i] = tap.entries[i];
            addOuterProduct(a, entries, weightOf(tap, 1.0));
            for (size_t k = 0; k < 3; ++k) colors[k] += weightOf(tap, 1.0) * tap.color[k] * entries;
        }
        Vector curvature(0.0, 2 * rank + 1);
        for (const Vector& color : colors) curvature += std::abs(solved(a, color)) * (2.0 / 3.0);
        for (size_t i = 0; i < rank; ++i) bandwidths_[i] = factor / std::sqrt(curvature[rank + 1 + i] + 0.16);
    }

    double weightOf(const Tap& tap, double scale) const {
        double weight = 1 / std::max(1.0, tap.variance);
        for (size_t i = 0; i < bandwidths_.size(); ++i) {
            const double t = tap.entries[i + 1] / (scale * bandwidths_[i]);
            weight *= 0.75 * std::max(1 - t * t, 0.0);
        }
        return weight;
    }

    const Scene& s_;
    uint32_t x_, y_;
    Tap own_;
    std::vector<Tap> taps_;  // of the window
    Vector bandwidths_;      // 1 until they are estimated
};

Picture regressionReference(const Scene& s, const Settings& settings) {
    std::vector<PixelFit> fits;
    const Picture scales = painted(s.color.width, s.color.height, kFloat1, [&](uint32_t x, uint32_t y) {
        return Rgba{1, 1, 1, 1} * fits.emplace_back(s, settings, x, y).optimalScale();
    });
    return painted(s.color.width, s.color.height, kFloat4, [&](uint32_t x, uint32_t y) {
        double sum = 0.0;
        double weights = 0.0;
        for (uint32_t v = y / 8 * 8; v < std::min(y / 8 * 8 + 8, s.color.height); ++v)
            for (uint32_t u = x / 8 * 8; u < std::min(x / 8 * 8 + 8, s.color.width); ++u) {
                const double dx = double(u) - x;
                const double dy = double(v) - y;
                const double weight = std::abs(dx) > 3 || std::abs(dy) > 3 ? 0 : std::exp(-0.5 * (dx * dx + dy * dy));
                sum += weight * scales.at(u, v)[0];
                weights += weight;
            }
        double ignored = 0.0;
        const Vector fit = fits[size_t{y} * s.color.width + x].value(sum / weights, ignored) * kSamples;
        return Rgba{fit[0], fit[1], fit[2], 1};
    });
}

// The scene as sums over the samples.
Scene sums(uint32_t width = kWidth, uint32_t height = kHeight) {
    Scene scene = makeScene(width, height);
    for (Picture* picture : {&scene.color, &scene.normal, &scene.depth, &scene.transition})
        *picture = scaled(*picture, kSamples);
    scene.variance = scaled(scene.variance, kSamples * (kSamples - 1));
    return scene;
}

class RegressionDenoiser : public SceneTest {
 protected:
    static Picture filtered(const Scene& scene, const Settings& settings = {3}) {
        return runWith(TOV_IMAGE_FILTER_LWR_DENOISE, scene.color,
                       {{"samples", static_cast<uint32_t>(kSamples)},
                        {"halfWindow", settings.halfWindow},
                        {"bandwidth", static_cast<float>(settings.bandwidth)}},
                       {{"vColorImg", &scene.variance},
                        {"transImg", &scene.transition},
                        {"vTransImg", &scene.transitionVariance},
                        {"normalsImg", &scene.normal},
                        {"vNormalsImg", &scene.normalVariance},
                        {"depthImg", &scene.depth},
                        {"vDepthImg", &scene.depthVariance}});
    }
};

// Rotations, thresholds and outliers are decided in float on the device: a pixel of which one is decided the other way
// may differ, all others agree closely.
TEST_F(RegressionDenoiser, MatchesTheReferenceWithCleanNoisyAndAbsentFeaturesAndNeverTurnsNegative) {
    Scene noisy = sums();
    Picture* const variances[] = {&noisy.depthVariance, &noisy.normalVariance, &noisy.transitionVariance};
    for (uint32_t third = 0; third < 3; ++third)
        *variances[third] = painted(kWidth, kHeight, kFloat4, [&](uint32_t x, uint32_t) {
            return Rgba{1, 1, 1, 0} * (3 * x / kWidth == third ? 0.3 : 0.0);
        });
    Scene bare = sums();
    bare.normal = bare.depth = bare.transition = {};
    Scene rim = bare;
    rim.color = painted(kWidth, kHeight, kFloat4, [](uint32_t x, uint32_t) {  // over which fits run on below zero
        return x < 3 ? Rgba{0, 0, 0, 4} : Rgba{2.0, 1.0, 1.8, 4};
    });
    rim.variance = scaled(rim.variance, 20.0);
    Scene steps = bare;  // whose normals are constant over most windows: but for rounding, they do not deviate
    steps.normal = painted(kWidth, kHeight, kFloat4, [](uint32_t x, uint32_t) {
        return Rgba{0.3, 0.3, 1.0, 0.0} * (0.04 + 0.09 * (x / 8));
    });
    for (const auto& [scene, settings] :
         {std::pair{sums(), Settings{3}}, {noisy, {3}}, {bare, {4, 2.0}}, {rim, {}}, {steps, {3}}}) {
        const Picture result = filtered(scene, settings);
        const Picture expected = regressionReference(scene, settings);
        size_t different = 0;
        for (uint32_t i = 0; i < result.pixelCount(); ++i)
            different += length(result.at(i, 0) - expected.at(i, 0)) <= 0.01 * kSamples ? 0 : 1;
        EXPECT_LE(different, result.pixelCount() / 50);
        EXPECT_GT(maxDifference(expected, scene.color), 0.05) << "the filter must change the picture";
        expectFilled(result, 0.0);
    }
}

TEST_F(RegressionDenoiser, FlatAndBlackAreasStayAsTheyAre) {
    Scene scene = sums();
    scene.color = painted(kWidth, kHeight, kFloat4, [](uint32_t x, uint32_t) {
        return x < 10 ? Rgba{0, 0, 0, 1} : Rgba{2.0, 1.0, 4.0, 1.0};
    });
    scene.variance = {};  // nothing beyond 0.005 of the centre counts
    // The ridges of the systems draw fits towards zero: by 1e-4 of a weight that is small among many features.
    EXPECT_LT(maxDifference(filtered(scene), scene.color), 0.02);
    scene.normal = scene.depth = scene.transition = {};
    EXPECT_LT(maxDifference(filtered(scene), scene.color), 0.02);
}

TEST_F(RegressionDenoiser, UnusablePixelsAreFilledAndSpreadNowhere) {
    Scene scene = sums();
    for (float& value : scene.color.values) value = std::max(value, 1.0f);
    fillPixel(scene.color, 4, 4, kNaN);
    fillPixel(scene.color, 12, 6, kInfinity);
    fillPixel(scene.normal, 7, 9, kNaN);
    fillPixel(scene.transition, 15, 3, -kInfinity);
    fillPixel(scene.variance, 18, 11, kNaN);
    for (uint32_t y = 0; y < 3; ++y) fillPixel(scene.depth, 20, y, kInfinity);
    expectFilled(filtered(scene), 0.5);
    expectFilled(filtered(sums(3, 2), {256}), 0.0);  // a window that is mostly outside
}

TEST_F(RegressionDenoiser, RefusesWhatItWouldDivideByZeroOrNotFinish) {
    const Handle input = newImage(Picture(kWidth, kHeight));
    const Handle output = newImage(Picture(kWidth, kHeight));
    for (const auto& [name, value] : {std::pair{"samples", 1u}, {"halfWindow", 0u}, {"halfWindow", 257u}}) {
        const Handle filter = newFilter(TOV_IMAGE_FILTER_LWR_DENOISE, {{name, value}});
        int32_t code = TOV_SUCCESS;
        EXPECT_THAT(printedBy([&] { code = execute(filter, input, output); }), testing::HasSubstr(name));
        EXPECT_EQ(code, TOV_ERROR_INVALID_PARAMETER) << name;
    }
}

}  // namespace
