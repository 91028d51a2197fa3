// The form of the kernel texts: what the parser's splitting rules and the plain-text rewriting of fusion rely on.
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <regex>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "kernel_catalogue.h"
#include "kernelgen/kernel_code.h"
#include "kernelgen/sources.h"

namespace {

const std::vector<std::string> kPrograms = {
    "Filters", "BilateralDenoiser",   "Resample", "GaussBlur", "LWRDenoiser", "EAWDenoiser", "Math",
    "MLAA",    "TemporalAccumulation"};

std::string programText(const std::string& program) {
    return std::string(findKernelSource(program));
}

// The program's own text, behind the shared one.
std::string ownText(const std::string& program) {
    const std::string text = programText(program);
    const std::string common(commonKernelSource());
    return text.substr(text.find(common) + common.size());
}

std::vector<std::string> allMatches(const std::string& text, const std::string& pattern, size_t group = 0) {
    const std::regex expression(pattern);
    std::vector<std::string> found;
    for (std::sregex_iterator it(text.begin(), text.end(), expression), end; it != end; ++it) {
        found.push_back((*it)[group].str());
    }
    return found;
}

size_t count(const std::string& text, const std::string& part) {
    size_t found = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) ++found;
    return found;
}

// Comments; the kernel texts have line comments only.
std::string commentsOf(const std::string& text) {
    std::string comments;
    for (const std::string& comment : allMatches(text, "//[^\n]*\n")) comments += comment;
    return comments;
}

std::string withoutComments(const std::string& text) {
    return std::regex_replace(text, std::regex("//[^\n]*"), "");
}

// The lines of all macro definitions, continuations included.
std::string macrosOf(const std::string& text) {
    std::string macros;
    for (const std::string& macro : allMatches(text, "#define([^\n]*\\\\\n)*[^\n]*\n")) macros += macro;
    return macros;
}

// Names that the program defines for itself outside of its kernels: macros, functions and constants.
std::set<std::string> ownNames(const std::string& text) {
    std::set<std::string> names;
    for (const char* pattern :
         {"\n#define (\\w+)", "\nstatic inline [\\w ]*?[ *](\\w+)\\(", "\n__constant [\\w ]* (\\w+)"}) {
        for (const std::string& name : allMatches(text, pattern, 1)) names.insert(name);
    }
    return names;
}

std::string join(const std::vector<TovKernelVariable>& arguments) {
    std::string text;
    for (const TovKernelVariable& argument : arguments) {
        if (!text.empty()) text += '|';
        text += argument.text();
    }
    return text;
}

TovKernelCode parse(const KernelEntry& entry) {
    TovKernelCode code;
    ParseKernel(code, entry.kernel, findKernelSource(entry.program));
    return code;
}

}  // namespace

TEST(KernelForm, TheParserReadsEverySignatureAsTheCatalogueBindsIt) {
    std::map<std::string, std::set<std::string>> kernels;
    for (const KernelEntry& entry : kernelCatalogue()) {
        EXPECT_EQ(join(parse(entry).arguments), entry.parameters) << entry.kernel;
        kernels[entry.program].insert(entry.kernel);
    }
    for (const std::string& program : kPrograms) {
        const std::vector<std::string> found = allMatches(programText(program), "__kernel\\s+void\\s+(\\w+)\\(", 1);
        EXPECT_EQ(std::set<std::string>(found.begin(), found.end()), kernels[program]) << program;
        EXPECT_EQ(count(programText(program), "__kernel"), found.size())
            << "not of the form __kernel void: " << program;
    }
}

TEST(KernelForm, ParameterListsFollowTheSplittingRules) {
    for (const KernelEntry& entry : kernelCatalogue()) {
        SCOPED_TRACE(entry.kernel);
        const std::string pattern = std::string("__kernel void ") + entry.kernel + "\\(([^{]*)\\) \\{";
        const std::vector<std::string> lists = allMatches(programText(entry.program), pattern, 1);
        ASSERT_FALSE(lists.empty()) << "not of the form __kernel void NAME(...) {";
        // A kernel with a body for each kind of device is parsed from the first.
        for (const std::string& other : lists) EXPECT_EQ(other, lists[0]);
        const std::string& list = lists[0];
        EXPECT_FALSE(std::regex_search(list, std::regex(",\\S"))) << "no white space after a comma";
        EXPECT_FALSE(std::regex_search(list, std::regex("BufferType( |\\( |\\(\\w+ )")))
            << "a blank in an image parameter";
        EXPECT_FALSE(std::regex_search(list, std::regex("\\*\\w"))) << "a * stuck to a name";
        EXPECT_EQ(list.find("//"), std::string::npos);
        EXPECT_EQ(list.find("/*"), std::string::npos);
        EXPECT_EQ(list.find('#'), std::string::npos);
    }
}

TEST(KernelForm, BracesAreNeitherInCommentsNorUnbalancedInAPreprocessorBranch) {
    for (const std::string& program : kPrograms) {
        SCOPED_TRACE(program);
        const std::string text = programText(program);
        EXPECT_EQ(commentsOf(text).find_first_of("{}"), std::string::npos);
        EXPECT_EQ(text.find("/*"), std::string::npos) << "line comments only";
        EXPECT_FALSE(std::regex_search(text, std::regex("__kernel[^{]*__attribute__")));
        EXPECT_EQ(text.find("#include"), std::string::npos);
        std::vector<int> starts;
        int depth = 0;
        std::istringstream lines(withoutComments(text));
        for (std::string line; std::getline(lines, line);) {
            const bool opens = line.starts_with("#if");
            const bool closes = line.starts_with("#endif");
            if (closes || line.starts_with("#el")) {
                EXPECT_EQ(depth, starts.back()) << line;
            }
            if (opens) starts.push_back(depth);
            if (closes) starts.pop_back();
            for (const char c : line) depth += (c == '{') - (c == '}');
        }
        EXPECT_EQ(depth, 0);
    }
}

TEST(KernelForm, ProgramsBeginWithTheSharedTextWhichLooksAtNoDefinition) {
    const std::string common(commonKernelSource());
    for (const std::string& program : kPrograms) {
        const std::string front = programText(program).substr(0, programText(program).find(common));
        EXPECT_TRUE(withoutComments(front).find_first_not_of("\n") == std::string::npos) << program;
        EXPECT_EQ(front.empty(), program != "MLAA") << program;
    }
    // Only what compilers or the text itself define may be asked for: in a fused program all else follows the include.
    const std::set<std::string> own = ownNames(common);
    for (const std::string& condition : allMatches(common, "\n#(?:if|ifdef|ifndef|elif)\\b([^\n]*)", 1)) {
        for (const std::string& name : allMatches(condition, "[A-Za-z_]\\w*")) {
            EXPECT_TRUE(name == "defined" || name.starts_with("__") || own.count(name) > 0) << condition;
        }
    }
}

TEST(KernelForm, FusableKernelsStandOnTheirOwn) {
    for (const KernelEntry& entry : kernelCatalogue()) {
        if (!entry.fusable) continue;
        SCOPED_TRACE(entry.kernel);
        const std::string body = parse(entry).body;
        ASSERT_FALSE(body.empty());
        EXPECT_FALSE(std::regex_search(body, std::regex("\\breturn\\b")));
        const std::vector<std::string> defined = allMatches(body, "#define (\\w+)", 1);
        for (const std::string& name : ownNames(ownText(entry.program))) {
            const bool inBody = std::find(defined.begin(), defined.end(), name) != defined.end();
            const bool pasted = name == "input";  // as input##itr, where it is no macro
            const bool used = std::regex_search(body, std::regex("\\b" + name + "\\b"));
            EXPECT_TRUE(inBody || pasted || !used) << "uses a name of its own file: " << name;
        }
        for (const std::string& name : defined) EXPECT_EQ(count(body, "#undef " + name + "\n"), 1u) << name;
    }
}

TEST(KernelForm, FusableKernelsReadTheirPixelAndWriteOnceAtTheEnd) {
    for (const KernelEntry& entry : kernelCatalogue()) {
        if (!entry.fusable) continue;
        SCOPED_TRACE(entry.kernel);
        const TovKernelCode code = parse(entry);
        std::string output;
        for (const TovKernelVariable& argument : code.arguments) {
            if (argument.type == "dstBufferType") output = argument.name;
            const std::set<std::string> reserved = {"x", "y", "buffer", "bufferSize", "xidx", "yidx"};
            EXPECT_EQ(reserved.count(argument.name), 0u) << argument.name;
        }
        EXPECT_EQ(count(code.body, "GET_COORD("), 1u);
        EXPECT_TRUE(std::regex_search(code.body, std::regex("int2 coord;\\s*GET_COORD\\(coord, [^;]*\\);")));
        EXPECT_EQ(count(code.body, "WritePixel("), 1u);
        EXPECT_TRUE(code.body.ends_with("    WritePixel(" + output + ", coord.x, coord.y, result);\n"));
        for (const std::string& text : {commentsOf(code.body), macrosOf(code.body)}) {
            EXPECT_EQ(text.find("WritePixel("), std::string::npos);
            EXPECT_EQ(text.find("GET_COORD("), std::string::npos);
        }
    }
}

TEST(KernelForm, NoNameOfAFusableKernelHoldsAParameterNameAsAPart) {
    for (const KernelEntry& entry : kernelCatalogue()) {
        if (!entry.fusable) continue;
        SCOPED_TRACE(entry.kernel);
        const TovKernelCode code = parse(entry);
        const std::vector<std::string> names = allMatches(withoutComments(code.body), "[A-Za-z_]\\w*");
        for (const TovKernelVariable& argument : code.arguments) {
            for (const std::string& name : names) {
                const bool holds = name != argument.name && name.find(argument.name) != std::string::npos;
                // Both names are the interface of the kernel.
                const bool given = name == "prev_view_projection" && argument.name == "view_projection";
                EXPECT_TRUE(!holds || given) << name << " holds " << argument.name;
            }
        }
    }
}
