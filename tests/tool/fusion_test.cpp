// --fuse: which stages go together, and that the picture stays the same.
#include <gmock/gmock.h>

#include "process.h"
#include "stage_groups.h"
#include "test_pictures.h"

namespace tooltest {

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

std::vector<size_t> groups(const std::vector<std::string>& texts, bool fuse = true) {
    std::vector<tool::Stage> stages;
    for (const std::string& text : texts) stages.push_back(tool::parseStage(text));
    return tool::groupStages(stages, fuse);
}

TEST(FusedStages, GoTogetherWhereNothingBetweenThemNeedsAPicture) {
    EXPECT_THAT(groups({"sobel", "normalization", "sobel"}, false), ElementsAre(1, 1, 1));
    EXPECT_THAT(groups({"sobel", "normalization", "sobel"}), ElementsAre(3));
    EXPECT_THAT(groups({"sobel", "gaussian_blur", "sobel", "sobel"}), ElementsAre(1, 1, 2));
    EXPECT_THAT(groups({"linear_tonemap", "drago_tonemap", "gamma_correction"}), ElementsAre(1, 2));
    EXPECT_THAT(groups({"linear_tonemap", "drago_tonemap:avLum=1,maxLum=2", "gamma_correction"}), ElementsAre(3));
    EXPECT_THAT(groups({"sobel", "multiply:inputs=a.exr"}), ElementsAre(2));
    EXPECT_THAT(groups({"sobel", "multiply:inputs=a.exr+@"}), ElementsAre(1, 1));
    EXPECT_THAT(groups({"eaw_denoise", "lwr_denoise", "bilateral_denoise", "mlaa"}), ElementsAre(1, 1, 1, 1));
}

TEST(FusedStages, StayWithinTheArgumentsOfALaunch) {
    size_t stages = 0;
    for (const size_t size : groups(std::vector<std::string>(100, "sobel"))) {
        EXPECT_LE(size, 31u);  // two arguments each, and the input and the output
        stages += size;
    }
    EXPECT_EQ(stages, 100u);
}

TEST(FusedStages, MakeTheSamePictureAndAreTold) {
    const TemporaryDirectory directory;
    Stored picture = pattern(23, 17, {"R", "G", "B"}, OIIO::TypeDesc::FLOAT);
    for (float& value : picture.values) value += 0.25f;
    store(directory / "in.exr", picture);
    std::vector<std::string> arguments{"run", directory / "in.exr", "--verbose"};
    for (const char* stage : {"linear_tonemap:cKey=2", "resample:size=15x12", "gamma_correction:cGamma=2", "resample",
                              "drago_tonemap", "weighted_sum:inputs=@,weights=0.5", "normalization"}) {
        arguments.insert(arguments.end(), {"-f", stage});
    }
    arguments.insert(arguments.end(), {"--size", "9x11", "-o", directory / "plain.exr"});
    const Outcome plain = runTool(arguments);
    ASSERT_EQ(plain.status, 0) << plain.err;
    EXPECT_THAT(plain.err, HasSubstr("stage 4 of 7: resample, "));
    arguments.back() = directory / "fused.exr";
    arguments.emplace_back("--fuse");
    const Outcome fused = runTool(arguments);
    ASSERT_EQ(fused.status, 0) << fused.err;
    EXPECT_THAT(fused.err,
                HasSubstr("stages 1 to 4 of 7, fused: linear_tonemap, resample, gamma_correction, resample"));
    EXPECT_THAT(fused.err, HasSubstr("stage 5 of 7: drago_tonemap, "));
    EXPECT_THAT(fused.err, HasSubstr("stages 6 to 7 of 7, fused: weighted_sum, normalization"));
    const Stored expected = load(directory / "plain.exr");
    const Stored result = load(directory / "fused.exr");
    ASSERT_EQ(result.width, 9);
    ASSERT_EQ(result.values.size(), expected.values.size());
    for (size_t i = 0; i < expected.values.size(); ++i) {
        // Compiled apart, relaxed mathematics rounds differently by a few units in the last place.
        ASSERT_NEAR(result.values[i], expected.values[i], 4e-6) << i;
    }
}

}  // namespace

}  // namespace tooltest
