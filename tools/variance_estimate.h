// A guess of a picture's noise for pictures that come without a variance layer.
#ifndef TOV_TOOLS_VARIANCE_ESTIMATE_H
#define TOV_TOOLS_VARIANCE_ESTIMATE_H

#include <cstdint>
#include <span>
#include <vector>

namespace tool {

// Pictures of one size, rows from the top, four floats per pixel. Features that are not known are empty.
struct NoisyPicture {
    uint32_t width = 0;
    uint32_t height = 0;
    std::span<const float> color;   // RGBA; alpha is not looked at
    std::span<const float> albedo;  // RGB and one unused
    std::span<const float> normal;  // xyz and one unused
    std::span<const float> depth;   // in the first of the four
};

// Variance of each pixel's RGB as the mean of its samples, alpha 0: four floats per pixel, finite, not negative.
// Around every pixel the colours of near pixels on the same surface (alike in all features that are given) are spread
// as the noise is; without features edges of the picture count as noise, so that the estimate is too large there.
// Values that are not finite take no part. Spans of another size than 4 * width * height throw std::invalid_argument.
std::vector<float> estimateVariance(const NoisyPicture& picture);

}  // namespace tool

#endif
