// Documents that repeat what programs say must say the same.
#include <gtest/gtest.h>

#include "process.h"

namespace tooltest {

namespace {

TEST(Documents, TheListOfFiltersIsTheToolsOwn) {
    EXPECT_TRUE(readFile(TOV_SOURCE "/docs/filters.md") == runTool({"filters", "--markdown"}).out)
        << "write it anew: tov filters --markdown > docs/filters.md";
}

TEST(Documents, TheReadmeShowsTheExampleAsItIsBuilt) {
    const std::string shown = "```c\n" + readFile(TOV_SOURCE "/examples/first_light.c") + "```\n";
    EXPECT_NE(readFile(TOV_SOURCE "/README.md").find(shown), std::string::npos)
        << "the README's program is not examples/first_light.c";
}

}  // namespace

}  // namespace tooltest
