// `tov denoise`: it finds layers, gains without tuning, keeps what is not colour, and refuses what does not fit.
#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <cmath>

#include "process.h"
#include "test_pictures.h"

namespace tooltest {

namespace {

using ::testing::HasSubstr;
using ::testing::Not;

constexpr int kSize = 48;

// Two walls that meet in the middle, in the order of an OpenEXR file's channels: albedo, colour, depth, normal.
class Denoising : public testing::Test {
 protected:
    Denoising() : clean_(scene(0.0f)) {
        store(directory_ / "noisy.exr", scene(0.25f));
        store(directory_ / "clean.exr", clean_);
    }

    static Stored scene(float noise) {
        Stored picture{kSize, kSize, {}, {}, OIIO::TypeDesc::FLOAT};
        for (const char* name : {"Albedo.R", "Albedo.G", "Albedo.B", "Combined.R", "Combined.G", "Combined.B",
                                 "Combined.A", "Depth.Z", "Normal.X", "Normal.Y", "Normal.Z"}) {
            picture.channels.push_back("View." + std::string(name));
        }
        uint32_t seed = 1;
        const auto jitter = [&] {
            seed = seed * 1664525u + 1013904223u;
            return noise * (static_cast<float>(seed >> 8U) / 8388608.0f - 1.0f);
        };
        for (int i = 0; i < kSize * kSize; ++i) {
            const bool left = i % kSize < kSize / 2;
            const float wall = left ? 0.8f : 0.4f;
            const std::array<float, 11> pixel = {wall,
                                                 wall,
                                                 wall,
                                                 wall + jitter(),
                                                 wall + jitter(),
                                                 wall + jitter(),
                                                 0.5f,
                                                 left ? 3.0f : 1e10f,
                                                 left ? 1.0f : 0.0f,
                                                 0.0f,
                                                 left ? 0.0f : 1.0f};
            picture.values.insert(picture.values.end(), pixel.begin(), pixel.end());
        }
        return picture;
    }

    Outcome denoise(const std::vector<std::string>& arguments, const std::string& input = "noisy.exr") const {
        std::vector<std::string> all{"denoise", directory_ / input, "-o", directory_ / "out.exr"};
        all.insert(all.end(), arguments.begin(), arguments.end());
        return runTool(all, {.directory = directory_.path()});
    }

    // Root of the mean square of the differences to the walls.
    static double error(const std::vector<float>& values, size_t stride, size_t first) {
        double sum = 0.0;
        for (size_t i = 0; i < size_t{kSize} * kSize; ++i) {
            for (size_t c = 0; c < 3; ++c) {
                const double difference = values[i * stride + first + c] - (i % kSize < kSize / 2 ? 0.8 : 0.4);
                sum += difference * difference;
            }
        }
        return std::sqrt(sum / (3.0 * kSize * kSize));
    }
    static double noisyError() { return error(scene(0.25f).values, 11, 3); }

    Stored result() const { return load(directory_ / "out.exr"); }

    const TemporaryDirectory directory_;
    const Stored clean_;
};

TEST_F(Denoising, LayersAreFoundAndTheNoiseGoes) {
    for (const char* method : {"eaw", "lwr"}) {
        const Outcome outcome = denoise({"--method", method});
        ASSERT_EQ(outcome.status, 0) << outcome.err;
        EXPECT_THAT(outcome.err, HasSubstr("its layers are used: Albedo, Normal, Depth"));
        EXPECT_THAT(outcome.err, HasSubstr("no variance is given: it is estimated"));
        const Stored picture = result();
        ASSERT_EQ(picture.channels, (std::vector<std::string>{"R", "G", "B", "A"}));
        EXPECT_LT(error(picture.values, 4, 0), noisyError() / 3) << method;
        for (size_t i = 3; i < picture.values.size(); i += 4) ASSERT_EQ(picture.values[i], 0.5f);
    }
}

TEST_F(Denoising, GainsWithColourAlone) {
    ASSERT_EQ(runTool({"run", (directory_ / "noisy.exr") + ":Combined", "-f", "linear_tonemap", "-o",
                       directory_ / "color.exr"})
                  .status,
              0);
    const Outcome outcome = denoise({}, "color.exr");
    EXPECT_THAT(outcome.err, Not(HasSubstr("layers are used")));
    EXPECT_LT(error(result().values, 4, 0), noisyError() / 2);
}

TEST_F(Denoising, GivenFilesTakePrecedenceOverLayers) {
    Stored variance{kSize, kSize, {"R", "G", "B"}, {}, OIIO::TypeDesc::FLOAT};
    variance.values.assign(size_t{3} * kSize * kSize, 0.0f);
    store(directory_ / "variance.exr", variance);
    const Outcome outcome =
        denoise({"--variance", "variance.exr", "--normal", "clean.exr:Normal", "--albedo", "clean.exr", "--verbose"});
    ASSERT_EQ(outcome.status, 0) << outcome.err;
    EXPECT_THAT(outcome.err, HasSubstr("its layers are used: Depth\n"));
    EXPECT_THAT(outcome.err, Not(HasSubstr("estimated")));
    EXPECT_THAT(outcome.err, HasSubstr("eaw_denoise: colorSigma=0.5, "));  // no noise
    EXPECT_NEAR(error(result().values, 4, 0), noisyError(), 0.01);
}

TEST_F(Denoising, WhatDoesNotFitIsRefused) {
    store(directory_ / "small.exr", pattern(3, 3, {"R", "G", "B"}, OIIO::TypeDesc::FLOAT));
    const struct {
        std::vector<std::string> arguments;
        int status;
        const char* message;
    } rows[] = {
        {{"--albedo", "small.exr"}, 2, "small.exr has 3 x 3 pixels"},
        {{"--depth", "none.exr"}, 4, "none.exr: there is no such file"},
        {{"--normal", "noisy.exr:Nrml"}, 4, "its layers are View.Albedo, View.Combined, View.Depth, View.Normal"},
        {{"--normal", ""}, 2, "--normal is empty"},
        {{"--method", "magic"}, 2, "not one of eaw, lwr"},
        {{"--method", "lwr", "--samples", "1"}, 2, "--samples: at least 2"},
        {{"--samples", "4"}, 2, "goes with --method lwr"}};
    for (const auto& row : rows) {
        const Outcome outcome = denoise(row.arguments);
        EXPECT_EQ(outcome.status, row.status) << row.message;
        EXPECT_THAT(outcome.err, HasSubstr(row.message));
    }
}

}  // namespace

}  // namespace tooltest
