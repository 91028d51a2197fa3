// Small scenes for the denoisers: a noisy colour picture with features that have edges, slopes and textures.
#pragma once

#include <vector>

#include "picture.h"

namespace denoisetest {

using apitest::Layout;
using apitest::Picture;
using apitest::Rgba;

struct Scene {
    Picture color;       // noisy, alpha 1
    Picture normal;      // a floor, a wall and a ball, unit length
    Picture depth;       // one component
    Picture transition;  // checkered
    Picture variance;    // of the noise, alpha 0
};

Scene makeScene(uint32_t width, uint32_t height);

// Every value times a factor.
Picture scaled(Picture picture, double factor);

// A picture of a layout that shows the same.
Picture converted(const Picture& picture, Layout layout);

// Sets every component of a pixel.
void fillPixel(Picture& picture, uint32_t x, uint32_t y, float value);

// Mean square of the differences of the first three components.
double meanSquare(const Picture& a, const Picture& b);

}  // namespace denoisetest
