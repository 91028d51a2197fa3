// The filters behind the names: pixels of `tov run` against plain arithmetic, and values measured on the way.
#include <gmock/gmock.h>

#include <cmath>

#include "luminance.h"
#include "process.h"
#include "test_pictures.h"
#include "text.h"

namespace tooltest {

namespace {

using ::testing::HasSubstr;

const std::string kRender = TOV_DATA "/render.exr";

Outcome run(const std::string& input, const std::vector<std::string>& stages, const std::string& output) {
    std::vector<std::string> arguments{"run", input, "-o", output};
    for (const std::string& stage : stages) arguments.insert(arguments.end(), {"-f", stage});
    return runTool(arguments);
}

TEST(Filtering, ALinearToneMapMultipliesColourExactlyAndKeepsAlpha) {
    const TemporaryDirectory directory;
    ASSERT_EQ(run(kRender, {"linear_tonemap:cKey=2"}, directory / "out.exr").status, 0);
    const Stored render = load(kRender);
    const Stored result = load(directory / "out.exr");
    ASSERT_EQ(result.values.size(), render.values.size());
    for (size_t i = 0; i < render.values.size(); ++i) {
        ASSERT_EQ(result.values[i], render.values[i] * (i % 4 == 3 ? 1.0f : 2.0f)) << i;
    }
}

TEST(Filtering, StagesRunInTheOrderGiven) {
    const TemporaryDirectory directory;
    store(directory / "in.exr", pattern(11, 5, {"R", "G", "B"}, OIIO::TypeDesc::FLOAT));
    ASSERT_EQ(
        run(directory / "in.exr", {"linear_tonemap:cKey=4", "gamma_correction:cGamma=2"}, directory / "out.exr").status,
        0);
    const Stored input = load(directory / "in.exr");
    const Stored result = load(directory / "out.exr");
    for (size_t i = 0; i < input.values.size(); ++i) {
        // The driver's relaxed power errs by a few units in the last place.
        ASSERT_NEAR(result.values[i], std::sqrt(4.0 * input.values[i]), 2e-6) << i;
    }
}

TEST(Filtering, ColourSpacesAreKnownByNameAndNumber) {
    const TemporaryDirectory directory;
    const auto convert = [&](const std::string& values, const char* name) {
        EXPECT_EQ(run(kRender, {"color_space:" + values}, directory / name).status, 0);
        return load(directory / name).values;
    };
    const auto byName = convert("srcColorSpace=rec2020,dstColorSpace=srgb", "a.exr");
    EXPECT_EQ(byName, convert("srcColorSpace=3,dstColorSpace=1", "b.exr"));
    EXPECT_NE(byName, load(kRender).values);
}

// The render's mean and largest luminance over the pixels that have one, in double.
tool::Luminance plainLuminance(const Stored& picture) {
    double sum = 0.0;
    double largest = 0.0;
    for (size_t i = 0; i < picture.values.size(); i += 4) {
        const float* const p = &picture.values[i];
        const double luminance = 0.2126 * p[0] + 0.7152 * p[1] + 0.0722 * p[2];
        sum += luminance;
        largest = std::max(largest, luminance);
    }
    return {static_cast<float>(sum / (static_cast<double>(picture.values.size()) / 4.0)), static_cast<float>(largest)};
}

TEST(Filtering, DragoMeasuresWhatIsNotGiven) {
    const TemporaryDirectory directory;
    const Outcome measured = run(kRender, {"drago_tonemap:cBias=0.85"}, directory / "measured.exr");
    const tool::Luminance luminance = plainLuminance(load(kRender));
    const std::string average = "avLum=" + tool::formatFloat(luminance.average);
    const std::string maximum = "maxLum=" + tool::formatFloat(luminance.maximum);
    EXPECT_THAT(measured.err, HasSubstr(average + ", " + maximum));
    run(kRender, {"drago_tonemap:cBias=0.85," + average + "," + maximum}, directory / "given.exr");
    EXPECT_EQ(load(directory / "measured.exr").values, load(directory / "given.exr").values);

    const Outcome half = run(kRender, {"drago_tonemap:cBias=0.85,avLum=0.5"}, directory / "half.exr");
    EXPECT_THAT(half.err, HasSubstr("measured on its input: " + maximum));
}

TEST(Filtering, DragoMeasuresTheInputOfItsOwnStage) {
    const TemporaryDirectory directory;
    const Outcome outcome = run(kRender, {"linear_tonemap:cKey=4", "drago_tonemap"}, directory / "out.exr");
    EXPECT_THAT(outcome.err, HasSubstr("maxLum=" + tool::formatFloat(4.0f * plainLuminance(load(kRender)).maximum)));
}

TEST(Filtering, DragoKeepsABlackPictureBlackAndSaysSo) {
    const TemporaryDirectory directory;
    Stored black = pattern(8, 8, {"R", "G", "B"}, OIIO::TypeDesc::FLOAT);
    for (float& value : black.values) value = 0.0f;
    store(directory / "black.exr", black);
    const Outcome outcome = run(directory / "black.exr", {"drago_tonemap"}, directory / "out.exr");
    EXPECT_EQ(outcome.status, 0);
    EXPECT_THAT(outcome.err, HasSubstr("its input is black"));
    EXPECT_EQ(load(directory / "out.exr").values, black.values);
}

TEST(Filtering, LuminanceLeavesOutWhatIsNotFinite) {
    const float infinity = std::numeric_limits<float>::infinity();
    const std::vector<float> pixels = {1, 1, 1, 1, 3, 3, 3, 1, infinity, 0, 0, 1, std::nanf(""), 0, 0, 1};
    const tool::Luminance luminance = tool::measureLuminance(pixels);
    EXPECT_FLOAT_EQ(luminance.average, 2.0f);
    EXPECT_FLOAT_EQ(luminance.maximum, 3.0f);
    EXPECT_FALSE(tool::measureLuminance({}).usable());
}

TEST(Filtering, TheExampleMakesTheToolsPicture) {
    const TemporaryDirectory directory;
    const Outcome example = runProgram(TOV_FIRST_LIGHT, {TOV_DATA "/render.pfm", directory / "example.ppm"},
                                       {.directory = directory.path()});
    ASSERT_EQ(example.status, 0) << example.err;
    run(kRender, {"reinhard_tonemap", "gamma_correction:cGamma=2.2"}, directory / "tool.ppm");
    const Stored fromExample = load(directory / "example.ppm");
    const Stored fromTool = load(directory / "tool.ppm");
    ASSERT_EQ(fromExample.values.size(), fromTool.values.size());
    for (size_t i = 0; i < fromTool.values.size(); ++i) {
        // One 8-bit step: layouts of three and four components are compiled apart, and halves round either way.
        ASSERT_NEAR(fromExample.values[i], fromTool.values[i], 1.01 / 255.0) << i;
    }
}

}  // namespace

}  // namespace tooltest
