// Scenes for the denoisers and for accumulation, and how the filters run on them.
#pragma once

#include <gmock/gmock.h>

#include "fixture.h"
#include "vectors.h"

namespace apitest {

inline constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
inline constexpr float kInfinity = std::numeric_limits<float>::infinity();

// Any picture but the colour may be absent, which is empty. Colour has alpha 1, normals have unit length.
struct Scene {
    Picture color, position, normal, depth, meshId, transition;
    Picture variance, depthVariance, normalVariance, transitionVariance;
    Matrix camera = {};
};

// A camera at (shift, 0, 0) that looks along y; width and height of the view are two metres at a distance of one.
inline Matrix cameraAt(double shift, double turn = 0.0) {
    const auto c = static_cast<float>(std::cos(turn));
    const auto s = static_cast<float>(std::sin(turn));
    const auto x = static_cast<float>(shift);
    return {c, -s, 0, -c * x, 0, 0, 1, 0, 0, 0, 0, 1, s, c, 0, -s * x};
}

// A corrugated board 3 m away before the right half of a slanted wall, both checkered, seen from a camera under grain.
inline Scene makeScene(uint32_t width, uint32_t height, double shift = 0.0, uint32_t seed = 1) {
    Scene scene;
    const auto across = [&](uint32_t x) { return 2 * (x + 0.5) / width - 1; };
    const auto onBoard = [&](uint32_t x) { return shift + 3 * across(x) > 0.6; };
    scene.camera = cameraAt(shift);
    scene.position = painted(width, height, kFloat4, [&](uint32_t x, uint32_t y) {
        const double depth = onBoard(x) ? 3 : (4 + 0.3 * shift) / (1 - 0.3 * across(x));
        return Rgba{shift + depth * across(x), depth, depth * (1 - 2 * (y + 0.5) / height), 1};
    });
    scene.normal = painted(width, height, kFloat4, [&](uint32_t x, uint32_t y) {
        const double turn = onBoard(x) ? 0.5 * std::sin(3 * scene.position.at(x, y)[2]) : 0;
        return Rgba{std::sin(turn), -std::cos(turn), 0, 1};
    });
    scene.depth = mapped(scene.position, kFloat1, [](const Rgba& p) { return gray(p[1]); });
    scene.meshId = painted(width, height, kFloat1, [&](uint32_t x, uint32_t) { return gray(onBoard(x) ? 7 : 3); });
    scene.transition = mapped(scene.position, kFloat4, [](const Rgba& p) {
        return std::sin(2 * p[0]) * std::sin(2 * p[2]) > 0 ? Rgba{0.8, 0.7, 0.6, 1} : Rgba{0.2, 0.25, 0.3, 1};
    });
    const Picture noisy = noise(width, height, kFloat4, 0.4, seed);
    scene.color = painted(width, height, kFloat4, [&](uint32_t x, uint32_t y) {
        const double light = 0.2 - 0.4 * scene.normal.at(x, y)[1];
        const Rgba c = scene.transition.at(x, y) * light + noisy.at(x, y);
        return Rgba{c[0], c[1], c[2], 1};
    });
    scene.variance = painted(width, height, kFloat4, [&](uint32_t x, uint32_t) {
        return Rgba{1, 0.9, 1.1, 0} * (0.01 + 0.007 * x / width);
    });
    return scene;
}

class SceneTest : public DeviceTest {
 protected:
    // Binds what is present of the scene and known to the filter, and keeps the results.
    int32_t execute(tov_image_filter filter, const Scene& scene) {
        const std::pair<const char*, const Picture*> pictures[] = {{"positionsImg", &scene.position},
                                                                   {"normalsImg", &scene.normal},
                                                                   {"depthImg", &scene.depth},
                                                                   {"meshIdsImg", &scene.meshId},
                                                                   {"transImg", &scene.transition},
                                                                   {"colorVar", &scene.variance},
                                                                   {"vColorImg", &scene.variance},
                                                                   {"vDepthImg", &scene.depthVariance},
                                                                   {"vNormalsImg", &scene.normalVariance},
                                                                   {"vTransImg", &scene.transitionVariance}};
        const Picture blank(scene.color.width, scene.color.height, scene.color.layout);
        const Handle output = newImage(blank);
        const Handle variance = newImage(blank);
        std::vector<Handle> images;
        for (const auto& [name, picture] : pictures)
            if (!picture->values.empty())
                setParameter(filter, {name, tov_image{images.emplace_back(newImage(*picture))}});
        setParameter(filter, {"outVarianceImg", tov_image{variance}});
        setParameter(filter, {"viewProjMatrix", scene.camera});
        const int32_t code = DeviceTest::execute(filter, newImage(scene.color), output);
        color_ = read(output, blank);
        variance_ = read(variance, blank);
        return code;
    }

    Picture color_, variance_;  // what the last execution gave
};

}  // namespace apitest
