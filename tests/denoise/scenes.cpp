#include "scenes.h"

#include <algorithm>
#include <cmath>

namespace denoisetest {

namespace {

constexpr double kNoise = 0.15;

bool onWall(uint32_t y, uint32_t height) {
    return 5 * y < 2 * height;
}

Rgba normalAt(uint32_t x, uint32_t y, uint32_t width, uint32_t height) {
    const double u = (x + 0.5) / width - 0.7;
    const double v = (y + 0.5) / height - 0.5;
    const double inside = 0.04 - u * u - v * v;
    if (inside > 0.0) return {u / 0.2, std::sqrt(inside) / 0.2, -v / 0.2, 1.0};
    return onWall(y, height) ? Rgba{0.0, -1.0, 0.0, 1.0} : Rgba{0.0, 0.0, 1.0, 1.0};
}

double depthAt(uint32_t x, uint32_t y, uint32_t height) {
    return onWall(y, height) ? 9.0 + 0.05 * x : 2.0 + 6.0 * (height - y) / height + 0.02 * x;
}

}  // namespace

Scene makeScene(uint32_t width, uint32_t height) {
    const auto paint = [&](Layout layout, const std::function<Rgba(uint32_t, uint32_t)>& color) {
        return apitest::painted(width, height, layout, color);
    };
    Scene scene;
    scene.normal = paint(apitest::kFloat4, [&](uint32_t x, uint32_t y) { return normalAt(x, y, width, height); });
    scene.depth = paint({1, TOV_COMPONENT_TYPE_FLOAT32}, [&](uint32_t x, uint32_t y) {
        const double depth = depthAt(x, y, height);
        return Rgba{depth, depth, depth, 1.0};
    });
    scene.transition = paint(apitest::kFloat4, [&](uint32_t x, uint32_t y) {
        return (x / 5 + y / 5) % 2 == 0 ? Rgba{0.8, 0.7, 0.6, 1.0} : Rgba{0.2, 0.25, 0.3, 1.0};
    });
    const Picture grain = apitest::noise(width, height, apitest::kFloat4, 2.0, 7);
    scene.color = paint(apitest::kFloat4, [&](uint32_t x, uint32_t y) {
        const Rgba base = scene.transition.at(x, y);
        const Rgba n = grain.at(x, y);
        const double light = 0.3 + 0.7 * std::abs(scene.normal.at(x, y)[2]);
        const auto noisy = [&](size_t i) { return std::max(base[i] * light + kNoise * (n[i] - 1.0), 0.0); };
        return Rgba{noisy(0), noisy(1), noisy(2), 1.0};
    });
    const double variance = kNoise * kNoise / 3.0;
    scene.variance = paint(apitest::kFloat4, [&](uint32_t x, uint32_t) {
        const double value = variance * (0.75 + 0.5 * x / width);
        return Rgba{value, 0.9 * value, 1.1 * value, 0.0};
    });
    return scene;
}

Picture scaled(Picture picture, double factor) {
    for (float& value : picture.values) value = static_cast<float>(value * factor);
    return picture;
}

Picture converted(const Picture& picture, Layout layout) {
    return apitest::painted(picture.width, picture.height, layout,
                            [&](uint32_t x, uint32_t y) { return picture.at(x, y); });
}

void fillPixel(Picture& picture, uint32_t x, uint32_t y, float value) {
    const uint32_t components = picture.layout.components;
    std::fill_n(picture.values.begin() + static_cast<std::ptrdiff_t>((size_t{y} * picture.width + x) * components),
                components, value);
}

double meanSquare(const Picture& a, const Picture& b) {
    double sum = 0.0;
    for (uint32_t y = 0; y < a.height; ++y)
        for (uint32_t x = 0; x < a.width; ++x)
            for (size_t i = 0; i < 3; ++i) sum += std::pow(a.at(x, y)[i] - b.at(x, y)[i], 2);
    return sum / (3.0 * static_cast<double>(a.pixelCount()));
}

}  // namespace denoisetest
