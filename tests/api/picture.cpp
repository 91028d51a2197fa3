#include "picture.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstring>
#include <limits>

namespace apitest {

namespace {

constexpr float kInfinite = std::numeric_limits<float>::infinity();

// IEEE halves are floats of a smaller bias: scaled by its difference, their bits are the upper ones of a float.
uint32_t halfFromFloat(float value) {
    const uint32_t sign = std::signbit(value) ? 0x8000u : 0u;
    const auto bits = std::bit_cast<uint32_t>(std::abs(value) * 0x1p-112f);
    if (std::isnan(value)) return sign | 0x7e00u;
    return sign | std::min(0x7c00u, (bits + 0xfffu + (bits >> 13 & 1u)) >> 13);  // to nearest even
}

float floatFromHalf(uint32_t bits) {
    const float magnitude = std::bit_cast<float>((bits & 0x7fffu) << 13) * 0x1p112f;
    const float finite = (bits & 0x8000u) != 0 ? -magnitude : magnitude;
    return magnitude < 65536 ? finite : magnitude > 65536 ? std::nanf("") : finite * kInfinite;
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

}  // namespace

std::vector<Layout> allLayouts() {
    std::vector<Layout> layouts;
    for (const uint32_t type : {TOV_COMPONENT_TYPE_UINT8, TOV_COMPONENT_TYPE_FLOAT16, TOV_COMPONENT_TYPE_FLOAT32})
        for (uint32_t components = 1; components <= 4; ++components) layouts.push_back({components, type});
    return layouts;
}

Rgba Picture::at(uint32_t x, uint32_t y) const {
    const uint32_t count = layout.components;
    const double scale = layout.type == TOV_COMPONENT_TYPE_UINT8 ? 255.0 : 1.0;
    const float* pixel = &values[(size_t{y} * width + x) * count];
    const auto component = [&](uint32_t i) { return double{pixel[count < 3 ? 0 : i]} / scale; };
    return {component(0), component(1), component(2), count % 2 == 0 ? double{pixel[count - 1]} / scale : 1.0};
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

double maxDifference(const Picture& a, const Picture& b, bool isRelative) {
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

bool isFinite(const Picture& picture) {
    return std::all_of(picture.values.begin(), picture.values.end(), [](float value) { return std::isfinite(value); });
}

}  // namespace apitest
