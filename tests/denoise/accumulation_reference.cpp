#include "accumulation_reference.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace denoisetest {

namespace {

using apitest::Matrix;
using apitest::Picture;
using apitest::Rgba;

constexpr Rgba kLuminance = {0.2126, 0.7152, 0.0722, 0.0};

double dot3(const Rgba& a, const Rgba& b) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}

double distance3(const Rgba& a, const Rgba& b) {
    return std::hypot(a[0] - b[0], a[1] - b[1], a[2] - b[2]);
}

Rgba read(const Picture& picture, uint32_t x, uint32_t y) {
    return picture.values.empty() ? Rgba{0, 0, 0, 0} : picture.at(x, y);
}

Rgba unit(Rgba v) {
    const double length = std::sqrt(dot3(v, v));
    for (size_t i = 0; i < 3 && length > 0.0; ++i) v[i] /= length;
    return v;
}

std::array<double, 4> transformed(const Matrix& m, const Rgba& p) {
    std::array<double, 4> c{};
    for (size_t r = 0; r < 4; ++r)
        c[r] = double{m[4 * r]} * p[0] + double{m[4 * r + 1]} * p[1] + double{m[4 * r + 2]} * p[2] + m[4 * r + 3];
    return c;
}

Rgba dividedByWeight(Rgba v) {
    const double w = std::max(1.0, v[3]);
    return {v[0] / w, v[1] / w, v[2] / w, v[3]};
}

bool consistent(const Frame& frame, const Rgba& a, const Rgba& b) {
    return frame.normal.values.empty() || dot3(a, b) > std::sqrt(0.5);
}

double gradient(const Picture& p, uint32_t x, uint32_t y) {
    const uint32_t l = x > 0 ? x - 1 : 0;
    const uint32_t r = std::min(x + 1, p.width - 1);
    const uint32_t t = y > 0 ? y - 1 : 0;
    const uint32_t b = std::min(y + 1, p.height - 1);
    double across = 0.0;
    double down = 0.0;
    for (size_t i = 0; i < 4; ++i) {
        const auto at = [&](uint32_t u, uint32_t v) { return p.at(u, v)[i]; };
        const double dx = at(l, t) - at(r, t) + 2 * (at(l, y) - at(r, y)) + at(l, b) - at(r, b);
        const double dy = at(l, t) - at(l, b) + 2 * (at(x, t) - at(x, b)) + at(r, t) - at(r, b);
        across += dx * dx / 16;
        down += dy * dy / 16;
    }
    return std::sqrt(across) + std::sqrt(down);
}

double spatialVariance(const Frame& frame, uint32_t x, uint32_t y) {
    const Rgba position = dividedByWeight(frame.position.at(x, y));
    const Rgba normal = dividedByWeight(read(frame.normal, x, y));
    const auto each = [&](auto&& visit) {
        for (uint32_t v = y > 3 ? y - 3 : 0; v <= std::min(y + 3, frame.color.height - 1); ++v)
            for (uint32_t u = x > 3 ? x - 3 : 0; u <= std::min(x + 3, frame.color.width - 1); ++u) {
                const double a = distance3(dividedByWeight(frame.position.at(u, v)), position) / 0.1;
                const double b = distance3(dividedByWeight(read(frame.normal, u, v)), normal) / 0.1;
                visit(dividedByWeight(frame.color.at(u, v)), std::exp(-0.5 * (a * a + b * b)));
            }
    };
    Rgba mean{};
    Rgba variance{};
    double sum = 0.0;
    each([&](const Rgba& color, double weight) {
        for (size_t i = 0; i < 3; ++i) mean[i] += color[i] * weight;
        sum += weight;
    });
    sum = std::max(sum, 0.00001);
    each([&](const Rgba& color, double weight) {
        for (size_t i = 0; i < 3; ++i) variance[i] += std::pow(mean[i] / sum - color[i], 2) * weight / sum;
    });
    return dot3(variance, kLuminance);
}

}  // namespace

std::vector<std::array<double, 2>> motionReference(const Picture& position, const Matrix& before, const Matrix& now) {
    std::vector<std::array<double, 2>> motion;
    for (uint32_t y = 0; y < position.height; ++y) {
        for (uint32_t x = 0; x < position.width; ++x) {
            const Rgba p = dividedByWeight(position.at(x, y));
            const auto c = transformed(now, p);
            const auto d = transformed(before, p);
            if (dot3(p, p) == 0.0) {
                motion.push_back({0.0, 0.0});
            } else if (c[3] == 0.0 || d[3] == 0.0) {
                motion.push_back({std::numeric_limits<double>::quiet_NaN(), 0.0});
            } else {
                motion.push_back({0.5 * (d[0] / d[3] - c[0] / c[3]), -0.5 * (d[1] / d[3] - c[1] / c[3])});
            }
        }
    }
    return motion;
}

const AccumulationReference::Pixel& AccumulationReference::at(int x, int y) const {
    const int u = std::clamp(x, 0, static_cast<int>(width_) - 1);
    const int v = std::clamp(y, 0, static_cast<int>(height_) - 1);
    return history_[static_cast<size_t>(v) * width_ + static_cast<size_t>(u)];
}

Rgba AccumulationReference::bilinear(Rgba Pixel::*slice, double x, double y) const {
    const int left = static_cast<int>(std::floor(x));
    const int top = static_cast<int>(std::floor(y));
    const double fx = x - left;
    const double fy = y - top;
    Rgba sum{};
    for (size_t i = 0; i < 4; ++i)
        sum[i] = ((at(left, top).*slice)[i] * (1 - fx) + (at(left + 1, top).*slice)[i] * fx) * (1 - fy) +
                 ((at(left, top + 1).*slice)[i] * (1 - fx) + (at(left + 1, top + 1).*slice)[i] * fx) * fy;
    return sum;
}

bool AccumulationReference::historyColor(const Frame& frame, uint32_t x, uint32_t y, double u, double v,
                                         Rgba& color) const {
    const Rgba normal = unit(read(frame.normal, x, y));
    const double id = std::rint(read(frame.meshId, x, y)[0]);
    const int left = static_cast<int>(std::floor(u));
    const int top = static_cast<int>(std::floor(v));
    Rgba sum{};
    int accepted = 0;
    int weighted = 0;
    for (int j = 0; j < 2; ++j) {
        for (int i = 0; i < 2; ++i) {
            if ((i == 1 && u == left) || (j == 1 && v == top)) continue;  // without weight
            const Pixel& tap = at(left + i, top + j);
            ++weighted;
            if (!consistent(frame, normal, tap.normal) || std::rint(tap.meshId[0]) != id) continue;
            for (size_t k = 0; k < 4; ++k) sum[k] += tap.color[k];
            ++accepted;
        }
    }
    if (accepted == 0) return false;
    for (double& value : sum) value /= accepted;
    color = accepted == weighted ? bilinear(&Pixel::color, u, v) : sum;
    return true;
}

void AccumulationReference::step(const Frame& frame, uint32_t x, uint32_t y, const std::array<double, 2>& motion,
                                 Pixel& out) const {
    out.position = frame.position.at(x, y);
    out.normal = unit(read(frame.normal, x, y));
    out.meshId = read(frame.meshId, x, y);
    const Rgba color = frame.color.at(x, y);
    const double luminance = dot3(color, kLuminance);
    const auto placed = [](double value, uint32_t size) {
        value = std::clamp(value, -0.5, size - 0.5);
        return std::abs(value - std::rint(value)) < 0.001 ? std::rint(value) : value;
    };
    bool keep = !history_.empty() && std::isfinite(motion[0]) && std::isfinite(motion[1]);
    if (keep) {
        const double u = placed(x + motion[0] * width_, width_);
        const double v = placed(y + motion[1] * height_, height_);
        const Rgba position = bilinear(&Pixel::position, u, v);
        keep = distance3(position, out.position) < 4 * gradient(frame.position, x, y) && dot3(position, position) > 0 &&
               dot3(out.position, out.position) > 0 &&
               std::rint(bilinear(&Pixel::meshId, u, v)[0]) == std::rint(out.meshId[0]) &&
               consistent(frame, bilinear(&Pixel::normal, u, v), out.normal);
        out.moments = bilinear(&Pixel::moments, u, v);
        out.color = color;
        historyColor(frame, x, y, u, v, out.color);
    }
    if (keep) {
        const double delta = std::pow(luminance - out.moments[0], 2);
        out.moments = {0.8 * out.moments[0] + 0.2 * luminance, 0.8 * out.moments[1] + 0.2 * delta, 0,
                       out.moments[3] + 1};
        for (size_t i = 0; i < 4; ++i) out.color[i] = 0.8 * out.color[i] + 0.2 * color[i];
    } else {
        out.moments = {luminance, 0, 0, 1};
        out.color = color;
    }
}

AccumulationReference::Result AccumulationReference::accumulate(const Frame& frame) {
    if (history_.empty() || width_ != frame.color.width || height_ != frame.color.height) {
        history_.assign(frame.color.pixelCount(), Pixel{});
        if (width_ == 0) previous_ = frame.camera;
        width_ = frame.color.width;
        height_ = frame.color.height;
    }
    const auto motion = motionReference(frame.position, previous_, frame.camera);
    std::vector<Pixel> next(history_.size());
    Result result{Picture(width_, height_), Picture(width_, height_)};
    for (uint32_t y = 0; y < height_; ++y) {
        for (uint32_t x = 0; x < width_; ++x) {
            const size_t i = size_t{y} * width_ + x;
            step(frame, x, y, motion[i], next[i]);
            const double estimate = next[i].moments[3] > 4 ? next[i].moments[1] : spatialVariance(frame, x, y);
            const double variance = std::clamp(estimate, 0.0, 1000.0);
            result.color.set(x, y, next[i].color);
            result.variance.set(x, y, {variance, variance, variance, variance});
        }
    }
    history_ = std::move(next);
    previous_ = frame.camera;
    return result;
}

}  // namespace denoisetest
