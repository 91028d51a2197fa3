// The local weighted regression filter, walk by walk in double.
#include <valarray>

#include "scenes.h"

namespace {

using namespace apitest;

constexpr double kSamples = 4.0;
constexpr uint32_t kWidth = 21;  // three groups across, the last not full
constexpr uint32_t kHeight = 13;

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
            const double factor = r == i ? 0.0 : a[r][i] / a[i][i];
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
    for (int sweep = 0; sweep <= 6; ++sweep) {
        for (size_t j = 0; j < rank; ++j)
            for (size_t k = j + 1; k < rank; ++k) {
                const double p = (columns[j] * columns[k]).sum();
                const double q = squares[j] = (columns[j] * columns[j]).sum();
                const double r = squares[k] = (columns[k] * columns[k]).sum();
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
    PixelFit(const Scene& scene, uint32_t h, double bandwidth, uint32_t x, uint32_t y)
        : s_(scene), x_(x), y_(y), own_(tapAt(x, y)) {
        for (uint32_t v = y - std::min(y, h); v <= std::min(y + h, scene.color.height - 1); ++v)
            for (uint32_t u = x - std::min(x, h); u <= std::min(x + h, scene.color.width - 1); ++u)
                taps_.push_back(tapAt(u, v));
        reduceFeatures(h);
        estimateBandwidths(bandwidth);
        std::erase_if(taps_, [&](const Tap& tap) {  // outliers
            const double limit = 3 * (std::sqrt(own_.variance) + std::sqrt(tap.variance)) + 0.005;
            return std::abs(tap.color.sum() - own_.color.sum()) / 3 > limit;
        });
    }

    // The bandwidths' factor that balances bias and variance, which are modelled over five candidates.
    double optimalScale() const {
        const auto rank = static_cast<double>(bandwidths_.size());
        const Vector scales = {0.2, 0.4, 0.6, 0.8, 1.0};
        Vector bias(5), spread(5);
        for (size_t g = 0; g < 5; ++g) {
            const Vector fit = value(scales[g]);
            bias[g] = (fit[0] + fit[1] + fit[2] - own_.color.sum()) / 3;
            spread[g] = kSamples * fit[3];
        }
        const auto rise = [](const Vector& t, const Vector& v) {
            return (5 * (t * v).sum() - t.sum() * v.sum()) / (5 * (t * t).sum() - t.sum() * t.sum() + 0.0001);
        };
        const double denominator = 4 * kSamples * std::pow(rise(scales * scales, bias), 2);
        const double numerator = rank * std::abs(rise(std::pow(scales, -rank), spread));
        return denominator < 1e-20 ? 1.0 : std::clamp(std::pow(numerator / denominator, 1 / (4 + rank)), 0.2, 1.0);
    }

    // The fit at the pixel with all bandwidths times `scale`: its colour and its variance.
    Vector value(double scale) const {
        SquareMatrix a = diagonal(bandwidths_.size() + 1, 0.0001);
        for (const Tap& tap : taps_) addOuterProduct(a, tap.entries, weightOf(tap, scale));
        const Vector row = solved(a, diagonal(a.size(), 1.0)[0]);
        const auto summed = [&](double least) {
            Vector sum(0.0, 5);  // the last is that of the weights
            for (const Tap& tap : taps_) {
                const double weight = weightOf(tap, scale) * (row * tap.entries).sum();
                const Vector& c = tap.color;
                if (weight > least) sum += weight * Vector{c[0], c[1], c[2], weight * tap.variance, 1};
            }
            return sum;
        };
        const Vector fit = summed(-kInfinity);
        if (std::min({fit[0], fit[1], fit[2]}) >= 0.0) return fit;
        const Vector positive = summed(0.0);
        const double w = std::max(positive[4], 0.001);
        return positive / Vector{w, w, w, w * w, 1};
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
        const Picture* const pictures[] = {&s_.depth, &s_.normal, &s_.transition};
        const Picture* const variances[] = {&s_.depthVariance, &s_.normalVariance, &s_.transitionVariance};
        const Rgba c = nearest(s_.color, u, v) * (1 / kSamples);
        Tap tap = {Vector(9), Vector(9), {c[0], c[1], c[2]}};
        tap.variance = dot(nearest(s_.variance, u, v), gray(1 / (3 * kSamples * (kSamples - 1))));
        tap.features[0] = double(u) - x_;
        tap.features[1] = double(v) - y_;
        for (size_t i = 2; i < 9; ++i) {
            tap.features[i] = nearest(*pictures[i / 3], u, v)[i % 3] / kSamples;
            tap.noise[i] = std::clamp(nearest(*variances[i / 3], u, v)[i % 3] / (kSamples - 1), 0.0, 1.0);
        }
        return tap;
    }

    // Entries are the directions in which the features of the window vary more than their noise.
    void reduceFeatures(double halfWindow) {
        Vector mean(0.0, 9);
        for (const Tap& tap : taps_) mean += tap.features / static_cast<double>(taps_.size());
        mean[0] = mean[1] = 0.0;
        Vector extent(0.01, 9);
        for (const Tap& tap : taps_) {
            const Vector d = tap.features - mean;
            const double norms[] = {std::abs(d[2]), std::hypot(d[3], d[4], d[5]), std::hypot(d[6], d[7], d[8])};
            for (size_t i = 2; i < 9; ++i) extent[i] = std::max(extent[i], norms[i / 3]);
        }
        extent[0] = extent[1] = halfWindow;
        SquareMatrix matrix = diagonal(9, 0.0);
        double noise = 0.0;
        for (const Tap& tap : taps_) {
            addOuterProduct(matrix, (tap.features - mean) / extent, 1.0);
            noise += (tap.noise / (extent * extent)).sum() / kSamples;
        }
        SquareMatrix vectors = diagonal(9, 1.0);
        Vector squares(9);
        const double rank = decompose(matrix, squares, vectors);
        SquareMatrix directions;
        for (size_t i = 0; i < 9; ++i)  // those of the position always count
            if (i < 2 || std::pow(squares[i], 0.25) > 0.01 + 4 * std::sqrt(noise / rank))
                directions.emplace_back(vectors[i] / extent);
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
        SquareMatrix colors(3, Vector(0.0, 2 * rank + 1));
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

Picture regressionReference(const Scene& s, uint32_t halfWindow, double bandwidth) {
    std::vector<PixelFit> fits;
    const Picture scales = painted(kWidth, kHeight, kFloat1, [&](uint32_t x, uint32_t y) {
        return gray(fits.emplace_back(s, halfWindow, bandwidth, x, y).optimalScale());
    });
    return painted(kWidth, kHeight, kFloat4, [&](uint32_t x, uint32_t y) {
        double sum = 0.0;
        double weights = 0.0;
        for (uint32_t v = y / 8 * 8; v < std::min(y / 8 * 8 + 8, kHeight); ++v)  // of the same group
            for (uint32_t u = x / 8 * 8; u < std::min(x / 8 * 8 + 8, kWidth); ++u) {
                const double dx = std::abs(double(u) - x), dy = std::abs(double(v) - y);
                const double weight = std::max(dx, dy) > 3 ? 0 : std::exp(-0.5 * (dx * dx + dy * dy));
                sum += weight * scales.at(u, v)[0];
                weights += weight;
            }
        const Vector fit = fits[size_t{y} * kWidth + x].value(sum / weights) * kSamples;
        return Rgba{fit[0], fit[1], fit[2], 1};
    });
}

// The scene as sums over the samples.
Scene sums() {
    Scene scene = makeScene(kWidth, kHeight);
    for (Picture* picture : {&scene.color, &scene.normal, &scene.depth, &scene.transition})
        *picture = mapped(*picture, picture->layout, [](const Rgba& p) { return p * kSamples; });
    scene.variance = mapped(scene.variance, kFloat4, [](const Rgba& p) { return p * (kSamples * (kSamples - 1)); });
    return scene;
}

using RegressionDenoiser = SceneTest;

// Rotations, thresholds and outliers are decided in float on the device: a pixel of which one is decided the other way
// may differ, all others agree closely.
TEST_F(RegressionDenoiser, MatchesTheReferenceWithCleanNoisyAndAbsentFeaturesAndNeverTurnsNegative) {
    Scene noisy = sums();
    noisy.depthVariance = noise(kWidth, kHeight, kFloat4, 0.3, 5);
    noisy.normalVariance = noise(kWidth, kHeight, kFloat4, 0.3, 6);
    noisy.transitionVariance = noise(kWidth, kHeight, kFloat4, 0.3, 7);
    Scene bare = sums();
    bare.normal = bare.depth = bare.transition = {};
    Scene rim = bare;
    rim.color = painted(kWidth, kHeight, kFloat4, [](uint32_t x, uint32_t) {  // over which fits run on below zero
        return x < 3 ? Rgba{0, 0, 0, 4} : Rgba{2.0, 1.0, 1.8, 4};
    });
    rim.variance = mapped(rim.variance, kFloat4, [](const Rgba& p) { return p * 20.0; });
    Scene steps = bare;  // whose normals are constant over most windows: but for rounding, they do not deviate
    steps.normal = painted(kWidth, kHeight, kFloat4, [](uint32_t x, uint32_t) {
        return Rgba{0.3, 0.3, 1.0, 0.0} * (0.04 + 0.09 * (x / 8));
    });
    const Scene clean = sums();
    for (const auto& [scene, halfWindow, bandwidth] :
         {std::tuple{&clean, 3u, 1.0f}, {&noisy, 3u, 1.0f}, {&bare, 4u, 2.0f}, {&rim, 4u, 1.0f}, {&steps, 3u, 1.0f}}) {
        const Parameters parameters = {{"halfWindow", halfWindow}, {"bandwidth", bandwidth}};
        ASSERT_EQ(execute(newFilter(TOV_IMAGE_FILTER_LWR_DENOISE, parameters), *scene), TOV_SUCCESS);
        const Picture expected = regressionReference(*scene, halfWindow, double{bandwidth});
        size_t different = 0;
        for (uint32_t i = 0; i < color_.pixelCount(); ++i)
            different += length(color_.at(i, 0) - expected.at(i, 0)) <= 0.01 * kSamples ? 0 : 1;
        EXPECT_LE(different, color_.pixelCount() / 50);
        EXPECT_GT(maxDifference(expected, scene->color), 0.05) << "the filter must change the picture";
        EXPECT_GE(*std::min_element(color_.values.begin(), color_.values.end()), 0.0f);
    }
}

}  // namespace
