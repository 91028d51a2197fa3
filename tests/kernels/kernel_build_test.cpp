// Every program compiles without a warning under the library's own options, for the layouts that its kernels support.
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "build_options.h"
#include "kernelgen/sources.h"
#include "raw_opencl.h"

namespace {

using options::image;
using options::Layout;

class KernelBuild : public testing::Test {
 protected:
    static void SetUpTestSuite() { device_ = new raw::Device; }
    static void TearDownTestSuite() {
        delete device_;
        device_ = nullptr;
    }

    // Builds a program and looks a kernel up in it; a compiler's complaint or a missing kernel fails the test.
    static void expectBuilds(const std::string& program, const char* kernel, bool grid2D,
                             const std::string& definitions) {
        EXPECT_NO_THROW(device_->kernel(
            device_->build(std::string(findKernelSource(program)), options::ofPass(grid2D, definitions)), kernel))
            << program;
    }
    // The compiler's log of a build that must fail.
    static std::string logOfFailure(const std::string& program, const std::string& definitions) {
        try {
            device_->build(std::string(findKernelSource(program)), options::ofPass(true, definitions));
        } catch (const std::runtime_error& error) {
            return error.what();
        }
        return "built";
    }

    static inline raw::Device* device_ = nullptr;
};

std::string images(const std::vector<std::string>& names, Layout layout) {
    std::string definitions;
    for (const std::string& name : names) definitions += image(name, layout, 37, 23);
    return definitions;
}

std::string sourceAndResult(Layout source, Layout result) {
    return image("srcBuffer", source, 37, 23) + image("dstBuffer", result, 37, 23);
}

std::string inputs(int number, Layout layout) {
    std::string definitions = options::define("INPUTS_NUM=" + std::to_string(number));
    for (int i = 0; i < number; ++i) definitions += image("input" + std::to_string(i), layout, 37, 23);
    return definitions;
}

// One buffer layout of each type and one image object: what a kernel sees of the others is the access layer's matter.
constexpr Layout kSamples[] = {{"uint", "3"}, {"half", "2"}, {"float", "4"}, options::kSampler};

}  // namespace

TEST_F(KernelBuild, FiltersForEveryLayout) {
    for (const Layout layout : options::kBufferLayouts) {
        expectBuilds("Filters", "DragoToneMappingKernel", true, sourceAndResult(layout, layout));
    }
    expectBuilds("Filters", "SobelOperatorKernel", true, sourceAndResult(options::kSampler, options::kSampler));
}

TEST_F(KernelBuild, MathAndBilateralForNoneToSixInputs) {
    for (const int number : {0, 1, 6}) {
        for (const Layout layout : {kSamples[0], options::kSampler, options::kAbsent}) {
            const std::string definitions = sourceAndResult(kSamples[1], kSamples[2]) + inputs(number, layout);
            expectBuilds("Math", "WeightedSumKernel", true, definitions);
            expectBuilds("BilateralDenoiser", "BilateralFilterKernel", true, definitions + options::define("radius=5"));
        }
    }
}

TEST_F(KernelBuild, MoreThanSixInputsAreRefusedByName) {
    const std::string definitions = sourceAndResult(options::kFloat4, options::kFloat4) + inputs(7, options::kFloat4);
    EXPECT_NE(logOfFailure("Math", definitions).find("Internal error: too lot of inputs!"), std::string::npos);
    EXPECT_NE(logOfFailure("BilateralDenoiser", definitions + options::define("radius=1"))
                  .find("Internal error: too lot of inputs!"),
              std::string::npos);
}

TEST_F(KernelBuild, ResamplingForItsThreeOperatorsOnly) {
    const std::string ratios = options::define("CRATIO_X=2") + options::define("CRATIO_Y=3");
    for (const Layout layout : kSamples) {
        for (const char* operation : {"0", "1", "2"}) {
            expectBuilds("Resample", "ResampleKernel", true,
                         sourceAndResult(layout, layout) + ratios +
                             options::define(std::string("INTERPOLATION_OPERATOR=") + operation));
        }
    }
    const raw::ProgramHandle program =
        device_->build(std::string(findKernelSource("Resample")),
                       options::ofPass(true, sourceAndResult(options::kFloat4, options::kFloat4) + ratios +
                                                 options::define("INTERPOLATION_OPERATOR=3")));
    EXPECT_THROW(device_->kernel(program, "ResampleKernel"), std::runtime_error);
}

TEST_F(KernelBuild, BlurPlainAndTiledForSmallAndLargeRadii) {
    for (const Layout layout : kSamples) {
        for (const int radius : {2, 40}) {
            std::string coefficients = "COEFFS={0.5f";
            for (int i = 0; i < 2 * radius; ++i) coefficients += ",0.5f";
            for (const char* tiled : {"0", "1"}) {
                expectBuilds("GaussBlur", "GaussBlurHorKernel", false,
                             sourceAndResult(layout, layout) + options::define("cRadius=" + std::to_string(radius)) +
                                 options::define(coefficients + "}") + options::define(std::string("TILED=") + tiled));
            }
        }
    }
}

TEST_F(KernelBuild, TheWaveletDenoiserForAllLevelsWithAndWithoutFeatures) {
    for (const Layout layout : {kSamples[0], options::kFloat4}) {
        for (const char* level : {" -D offset=1  -D FIRST_LEVEL ", " -D offset=2  -D ODD ", " -D offset=16 "}) {
            for (const Layout feature : {options::kFloat4, options::kAbsent}) {
                expectBuilds("EAWDenoiser", "EAWDenoiserKernel", true,
                             sourceAndResult(layout, layout) + level +
                                 images({"normalsBuff", "depthBuff", "transBuff", "vColorBuff"}, feature));
            }
        }
    }
}

TEST_F(KernelBuild, TheRegressionDenoiserWithAndWithoutFeatures) {
    for (const Layout layout : {kSamples[0], options::kSampler, options::kAbsent}) {
        expectBuilds("LWRDenoiser", "LWRDenoiserFirstPass", true,
                     sourceAndResult(options::kFloat4, kSamples[1]) +
                         images({"vColorBuff", "transBuff", "vTransBuff", "normalsBuff", "vNormalsBuff", "depthBuff",
                                 "vDepthBuff"},
                                layout));
    }
}

TEST_F(KernelBuild, AntialiasingPassByPass) {
    const std::string features = images({"mesh_id", "normal", "depthTex"}, options::kAbsent);
    for (const Layout layout : kSamples) {
        expectBuilds("MLAA", "EdgeDetectionMLAA", true,
                     images({"colorTex", "mesh_id", "normal", "depthTex"}, layout) + options::define("EDGE_DETECTION"));
    }
    expectBuilds("MLAA", "EdgeDetectionMLAA", true,
                 images({"colorTex"}, options::kFloat4) + features + options::define("EDGE_DETECTION"));
    expectBuilds("MLAA", "BlendingWeightCalculationMLAA", true, options::define("WEIGH_CALC"));
    for (const Layout layout : {Layout{"half", "4"}, options::kFloat4}) {
        expectBuilds(
            "MLAA", "NeighborhoodBlendingMLAA", true,
            images({"colorTex"}, layout) + images({"out_buffer"}, {"uint", "4"}) + options::define("BLENDING"));
    }
    EXPECT_NE(logOfFailure("MLAA", images({"colorTex", "out_buffer"}, {"uint", "4"}) + options::define("BLENDING")),
              "built")
        << "pixels that the bilinear sampler does not know";
}

TEST_F(KernelBuild, AccumulationPassByPass) {
    for (const Layout layout : {Layout{"half", "4"}, options::kSampler, options::kAbsent}) {
        const std::string scene = images({"positions"}, kSamples[2]) + images({"normals", "meshIds"}, layout);
        expectBuilds("TemporalAccumulation", "GenerateMotionBuffer", true,
                     scene + images({"motion"}, kSamples[1]) + options::define("MOTION_BUFFER"));
        expectBuilds("TemporalAccumulation", "TemporalAccumulation", true,
                     scene + images({"colors", "motions", "outColors"}, kSamples[2]) +
                         images({"outVariances"}, layout) + options::define("TEMPORAL_ACCUMULATION"));
        expectBuilds("TemporalAccumulation", "SwapOutToIn", true, scene + options::define("COPY"));
    }
}
