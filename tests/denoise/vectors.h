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

// Of the first three components.
inline double dot(const Rgba& a, const Rgba& b) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}
inline double length(const Rgba& a) {
    return std::sqrt(dot(a, a));
}
inline constexpr Rgba kLuminance = {0.2126, 0.7152, 0.0722, 0.0};

// The pixel, or the nearest one of the picture; zeros of an absent picture, which is empty.
inline Rgba nearest(const Picture& picture, int64_t x, int64_t y) {
    if (picture.values.empty()) return {};
    return picture.at(static_cast<uint32_t>(std::clamp<int64_t>(x, 0, int64_t{picture.width} - 1)),
                      static_cast<uint32_t>(std::clamp<int64_t>(y, 0, int64_t{picture.height} - 1)));
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
