// Text in, text out: the kernel parser, layout definitions, numbers and hashes; and the antialiasing table. No device.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <locale>

#include "core/context.h"
#include "filters/area_table.h"
#include "filters/catalogue.h"
#include "filters/color_tools.h"
#include "kernelgen/kernel_code.h"
#include "kernelgen/option_text.h"
#include "kernelgen/sources.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

std::vector<std::string> namesOf(const TovKernelCode& code) {
    std::vector<std::string> names;
    for (const TovKernelVariable& argument : code.arguments) names.push_back(argument.name);
    return names;
}

TovKernelCode parsed(const std::string& kernel, std::string_view source) {
    TovKernelCode code;
    ParseKernel(code, kernel, source);
    return code;
}

TEST(KernelParser, ReadsPlainMacroAndArrayParameters) {
    const TovKernelCode wavelets = parsed("EAWDenoiserKernel", findKernelSource("EAWDenoiser"));
    EXPECT_THAT(namesOf(wavelets),
                ElementsAre("srcBuffer", "normalsBuff", "depthBuff", "transBuff", "vColorBuff", "colSigma", "normSigma",
                            "dptSigma", "transSigma", "dstBuffer", "variance"));
    EXPECT_EQ(wavelets.arguments.back().type, "__global float2*");
    EXPECT_EQ(wavelets.arguments.front().text(), "srcBufferType(srcBuffer)");
    EXPECT_EQ(wavelets.arguments[5].text(), "float colSigma");

    const TovKernelCode sum = parsed("WeightedSumKernel", findKernelSource("Math"));
    EXPECT_THAT(namesOf(sum), ElementsAre("srcBuffer", "dstBuffer", "input", "INPUTS_NUM"));
    EXPECT_EQ(sum.arguments[2].type, "IMAGE_ARRAY");
    EXPECT_EQ(sum.arguments[3].text(), "REPEAT INPUTS_NUM");
}

TEST(KernelParser, TakesTheFirstOccurrenceAndItsWholeBody) {
    const char* const source =
        "__kernel  void\n first(float a) { if (a) { a = 1; } }\n"
        "#ifdef X\n__kernel void twice(int b) {\n#define Y 1\n {}\n}\n#else\n__kernel void twice(int c) { other "
        "}\n#endif\n";
    EXPECT_EQ(parsed("first", source).body, " if (a) { a = 1; } ");
    EXPECT_THAT(namesOf(parsed("twice", source)), ElementsAre("b"));
    EXPECT_EQ(parsed("twice", source).body, "\n#define Y 1\n {}\n");
}

TEST(KernelParser, LeavesAKernelThatIsNotThereEmptyAndSurvivesBrokenText) {
    EXPECT_TRUE(parsed("absent", "__kernel void present(int a) {}").arguments.empty());
    EXPECT_EQ(parsed("absent", "__kernel void present(int a) {}").name, "absent");
    EXPECT_TRUE(parsed("k", "__kernel void k(").arguments.empty());
    EXPECT_TRUE(parsed("k", "__kernel void k(int a) {{ never closed").body.empty());
    EXPECT_TRUE(parsed("k", "").body.empty());
    EXPECT_THAT(namesOf(parsed("k", "__kernel void k() {}")), ElementsAre());
    parsed("k", "__kernel void k(a), )(, ()) {}");
    parsed("k", "__kernel void k(,,,) {}");
}

TEST(KernelParser, FindsEveryKernelOfTheCatalogueWithANameForEachArgument) {
    for (uint32_t type = 0; type < kFilterTypes; ++type) {
        for (const PassSpec& pass : filterSpec(type).passes) {
            const TovKernelCode& code = embeddedKernelCode(pass.program, pass.kernel);
            EXPECT_FALSE(code.body.empty()) << pass.kernel;
            for (const TovKernelVariable& argument : code.arguments) {
                EXPECT_FALSE(argument.name.empty()) << pass.kernel;
                EXPECT_FALSE(argument.type.empty()) << pass.kernel << " " << argument.name;
            }
        }
    }
}

TEST(KernelTexts, AreNineSelfContainedOnes) {
    for (const char* name : {"Filters", "BilateralDenoiser", "Resample", "GaussBlur", "LWRDenoiser", "EAWDenoiser",
                             "Math", "MLAA", "TemporalAccumulation"}) {
        const std::string text(findKernelSource(name));
        EXPECT_THAT(text, HasSubstr(std::string(commonKernelSource()))) << name;
        EXPECT_THAT(text, testing::Not(HasSubstr("#include"))) << name;
        const bool hasHeader = std::string_view(name) == "MLAA";
        EXPECT_EQ(text.find(commonKernelSource()) != 0, hasHeader) << name;
    }
    EXPECT_TRUE(findKernelSource("Combined").empty());
}

TEST(OptionText, HashesWithOneAsStartAndSignedBytes) {
    EXPECT_EQ(HashSource("", 0), 294921u);
    EXPECT_EQ(HashSource("abc", 3), 1307784515u);
    EXPECT_EQ(HashSource("\xE9", 1), 785720697u);
}

TEST(OptionText, DescribesLayoutsAndWritesSizesAsSignedNumbers) {
    const tov_image_desc desc = {1920, 1080, 1, 2048, 0, 3, TOV_COMPONENT_TYPE_FLOAT16};
    EXPECT_EQ(GetImageDefines("input2", desc, false),
              " -D input2_Res=(int2)(1920,1080) -D input2_COMP_NUM=3 -D input2_COMP_TYPE=half");
    EXPECT_EQ(GetImageDefines("a", desc, true), " -D a_Res=(int2)(1920,1080) -D a_COMP_NUM= -D a_COMP_TYPE=sampler");
    EXPECT_EQ(GetImageDefines("a", {0x80000000u, 1, 1, 0, 0, 1, 9}, false),
              " -D a_Res=(int2)(-2147483648,1) -D a_COMP_NUM=1 -D a_COMP_TYPE=");
    EXPECT_EQ(absentImageDefines("a"), " -D a_COMP_NUM=none -D a_COMP_TYPE=none -D a_Res=(int2)1");
}

TEST(OptionText, NumbersLookLikeADefaultStreamsWhateverTheLocale) {
    struct Grouped : std::numpunct<char> {
        char do_decimal_point() const override { return ','; }
        char do_thousands_sep() const override { return '.'; }
        std::string do_grouping() const override { return "\3"; }
    };
    const std::locale before = std::locale::global(std::locale(std::locale::classic(), new Grouped));
    EXPECT_EQ(decimal(1234567), "1234567");
    EXPECT_EQ(sixDigits(0.1f), "0.1");
    EXPECT_EQ(sixDigits(1234567.0f), "1.23457e+06");
    EXPECT_EQ(sixDigits(0.00001f), "1e-05");
    EXPECT_EQ(sixDigits(-2.0f), "-2");
    EXPECT_EQ(fixedSixDigits(0.2740686f), "0.274069");
    EXPECT_EQ(fixedSixDigits(1.0f), "1.000000");
    EXPECT_THAT(fixedSixDigits(3.4e38f), testing::MatchesRegex("[0-9]+\\.000000"));
    std::locale::global(before);
}

TEST(ColourTools, MatricesOfEveryGamutMapWhiteToD65AndInvert) {
    ASSERT_EQ(ColorTools::gamuts().size(), 4u);
    for (const ColorTools::TovColorSpaceGamut& gamut : ColorTools::gamuts()) {
        const ColorTools::Matrix3 matrix = ColorTools::rgbToXyz(gamut);
        const ColorTools::Matrix3 back = ColorTools::inverse(matrix);
        const double white[] = {0.3127 / 0.329, 1.0, 0.3583 / 0.329};
        for (size_t row = 0; row < 3; ++row) {
            EXPECT_NEAR(matrix[3 * row] + matrix[3 * row + 1] + matrix[3 * row + 2], white[row], 1e-6);
            for (size_t column = 0; column < 3; ++column) {
                double product = 0;
                for (size_t i = 0; i < 3; ++i) product += double{matrix[3 * row + i]} * back[3 * i + column];
                EXPECT_NEAR(product, row == column ? 1.0 : 0.0, 1e-6);
            }
        }
    }
}

TEST(AreaTable, HoldsTheIntegralsOfItsEdgeShapes) {
    const std::vector<uint8_t>& table = areaTable();
    ASSERT_EQ(table.size(), 54450u);
    struct Row {
        size_t column, row, left, right;
        int own, opposite;
    };
    const Row rows[] = {
        {1, 0, 0, 4, 0, 102}, {1, 0, 1, 4, 0, 63},  {1, 1, 0, 0, 0, 62},   {1, 1, 3, 3, 0, 8},   {1, 1, 0, 4, 0, 102},
        {1, 3, 2, 5, 0, 47},  {1, 3, 7, 2, 63, 0},  {1, 3, 0, 0, 31, 31},  {3, 1, 0, 4, 102, 0}, {4, 3, 0, 4, 0, 102},
        {4, 3, 7, 2, 63, 0},  {4, 1, 0, 4, 102, 0}, {1, 4, 10, 20, 0, 41}, {0, 3, 1, 0, 63, 0},  {4, 4, 3, 5, 0, 0},
        {4, 0, 3, 5, 0, 0},   {2, 1, 0, 4, 0, 0},   {1, 2, 0, 4, 0, 0},
    };
    for (const Row& r : rows) {
        const size_t texel = 2 * ((r.row * 33 + r.right) * 165 + r.column * 33 + r.left);
        EXPECT_EQ(table[texel], r.own) << r.column << ", " << r.row << ": " << r.left << ", " << r.right;
        EXPECT_EQ(table[texel + 1], r.opposite) << r.column << ", " << r.row << ": " << r.left << ", " << r.right;
    }
    EXPECT_EQ(*std::max_element(table.begin(), table.end()), 123);
}

}  // namespace
