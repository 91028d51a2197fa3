// Motion and temporal accumulation in double, from their formulas, with a history that is kept between frames.
#pragma once

#include <array>
#include <vector>

#include "fixture.h"
#include "picture.h"

namespace denoisetest {

struct Frame {
    apitest::Picture color;
    apitest::Picture position;  // float RGBA
    apitest::Picture normal;    // empty when absent, as mesh ids
    apitest::Picture meshId;
    apitest::Matrix camera = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
};

// Shift on the screen of every pixel, two values each; NaN where a point is in the plane of a camera.
std::vector<std::array<double, 2>> motionReference(const apitest::Picture& position, const apitest::Matrix& before,
                                                   const apitest::Matrix& now);

class AccumulationReference {
 public:
    struct Result {
        apitest::Picture color;
        apitest::Picture variance;
    };
    Result accumulate(const Frame& frame);

 private:
    struct Pixel {
        apitest::Rgba position{};
        apitest::Rgba normal{};
        apitest::Rgba meshId{};
        apitest::Rgba moments{};
        apitest::Rgba color{};
    };
    const Pixel& at(int x, int y) const;
    apitest::Rgba bilinear(apitest::Rgba Pixel::*slice, double x, double y) const;
    bool historyColor(const Frame& frame, uint32_t x, uint32_t y, double u, double v, apitest::Rgba& color) const;
    void step(const Frame& frame, uint32_t x, uint32_t y, const std::array<double, 2>& motion, Pixel& out) const;

    uint32_t width_ = 0;
    uint32_t height_ = 0;
    std::vector<Pixel> history_;
    apitest::Matrix previous_{};
};

}  // namespace denoisetest
