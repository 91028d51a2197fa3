// A joint bilateral window around every pixel: the weighted spread of its colours is the noise, as far as the features
// keep other surfaces out. Then a small box over the estimates, whose own noise the filters would take for structure.
#include "variance_estimate.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <stdexcept>

#include "picture.h"

namespace tool {
namespace {

constexpr int kRadius = 3;
constexpr size_t kWindow = size_t{kRadius} * 2 + 1;  // pixels on a side
constexpr int kSmoothingRadius = 1;
constexpr float kSpatialSigma = 2.0f;
constexpr float kNormalSigma = 0.15f;
constexpr float kAlbedoSigma = 0.1f;
constexpr float kDepthTolerance = 0.01f;  // of the depth itself, beside its slope
constexpr float kLeastWeight = 1e-4f;
constexpr float kLeastCorrection = 0.02f;
constexpr float kLargestVariance = 1e12f;  // the filters take larger values for unusable

using Rgb = std::array<float, 3>;

bool finite(const float* rgb) {
    return std::isfinite(rgb[0]) && std::isfinite(rgb[1]) && std::isfinite(rgb[2]);
}

float squaredDistance(const float* a, const float* b) {
    float sum = 0.0f;
    for (size_t i = 0; i < 3; ++i) sum += (a[i] - b[i]) * (a[i] - b[i]);
    return sum;
}

// Exponents of the window's Gaussian, row by row.
std::array<float, kWindow * kWindow> spatialExponents() {
    std::array<float, kWindow * kWindow> exponents{};
    for (int j = -kRadius; j <= kRadius; ++j)
        for (int i = -kRadius; i <= kRadius; ++i)
            exponents[static_cast<size_t>(j + kRadius) * kWindow + static_cast<size_t>(i + kRadius)] =
                static_cast<float>(i * i + j * j) / (2.0f * kSpatialSigma * kSpatialSigma);
    return exponents;
}

class Estimator {
 public:
    explicit Estimator(const NoisyPicture& picture)
        : picture_(picture),
          width_(static_cast<int>(picture.width)),
          height_(static_cast<int>(picture.height)),
          exponents_(spatialExponents()) {}

    // Variance of the pixel's colours, and in the fourth how much of the window spoke for it, 0 to 1.
    std::array<float, kComponents> spread(int x, int y) const {
        const size_t centre = index(x, y);
        const float slope = depthSlope(x, y);
        const Rgb origin = finite(&picture_.color[centre])
                               ? Rgb{picture_.color[centre], picture_.color[centre + 1], picture_.color[centre + 2]}
                               : Rgb{};
        Rgb sum{};
        Rgb squares{};
        float weights = 0.0f;
        float squaredWeights = 0.0f;
        for (int v = std::max(y - kRadius, 0); v <= std::min(y + kRadius, height_ - 1); ++v) {
            for (int u = std::max(x - kRadius, 0); u <= std::min(x + kRadius, width_ - 1); ++u) {
                const size_t at = index(u, v);
                const size_t place =
                    static_cast<size_t>(v - y + kRadius) * kWindow + static_cast<size_t>(u - x + kRadius);
                const float weight = std::exp(-(exponents_[place] + unlikeness(centre, at, place, slope)));
                if (!(weight >= kLeastWeight) || !finite(&picture_.color[at])) continue;
                for (size_t i = 0; i < 3; ++i) {
                    const float difference = picture_.color[at + i] - origin[i];
                    sum[i] += weight * difference;
                    squares[i] += weight * difference * difference;
                }
                weights += weight;
                squaredWeights += weight * weight;
            }
        }
        if (weights == 0.0f) return {};
        // The mean is fitted to the same few colours: their spread about it is too small by this factor.
        const float correction = 1.0f - squaredWeights / (weights * weights);
        std::array<float, kComponents> result{};
        for (size_t i = 0; i < 3; ++i) {
            const float mean = sum[i] / weights;
            const float variance = std::max(squares[i] / weights - mean * mean, 0.0f);
            const float corrected = correction > kLeastCorrection ? variance / correction : variance;
            result[i] = corrected < kLargestVariance ? corrected : kLargestVariance;  // also in place of NaN
        }
        result[3] = correction;
        return result;
    }

 private:
    size_t index(int x, int y) const {
        return (static_cast<size_t>(y) * picture_.width + static_cast<size_t>(x)) * kComponents;
    }

    float depthAt(int x, int y) const {
        return picture_.depth[index(std::clamp(x, 0, width_ - 1), std::clamp(y, 0, height_ - 1))];
    }

    // Change of the depth from pixel to pixel; the smaller of the two sides, so that edges count on neither.
    float depthSlope(int x, int y) const {
        if (picture_.depth.empty()) return 0.0f;
        const float depth = depthAt(x, y);
        const float across = std::min(std::abs(depthAt(x + 1, y) - depth), std::abs(depthAt(x - 1, y) - depth));
        const float down = std::min(std::abs(depthAt(x, y + 1) - depth), std::abs(depthAt(x, y - 1) - depth));
        return across + down;
    }

    // Exponent of the features' weight; NaN where one is not finite, which then weighs nothing.
    float unlikeness(size_t a, size_t b, size_t place, float slope) const {
        if (a == b) return 0.0f;
        float exponent = 0.0f;
        if (!picture_.normal.empty())
            exponent +=
                squaredDistance(&picture_.normal[a], &picture_.normal[b]) / (2.0f * kNormalSigma * kNormalSigma);
        if (!picture_.albedo.empty())
            exponent +=
                squaredDistance(&picture_.albedo[a], &picture_.albedo[b]) / (2.0f * kAlbedoSigma * kAlbedoSigma);
        if (!picture_.depth.empty()) {
            const float distance = std::sqrt(exponents_[place] * 2.0f) * kSpatialSigma;
            const float reach = slope * distance + kDepthTolerance * std::abs(picture_.depth[a]) + 1e-4f;
            exponent += std::abs(picture_.depth[a] - picture_.depth[b]) / reach;
        }
        return exponent;
    }

    const NoisyPicture& picture_;
    int width_;
    int height_;
    std::array<float, kWindow * kWindow> exponents_;
};

// Means over small boxes, weighted with the fourth component, which becomes 0.
std::vector<float> smoothed(const std::vector<float>& values, uint32_t width, uint32_t height) {
    constexpr float kLeast = 0.01f;
    std::vector<float> result(values.size(), 0.0f);
    for (uint32_t y = 0; y < height; ++y) {
        for (uint32_t x = 0; x < width; ++x) {
            Rgb sum{};
            float weights = 0.0f;
            for (uint32_t v = y - std::min<uint32_t>(y, kSmoothingRadius);
                 v <= std::min(y + kSmoothingRadius, height - 1); ++v) {
                for (uint32_t u = x - std::min<uint32_t>(x, kSmoothingRadius);
                     u <= std::min(x + kSmoothingRadius, width - 1); ++u) {
                    const float* at = &values[(size_t{v} * width + u) * kComponents];
                    const float weight = std::max(at[3], kLeast);
                    for (size_t i = 0; i < 3; ++i) sum[i] += weight * at[i];
                    weights += weight;
                }
            }
            for (size_t i = 0; i < 3; ++i) result[(size_t{y} * width + x) * kComponents + i] = sum[i] / weights;
        }
    }
    return result;
}

}  // namespace

std::vector<float> estimateVariance(const NoisyPicture& picture) {
    const size_t size = size_t{picture.width} * picture.height * kComponents;
    for (const std::span<const float>& feature : {picture.albedo, picture.normal, picture.depth})
        if (!feature.empty() && feature.size() != size) throw std::invalid_argument("feature of another size");
    if (picture.color.size() != size) throw std::invalid_argument("colours of another size");
    const Estimator estimator(picture);
    std::vector<float> spreads(size);
    for (uint32_t y = 0; y < picture.height; ++y)
        for (uint32_t x = 0; x < picture.width; ++x) {
            const auto spread = estimator.spread(static_cast<int>(x), static_cast<int>(y));
            std::copy(spread.begin(), spread.end(), &spreads[(size_t{y} * picture.width + x) * kComponents]);
        }
    return smoothed(spreads, picture.width, picture.height);
}

}  // namespace tool
