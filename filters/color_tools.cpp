#include "filters/color_tools.h"

namespace ColorTools {

namespace {

constexpr Chromaticity kD65 = {0.3127f, 0.329f, 0.3583f};

constexpr std::array<TovColorSpaceGamut, 4> kGamuts = {{
    {{0.64f, 0.33f, 0.03f}, {0.30f, 0.60f, 0.10f}, {0.15f, 0.06f, 0.79f}, kD65},        // sRGB
    {{0.64f, 0.33f, 0.03f}, {0.21f, 0.71f, 0.08f}, {0.15f, 0.06f, 0.79f}, kD65},        // Adobe RGB
    {{0.708f, 0.292f, 0.0f}, {0.17f, 0.797f, 0.033f}, {0.131f, 0.046f, 0.823f}, kD65},  // Rec. 2020
    {{0.68f, 0.32f, 0.0f}, {0.265f, 0.69f, 0.045f}, {0.15f, 0.06f, 0.79f}, kD65},       // DCI-P3
}};

}  // namespace

std::span<const TovColorSpaceGamut> gamuts() noexcept {
    return kGamuts;
}

Matrix3 rgbToXyz(const TovColorSpaceGamut& gamut) noexcept {
    const auto& [r, g, b, w] = gamut;
    const Matrix3 primaries = {r.x, g.x, b.x, r.y, g.y, b.y, r.z, g.z, b.z};
    const std::array<float, 3> white = {w.x / w.y, 1.0f, w.z / w.y};
    const Matrix3 inverted = inverse(primaries);
    Matrix3 result{};
    for (size_t column = 0; column < 3; ++column) {
        const float* row = &inverted[3 * column];
        const float scale = row[0] * white[0] + row[1] * white[1] + row[2] * white[2];
        for (size_t i = 0; i < 3; ++i) result[3 * i + column] = primaries[3 * i + column] * scale;
    }
    return result;
}

Matrix3 inverse(const Matrix3& a) noexcept {
    const float determinant =
        a[0] * (a[4] * a[8] - a[5] * a[7]) - a[3] * (a[1] * a[8] - a[7] * a[2]) + a[6] * (a[1] * a[5] - a[4] * a[2]);
    const float r = 1.0f / determinant;
    return {(a[4] * a[8] - a[5] * a[7]) * r,  -(a[1] * a[8] - a[7] * a[2]) * r, (a[1] * a[5] - a[2] * a[4]) * r,
            -(a[3] * a[8] - a[6] * a[5]) * r, (a[0] * a[8] - a[6] * a[2]) * r,  -(a[0] * a[5] - a[2] * a[3]) * r,
            (a[3] * a[7] - a[6] * a[4]) * r,  -(a[0] * a[7] - a[1] * a[6]) * r, (a[0] * a[4] - a[1] * a[3]) * r};
}

}  // namespace ColorTools
