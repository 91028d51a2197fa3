#include "eaw_reference.h"

#include <algorithm>
#include <cmath>

namespace denoisetest {

namespace {

using apitest::Picture;
using apitest::Rgba;
using Vec3 = std::array<double, 3>;

constexpr std::array<double, 5> kSpline = {1.0 / 16, 1.0 / 4, 3.0 / 8, 1.0 / 4, 1.0 / 16};
constexpr int kSobel[3][3] = {{1, 0, -1}, {2, 0, -2}, {1, 0, -1}};
constexpr double kGauss[3][3] = {
    {0.077847, 0.123317, 0.077847}, {0.123317, 0.195346, 0.123317}, {0.077847, 0.123317, 0.077847}};

uint32_t reflected(int value, uint32_t size) {
    const int n = static_cast<int>(size);
    if (value < 0) value = -value - 1;
    if (value >= n) value = 2 * n - value - 1;
    return static_cast<uint32_t>(std::clamp(value, 0, n - 1));
}

Vec3 divided(const Rgba& c) {
    const double w = c[3] != 0.0 ? c[3] : 1.0;
    return {c[0] / w, c[1] / w, c[2] / w};
}

double distance(const Vec3& a, const Vec3& b) {
    return std::hypot(a[0] - b[0], a[1] - b[1], a[2] - b[2]);
}

double normalWeight(const Rgba& a, const Rgba& b, double sigma) {
    double ab = 0.0;
    double aa = 0.0;
    double bb = 0.0;
    for (size_t i = 0; i < 3; ++i) {
        ab += (a[i] + 0.01) * (b[i] + 0.01);
        aa += (a[i] + 0.01) * (a[i] + 0.01);
        bb += (b[i] + 0.01) * (b[i] + 0.01);
    }
    return std::pow(std::max(ab / std::sqrt(aa * bb), 0.0), 1.0 / sigma);
}

class Level {
 public:
    Level(const Picture& color, const WaveletInputs& inputs, const std::vector<double>& variance, int spacing)
        : color_(color), inputs_(inputs), variance_(variance), spacing_(spacing) {}

    // The filtered colour; its variance goes to `filtered`.
    Rgba pixel(uint32_t x, uint32_t y, double& filtered) const {
        const Vec3 q = divided(color_.at(x, y));
        const std::array<double, 2> slope = gradient(x, y);
        const double scale = inputs_.colorSigma * std::sqrt(centreVariance(x, y)) + 0.00001;
        Vec3 sum = {0, 0, 0};
        double varianceSum = 0.0;
        double weightSum = 0.0;
        for (int i = -2; i <= 2; ++i) {
            for (int j = -2; j <= 2; ++j) {
                const uint32_t u = column(static_cast<int>(x) + i * spacing_);
                const uint32_t v = row(static_cast<int>(y) + j * spacing_);
                const Vec3 c = divided(color_.at(u, v));
                const double rise = std::abs(slope[0] * i * spacing_ + slope[1] * j * spacing_);
                const double weight = kSpline[size_t(i + 2)] * kSpline[size_t(j + 2)] *
                                      std::exp(-distance(c, q) / scale) * featureWeight(u, v, x, y, rise);
                for (size_t k = 0; k < 3; ++k) sum[k] += c[k] * weight;
                varianceSum += tapVariance(u, v) * weight * weight;
                weightSum += weight;
            }
        }
        filtered = varianceSum / (weightSum * weightSum);
        return {sum[0] / weightSum, sum[1] / weightSum, sum[2] / weightSum, 1.0};
    }

 private:
    uint32_t column(int x) const { return reflected(x, color_.width); }
    uint32_t row(int y) const { return reflected(y, color_.height); }
    static Rgba read(const Picture* picture, uint32_t x, uint32_t y) {
        return picture != nullptr ? picture->at(x, y) : Rgba{0, 0, 0, 0};
    }

    double featureWeight(uint32_t u, uint32_t v, uint32_t x, uint32_t y, double rise) const {
        const double step = std::abs(read(inputs_.depth, u, v)[0] - read(inputs_.depth, x, y)[0]);
        const double change =
            distance(divided(read(inputs_.transition, u, v)), divided(read(inputs_.transition, x, y)));
        return normalWeight(read(inputs_.normal, u, v), read(inputs_.normal, x, y), inputs_.normalSigma) *
               std::exp(-step / (inputs_.depthSigma * rise + 0.001)) * std::exp(-change / inputs_.transSigma);
    }

    std::array<double, 2> gradient(uint32_t x, uint32_t y) const {
        std::array<double, 2> g = {0, 0};
        for (int i = -1; i <= 1; ++i) {
            for (int j = -1; j <= 1; ++j) {
                const double depth =
                    read(inputs_.depth, column(static_cast<int>(x) + j), row(static_cast<int>(y) + i))[0];
                g[0] += kSobel[i + 1][j + 1] * depth;
                g[1] += kSobel[j + 1][i + 1] * depth;
            }
        }
        return g;
    }

    double centreVariance(uint32_t x, uint32_t y) const {
        if (!variance_.empty()) return variance_[size_t{y} * color_.width + x];
        Vec3 blurred = {0, 0, 0};
        for (int i = -1; i <= 1; ++i)
            for (int j = -1; j <= 1; ++j)
                for (size_t k = 0; k < 3; ++k)
                    blurred[k] += kGauss[i + 1][j + 1] * read(inputs_.variance, column(static_cast<int>(x) + j),
                                                              row(static_cast<int>(y) + i))[k];
        return std::hypot(blurred[0], blurred[1], blurred[2]);
    }

    double tapVariance(uint32_t x, uint32_t y) const {
        if (!variance_.empty()) return variance_[size_t{y} * color_.width + x];
        const Rgba v = read(inputs_.variance, x, y);
        return std::sqrt(v[0] * v[0] + v[1] * v[1] + v[2] * v[2] + v[3] * v[3]);
    }

    const Picture& color_;
    const WaveletInputs& inputs_;
    const std::vector<double>& variance_;  // empty at the first level
    int spacing_;
};

}  // namespace

Picture waveletReference(const Picture& color, const WaveletInputs& inputs) {
    Picture current = color;
    std::vector<double> variance;
    for (int spacing = 1; spacing <= 16; spacing *= 2) {
        const Level level(current, inputs, variance, spacing);
        Picture next(color.width, color.height, color.layout);
        std::vector<double> nextVariance(color.pixelCount());
        for (uint32_t y = 0; y < color.height; ++y)
            for (uint32_t x = 0; x < color.width; ++x)
                next.set(x, y, level.pixel(x, y, nextVariance[size_t{y} * color.width + x]));
        current = std::move(next);
        variance = std::move(nextVariance);
    }
    return current;
}

}  // namespace denoisetest
