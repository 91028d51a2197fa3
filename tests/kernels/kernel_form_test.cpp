// The form of the kernel texts: what the plain-text rewriting of fusion relies on.
#include <gtest/gtest.h>

#include <algorithm>
#include <regex>
#include <string>
#include <vector>

#include "filters/catalogue.h"
#include "kernelgen/kernel_code.h"
#include "kernelgen/sources.h"

namespace {

// A type of no more than its words, and a name that no macro and no fused text uses itself.
const std::string kArgument = "^[^(),/]+ (?!(x|y|buffer|bufferSize|xidx|yidx)$)[A-Za-z_]\\w*$";

std::vector<std::string> allMatches(const std::string& text, const std::string& pattern, size_t group = 0) {
    const std::regex expression(pattern);
    std::vector<std::string> found;
    for (std::sregex_iterator it(text.begin(), text.end(), expression), end; it != end; ++it)
        found.push_back((*it)[group].str());
    return found;
}

void expectFusableForm(const std::string& body) {
    const auto count = [&](const std::string& pattern) { return allMatches(body, pattern).size(); };
    EXPECT_EQ(count("\\breturn\\b"), 0u);
    EXPECT_EQ(count("//[^\n]*[{}]|/\\*"), 0u) << "a brace in a comment ends the body for the parser";
    EXPECT_EQ(count("(//|#define)([^\n]*\\\\\n)*[^\n]*(WritePixel|GET_COORD)\\("), 0u);
    EXPECT_EQ(count("GET_COORD\\("), 1u);
    EXPECT_EQ(count("int2 coord;\\s*GET_COORD\\(coord, [^;]*\\);"), 1u);
    EXPECT_EQ(count("WritePixel\\("), 1u);
    EXPECT_EQ(count("    WritePixel\\(\\w+, coord\\.x, coord\\.y, result\\);\n$"), 1u);
    for (const std::string& name : allMatches(body, "#define (\\w+)", 1))
        EXPECT_EQ(count("#undef " + name + "\n"), 1u) << name;
}

}  // namespace

// Only what compilers, the text itself or the options of fused builds define may be asked for: in a fused program all
// else follows the shared text.
TEST(KernelForm, TheSharedTextLooksAtNoDefinition) {
    const std::string common(commonKernelSource());
    const std::vector<std::string> own = allMatches(common, "\n#define (\\w+)", 1);
    const std::vector<std::string> conditions = allMatches(common, "\n#(?:if|ifdef|ifndef|elif)\\b([^\n]*)", 1);
    EXPECT_FALSE(conditions.empty());
    for (const std::string& condition : conditions)
        for (const std::string& name : allMatches(condition, "[A-Za-z_]\\w*"))
            EXPECT_TRUE(name == "defined" || name == "HASH" || name.starts_with("__") ||
                        std::ranges::count(own, name) > 0)
                << condition;
}

TEST(KernelForm, EveryKernelParsesAndFusableOnesReadTheirPixelAndWriteOnceAtTheEnd) {
    size_t fusable = 0;
    for (uint32_t type = 0; type < kFilterTypes; ++type)
        for (const PassSpec& pass : filterSpec(type).passes) {
            SCOPED_TRACE(pass.kernel);
            const TovKernelCode& code = embeddedKernelCode(pass.program, pass.kernel);
            EXPECT_FALSE(code.arguments.empty());
            for (const auto& [name, kind] : code.arguments)
                EXPECT_EQ(allMatches(kind + " " + name, kArgument).size(), 1u) << kind << " " << name;
            if (!filterSpec(type).fusable) continue;
            expectFusableForm(code.body);
            ++fusable;
        }
    EXPECT_EQ(fusable, 14u);
}
