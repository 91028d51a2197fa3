// Arithmetic of pixels, for references in double.
#pragma once

#include <algorithm>
#include <cmath>

#include "picture.h"

namespace apitest {

inline Rgba operator+(Rgba a, const Rgba& b) {
    for (size_t i = 0; i < 4; ++i) a[i] += b[i];
    return a;
}
inline Rgba operator*(Rgba a, double factor) {
    for (double& value : a) value *= factor;
    return a;
}
inline Rgba operator-(const Rgba& a, const Rgba& b) {
    return a + b * -1.0;
}

inline Rgba gray(double value) {
    return {value, value, value, value};
}

// Of the first three components.
inline double dot(const Rgba& a, const Rgba& b) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}
inline double length(const Rgba& a) {
    return std::sqrt(dot(a, a));
}
// The colour of alpha 1; alpha 0 does not divide.
inline Rgba overAlpha(const Rgba& c) {
    return c[3] != 0.0 ? c * (1 / c[3]) : c + Rgba{0, 0, 0, 1};
}
inline constexpr Rgba kLuminance = {0.2126, 0.7152, 0.0722, 0.0};
inline constexpr Layout kFloat1 = {1, TOV_COMPONENT_TYPE_FLOAT32};

// The pixel, or the nearest one of the picture; zeros of an absent picture, which is empty.
inline Rgba nearest(const Picture& picture, int64_t x, int64_t y) {
    if (picture.values.empty()) return {};
    return picture.at(static_cast<uint32_t>(std::clamp<int64_t>(x, 0, int64_t{picture.width} - 1)),
                      static_cast<uint32_t>(std::clamp<int64_t>(y, 0, int64_t{picture.height} - 1)));
}

// Sobel's difference towards (dx, dy), one pixel away.
inline Rgba slope(const Picture& picture, int64_t x, int64_t y, int dx, int dy) {
    Rgba sum{};
    for (int k = -1; k <= 1; ++k) {
        const Rgba behind = nearest(picture, x - dx + k * dy, y - dy + k * dx);
        sum = sum + (behind - nearest(picture, x + dx + k * dy, y + dy + k * dx)) * (2 - k * k);
    }
    return sum;
}

// Whole numbers are centres of pixels.
inline Rgba bilinear(const Picture& picture, double x, double y) {
    const auto left = static_cast<int64_t>(std::floor(x));
    const auto top = static_cast<int64_t>(std::floor(y));
    const auto row = [&](int64_t v) {
        const Rgba a = nearest(picture, left, v);
        return a + (nearest(picture, left + 1, v) - a) * (x - std::floor(x));
    };
    return row(top) + (row(top + 1) - row(top)) * (y - std::floor(y));
}

}  // namespace apitest
