// RGB colour spaces: their gamuts and the matrices to and from CIE XYZ.
#pragma once

#include <array>
#include <cstddef>
#include <span>

namespace ColorTools {

struct Chromaticity {
    float x, y, z;
};

// CIE xyz chromaticities of the primaries and the white point: twelve floats.
struct TovColorSpaceGamut {
    Chromaticity red, green, blue, white;
};

// Indexed by colour-space value - 1.
std::span<const TovColorSpaceGamut> gamuts() noexcept;

using Matrix3 = std::array<float, 9>;  // row after row

// Linear RGB to XYZ with Y = 1 for white, derived as in SMPTE RP 177-1993.
Matrix3 rgbToXyz(const TovColorSpaceGamut& gamut) noexcept;

// Adjugate over determinant; no test for singularity.
Matrix3 inverse(const Matrix3& a) noexcept;

}  // namespace ColorTools
