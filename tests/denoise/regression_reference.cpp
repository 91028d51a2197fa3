#include "regression_reference.h"

#include <algorithm>
#include <cmath>

namespace denoisetest {

namespace {

using apitest::Picture;
using apitest::Rgba;
using Vec3 = std::array<double, 3>;
constexpr size_t kFeatures = 9;
using Features = std::array<double, kFeatures>;
using Matrix = std::vector<std::vector<double>>;

Matrix square(size_t n) {
    return Matrix(n, std::vector<double>(n, 0.0));
}

double average(const Vec3& v) {
    return (v[0] + v[1] + v[2]) / 3.0;
}

// Gauss elimination of a symmetric positive definite system.
std::vector<double> solved(Matrix a, std::vector<double> b) {
    const size_t n = b.size();
    for (size_t i = 0; i < n; ++i) {
        for (size_t r = i + 1; r < n; ++r) {
            const double f = a[r][i] / a[i][i];
            for (size_t c = i; c < n; ++c) a[r][c] -= f * a[i][c];
            b[r] -= f * b[i];
        }
    }
    for (size_t i = n; i-- > 0;) {
        for (size_t c = i + 1; c < n; ++c) b[i] -= a[i][c] * b[c];
        b[i] /= a[i][i];
    }
    return b;
}

// One-sided Jacobi rotations of the columns of u; v collects them, norms are the columns' squared lengths.
size_t decompose(Matrix& u, Matrix& v, Features& norms) {
    const double eps = 1e-7;
    const double e2 = 10.0 * kFeatures * eps * eps;
    const double tol = 0.1 * eps;
    for (size_t i = 0; i < kFeatures; ++i) v[i][i] = 1.0;
    size_t rank = kFeatures;
    size_t rotations = 1;
    for (int sweep = 0; rotations != 0 && sweep <= 6; ++sweep) {
        rotations = rank * (rank - 1) / 2;
        for (size_t j = 0; j + 1 < rank; ++j) {
            for (size_t k = j + 1; k < rank; ++k) {
                double p = 0.0;
                double q = 0.0;
                double r = 0.0;
                for (size_t i = 0; i < kFeatures; ++i) {
                    p += u[i][j] * u[i][k];
                    q += u[i][j] * u[i][j];
                    r += u[i][k] * u[i][k];
                }
                norms[j] = q;
                norms[k] = r;
                double c = 0.0;
                double s = 0.0;
                if (q >= r) {
                    if (q <= e2 * norms[0] || std::abs(p) <= tol * q) {
                        --rotations;
                        continue;
                    }
                    const double ratio = 1.0 - r / q;
                    const double vt = std::sqrt(4.0 * p / q * p / q + ratio * ratio);
                    c = std::sqrt(0.5 * (1.0 + ratio / vt));
                    s = p / q / (vt * c);
                } else {
                    const double ratio = q / r - 1.0;
                    const double vt = std::sqrt(4.0 * p / r * p / r + ratio * ratio);
                    s = std::sqrt(0.5 * (1.0 - ratio / vt)) * (p < 0.0 ? -1.0 : 1.0);
                    c = p / r / (vt * s);
                }
                for (size_t i = 0; i < kFeatures; ++i) {
                    for (Matrix* m : {&u, &v}) {
                        const double x = (*m)[i][j];
                        const double y = (*m)[i][k];
                        (*m)[i][j] = x * c + y * s;
                        (*m)[i][k] = y * c - x * s;
                    }
                }
            }
        }
        while (rank >= 3 && norms[rank - 1] <= norms[0] * tol + tol * tol) --rank;
    }
    return rank;
}

class PixelFit {
 public:
    PixelFit(const Picture& color, const RegressionInputs& inputs, uint32_t x, uint32_t y)
        : color_(color), in_(inputs), x_(x), y_(y), invS_(1.0 / inputs.samples), invSv_(1.0 / (inputs.samples - 1.0)) {
        reduce();
        estimateBandwidths();
    }

    double optimalScale() const {
        double m[4] = {};
        double n[4] = {};
        double biasSide[2] = {};
        double varianceSide[2] = {};
        for (int g = 0; g < 5; ++g) {
            const double scale = (g + 1) / 5.0;
            double variance = 0.0;
            uint32_t ignored = 0;
            const Vec3 fit = value(scale, variance, ignored);
            const Vec3 own = colorAt(x_, y_);
            const double bias = average({fit[0] - own[0], fit[1] - own[1], fit[2] - own[2]});
            const double spread = std::max(in_.samples * variance, 0.0);
            const double h2 = scale * scale;
            const double ihr = std::pow(scale, -static_cast<double>(rank_));
            const double biasTerms[4] = {1, h2, h2, h2 * h2};
            const double varianceTerms[4] = {1, ihr, ihr, ihr * ihr};
            for (size_t i = 0; i < 4; ++i) m[i] += biasTerms[i];
            for (size_t i = 0; i < 4; ++i) n[i] += varianceTerms[i];
            biasSide[0] += bias;
            biasSide[1] += h2 * bias;
            varianceSide[0] += spread;
            varianceSide[1] += spread * ihr;
        }
        const double biasSlope = (m[0] * biasSide[1] - m[2] * biasSide[0]) / (m[0] * m[3] - m[1] * m[2] + 0.0001);
        const double varianceSlope =
            std::abs((n[0] * varianceSide[1] - n[2] * varianceSide[0]) / (n[0] * n[3] - n[1] * n[2] + 0.0001));
        const double denominator = 4.0 * biasSlope * biasSlope * in_.samples;
        if (denominator < 1e-20) return 1.0;
        const double rank = static_cast<double>(rank_);
        return std::clamp(std::pow(rank * varianceSlope / denominator, 1.0 / (4.0 + rank)), 0.2, 1.0);
    }

    // The fit's value at the pixel with all bandwidths times `scale`.
    Vec3 value(double scale, double& variance, uint32_t& fallbacks) const {
        Matrix a = square(rank_ + 1);
        visit([&](uint32_t u, uint32_t v) {
            const std::vector<double> e = entries(u, v);
            const double weight = kernelWeight(e, scale, u, v);
            for (size_t r = 0; r <= rank_; ++r)
                for (size_t c = 0; c <= rank_; ++c) a[r][c] += weight * e[r] * e[c];
        });
        for (size_t i = 0; i <= rank_; ++i) a[i][i] += 0.0001;
        std::vector<double> unit(rank_ + 1, 0.0);
        unit[0] = 1.0;
        const std::vector<double> row = solved(a, unit);
        Vec3 fit{};
        Vec3 positive{};
        double positiveSum = 0.0;
        double positiveVariance = 0.0;
        variance = 0.0;
        visit([&](uint32_t u, uint32_t v) {
            const std::vector<double> e = entries(u, v);
            double l = 0.0;
            for (size_t i = 0; i <= rank_; ++i) l += row[i] * e[i];
            l *= kernelWeight(e, scale, u, v);
            const Vec3 c = colorAt(u, v);
            const double noise = l * l * std::max(varianceAt(u, v), 0.0);
            for (size_t i = 0; i < 3; ++i) fit[i] += c[i] * l;
            variance += noise;
            if (l <= 0.0) return;
            for (size_t i = 0; i < 3; ++i) positive[i] += c[i] * l;
            positiveVariance += noise;
            positiveSum += l;
        });
        if (fit[0] >= 0.0 && fit[1] >= 0.0 && fit[2] >= 0.0) return fit;
        ++fallbacks;
        positiveSum = std::max(positiveSum, 0.001);
        variance = positiveVariance / (positiveSum * positiveSum);
        return {positive[0] / positiveSum, positive[1] / positiveSum, positive[2] / positiveSum};
    }

 private:
    static Rgba read(const Picture* picture, uint32_t x, uint32_t y) {
        return picture != nullptr ? picture->at(x, y) : Rgba{};
    }
    Vec3 colorAt(uint32_t x, uint32_t y) const {
        const Rgba c = color_.at(x, y);
        return {c[0] * invS_, c[1] * invS_, c[2] * invS_};
    }
    double varianceAt(uint32_t x, uint32_t y) const {
        const Rgba v = read(in_.variance, x, y);
        return average({v[0], v[1], v[2]}) * invS_ * invSv_;
    }
    Features featuresAt(uint32_t x, uint32_t y) const {
        const Rgba n = read(in_.normal, x, y);
        const Rgba t = read(in_.transition, x, y);
        return {double(x) - x_, double(y) - y_, read(in_.depth, x, y)[1] * invS_,
                n[0] * invS_,   n[1] * invS_,   n[2] * invS_,
                t[0] * invS_,   t[1] * invS_,   t[2] * invS_};
    }

    template <class Body>
    void walk(Body&& body) const {
        const uint32_t h = in_.halfWindow;
        for (uint32_t v = y_ > h ? y_ - h : 0; v <= std::min(y_ + h, color_.height - 1); ++v)
            for (uint32_t u = x_ > h ? x_ - h : 0; u <= std::min(x_ + h, color_.width - 1); ++u) body(u, v);
    }
    // Without outliers.
    template <class Body>
    void visit(Body&& body) const {
        const double own = average(colorAt(x_, y_));
        const double deviation = std::sqrt(varianceAt(x_, y_));
        walk([&](uint32_t u, uint32_t v) {
            const double limit = 3.0 * (deviation + std::sqrt(varianceAt(u, v))) + 0.005;
            if (std::abs(average(colorAt(u, v)) - own) <= limit) body(u, v);
        });
    }

    // Noise of the features, scaled.
    double noiseAt(uint32_t u, uint32_t v, const Features& scales) const {
        const auto bounded = [&](const Picture* picture, size_t i) {
            return std::clamp(read(picture, u, v)[i] * invSv_, 0.0, 1.0);
        };
        double noise = scales[2] * scales[2] * bounded(in_.depthVariance, 1);
        for (size_t i = 0; i < 3; ++i) noise += scales[3] * scales[3] * bounded(in_.normalVariance, i);
        for (size_t i = 0; i < 3; ++i) noise += scales[6] * scales[6] * bounded(in_.transitionVariance, i);
        return noise * invS_;
    }

    void reduce() {
        Features mean{};
        double count = 0.0;
        walk([&](uint32_t u, uint32_t v) {
            const Features f = featuresAt(u, v);
            for (size_t i = 2; i < kFeatures; ++i) mean[i] += f[i];
            count += 1.0;
        });
        for (double& m : mean) m /= count;
        double range[3] = {};
        walk([&](uint32_t u, uint32_t v) {
            const Features f = featuresAt(u, v);
            const auto length = [&](size_t at) {
                return std::hypot(f[at] - mean[at], f[at + 1] - mean[at + 1], f[at + 2] - mean[at + 2]);
            };
            range[0] = std::max(range[0], std::abs(f[2] - mean[2]));
            range[1] = std::max(range[1], length(3));
            range[2] = std::max(range[2], length(6));
        });
        Features scales{};
        for (size_t i = 0; i < kFeatures; ++i)
            scales[i] = i < 2 ? 1.0 / in_.halfWindow : 1.0 / std::max(range[i < 3 ? 0 : i < 6 ? 1 : 2], 0.01);
        Matrix u = square(kFeatures);
        Matrix v = square(kFeatures);
        double norm = 0.0;
        walk([&](uint32_t px, uint32_t py) {
            const Features f = featuresAt(px, py);
            for (size_t r = 0; r < kFeatures; ++r)
                for (size_t c = 0; c < kFeatures; ++c)
                    u[r][c] += (f[r] - mean[r]) * scales[r] * (f[c] - mean[c]) * scales[c];
            norm += noiseAt(px, py, scales);
        });
        Features norms{};
        const size_t estimated = decompose(u, v, norms);
        const double threshold = 0.01 + 2.0 * std::sqrt(norm) / (std::sqrt(static_cast<double>(estimated)) * 0.5);
        for (size_t c = 0; c < kFeatures; ++c) {
            if (c >= 2 && std::pow(norms[c], 0.25) <= threshold) continue;
            Features column{};
            for (size_t r = 0; r < kFeatures; ++r) column[r] = v[r][c] * scales[r];
            projection_.push_back(column);
        }
        rank_ = projection_.size();
    }

    // 1 and the reduced coordinates.
    std::vector<double> entries(uint32_t u, uint32_t v) const {
        const Features f = featuresAt(u, v);
        const Features own = featuresAt(x_, y_);
        std::vector<double> e(rank_ + 1, 0.0);
        e[0] = 1.0;
        for (size_t c = 0; c < rank_; ++c)
            for (size_t r = 0; r < kFeatures; ++r) e[c + 1] += projection_[c][r] * (f[r] - own[r]);
        return e;
    }

    double kernelWeight(const std::vector<double>& e, double scale, uint32_t u, uint32_t v) const {
        double weight = 1.0;
        for (size_t i = 0; i < rank_; ++i) {
            const double t = e[i + 1] / (bandwidths_.empty() ? 1.0 : scale * bandwidths_[i]);
            weight *= std::abs(t) < 1.0 ? 0.75 * (1.0 - t * t) : 0.0;
        }
        return weight / std::max(1.0, varianceAt(u, v));
    }

    void estimateBandwidths() {
        const size_t size = 2 * rank_ + 1;
        Matrix a = square(size);
        std::array<std::vector<double>, 3> b;
        b.fill(std::vector<double>(size, 0.0));
        walk([&](uint32_t u, uint32_t v) {
            std::vector<double> e = entries(u, v);
            const double weight = kernelWeight(e, 1.0, u, v);
            for (size_t i = 1; i <= rank_; ++i) e.push_back(e[i] * e[i]);
            const Vec3 color = colorAt(u, v);
            for (size_t r = 0; r < size; ++r) {
                for (size_t c = 0; c < size; ++c) a[r][c] += weight * e[r] * e[c];
                for (size_t k = 0; k < 3; ++k) b[k][r] += weight * e[r] * color[k];
            }
        });
        for (size_t i = 0; i < size; ++i) a[i][i] += 0.001;
        for (std::vector<double>& side : b) side = solved(a, side);
        std::vector<double> bandwidths;
        for (size_t i = rank_ + 1; i < size; ++i) {
            const double curvature = 2.0 * average({std::abs(b[0][i]), std::abs(b[1][i]), std::abs(b[2][i])});
            bandwidths.push_back(in_.bandwidth / std::sqrt(curvature + 0.16));
        }
        bandwidths_ = bandwidths;
    }

    const Picture& color_;
    const RegressionInputs& in_;
    uint32_t x_;
    uint32_t y_;
    double invS_;
    double invSv_;
    size_t rank_ = 0;
    std::vector<Features> projection_;
    std::vector<double> bandwidths_;  // empty while they are 1
};

}  // namespace

Picture regressionReference(const Picture& color, const RegressionInputs& inputs, uint32_t* fallbacks) {
    std::vector<PixelFit> fits;
    std::vector<double> scales;
    for (uint32_t y = 0; y < color.height; ++y) {
        for (uint32_t x = 0; x < color.width; ++x) {
            fits.emplace_back(color, inputs, x, y);
            scales.push_back(fits.back().optimalScale());
        }
    }
    Picture result(color.width, color.height, color.layout);
    for (uint32_t y = 0; y < color.height; ++y) {
        for (uint32_t x = 0; x < color.width; ++x) {
            double sum = 0.0;
            double weights = 0.0;
            for (uint32_t v = y / 8 * 8; v < std::min(y / 8 * 8 + 8, color.height); ++v) {
                for (uint32_t u = x / 8 * 8; u < std::min(x / 8 * 8 + 8, color.width); ++u) {
                    const double dx = double(u) - x;
                    const double dy = double(v) - y;
                    if (std::abs(dx) > 3 || std::abs(dy) > 3) continue;
                    const double weight = std::exp(-0.5 * (dx * dx + dy * dy));
                    sum += weight * scales[size_t{v} * color.width + u];
                    weights += weight;
                }
            }
            double ignored = 0.0;
            uint32_t negative = 0;
            const Vec3 fit = fits[size_t{y} * color.width + x].value(sum / weights, ignored, negative);
            if (fallbacks != nullptr) *fallbacks += negative;
            result.set(x, y, {fit[0] * inputs.samples, fit[1] * inputs.samples, fit[2] * inputs.samples, 1.0});
        }
    }
    return result;
}

}  // namespace denoisetest
