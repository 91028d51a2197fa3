#include "picture.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstring>
#include <limits>

namespace apitest {

namespace {

constexpr double kInfinite = std::numeric_limits<double>::infinity();

double scaleOf(const Layout& layout) {
    return layout.type == TOV_COMPONENT_TYPE_UINT8 ? 255.0 : 1.0;
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

template <class Value>
void put(std::byte* at, Value value) {
    std::memcpy(at, &value, sizeof value);
}
template <class Value>
Value get(const std::byte* at) {
    Value value;
    std::memcpy(&value, at, sizeof value);
    return value;
}

bool comparable(const Picture& a, const Picture& b) {
    return a.width == b.width && a.height == b.height && a.layout == b.layout;
}

template <class Difference>
double worst(const Picture& a, const Picture& b, Difference&& difference) {
    if (!comparable(a, b)) return kInfinite;
    double result = 0.0;
    for (size_t i = 0; i < a.values.size(); ++i) {
        const double x = a.values[i];
        const double y = b.values[i];
        if (x == y || (std::isnan(x) && std::isnan(y))) continue;
        if (!std::isfinite(x) || !std::isfinite(y)) return kInfinite;
        result = std::max(result, difference(x, y));
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

tov_image_desc Picture::desc() const {
    return {width, height, 1, 0, 0, layout.components, layout.type};
}

Rgba Picture::at(uint32_t x, uint32_t y) const {
    const float* pixel = &values[(size_t{y} * width + x) * layout.components];
    std::array<double, 4> c{};
    for (uint32_t i = 0; i < layout.components; ++i) c[i] = double{pixel[i]} / scaleOf(layout);
    switch (layout.components) {
        case 1:
            return {c[0], c[0], c[0], 1.0};
        case 2:
            return {c[0], c[0], c[0], c[1]};
        case 3:
            return {c[0], c[1], c[2], 1.0};
        default:
            return c;
    }
}

void Picture::set(uint32_t x, uint32_t y, const Rgba& rgba) {
    float* pixel = &values[(size_t{y} * width + x) * layout.components];
    const double gray = (rgba[0] + rgba[1] + rgba[2]) / 3.0;
    const std::array<double, 4> shortForm = {gray, rgba[3]};
    for (uint32_t i = 0; i < layout.components; ++i)
        pixel[i] = stored(layout.components <= 2 ? shortForm[i] : rgba[i], layout.type);
}

std::vector<std::byte> Picture::encoded() const {
    const size_t size = bytesOf(layout.type);
    std::vector<std::byte> bytes(values.size() * size);
    for (size_t i = 0; i < values.size(); ++i) {
        std::byte* at = &bytes[i * size];
        if (size == 1) put(at, static_cast<uint8_t>(values[i]));
        if (size == 2) put(at, halfFromFloat(values[i]));
        if (size == 4) put(at, values[i]);
    }
    return bytes;
}

void Picture::decode(const std::byte* bytes) {
    const size_t size = bytesOf(layout.type);
    for (size_t i = 0; i < values.size(); ++i) {
        const std::byte* at = bytes + i * size;
        if (size == 1) values[i] = get<uint8_t>(at);
        if (size == 2) values[i] = floatFromHalf(get<uint16_t>(at));
        if (size == 4) values[i] = get<float>(at);
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
    const auto next = [&] {
        state = state * 1664525u + 1013904223u;
        return scale * static_cast<double>(state >> 8) / 16777216.0;
    };
    return painted(width, height, layout, [&](uint32_t, uint32_t) {
        const double r = next();
        const double g = next();
        const double b = next();
        return Rgba{r, g, b, next()};
    });
}

Picture mapped(const Picture& input, Layout layout, const std::function<Rgba(const Rgba&)>& function) {
    return painted(input.width, input.height, layout, [&](uint32_t x, uint32_t y) { return function(input.at(x, y)); });
}

double maxDifference(const Picture& a, const Picture& b) {
    return worst(a, b, [](double x, double y) { return std::abs(x - y); });
}

double maxRelativeDifference(const Picture& picture, const Picture& reference) {
    return worst(picture, reference, [](double x, double y) { return std::abs(x - y) / std::max(1.0, std::abs(y)); });
}

bool isFinite(const Picture& picture) {
    return std::all_of(picture.values.begin(), picture.values.end(), [](float value) { return std::isfinite(value); });
}

uint16_t halfFromFloat(float value) {
    const auto bits = std::bit_cast<uint32_t>(value);
    const auto sign = static_cast<uint16_t>((bits >> 16) & 0x8000u);
    const double magnitude = std::abs(double{value});
    if (std::isnan(value)) return static_cast<uint16_t>(sign | 0x7e00u);
    if (magnitude >= 65520.0) return static_cast<uint16_t>(sign | 0x7c00u);  // rounds to the next power: infinity
    if (magnitude == 0.0) return sign;
    const int exponent = std::max(std::ilogb(magnitude), -14);
    const auto steps = static_cast<uint32_t>(std::nearbyint(std::ldexp(magnitude, 10 - exponent)));
    // A mantissa that rounds up to the next power carries into the exponent, as the bits are meant to.
    return static_cast<uint16_t>(sign | (static_cast<uint32_t>(exponent + 14) * 1024u + steps));
}

float floatFromHalf(uint16_t bits) {
    const double sign = (bits & 0x8000u) != 0 ? -1.0 : 1.0;
    const int exponent = (bits >> 10) & 31;
    const int mantissa = bits & 1023;
    if (exponent == 31)
        return mantissa != 0 ? std::numeric_limits<float>::quiet_NaN() : static_cast<float>(sign * kInfinite);
    const double value = exponent == 0 ? std::ldexp(mantissa, -24) : std::ldexp(mantissa + 1024, exponent - 25);
    return static_cast<float>(sign * value);
}

}  // namespace apitest
