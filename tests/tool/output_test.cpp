// An output file is written whole or not at all.
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>

#include "process.h"
#include "test_pictures.h"

namespace tooltest {

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::StartsWith;

namespace fs = std::filesystem;

const std::string kRender = TOV_DATA "/render.exr";

Outcome develop(const std::string& input, const std::string& output, const char* stage = "linear_tonemap",
                const Setting& setting = {}) {
    return runTool({"run", input, "-f", stage, "-o", output}, setting);
}

TEST(Output, AFailureLeavesTheOldFileAndNothingElse) {
    const TemporaryDirectory directory;
    writeFile(directory / "out.png", "precious");
    EXPECT_EQ(develop(kRender, directory / "out.png", "gamma_correction:cGamma=0").status, 1);
    EXPECT_EQ(develop(directory / "missing.exr", directory / "out.png").status, 4);
    EXPECT_EQ(readFile(directory / "out.png"), "precious");
    EXPECT_THAT(directory.list(), ElementsAre("out.png"));
}

TEST(Output, AFullDiskLeavesTheOldFileAndNothingElse) {
    const TemporaryDirectory directory;
    // A driver that compiled now would meet the limit, too, and some end the process then.
    const TemporaryDirectory before;
    ASSERT_EQ(develop(kRender, before / "out.tif", "linear_tonemap").status, 0);
    writeFile(directory / "out.tif", "precious");
    const Setting smallFiles{.prepare = [] {
        const rlimit limit{65536, 65536};
        ::setrlimit(RLIMIT_FSIZE, &limit);
        std::signal(SIGXFSZ, SIG_IGN);
    }};
    const Outcome outcome = develop(kRender, directory / "out.tif", "linear_tonemap", smallFiles);
    EXPECT_EQ(outcome.status, 5);
    EXPECT_THAT(outcome.err, HasSubstr("cannot write " + directory / "out.tif"));
    EXPECT_EQ(readFile(directory / "out.tif"), "precious");
    EXPECT_THAT(directory.list(), ElementsAre("out.tif"));
}

TEST(Output, MayBeTheInput) {
    const TemporaryDirectory directory;
    Stored picture = pattern(19, 7, {"R", "G", "B", "A"}, OIIO::TypeDesc::FLOAT);
    store(directory / "both.exr", picture);
    EXPECT_EQ(develop(directory / "both.exr", directory / "both.exr", "linear_tonemap:cKey=2").status, 0);
    for (size_t i = 0; i < picture.values.size(); ++i) picture.values[i] *= i % 4 == 3 ? 1.0f : 2.0f;
    EXPECT_EQ(load(directory / "both.exr").values, picture.values);
}

TEST(Output, ASymbolicLinkStaysOneAndItsTargetIsReplaced) {
    const TemporaryDirectory directory;
    fs::create_directory(directory.path() / "far");
    fs::create_symlink("far/away.exr", directory.path() / "link.exr");  // leads to nothing yet
    for (int round = 0; round < 2; ++round) {
        EXPECT_EQ(develop(kRender, directory / "link.exr").status, 0);
        EXPECT_TRUE(fs::is_symlink(directory.path() / "link.exr"));
        EXPECT_EQ(load(directory / "far/away.exr").width, 320);
    }
}

TEST(Output, KeepsThePermissionsOfTheFileItReplaces) {
    const TemporaryDirectory directory;
    const Setting strict{.prepare = [] { ::umask(027); }};
    EXPECT_EQ(develop(kRender, directory / "new.exr", "linear_tonemap", strict).status, 0);
    EXPECT_EQ(fs::status(directory / "new.exr").permissions(), static_cast<fs::perms>(0640));
    fs::permissions(directory / "new.exr", static_cast<fs::perms>(0604));
    EXPECT_EQ(develop(kRender, directory / "new.exr", "linear_tonemap", strict).status, 0);
    EXPECT_EQ(fs::status(directory / "new.exr").permissions(), static_cast<fs::perms>(0604));
}

TEST(Output, FormatsFollowTheExtensionAndTheInput) {
    const TemporaryDirectory directory;
    const struct {
        const char* name;
        OIIO::TypeDesc::BASETYPE type;
        int channels;
    } rows[] = {{"a.exr", OIIO::TypeDesc::HALF, 4},  {"a.tif", OIIO::TypeDesc::FLOAT, 4},
                {"a.hdr", OIIO::TypeDesc::FLOAT, 3}, {"a.PNG", OIIO::TypeDesc::UINT8, 4},
                {"a.jpg", OIIO::TypeDesc::UINT8, 3}, {"a.ppm", OIIO::TypeDesc::UINT8, 3}};
    for (const auto& row : rows) {
        const Outcome outcome = develop(kRender, directory / row.name);
        EXPECT_EQ(outcome.status, 0) << row.name;
        EXPECT_EQ(outcome.err.find("alpha is not written") != std::string::npos, row.channels == 3) << row.name;
        const Stored result = load(directory / row.name);
        EXPECT_EQ(result.type, row.type) << row.name;
        EXPECT_EQ(result.channels.size(), static_cast<size_t>(row.channels)) << row.name;
    }
}

TEST(Output, ValuesTooLargeForHalfAreKeptAsFloats) {
    const TemporaryDirectory directory;
    Stored picture = pattern(4, 4, {"R", "G", "B"}, OIIO::TypeDesc::HALF);
    store(directory / "half.exr", picture);
    const Outcome outcome = develop(directory / "half.exr", directory / "out.exr", "linear_tonemap:cKey=1048576");
    EXPECT_THAT(outcome.err, StartsWith("note: "));
    const Stored result = load(directory / "out.exr");
    EXPECT_EQ(result.type, OIIO::TypeDesc::FLOAT);
    for (float& value : picture.values) value *= 1048576.0f;
    EXPECT_EQ(result.values, picture.values);
}

}  // namespace

}  // namespace tooltest
