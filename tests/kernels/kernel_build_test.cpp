// The nine program texts compile without a warning under the library's own options, for every layout of every image.
#include <gtest/gtest.h>

#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "kernelgen/sources.h"
#include "zor/device.h"

namespace {

struct Layout {
    const char* type;
    const char* count;
};
// The twelve buffers, the image object, and the absent image.
constexpr Layout kLayouts[] = {{"uint", "1"},  {"half", "1"},  {"float", "1"},  {"uint", "2"},   {"half", "2"},
                               {"float", "2"}, {"uint", "3"},  {"half", "3"},   {"float", "3"},  {"uint", "4"},
                               {"half", "4"},  {"float", "4"}, {"sampler", ""}, {"none", "none"}};
constexpr size_t kBuffers = 12;
constexpr size_t kPresent = 13;
constexpr size_t kAll = 14;

// Definitions of images in one of kAll builds, in which each takes every layout, and seldom that of its neighbour.
std::string images(const std::string& names, size_t build, size_t layouts) {
    std::string definitions;
    std::istringstream list(names);
    for (std::string name; list >> name; build += 5) {
        const auto& [type, count] = kLayouts[build % layouts];
        definitions += " -D " + name + "_Res=(int2)(37,23) -D " + name + "_COMP_NUM=" + count + " -D " + name +
                       "_COMP_TYPE=" + type;
    }
    return definitions;
}

struct Program {
    const char* text;
    std::vector<std::string> passes;  // definitions, taken in turns
    const char* images;               // that must be there
    const char* optional = "";
    size_t layouts = kPresent;  // that they may have
};

const char* const kBoth = "srcBuffer dstBuffer";
const std::string kGrid = " -D GROUP_DIM_2D";
const std::string kRatio = kGrid + " -D CRATIO_X=2 -D CRATIO_Y=3 -D INTERPOLATION_OPERATOR=";
const std::string kTiled = " -D GROUP_DIM_1D -D cRadius=1 -D COEFFS={0.5f,0.5f,0.5f} -D TILED=";
const std::string kBlend =
    kGrid + " -D BLENDING -D colorTex_Res=(int2)(37,23) -D colorTex_COMP_NUM=4 -D colorTex_COMP_TYPE=";
const Program kPrograms[] = {
    {"Filters", {kGrid}, kBoth},
    {"Math",
     {kGrid + " -D INPUTS_NUM=0", kGrid + " -D INPUTS_NUM=6"},
     kBoth,
     "input0 input1 input2 input3 input4 input5"},
    {"BilateralDenoiser", {kGrid + " -D INPUTS_NUM=2 -D radius=5"}, kBoth, "input0 input1"},
    {"Resample", {kRatio + "0", kRatio + "1", kRatio + "2"}, kBoth},
    {"GaussBlur", {kTiled + "0", kTiled + "1"}, kBoth},
    {"EAWDenoiser",
     {kGrid + " -D offset=1 -D FIRST_LEVEL", kGrid + " -D offset=2 -D ODD", kGrid + " -D offset=4"},
     kBoth,
     "normalsBuff depthBuff transBuff vColorBuff",
     kBuffers},
    {"LWRDenoiser", {kGrid}, kBoth, "vColorBuff transBuff vTransBuff normalsBuff vNormalsBuff depthBuff vDepthBuff"},
    {"MLAA", {kGrid + " -D EDGE_DETECTION"}, "colorTex", "mesh_id normal depthTex"},
    {"MLAA", {kGrid + " -D WEIGH_CALC", kBlend + "half", kBlend + "float"}, "out_buffer"},
    {"TemporalAccumulation",
     {kGrid + " -D MOTION_BUFFER", kGrid + " -D TEMPORAL_ACCUMULATION", kGrid + " -D COPY"},
     "positions motion colors motions outColors",
     "normals meshIds outVariances"},
};

// Whether the library's compiler takes a text. Without a file name nothing goes to the cache of programs.
bool builds(zor::Device& device, std::string_view text, const std::string& definitions) {
    const std::string options =
        "-Werror -cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2 -I .  -D X64 " + definitions;
    const std::string_view sources[] = {text, "\nkernel void Built() {}\n"};
    return device.getKernel({.kernelName = "Built", .options = options, .sources = sources}) != nullptr;
}

}  // namespace

TEST(KernelTexts, CompileWithoutAWarningForEveryLayout) {
    const std::unique_ptr<zor::Device, void (*)(zor::Device*)> device(
        zor::createDevice(zor::DEVICE_KIND_CL, {.deviceType = 1}), zor::destroyDevice);
    ASSERT_TRUE(device->isInitialized());
    for (const Program& program : kPrograms)
        for (size_t build = 0; build < kAll; ++build) {
            const std::string definitions = program.passes[build % program.passes.size()] +
                                            images(program.images, build, program.layouts) +
                                            images(program.optional, build, kAll);
            EXPECT_TRUE(builds(*device, findKernelSource(program.text), definitions)) << program.text << definitions;
        }
    EXPECT_FALSE(builds(*device, "kernel void Warned(global int* p) { if (*p = 1) p[1] = 2; }", kGrid))
        << "a warning is no error";
    EXPECT_FALSE(builds(*device, findKernelSource("Math"), kGrid + images(kBoth, 0, 1) + " -D INPUTS_NUM=7"))
        << "more than six inputs";
}
