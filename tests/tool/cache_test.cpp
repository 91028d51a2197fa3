// Where compiled kernels go.
#include <gmock/gmock.h>
#include <unistd.h>

#include "process.h"

namespace tooltest {

namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

namespace fs = std::filesystem;

using Environment = std::vector<std::pair<std::string, std::string>>;

Outcome develop(const Environment& environment, const std::vector<std::string>& more = {}) {
    const TemporaryDirectory directory;
    std::vector<std::string> arguments{"run", TOV_DATA "/render.exr", "-f", "linear_tonemap",
                                       "-o",  directory / "out.exr"};
    arguments.insert(arguments.end(), more.begin(), more.end());
    return runTool(arguments, {.environment = environment});
}

void expectPrivateCache(const fs::path& path) {
    ASSERT_TRUE(fs::is_directory(path)) << path;
    EXPECT_EQ(fs::status(path).permissions(), fs::perms::owner_all) << path;
    EXPECT_FALSE(fs::is_empty(path)) << path;
}

TEST(Cache, LiesInTheUsersCacheDirectoryMadeWithItsParents) {
    const TemporaryDirectory home;
    EXPECT_EQ(develop({{"XDG_CACHE_HOME", home / "a/b"}, {"HOME", home / "home"}}).status, 0);
    expectPrivateCache(home / "a/b/tov");
    EXPECT_FALSE(fs::exists(home / "home"));
    // A relative path there is invalid by the desktop's convention.
    EXPECT_EQ(develop({{"XDG_CACHE_HOME", "relative"}, {"HOME", home / "home"}}).status, 0);
    expectPrivateCache(home / "home/.cache/tov");
}

TEST(Cache, IsClosedToOthersAndRefusedWhenItIsTheirs) {
    const TemporaryDirectory home;
    fs::create_directories(home / ".cache/tov");
    fs::permissions(home / ".cache/tov", fs::perms::all);
    const Environment environment{{"XDG_CACHE_HOME", ""}, {"HOME", home.path()}};
    EXPECT_EQ(develop(environment).status, 0);
    expectPrivateCache(home / ".cache/tov");
    if (::geteuid() != 0) return;  // only root can give a directory away
    ASSERT_EQ(::chown((home / ".cache/tov").c_str(), 1, 1), 0);
    const Outcome theirs = develop(environment);
    EXPECT_EQ(theirs.status, 1);
    EXPECT_THAT(theirs.err, HasSubstr("belongs to another user"));
}

TEST(Cache, CanBeNamedUpTo127Bytes) {
    const TemporaryDirectory directory;
    const std::string prefix = directory / "";
    const std::string longest = prefix + std::string(127 - prefix.size(), 'c');
    EXPECT_EQ(develop({}, {"--cache", longest}).status, 0);
    expectPrivateCache(longest);
    const Outcome tooLong = develop({}, {"--cache", longest + "c"});
    EXPECT_EQ(tooLong.status, 2);
    EXPECT_THAT(tooLong.err, HasSubstr("128 bytes"));
}

TEST(Cache, ADefaultThatIsTooLongAsksForAnother) {
    const TemporaryDirectory directory;
    const Outcome outcome = develop({{"XDG_CACHE_HOME", directory / std::string(120, 'c')}});
    EXPECT_EQ(outcome.status, 2);
    EXPECT_THAT(outcome.err, HasSubstr("name a shorter one with --cache"));
    EXPECT_THAT(directory.list(), IsEmpty());
}

TEST(Cache, ADefaultThatCannotBeMadeIsOnlyANote) {
    const TemporaryDirectory directory;
    writeFile(directory / "file", "");
    // The driver keeps files of its own there, and fails without.
    const Outcome outcome = develop({{"XDG_CACHE_HOME", directory / "file"}, {"POCL_CACHE_DIR", directory / "driver"}});
    EXPECT_EQ(outcome.status, 0);
    EXPECT_THAT(outcome.err, HasSubstr("compiled kernels are not kept"));
}

TEST(Cache, ASecondRunCompilesNothing) {
    const TemporaryDirectory cache;
    const Outcome first = develop({}, {"--cache", cache.path(), "--verbose"});
    EXPECT_THAT(first.err, HasSubstr("Cached file created"));
    const Outcome second = develop({}, {"--cache", cache.path(), "--verbose"});
    EXPECT_EQ(second.status, 0);
    EXPECT_THAT(second.err, Not(HasSubstr("Cached file created")));
}

}  // namespace

}  // namespace tooltest
