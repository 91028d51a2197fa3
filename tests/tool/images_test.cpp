// Pictures that filters read beside their input: files, layers of files, lists, and what is refused about them.
#include <gmock/gmock.h>

#include <algorithm>

#include "picture_channels.h"
#include "process.h"
#include "test_pictures.h"

namespace tooltest {

namespace {

using ::testing::Each;
using ::testing::HasSubstr;

const OIIO::TypeDesc kFloat = OIIO::TypeDesc::FLOAT;

class Images : public testing::Test {
 protected:
    Outcome run(const std::string& input, const std::vector<std::string>& arguments) const {
        std::vector<std::string> all{"run", directory_ / input, "-o", directory_ / "out.exr"};
        all.insert(all.end(), arguments.begin(), arguments.end());
        return runTool(all, {.directory = directory_.path()});
    }

    // A picture of constant channels.
    void storeFlat(const std::string& name, int width, int height, const std::vector<std::string>& channels,
                   const std::vector<float>& values) const {
        Stored picture{width, height, channels, {}, kFloat};
        for (int i = 0; i < width * height; ++i)
            picture.values.insert(picture.values.end(), values.begin(), values.end());
        store(directory_ / name, picture);
    }

    Stored result() const { return load(directory_ / "out.exr"); }

    const TemporaryDirectory directory_;
};

TEST_F(Images, AWeightedSumAddsFilesLayersAndItsOwnInput) {
    storeFlat("a.exr", 9, 5, {"R", "G", "B"}, {1, 2, 3});
    storeFlat("gray.exr", 9, 5, {"Y"}, {8});
    storeFlat("layers.exr", 9, 5, {"View.Normal.X", "View.Normal.Y", "View.Normal.Z", "Z"}, {16, 32, 64, 128});
    const Outcome outcome =
        run("a.exr", {"-f", "linear_tonemap:cKey=10", "-f",
                      "weighted_sum:inputs=a.exr+gray.exr+layers.exr:Normal+layers.exr:Z+@,weights=1+2+1+1+1"});
    ASSERT_EQ(outcome.status, 0) << outcome.err;
    const Stored sum = result();
    for (size_t i = 0; i < sum.values.size(); i += 3) {
        ASSERT_EQ(sum.values[i], 1 + 16 + 16 + 128 + 10);  // small whole numbers: exact
        ASSERT_EQ(sum.values[i + 1], 2 + 16 + 32 + 128 + 20);
        ASSERT_EQ(sum.values[i + 2], 3 + 16 + 64 + 128 + 30);
    }
}

TEST_F(Images, ALayerMayBeTheInputItself) {
    storeFlat("layers.exr", 4, 4, {"V.Noisy Image.R", "V.Noisy Image.G", "V.Noisy Image.B", "V.Depth.Z"}, {1, 2, 3, 4});
    ASSERT_EQ(run("layers.exr:Depth", {"-f", "linear_tonemap:cKey=2"}).status, 0);
    EXPECT_THAT(result().values, Each(8.0f));
    ASSERT_EQ(run("layers.exr:noisy image", {"-f", "linear_tonemap"}).status, 0);
    EXPECT_EQ(result().channels.size(), 3u);
}

TEST_F(Images, LayersAreFoundByWholeNameEndOrChannel) {
    using Indices = std::vector<int>;
    const std::vector<std::string> channels = {"A.Normal.X", "A.Normal.Y", "A.Normal.Z", "A.Depth.Z",
                                               "R",          "Z",          "B.Normal.X", "normal.X"};
    EXPECT_EQ(tool::findLayer(channels, "B.Normal"), (Indices{6}));
    EXPECT_EQ(tool::findLayer(channels, "Normal"), (Indices{0, 1, 2}));
    EXPECT_EQ(tool::findLayer(channels, "normal"), (Indices{7}));
    EXPECT_EQ(tool::findLayer(channels, "DEPTH"), (Indices{3}));
    EXPECT_EQ(tool::findLayer(channels, "A.Depth.Z"), (Indices{3}));
    EXPECT_EQ(tool::findLayer(channels, "R"), (Indices{4}));
    EXPECT_EQ(tool::findLayer({"N.X", "N.Y", "N.Z"}, "Z"), Indices{});
    EXPECT_EQ(tool::findLayer({"N.X", "N.Y", "N.Z", "V.R", "V.Z"}, "Z"), (Indices{4}));
    EXPECT_EQ(tool::findLayer(channels, "ormal"), Indices{});
    EXPECT_EQ(tool::findLayer(channels, ""), Indices{});
}

// The a-trous filter takes the length of the variance's four components: a stand-in of 1 for alpha would add to it.
TEST_F(Images, AVarianceWithoutAlphaHasNone) {
    const Stored noisy = pattern(33, 32, {"R", "G", "B"}, kFloat);
    store(directory_ / "noisy.exr", noisy);
    storeFlat("v3.exr", 33, 32, {"R", "G", "B"}, {0.01f, 0.01f, 0.01f});
    storeFlat("v4.exr", 33, 32, {"R", "G", "B", "A"}, {0.01f, 0.01f, 0.01f, 0});
    ASSERT_EQ(run("noisy.exr", {"-f", "eaw_denoise:colorSigma=4,colorVar=v3.exr"}).status, 0);
    const std::vector<float> without = result().values;
    ASSERT_EQ(run("noisy.exr", {"-f", "eaw_denoise:colorSigma=4,colorVar=v4.exr"}).status, 0);
    EXPECT_EQ(without, result().values);
    EXPECT_NE(without, noisy.values);
}

TEST_F(Images, AMatrixIsSixteenNumbers) {
    storeFlat("positions.exr", 6, 6, {"R", "G", "B"}, {0.5f, 0.25f, 0.75f});
    const std::string scale = "motion_buffer:viewProjMatrix=2+0+0+0+0+2+0+0+0+0+1+0+0+0+0+1";
    ASSERT_EQ(run("positions.exr", {"-f", scale}).status, 0);
    EXPECT_EQ(result().values[0], 0.0f);  // the first matrix is the previous one, too
}

TEST_F(Images, WhatDoesNotFitIsRefusedByName) {
    storeFlat("a.exr", 8, 6, {"R", "G", "B"}, {1, 1, 1});
    storeFlat("small.exr", 4, 3, {"R", "G", "B"}, {1, 1, 1});
    storeFlat("layers.exr", 8, 6, {"N.X", "N.Y", "N.Z", "UV.U", "UV.V"}, {0, 0, 1, 0, 0});
    const struct {
        std::vector<std::string> arguments;
        int status;
        std::vector<const char*> messages;
    } rows[] = {
        {{"-f", "multiply:inputs=a.exr+small.exr"}, 2, {"small.exr has 4 x 3 pixels", "a.exr has 8 x 6"}},
        {{"-f", "resample:size=4x3", "-f", "multiply:inputs=a.exr"}, 2, {"a.exr has 8 x 6", "resampled, has 4 x 3"}},
        {{"-f", "mlaa:depthImg=none.exr"}, 4, {"none.exr: there is no such file"}},
        {{"-f", "mlaa:depthImg=none.exr:Z"}, 4, {"none.exr:Z: there is no such file"}},
        {{"-f", "mlaa:depthImg=layers.exr:"}, 2, {"the name of the layer is missing"}},
        {{"-f", "mlaa:normalsImg=layers.exr:M"}, 4, {"has no layer \"M\"", "its layers are N, UV"}},
        {{"-f", "mlaa:normalsImg=layers.exr:UV"}, 4, {"do not say how they make a picture: UV.U, UV.V"}},
    };
    for (const auto& row : rows) {
        const Outcome outcome = run("a.exr", row.arguments);
        EXPECT_EQ(outcome.status, row.status) << row.arguments.back();
        for (const char* message : row.messages) EXPECT_THAT(outcome.err, HasSubstr(message));
    }
}

TEST_F(Images, ResamplingTakesItsSizeFromTheOptionOrTheStage) {
    Stored picture = pattern(8, 6, {"R", "G", "B"}, kFloat);
    store(directory_ / "a.exr", picture);
    ASSERT_EQ(run("a.exr", {"-f", "resample:interpOperator=box", "--size", "4x3"}).status, 0);
    const Stored halved = result();
    ASSERT_EQ(halved.width, 4);
    ASSERT_EQ(halved.height, 3);
    for (size_t c = 0; c < 3; ++c) {  // quarters, so the mean of four is exact
        const float mean =
            (picture.values[c] + picture.values[3 + c] + picture.values[24 + c] + picture.values[27 + c]) / 4;
        EXPECT_EQ(halved.values[c], mean);
    }
    ASSERT_EQ(run("a.exr", {"-f", "resample:size=16x12", "-f", "sobel", "-f", "resample", "--size", "5x7"}).status, 0);
    EXPECT_EQ(result().width, 5);
    EXPECT_EQ(result().height, 7);
}

}  // namespace

}  // namespace tooltest
