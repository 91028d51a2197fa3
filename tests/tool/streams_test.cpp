// Standard output carries results and nothing else, and no failure to write them goes unnoticed.
#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdlib>

#include "process.h"

namespace tooltest {

namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;
using ::testing::Not;

std::vector<std::string> developInto(const std::string& output) {
    return {"run", TOV_DATA "/render.exr", "-f", "linear_tonemap", "-o", output};
}

TEST(Streams, ResultsAreAllThatStandardOutputCarries) {
    const TemporaryDirectory directory;
    EXPECT_THAT(runTool({"devices"}).out, MatchesRegex("([gc]pu:[0-9]+  .+ \\(.+\\)\n)+"));
    EXPECT_EQ(runTool({"filters", "gamma_correction"}).out,
              "gamma_correction\n  Performs gamma correction for input image.\n"
              "    cGamma  float = 1  gamma correction coefficient\n");
    EXPECT_THAT(runTool(developInto(directory / "out.exr")).out, IsEmpty());
}

TEST(Streams, LinesOfTheLibraryAreShownOnlyWhenTheyMatter) {
    const TemporaryDirectory directory;
    std::vector<std::string> arguments = developInto(directory / "out.exr");
    EXPECT_THAT(runTool(arguments).err, IsEmpty());
    arguments.emplace_back("--verbose");
    EXPECT_THAT(runTool(arguments).err, HasSubstr("> CL Initialization\n"));
    const Outcome refused =
        runTool({"run", TOV_DATA "/render.exr", "-f", "gamma_correction:cGamma=0", "-o", directory / "out.exr"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_THAT(refused.err, HasSubstr("cGamma"));  // the library's own line
    EXPECT_THAT(refused.err, HasSubstr("TOV_ERROR_INVALID_PARAMETER (-12)"));
}

TEST(Streams, ResultsThatCannotBeWrittenAreAFailure) {
    const Outcome full = runTool({"filters"}, {.standardOutput = "/dev/full"});
    EXPECT_EQ(full.status, 5);
    EXPECT_THAT(full.err, HasSubstr("standard output: No space left on device"));
    const Outcome closed = runTool({"filters"}, {.prepare = [] { ::close(STDOUT_FILENO); }});
    EXPECT_EQ(closed.status, 5);
    EXPECT_THAT(closed.err, HasSubstr("standard output: Bad file descriptor"));
}

TEST(Streams, APictureIsWrittenWithAllStandardDescriptorsClosed) {
    const TemporaryDirectory directory;
    const Outcome outcome = runTool(developInto(directory / "out.exr"), {.prepare = [] {
                                        for (int descriptor = 0; descriptor <= 2; ++descriptor) ::close(descriptor);
                                    }});
    EXPECT_EQ(outcome.status, 0);
    EXPECT_THAT(readFile(directory / "out.exr"), Not(IsEmpty()));
}

// A desktop's locale may write 0,1 for a tenth.
TEST(Streams, NumbersDoNotFollowTheLocale) {
    const TemporaryDirectory directory;
    ASSERT_EQ(std::system(("localedef -i de_DE -f UTF-8 " + directory / "de_DE.UTF-8").c_str()), 0);
    const Setting german{.environment = {{"LOCPATH", directory.path()}, {"LC_ALL", "de_DE.UTF-8"}}};
    EXPECT_THAT(runTool({"filters", "mlaa"}, german).out, HasSubstr("float = 0.05"));
    const std::vector<std::string> stages = {"run", TOV_DATA "/render.exr", "-f", "gamma_correction:cGamma=2.2", "-o"};
    std::vector<std::string> inGerman = stages;
    std::vector<std::string> inEnglish = stages;
    inGerman.push_back(directory / "german.png");
    inEnglish.push_back(directory / "english.png");
    EXPECT_EQ(runTool(inGerman, german).status, 0);
    EXPECT_EQ(runTool(inEnglish).status, 0);
    EXPECT_EQ(readFile(inGerman.back()), readFile(inEnglish.back()));
}

}  // namespace

}  // namespace tooltest
