// Pictures of any of the twelve layouts, and what kernels read from and write to them, from the layouts' definition.
#pragma once

#include <tov/tov.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <vector>

namespace apitest {

using Rgba = std::array<double, 4>;

struct Layout {
    uint32_t components = 4;
    uint32_t type = TOV_COMPONENT_TYPE_FLOAT32;

    bool operator==(const Layout&) const = default;
};

inline constexpr Layout kFloat4 = {4, TOV_COMPONENT_TYPE_FLOAT32};
inline constexpr Layout kByte4 = {4, TOV_COMPONENT_TYPE_UINT8};

// All twelve: 1 to 4 components of each type.
std::vector<Layout> allLayouts();

// Stored values without their encoding: bytes are 0 ... 255, halves are floats that a half can hold.
struct Picture {
    uint32_t width = 0;
    uint32_t height = 0;
    Layout layout;
    std::vector<float> values;  // width * height * components

    Picture() = default;
    Picture(uint32_t w, uint32_t h, Layout l = kFloat4)
        : width(w), height(h), layout(l), values(size_t{w} * h * l.components, 0.0f) {}

    tov_image_desc desc() const { return {width, height, 1, 0, 0, layout.components, layout.type}; }
    size_t pixelCount() const { return size_t{width} * height; }
    // The pixel as kernels read it: RGBA, bytes as 0 ... 1, gray repeated, a missing alpha 1.
    Rgba at(uint32_t x, uint32_t y) const;
    // Stores what kernels write: gray is the mean of R, G and B, bytes are clamped and rounded to nearest even.
    void set(uint32_t x, uint32_t y, const Rgba& rgba);

    std::vector<std::byte> encoded() const;
    void decode(const std::byte* bytes);
};

// A picture of the layout, each pixel from a function of its coordinates.
Picture painted(uint32_t width, uint32_t height, Layout layout, const std::function<Rgba(uint32_t, uint32_t)>& color);
// Pseudo-random values in 0 ... scale, the same in every run.
Picture noise(uint32_t width, uint32_t height, Layout layout = kFloat4, double scale = 1.0, uint32_t seed = 1);
// One function applied to every pixel of an input.
Picture mapped(const Picture& input, Layout layout, const std::function<Rgba(const Rgba&)>& function);

// Largest difference of stored values; infinite for pictures of other sizes or layouts, and where only one is finite.
// A relative one is over the larger of 1 and the magnitude in b.
double maxDifference(const Picture& a, const Picture& b, bool isRelative = false);
inline double maxRelativeDifference(const Picture& picture, const Picture& reference) {
    return maxDifference(picture, reference, true);
}
bool isFinite(const Picture& picture);

}  // namespace apitest
