// Sums in double: a picture has millions of pixels.
#include "luminance.h"

#include <algorithm>
#include <cmath>
#include <cstddef>

#include "picture.h"

namespace tool {

Luminance measureLuminance(std::span<const float> rgba) {
    double sum = 0.0;
    double maximum = 0.0;
    size_t count = 0;
    for (size_t i = 0; i + kComponents <= rgba.size(); i += kComponents) {
        const double luminance = 0.2126 * rgba[i] + 0.7152 * rgba[i + 1] + 0.0722 * rgba[i + 2];
        if (!std::isfinite(luminance)) continue;
        sum += luminance;
        maximum = std::max(maximum, luminance);
        ++count;
    }
    const double average = count > 0 ? sum / static_cast<double>(count) : 0.0;
    return {static_cast<float>(average), static_cast<float>(maximum)};
}

}  // namespace tool
