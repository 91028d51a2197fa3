// The tool among processes and files: its streams, its output file, its cache, its documents.
#include <unistd.h>

#include "tool_test.h"
#include "tov/tov.h"

using Host = Tool;

const std::string kDevelop = "run $R -f linear_tonemap -o out.exr ";

TEST_F(Host, GetsResultsAndNothingElseOnStandardOutput) {
    EXPECT_THAT(tov("devices").out, testing::MatchesRegex("([gc]pu:[0-9]+  .+ \\(.+\\)\n)+"));
    EXPECT_THAT(tov("filters gamma_correction").out, HasSubstr("    cGamma  float = 1  gamma correction coefficient"));
    EXPECT_EQ(tov("--version").out, "tov " TOV_VERSION_STRING "\n");
    for (const std::string command : {"", "devices ", "filters ", "run ", "denoise "})
        EXPECT_THAT(tov(command + "--help").out, HasSubstr("tov " + command));
    const Outcome quiet = tov(kDevelop);
    EXPECT_EQ(quiet.out + quiet.err, "");
    expect(0, "> CL Initialization\n", kDevelop + "--verbose");
}

TEST_F(Host, SaysWhatTheDocumentsSay) {
    const std::string source = std::getenv("S");
    EXPECT_EQ(tov("filters --markdown").out, readFile(source + "/docs/filters.md"));
    const std::string program = "```c\n" + readFile(source + "/examples/first_light.c") + "```\n";
    EXPECT_THAT(readFile(source + "/README.md"), HasSubstr(program));
}

TEST_F(Host, IsToldWhereNoResultCanBeWrittenAndNoDeviceIsThere) {
    expect(5, "standard output: No space left on device", "filters >/dev/full");
    expect(3, "pocl-opencl-icd", kDevelop, "OCL_ICD_VENDORS=/none");
    EXPECT_EQ(tov(kDevelop + "<&- >&- 2>&-").status, 0);
    EXPECT_EQ(load("out.exr").width, 320);
}

TEST_F(Host, ReadsNumbersAlikeInEveryLocale) {
    ASSERT_EQ(std::system("localedef -i de_DE -f UTF-8 ./de_DE.UTF-8"), 0);
    const std::string german = "LOCPATH=$PWD LC_ALL=de_DE.UTF-8";  // writes 0,1 for a tenth
    const std::string command = "run $R -f gamma_correction:cGamma=2.2";
    EXPECT_EQ(made(command, german).values, made(command).values);
}

TEST_F(Host, KeepsItsFileOnAFullDiskAndItsLinksAndPermissions) {
    fs::create_directory("far");
    fs::create_symlink("far/away.exr", "out.exr");  // leads to nothing yet
    EXPECT_EQ(tov(kDevelop, "umask 027;").status, 0);
    EXPECT_EQ(fs::status("far/away.exr").permissions(), fs::perms{0640});
    fs::permissions("far/away.exr", fs::perms{0604});
    EXPECT_EQ(tov("run out.exr -f linear_tonemap:cKey=2 -o out.exr").status, 0) << "the output may be the input";
    EXPECT_TRUE(fs::is_symlink("out.exr"));
    EXPECT_EQ(fs::status("far/away.exr").permissions(), fs::perms{0604});
    const std::string before = readFile("out.exr");
    expect(5, "cannot write out.exr", "run $R -f linear_tonemap:cKey=2 -o out.exr", "trap '' XFSZ; ulimit -f 64;");
    EXPECT_EQ(readFile("out.exr"), before);
    EXPECT_EQ(std::distance(fs::directory_iterator("far"), {}), 1);
}

TEST_F(Host, HasAPrivateCacheInTheUsersDirectoryOrWhereItIsNamed) {
    const auto isPrivate = [](const std::string& path) {
        return fs::status(path).permissions() == fs::perms::owner_all && !fs::is_empty(path);
    };
    fs::create_directories("a/b/tov");  // open to all
    EXPECT_EQ(tov(kDevelop, "XDG_CACHE_HOME=$PWD/a/b HOME=$PWD/home").status, 0);
    EXPECT_TRUE(isPrivate("a/b/tov")) << "closed to others, too";
    // Relative paths there are invalid by the desktop's convention.
    EXPECT_EQ(tov(kDevelop, "XDG_CACHE_HOME=a HOME=$PWD/home").status, 0);
    EXPECT_TRUE(isPrivate("home/.cache/tov"));
    if (::geteuid() == 0 && ::chown("a/b/tov", 1, 1) == 0)  // only root can give a directory away
        expect(1, "belongs to another user", kDevelop, "XDG_CACHE_HOME=$PWD/a/b");
    // The driver keeps files of its own there, and fails without.
    expect(0, "compiled kernels are not kept", kDevelop, "XDG_CACHE_HOME=/dev/null POCL_CACHE_DIR=$PWD/driver");
}

TEST_F(Host, CompilesOnceIntoACacheOfUpTo127Bytes) {
    const std::string longest = kDevelop + "--verbose --cache " + std::string(127, 'c');
    expect(0, "Cached file created", longest);
    EXPECT_THAT(tov(longest).err, testing::Not(HasSubstr("Cached file created")));
    expect(2, "128 bytes", longest + "c");
}
