// The filters behind the names: pixels against plain arithmetic, values and pictures that a stage takes, denoising.
#include <cmath>
#include <random>

#include "stage_groups.h"
#include "tool_test.h"

using Stages = Tool;
using testing::ElementsAre;

// Compiled apart or raised to a power, pixels differ by a few units in the last place.
static void expectNear(const Values& values, const Values& expected, double tolerance = 4e-6) {
    ASSERT_EQ(values.size(), expected.size());
    for (size_t i = 0; i < values.size(); ++i) ASSERT_NEAR(values[i], expected[i], tolerance) << i;
}

TEST_F(Stages, RunInTheOrderGivenAndLeaveAlphaAlone) {
    store("in.exr", {11, 5, {"R", "G", "B", "A"}, kQuarters});
    Values values = load("in.exr").values;
    for (size_t i = 0; i < values.size(); ++i) values[i] = i % 4 == 3 ? values[i] : std::sqrt(4.0f * values[i]);
    expectNear(made("run in.exr -f linear_tonemap:cKey=4 -f gamma_correction:cGamma=2").values, values);
}

TEST_F(Stages, MeasureTheLuminanceThatDragoIsNotGivenOnTheirOwnInput) {
    store("in.exr", {3, 1, kRgb, {1, 1, 1, 3, 3, 3, std::numeric_limits<float>::infinity(), 0, 0}});
    expect(0, "avLum=8, maxLum=12", "run in.exr -f linear_tonemap:cKey=4 -f drago_tonemap -o out.exr");
}

TEST_F(Stages, AddFilesLayersAndTheirOwnInput) {
    store("a.exr", {9, 5, kRgb, {1, 2, 3}});
    store("gray.exr", {9, 5, {"Y"}, {8}});
    store("sum.exr", {9, 5, kRgb, {193, 242, 339}});
    store("layers.exr", {9, 5, {"V.Normal.X", "V.Normal.Y", "V.Normal.Z", "Z"}, {16, 32, 64, 128}});
    const std::string sum = "weighted_sum:inputs=a.exr+gray.exr+layers.exr:normal+layers.exr:Z+@,weights=1+2+1+1+1";
    EXPECT_EQ(made("run layers.exr:V.Normal -f linear_tonemap:cKey=2 -f " + sum).values, load("sum.exr").values);
}

TEST_F(Stages, ResampleToTheSizeOfTheOptionOrTheirOwn) {
    store("a.exr", {8, 6, {"Y"}, kQuarters});
    EXPECT_EQ(made("run a.exr -f resample:interpOperator=box --size 4x3").values[0], (0 + 0.75f + 1 + 0.5f) / 4);
    const Stored twice = made("run a.exr -f resample:size=16x12 -f sobel -f resample --size 5x7");
    EXPECT_EQ(twice.width * 100 + twice.height, 507);
}

TEST_F(Stages, AreFusedWhereNothingBetweenThemNeedsAPicture) {
    const auto groups = [](const Names& texts) {
        std::vector<tool::Stage> stages;
        for (const std::string& text : texts) stages.push_back(tool::parseStage(text));
        return tool::groupStages(stages, true);
    };
    EXPECT_THAT(groups({"sobel", "gaussian_blur", "sobel", "sobel", "eaw_denoise"}), ElementsAre(1, 1, 2, 1));
    EXPECT_THAT(groups({"sobel", "drago_tonemap", "multiply:inputs=a.exr+@"}), ElementsAre(1, 1, 1));
    for (const size_t size : groups(Names(100, "sobel"))) EXPECT_LE(size, 31u) << "arguments of a launch";
    const std::string stages =
        "run $R -f linear_tonemap:cKey=2 -f resample:size=15x12 -f gamma_correction:cGamma=2 -f drago_tonemap ";
    expect(0, "stages 1 to 3 of 4, fused", stages + "--fuse --verbose -o fused.exr");
    expectNear(load("fused.exr").values, made(stages).values);
}

TEST_F(Stages, OfTheExampleMakeTheToolsPicture) {
    ASSERT_EQ(std::system("$FIRST_LIGHT ${R%exr}pfm example.ppm"), 0);
    expect(0, "", "run $R -f reinhard_tonemap -f gamma_correction:cGamma=2.2 -o tool.ppm");
    // One step of 8 bits: layouts are compiled apart, and halves round either way.
    expectNear(load("example.ppm").values, load("tool.ppm").values, 1.01 / 255.0);
}

const Names kLayers = {"V.Albedo.Y", "V.Combined.R", "V.Combined.G", "V.Combined.B", "V.Combined.A",
                       "V.Depth.Z",  "V.Normal.X",   "V.Normal.Y",   "V.Normal.Z"};

// Two walls that meet in the middle, with their features, under noise.
static Values walls(float noise) {
    Values values;
    std::mt19937 generator(1);
    std::uniform_real_distribution<float> wall(0.4f - noise, 0.4f + noise);
    for (int i = 0; i < 48 * 48; ++i) {
        const float side = i % 48 < 24 ? 1.0f : 2.0f;
        values.push_back(side);
        for (int c = 0; c < 3; ++c) values.push_back(side * wall(generator));
        for (const float value : {0.5f, side == 1 ? 3 : 1e10f, side - 1, 0.0f, 2 - side}) values.push_back(value);
    }
    return values;
}

// Root of the mean square of the differences to the walls, of RGBA pictures whose alpha is kept.
static double errorOf(const Stored& picture) {
    double sum = 0.0;
    for (size_t i = 0; i < picture.values.size(); ++i)
        sum += std::pow(picture.values[i] - (i % 4 == 3 ? 0.5 : i / 4 % 48 < 24 ? 0.4 : 0.8), 2);
    return std::sqrt(sum / (3.0 * 48 * 48));
}

TEST_F(Stages, DenoiseWithTheLayersThatAreFoundOrGivenOrWithColourAlone) {
    store("noisy.exr", {48, 48, kLayers, walls(0.15f)});
    store("clean.exr", {48, 48, kLayers, walls(0)});
    store("zero.exr", {48, 48, kRgb, {0}});
    const double noise = errorOf(made("run noisy.exr -f linear_tonemap"));
    EXPECT_LT(errorOf(made("denoise made.exr")), noise / 2);  // colour alone
    EXPECT_LT(errorOf(made("denoise noisy.exr --method lwr")), noise / 3);
    expect(0, "its layers are used: Albedo, Normal, Depth\nnote: no variance is given", "denoise noisy.exr -o out.exr");
    EXPECT_LT(errorOf(load("out.exr")), noise / 3);
    const std::string given = "--variance zero.exr --normal clean.exr:Normal --albedo clean.exr";
    EXPECT_THAT(tov("denoise noisy.exr -o out.exr " + given).err, testing::EndsWith("its layers are used: Depth\n"));
    EXPECT_NEAR(errorOf(load("out.exr")), noise, 0.01) << "without variance there is no noise";
}
