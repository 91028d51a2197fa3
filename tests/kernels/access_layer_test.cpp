// The pixel-access layer over every layout, against a plain description of each: read, write, addressing, and the few
// functions that come with it.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "build_options.h"
#include "kernelgen/sources.h"
#include "raw_opencl.h"

namespace {

using options::Layout;
using Pixel = std::array<float, 4>;

constexpr int kWidth = 7;
constexpr int kHeight = 5;
constexpr size_t kPixels = kWidth * kHeight;

// IEEE half and back, rounded to nearest even.
uint16_t toHalf(float value) {
    uint32_t bits = 0;
    std::memcpy(&bits, &value, sizeof bits);
    const uint32_t sign = bits >> 16 & 0x8000u;
    const int exponent = static_cast<int>(bits >> 23 & 0xffu) - 127;
    const double magnitude = std::fabs(static_cast<double>(value));
    const int scale = std::max(exponent, -14) - 10;
    const double digits = std::nearbyint(std::ldexp(magnitude, -scale));
    const uint32_t biased = static_cast<uint32_t>(scale + 24);
    return static_cast<uint16_t>(sign | (static_cast<uint32_t>(digits) + (biased << 10)));
}
float fromHalf(uint16_t half) {
    const int exponent = half >> 10 & 0x1f;
    const double digits = half & 0x3ff;
    const double magnitude = exponent == 0 ? std::ldexp(digits, -24) : std::ldexp(1024.0 + digits, exponent - 25);
    return static_cast<float>(half & 0x8000 ? -magnitude : magnitude);
}

size_t componentBytes(Layout layout) {
    const std::string type = layout.type;
    return type == "uint" ? 1 : type == "half" ? 2 : 4;
}
size_t componentCount(Layout layout) {
    return static_cast<size_t>(layout.count[0] - '0');
}

double load(Layout layout, const unsigned char* at) {
    uint16_t half = 0;
    float number = 0;
    switch (componentBytes(layout)) {
        case 1:
            return *at / 255.0;
        case 2:
            std::memcpy(&half, at, 2);
            return fromHalf(half);
        default:
            std::memcpy(&number, at, 4);
            return number;
    }
}

void store(Layout layout, double value, unsigned char* at) {
    const float number = static_cast<float>(value);
    const uint16_t half = toHalf(number);
    switch (componentBytes(layout)) {
        case 1:
            *at = static_cast<unsigned char>(std::nearbyint(std::fmin(std::fmax(value, 0.0), 1.0) * 255.0));
            break;
        case 2:
            std::memcpy(at, &half, 2);
            break;
        default:
            std::memcpy(at, &number, 4);
            break;
    }
}

// What ReadPixel gives for a stored pixel.
Pixel readReference(Layout layout, const unsigned char* stored) {
    std::array<double, 4> c = {};
    for (size_t i = 0; i < componentCount(layout); ++i) c[i] = load(layout, stored + i * componentBytes(layout));
    const auto f = [](double v) { return static_cast<float>(v); };
    switch (componentCount(layout)) {
        case 1:
            return {f(c[0]), f(c[0]), f(c[0]), 1.0f};
        case 2:
            return {f(c[0]), f(c[0]), f(c[0]), f(c[1])};
        case 3:
            return {f(c[0]), f(c[1]), f(c[2]), 1.0f};
        default:
            return {f(c[0]), f(c[1]), f(c[2]), f(c[3])};
    }
}

// What WritePixel stores for a pixel.
std::vector<unsigned char> writeReference(Layout layout, const Pixel& rgba) {
    const double gray = (static_cast<double>(rgba[0]) + rgba[1] + rgba[2]) / 3.0;
    const size_t count = componentCount(layout);
    const std::array<double, 4> values = {count < 3 ? gray : rgba[0], count < 3 ? rgba[3] : rgba[1], rgba[2], rgba[3]};
    std::vector<unsigned char> bytes(count * componentBytes(layout));
    for (size_t i = 0; i < count; ++i) store(layout, values[i], bytes.data() + i * componentBytes(layout));
    return bytes;
}

// Pixels of exact binary fractions, so that no sum or rounding is in doubt: below 0, above 1 and on ties of bytes.
std::vector<Pixel> samplePixels() {
    std::vector<Pixel> pixels(kPixels);
    for (size_t i = 0; i < kPixels; ++i) {
        const float step = static_cast<float>(i) / 32.0f;
        // The three colours add up to three times a binary fraction: their mean is exact, too.
        pixels[i] = {step - 0.25f, step + 0.25f, step, 1.25f - step};
    }
    pixels[3] = {0.5f, 0.5f, 0.5f, 0.5f};
    return pixels;
}

const char kSweepKernels[] = R"(
__kernel void ReadAll(srcBufferType(source), __global float4* result) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(source));
    const float4 value = ReadPixel(source, coord.x, coord.y);
    WritePixel_float_4(result, GET_BUFFER_SIZE(source), coord.x, coord.y, value);
}
__kernel void WriteAll(__global float4* source, dstBufferType(result)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(result));
    const float4 value = ReadPixel_float_4(source, GET_BUFFER_SIZE(result), coord.x, coord.y);
    WritePixel(result, coord.x, coord.y, value);
}
)";

class AccessLayer : public testing::Test {
 protected:
    static void SetUpTestSuite() { device_ = new raw::Device; }
    static void TearDownTestSuite() {
        delete device_;
        device_ = nullptr;
    }
    static raw::ProgramHandle build(const std::string& kernels, const std::string& definitions, bool grid2D = true) {
        return device_->build(std::string(commonKernelSource()) + kernels, options::ofPass(grid2D, definitions));
    }
    static raw::ProgramHandle buildSweep(Layout layout) {
        return build(kSweepKernels, options::image("source", layout, kWidth, kHeight) +
                                        options::image("result", layout, kWidth, kHeight));
    }
    // Runs a kernel of (__global float4* result) over count items in a row and gives what it stored.
    static std::vector<Pixel> evaluate(const std::string& kernel, size_t count, const std::string& definitions = "",
                                       bool grid2D = true) {
        const raw::ProgramHandle program = build(kernel, definitions, grid2D);
        std::vector<Pixel> values(count);
        const raw::MemoryHandle result = device_->buffer(count * sizeof(Pixel), values.data());
        const raw::KernelHandle run = device_->kernel(program, "Evaluate");
        raw::setArguments(run, result);
        device_->run(run, count, 0, 1, 0);
        device_->read(result, count * sizeof(Pixel), values.data());
        return values;
    }

    static inline raw::Device* device_ = nullptr;
};

}  // namespace

TEST_F(AccessLayer, ReadsEveryBufferLayoutAsTheSamePixels) {
    for (const Layout layout : options::kBufferLayouts) {
        SCOPED_TRACE(std::string(layout.type) + layout.count);
        const size_t bytes = componentBytes(layout) * componentCount(layout);
        std::vector<unsigned char> stored(bytes * kPixels);
        for (size_t i = 0; i < stored.size(); i += componentBytes(layout)) {
            // Any byte, and numbers without NaN of the other types.
            if (componentBytes(layout) == 1)
                stored[i] = static_cast<unsigned char>(i * 37);
            else
                store(layout, 0.37 * static_cast<double>(i) - 3.0, stored.data() + i);
        }
        const raw::ProgramHandle program = buildSweep(layout);
        const raw::KernelHandle kernel = device_->kernel(program, "ReadAll");
        const raw::MemoryHandle source = device_->buffer(stored.size(), stored.data());
        const raw::MemoryHandle result = device_->buffer(kPixels * sizeof(Pixel), nullptr);
        raw::setArguments(kernel, source, result);
        device_->run(kernel, kWidth, kHeight, 8, 8);
        std::vector<Pixel> pixels(kPixels);
        device_->read(result, kPixels * sizeof(Pixel), pixels.data());
        for (size_t i = 0; i < kPixels; ++i) {
            const Pixel expected = readReference(layout, stored.data() + i * bytes);
            // Bytes are divided by 255 with one rounding more than the reference.
            for (size_t c = 0; c < 4; ++c) EXPECT_NEAR(pixels[i][c], expected[c], 1e-7f * std::fabs(expected[c])) << i;
        }
    }
}

TEST_F(AccessLayer, WritesEveryBufferLayoutToTheBit) {
    const std::vector<Pixel> pixels = samplePixels();
    for (const Layout layout : options::kBufferLayouts) {
        SCOPED_TRACE(std::string(layout.type) + layout.count);
        const size_t bytes = componentBytes(layout) * componentCount(layout);
        // Behind the picture lies a guard that stays untouched.
        std::vector<unsigned char> stored(bytes * kPixels + 16, 0xa5);
        const raw::ProgramHandle program = buildSweep(layout);
        const raw::KernelHandle kernel = device_->kernel(program, "WriteAll");
        const raw::MemoryHandle source = device_->buffer(kPixels * sizeof(Pixel), pixels.data());
        const raw::MemoryHandle result = device_->buffer(stored.size(), stored.data());
        raw::setArguments(kernel, source, result);
        device_->run(kernel, kWidth, kHeight, 8, 8);
        device_->read(result, stored.size(), stored.data());
        for (size_t i = 0; i < kPixels; ++i) {
            const std::vector<unsigned char> expected = writeReference(layout, pixels[i]);
            const auto at = stored.begin() + static_cast<std::ptrdiff_t>(i * bytes);
            if (componentBytes(layout) == 4) {  // the mean is a product with 1/3: its last digit is free
                for (size_t c = 0; c < componentCount(layout); ++c) {
                    EXPECT_NEAR(load(layout, &*at + 4 * c), load(layout, expected.data() + 4 * c), 1e-6) << i;
                }
            } else {
                EXPECT_EQ(std::vector<unsigned char>(at, at + static_cast<std::ptrdiff_t>(bytes)), expected) << i;
            }
        }
        for (size_t i = bytes * kPixels; i < stored.size(); ++i) EXPECT_EQ(stored[i], 0xa5);
    }
}

TEST_F(AccessLayer, ReadsAndWritesImageObjects) {
    const std::vector<Pixel> pixels = samplePixels();
    const raw::ProgramHandle program = buildSweep(options::kSampler);
    const raw::MemoryHandle image = device_->image(kWidth, kHeight, nullptr);
    const raw::MemoryHandle buffer = device_->buffer(kPixels * sizeof(Pixel), pixels.data());
    const raw::MemoryHandle copy = device_->buffer(kPixels * sizeof(Pixel), nullptr);
    const raw::KernelHandle write = device_->kernel(program, "WriteAll");
    raw::setArguments(write, buffer, image);
    device_->run(write, kWidth, kHeight, 8, 8);
    const raw::KernelHandle read = device_->kernel(program, "ReadAll");
    raw::setArguments(read, image, copy);
    device_->run(read, kWidth, kHeight, 8, 8);
    std::vector<Pixel> result(kPixels);
    device_->read(copy, kPixels * sizeof(Pixel), result.data());
    EXPECT_EQ(result, pixels);
}

TEST_F(AccessLayer, AnAbsentImageReadsAsZeroAndTakesNoWrites) {
    const std::string kernel = R"(
__kernel void Evaluate(__global float4* result, srcBufferType(source), dstBufferType(unused)) {
    WritePixel(unused, 5, 6, (float4)(7.0f));
    result[get_global_id(0)] = ReadPixel(source, 5, 6) + (float4)(IS_ABSENT(source));
})";
    const raw::ProgramHandle program = build(
        kernel, options::image("source", options::kAbsent, 0, 0) + options::image("unused", options::kAbsent, 0, 0));
    const raw::KernelHandle run = device_->kernel(program, "Evaluate");
    const raw::MemoryHandle result = device_->buffer(sizeof(Pixel), nullptr);
    raw::setArguments(run, result, 0, 0);
    device_->run(run, 1, 0, 1, 0);
    Pixel value = {};
    device_->read(result, sizeof value, value.data());
    EXPECT_EQ(value, (Pixel{1.0f, 1.0f, 1.0f, 1.0f}));
}

TEST_F(AccessLayer, OneDimensionalLaunchesWalkTheRows) {
    const std::string kernel = R"(
__kernel void Evaluate(__global float4* result) {
    int2 coord;
    GET_COORD(coord, (int2)(5, 2));
    result[get_global_id(0)] = (float4)(coord.x, coord.y, 1.0f, 0.0f);
})";
    const std::vector<Pixel> values = evaluate(kernel, 12, "", false);
    EXPECT_EQ(values[7], (Pixel{2.0f, 1.0f, 1.0f, 0.0f}));
    EXPECT_EQ(values[10], (Pixel{0.0f, 0.0f, 0.0f, 0.0f})) << "items behind the last row leave at once";
}

TEST_F(AccessLayer, DefinitionsMayFollowTheSharedText) {
    // As in a fused program: flags are defined as themselves, and the image "inner" is a function.
    const std::string kernel = R"(
#define GROUP_DIM_2D GROUP_DIM_2D
#define source_Res (int2)(1,1)
#define source_COMP_NUM 4
#define source_COMP_TYPE float
#define ReadPixel_inner_COMP_TYPE_inner_COMP_NUM(buffer, bufferSize, x, y) Computed(source, x, y)
#define inner_Res 0
inline float4 Computed(srcBufferType(source), int xidx, int yidx) {
    return ReadPixel(source, 0, 0) + (float4)(xidx, yidx, 0.0f, 0.0f);
}
__kernel void Evaluate(srcBufferType(source)) {
    int2 coord;
    GET_COORD(coord, (int2)(1, 1));
    int2 size = GET_BUFFER_SIZE(inner);
    const float4 result = ReadPixel(inner, 2, 3 + size.x);
    WritePixel(source, coord.x, coord.y, result);
})";
    // The options of a fused program, which has all its definitions in the text.
    const raw::ProgramHandle program = device_->build(std::string(commonKernelSource()) + kernel, " -D HASH=1");
    Pixel value = {};
    const raw::MemoryHandle source = device_->buffer(sizeof value, value.data());
    const raw::KernelHandle run = device_->kernel(program, "Evaluate");
    raw::setArguments(run, source);
    device_->run(run, 8, 8, 8, 8);
    device_->read(source, sizeof value, value.data());
    EXPECT_EQ(value, (Pixel{2.0f, 3.0f, 0.0f, 0.0f}));
}

TEST_F(AccessLayer, GammaKeepsWhatOneLeavesAndTheRestWithinItsAccuracy) {
    const std::string kernel = R"(
__kernel void Evaluate(__global float4* result) {
    const float4 odd = (float4)(-3.0f, 0.1f, 12345.0f, -0.5f);
    result[0] = applyGammaCorrection(1.0f, odd);
    result[1] = applyGammaCorrection(2.2f, odd);
    result[2] = applyGammaCorrection(-2.0f, (float4)(0.0f, 0.25f, 1.0f, 3.0f));
    result[3] = applyGammaCorrection(0.45f, (float4)(0.5f, 1e-4f, 20.0f, 0.0f));
})";
    const std::vector<Pixel> values = evaluate(kernel, 4);
    EXPECT_EQ(values[0], (Pixel{-3.0f, 0.1f, 12345.0f, -0.5f}));
    EXPECT_EQ(values[1][0], 0.0f);
    EXPECT_EQ(values[2], (Pixel{0.0f, 2.0f, 1.0f, 3.0f})) << "0 to a negative power is kept at 0";
    EXPECT_EQ(values[1][3], -0.5f);
    const std::array<std::array<double, 3>, 4> powers = {{{values[1][1], 0.1, 2.2},
                                                          {values[1][2], 10000.0, 2.2},
                                                          {values[3][0], 0.5, 0.45},
                                                          {values[3][2], 20.0, 0.45}}};
    for (const auto& [value, base, gamma] : powers) {
        // Logarithm and power carry about 2e-7 each, and the exponent's rounding grows with its size.
        EXPECT_NEAR(value, std::pow(base, 1.0 / gamma), 3e-6 * std::pow(base, 1.0 / gamma)) << base << " " << gamma;
    }
}

TEST_F(AccessLayer, InterpolationMeetsItsEndsAndTheCorners) {
    const std::string kernel = R"(
__kernel void Evaluate(srcBufferType(source)) {
    const int2 size = GET_BUFFER_SIZE(source);
    const float4 corner = Sampler2DBilinear(source, (float2)(0.0f, 0.0f));
    const float4 middle = Sampler2DBilinear(source, (float2)(0.5f, 0.5f));
    const float4 far_corner = BilinearAt(source, (float2)(9.0f, 9.0f));
    const float4 start = CubicInterp((float4)(3.0f), (float4)(1.0f), (float4)(2.0f), (float4)(7.0f), (float4)(0.0f));
    const float4 end = CubicInterp((float4)(3.0f), (float4)(1.0f), (float4)(2.0f), (float4)(7.0f), (float4)(1.0f));
    const float4 half_way = CubicInterp((float4)(3.0f), (float4)(1.0f), (float4)(2.0f), (float4)(7.0f), (float4)(0.5f));
    WritePixel(source, 0, 0, (float4)(corner.x, middle.x, far_corner.x, 0.0f));
    WritePixel(source, 1, 0, (float4)(start.x, end.x, half_way.x, (float)size.x));
})";
    const raw::ProgramHandle program = build(kernel, options::image("source", options::kFloat4, 2, 2));
    std::vector<Pixel> values = {{1.0f}, {2.0f}, {3.0f}, {10.0f}};
    const raw::MemoryHandle source = device_->buffer(4 * sizeof(Pixel), values.data());
    const raw::KernelHandle run = device_->kernel(program, "Evaluate");
    raw::setArguments(run, source);
    device_->run(run, 1, 0, 1, 0);
    device_->read(source, 4 * sizeof(Pixel), values.data());
    EXPECT_EQ(values[0], (Pixel{1.0f, 4.0f, 10.0f, 0.0f}));
    // Catmull-Rom half way: (9 (p1 + p2) - (p0 + p3)) / 16.
    EXPECT_EQ(values[1], (Pixel{1.0f, 2.0f, (9.0f * 3.0f - 10.0f) / 16.0f, 2.0f}));
}
