// The form of the kernel texts: what the plain-text rewriting of fusion relies on.
#include <gtest/gtest.h>

#include <regex>
#include <set>
#include <string>
#include <vector>

#include "filters/catalogue.h"
#include "kernelgen/kernel_code.h"
#include "kernelgen/sources.h"

namespace {

std::vector<std::string> allMatches(const std::string& text, const std::string& pattern, size_t group = 0) {
    const std::regex expression(pattern);
    std::vector<std::string> found;
    for (std::sregex_iterator it(text.begin(), text.end(), expression), end; it != end; ++it)
        found.push_back((*it)[group].str());
    return found;
}

bool contains(const std::string& text, const std::string& pattern) {
    return std::regex_search(text, std::regex(pattern));
}

// The kernel texts have line comments only.
std::string withoutComments(const std::string& text) {
    return std::regex_replace(text, std::regex("//[^\n]*"), "");
}

// Names that a text defines for itself outside of its kernels: macros, functions and constants.
std::set<std::string> ownNames(const std::string& text) {
    std::set<std::string> names;
    for (const char* pattern :
         {"\n#define (\\w+)", "\nstatic inline [\\w ]*?[ *](\\w+)\\(", "\n__constant [\\w ]* (\\w+)"})
        for (const std::string& name : allMatches(text, pattern, 1)) names.insert(name);
    return names;
}

// Runs a check on the parsed form of every kernel that can be fused, with the name of its program.
template <class Check>
void forEachFusable(Check check) {
    size_t checked = 0;
    for (uint32_t type = 0; type < kFilterTypes; ++type) {
        if (!filterSpec(type).fusable) continue;
        const PassSpec& pass = filterSpec(type).passes.at(0);
        SCOPED_TRACE(pass.kernel);
        check(embeddedKernelCode(pass.program, pass.kernel), pass.program);
        ++checked;
    }
    EXPECT_EQ(checked, 14u);
}

}  // namespace

// Only what compilers or the text itself define may be asked for: in a fused program all else follows the shared text.
TEST(KernelForm, TheSharedTextLooksAtNoDefinition) {
    const std::string common(commonKernelSource());
    const std::set<std::string> own = ownNames(common);
    const std::vector<std::string> conditions = allMatches(common, "\n#(?:if|ifdef|ifndef|elif)\\b([^\n]*)", 1);
    EXPECT_FALSE(conditions.empty());
    for (const std::string& condition : conditions)
        for (const std::string& name : allMatches(condition, "[A-Za-z_]\\w*"))
            EXPECT_TRUE(name == "defined" || name.starts_with("__") || own.count(name) > 0) << condition;
}

TEST(KernelForm, FusableKernelsStandOnTheirOwn) {
    forEachFusable([](const TovKernelCode& code, const char* program) {
        const std::string text(findKernelSource(program));
        const std::string common(commonKernelSource());
        EXPECT_FALSE(contains(code.body, "\\breturn\\b"));
        EXPECT_FALSE(contains(code.body, "//[^\n]*[{}]|/\\*")) << "a brace in a comment ends the body for the parser";
        const std::vector<std::string> macros = allMatches(code.body, "#define (\\w+)", 1);
        for (const std::string& name : ownNames(text.substr(text.find(common) + common.size()))) {
            const bool inBody = std::find(macros.begin(), macros.end(), name) != macros.end();
            const bool pasted = name == "input";  // as input##itr, where it is no macro
            EXPECT_TRUE(inBody || pasted || !contains(code.body, "\\b" + name + "\\b")) << name << " is its file's own";
        }
        for (const std::string& name : macros)
            EXPECT_EQ(allMatches(code.body, "#undef " + name + "\n").size(), 1u) << name;
    });
}

TEST(KernelForm, FusableKernelsReadTheirPixelAndWriteOnceAtTheEnd) {
    forEachFusable([](const TovKernelCode& code, const char*) {
        std::string output;
        for (const TovKernelVariable& argument : code.arguments)
            if (argument.type == "dstBufferType") output = argument.name;
        EXPECT_EQ(allMatches(code.body, "GET_COORD\\(").size(), 1u);
        EXPECT_TRUE(contains(code.body, "int2 coord;\\s*GET_COORD\\(coord, [^;]*\\);"));
        EXPECT_EQ(allMatches(code.body, "WritePixel\\(").size(), 1u);
        EXPECT_TRUE(code.body.ends_with("    WritePixel(" + output + ", coord.x, coord.y, result);\n"));
        EXPECT_FALSE(contains(code.body, "(//|#define)([^\n]*\\\\\n)*[^\n]*(WritePixel|GET_COORD)\\("));
    });
}

TEST(KernelForm, NoNameOfAFusableKernelHoldsAParameterNameAsAPart) {
    const std::set<std::string> reserved = {"x", "y", "buffer", "bufferSize", "xidx", "yidx"};
    forEachFusable([&](const TovKernelCode& code, const char*) {
        ASSERT_FALSE(code.arguments.empty());
        const std::vector<std::string> names = allMatches(withoutComments(code.body), "[A-Za-z_]\\w*");
        for (const TovKernelVariable& argument : code.arguments) {
            EXPECT_EQ(reserved.count(argument.name), 0u) << argument.name;
            for (const std::string& name : names) {
                const bool holds = name != argument.name && name.find(argument.name) != std::string::npos;
                // Both names are the interface of the kernel.
                const bool given = name == "prev_view_projection" && argument.name == "view_projection";
                EXPECT_TRUE(!holds || given) << name << " holds " << argument.name;
            }
        }
    });
}
