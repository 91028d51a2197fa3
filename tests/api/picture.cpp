#include "picture.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstring>
#include <limits>

namespace apitest {

namespace {

constexpr double kInfinite = std::numeric_limits<double>::infinity();

// IEEE halves, rounded to nearest even.
uint32_t halfFromFloat(float value) {
    const uint32_t sign = std::signbit(value) ? 0x8000u : 0u;
    const double magnitude = std::abs(double{value});
    if (std::isnan(value)) return sign | 0x7e00u;
    if (magnitude >= 65520.0) return sign | 0x7c00u;  // rounds to the next power: infinity
    const int exponent = std::max(std::ilogb(magnitude), -14);
    // A mantissa that rounds up to the next power carries into the exponent, as the bits are meant to.
    return sign | (static_cast<uint32_t>(exponent + 14) * 1024u +
                   static_cast<uint32_t>(std::nearbyint(std::ldexp(magnitude, 10 - exponent))));
}

float floatFromHalf(uint32_t bits) {
    const double sign = (bits & 0x8000u) != 0 ? -1.0 : 1.0;
    const int exponent = static_cast<int>(bits >> 10) & 31;
    const int mantissa = static_cast<int>(bits) & 1023;
    if (exponent == 31) return mantissa != 0 ? std::nanf("") : static_cast<float>(sign * kInfinite);
    const double value = exponent == 0 ? std::ldexp(mantissa, -24) : std::ldexp(mantissa + 1024, exponent - 25);
    return static_cast<float>(sign * value);
}

float stored(double value, uint32_t type) {
    if (type == TOV_COMPONENT_TYPE_UINT8)
        return static_cast<float>(std::nearbyint(std::clamp(value, 0.0, 1.0) * 255.0));
    const auto single = static_cast<float>(value);
    return type == TOV_COMPONENT_TYPE_FLOAT16 ? floatFromHalf(halfFromFloat(single)) : single;
}

size_t bytesOf(uint32_t type) {
    return type == TOV_COMPONENT_TYPE_UINT8 ? 1 : type == TOV_COMPONENT_TYPE_FLOAT16 ? 2 : 4;
}

double worst(const Picture& a, const Picture& b, bool isRelative) {
    if (a.width != b.width || a.height != b.height || a.layout != b.layout) return kInfinite;
    double result = 0.0;
    for (size_t i = 0; i < a.values.size(); ++i) {
        const double x = a.values[i];
        const double y = b.values[i];
        if (x == y || (std::isnan(x) && std::isnan(y))) continue;
        if (!std::isfinite(x) || !std::isfinite(y)) return kInfinite;
        result = std::max(result, std::abs(x - y) / (isRelative ? std::max(1.0, std::abs(y)) : 1.0));
    }
    return result;
}

}  // namespace

std::vector<Layout> allLayouts() {
    std::vector<Layout> layouts;
    for (const uint32_t type : {TOV_COMPONENT_TYPE_UINT8, TOV_COMPONENT_TYPE_FLOAT16, TOV_COMPONENT_TYPE_FLOAT32})
        for (uint32_t components = 1; components <= 4; ++components) layouts.push_back({components, type});
    return layouts;
}

Picture::Picture(uint32_t w, uint32_t h, Layout pictureLayout)
    : width(w), height(h), layout(pictureLayout), values(size_t{w} * h * pictureLayout.components, 0.0f) {}

Rgba Picture::at(uint32_t x, uint32_t y) const {
    const uint32_t count = layout.components;
    const double scale = layout.type == TOV_COMPONENT_TYPE_UINT8 ? 255.0 : 1.0;
    const float* pixel = &values[(size_t{y} * width + x) * count];
    const double alpha = count % 2 == 0 ? double{pixel[count - 1]} / scale : 1.0;
    if (count < 3) return {pixel[0] / scale, pixel[0] / scale, pixel[0] / scale, alpha};
    return {pixel[0] / scale, pixel[1] / scale, pixel[2] / scale, alpha};
}

void Picture::set(uint32_t x, uint32_t y, const Rgba& rgba) {
    float* pixel = &values[(size_t{y} * width + x) * layout.components];
    const std::array<double, 2> gray = {(rgba[0] + rgba[1] + rgba[2]) / 3.0, rgba[3]};
    for (uint32_t i = 0; i < layout.components; ++i)
        pixel[i] = stored(layout.components <= 2 ? gray[i] : rgba[i], layout.type);
}

// Components lie in memory with their low byte first.
std::vector<std::byte> Picture::encoded() const {
    const size_t size = bytesOf(layout.type);
    std::vector<std::byte> bytes(values.size() * size);
    for (size_t i = 0; i < values.size(); ++i) {
        const uint32_t bits = size == 1   ? static_cast<uint32_t>(values[i])
                              : size == 2 ? halfFromFloat(values[i])
                                          : std::bit_cast<uint32_t>(values[i]);
        std::memcpy(&bytes[i * size], &bits, size);
    }
    return bytes;
}

void Picture::decode(const std::byte* bytes) {
    const size_t size = bytesOf(layout.type);
    for (size_t i = 0; i < values.size(); ++i) {
        uint32_t bits = 0;
        std::memcpy(&bits, bytes + i * size, size);
        values[i] = size == 1 ? static_cast<float>(bits) : size == 2 ? floatFromHalf(bits) : std::bit_cast<float>(bits);
    }
}

Picture painted(uint32_t width, uint32_t height, Layout layout, const std::function<Rgba(uint32_t, uint32_t)>& color) {
    Picture picture(width, height, layout);
    for (uint32_t y = 0; y < height; ++y)
        for (uint32_t x = 0; x < width; ++x) picture.set(x, y, color(x, y));
    return picture;
}

Picture noise(uint32_t width, uint32_t height, Layout layout, double scale, uint32_t seed) {
    uint32_t state = seed * 2654435761u + 1u;
    return painted(width, height, layout, [&](uint32_t, uint32_t) {
        Rgba pixel;
        for (double& component : pixel) {
            state = state * 1664525u + 1013904223u;
            component = scale * static_cast<double>(state >> 8) / 16777216.0;
        }
        return pixel;
    });
}

Picture mapped(const Picture& input, Layout layout, const std::function<Rgba(const Rgba&)>& function) {
    return painted(input.width, input.height, layout, [&](uint32_t x, uint32_t y) { return function(input.at(x, y)); });
}

double maxDifference(const Picture& a, const Picture& b) {
    return worst(a, b, false);
}

double maxRelativeDifference(const Picture& picture, const Picture& reference) {
    return worst(picture, reference, true);
}

bool isFinite(const Picture& picture) {
    return std::all_of(picture.values.begin(), picture.values.end(), [](float value) { return std::isfinite(value); });
}

}  // namespace apitest
