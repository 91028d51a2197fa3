// Small scenes for the denoisers: a noisy colour picture with features that have edges, slopes and textures.
#pragma once

#include "fixture.h"
#include "vectors.h"

namespace apitest {

inline constexpr Layout kFloat1 = {1, TOV_COMPONENT_TYPE_FLOAT32};

// Any picture but the colour may be absent, which is empty.
struct Scene {
    Picture color;  // noisy, alpha 1
    Picture normal, depth, transition;
    Picture variance;  // of the noise, alpha 0
    Picture normalVariance, depthVariance, transitionVariance;
};

// A floor, a wall and a ball, checkered.
inline Scene makeScene(uint32_t width, uint32_t height) {
    Scene scene;
    const auto onWall = [&](uint32_t y) { return 5 * y < 2 * height; };
    scene.normal = painted(width, height, kFloat4, [&](uint32_t x, uint32_t y) {
        const Rgba ball = {5 * (x + 0.5) / width - 3.5, 0, 2.5 - 5 * (y + 0.5) / height, 1};
        const double inside = 1 - dot(ball, ball);
        if (inside > 0) return ball + Rgba{0, std::sqrt(inside), 0, 0};
        return onWall(y) ? Rgba{0, -1, 0, 1} : Rgba{0, 0, 1, 1};
    });
    scene.depth = painted(width, height, kFloat1, [&](uint32_t x, uint32_t y) {
        return Rgba{1, 1, 1, 1} * (onWall(y) ? 9 + 0.05 * x : 8 - 6.0 * y / height + 0.02 * x);
    });
    scene.transition = painted(width, height, kFloat4, [&](uint32_t x, uint32_t y) {
        return (x / 5 + y / 5) % 2 == 0 ? Rgba{0.8, 0.7, 0.6, 1} : Rgba{0.2, 0.25, 0.3, 1};
    });
    const Picture grain = noise(width, height, kFloat4, 0.3, 7);
    scene.color = painted(width, height, kFloat4, [&](uint32_t x, uint32_t y) {
        const double light = 0.3 + 0.7 * std::abs(scene.normal.at(x, y)[2]);
        const Rgba c = scene.transition.at(x, y) * light + grain.at(x, y) - Rgba{0.15, 0.15, 0.15, 0};
        return Rgba{std::max(c[0], 0.0), std::max(c[1], 0.0), std::max(c[2], 0.0), 1};
    });
    scene.variance = painted(width, height, kFloat4, [&](uint32_t x, uint32_t) {
        return Rgba{1, 0.9, 1.1, 0} * (0.15 * 0.15 / 3 * (0.75 + 0.5 * x / width));
    });
    return scene;
}

inline Picture scaled(const Picture& picture, double factor) {
    return mapped(picture, picture.layout, [&](const Rgba& c) { return c * factor; });
}

inline void fillPixel(Picture& picture, uint32_t x, uint32_t y, float value) {
    const uint32_t components = picture.layout.components;
    std::fill_n(&picture.values[(size_t{y} * picture.width + x) * components], components, value);
}

inline constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
inline constexpr float kInfinity = std::numeric_limits<float>::infinity();

class SceneTest : public DeviceTest {
 protected:
    // Runs with those of the pictures bound that are present.
    static Picture runWith(uint32_t type, const Picture& color, Parameters parameters,
                           std::initializer_list<std::pair<const char*, const Picture*>> pictures) {
        std::vector<Handle> images;
        for (const auto& [name, picture] : pictures)
            if (!picture->values.empty())
                parameters.push_back({name, tov_image{images.emplace_back(newImage(*picture))}});
        return run(type, color, parameters);
    }
    // All finite and nothing darker than the darkest usable pixel: unusable ones spread neither as NaN nor as black.
    static void expectFilled(const Picture& result, double darkest) {
        EXPECT_TRUE(isFinite(result));
        EXPECT_GE(*std::min_element(result.values.begin(), result.values.end()), darkest);
    }
};

}  // namespace apitest
