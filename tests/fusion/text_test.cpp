// What fusion makes of texts, without a device.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kernelgen/fusion.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
using testing::Pair;

TovKernelCode parsed(const std::string& options) {
    TovKernelCode code;
    ParseDefinitions(code, options);
    return code;
}

TovKernelCode kernel(std::vector<TovKernelVariable> arguments, std::string body) {
    TovKernelCode code;
    code.name = "Kernel";
    code.arguments = std::move(arguments);
    code.body = std::move(body);
    return code;
}

TEST(Definitions, AreReadFromAnOptionTextInOrder) {
    EXPECT_THAT(parsed(" -D offset=1  -D FIRST_LEVEL ").definitions,
                ElementsAre(Pair("offset", "1"), Pair("FIRST_LEVEL", "FIRST_LEVEL")));
    EXPECT_THAT(parsed("-Werror -cl-std=CL1.2 -I .  -D X64  -D a_Res=(int2)(3,4) -D a_COMP_NUM= -D a_COMP_TYPE=sampler")
                    .definitions,
                ElementsAre(Pair("X64", "X64"), Pair("a_Res", "(int2)(3,4)"), Pair("a_COMP_NUM", ""),
                            Pair("a_COMP_TYPE", "sampler")));
}

TEST(Definitions, MayBeNegative) {
    EXPECT_THAT(parsed(" -D a=-1.5 -D b_Res=(int2)(-2,-3) -D c=1e-05 -I../x").definitions,
                ElementsAre(Pair("a", "-1.5"), Pair("b_Res", "(int2)(-2,-3)"), Pair("c", "1e-05")));
}

TEST(Renaming, ReplacesWholeIdentifiersAndTheirLayoutEndings) {
    TovKernelCode code = kernel({{"weight", "float"}, {"image", "srcBufferType"}},
                                " weights = weight * image_Res.x + myimage + image2 + image_COMP_TYPE; radius + 1;");
    code.definitions = {{"radius", "radius"}, {"image_Res", "(int2)(1,1)"}, {"image_COMP_NUM", "4"}};
    RenameKernel(code, "10");
    EXPECT_EQ(code.name, "Kernel10");
    EXPECT_EQ(code.body, " weights = weight10 * image10_Res.x + myimage + image2 + image10_COMP_TYPE; radius10 + 1;");
    EXPECT_EQ(code.arguments[1].text(), "srcBufferType(image10)");
    EXPECT_THAT(code.definitions, ElementsAre(Pair("radius10", "radius"), Pair("image10_Res", "(int2)(1,1)"),
                                              Pair("image10_COMP_NUM", "4")));
}

TEST(Renaming, PutsTheLevelOfAnArrayBetweenItsNameAndTheIndex) {
    TovKernelCode code = kernel({{"input", "IMAGE_ARRAY"}}, "ReadPixel(input##n, 0, 0); input3_Res; input12;");
    code.definitions = {{"input0_Res", "1"}, {"input1_COMP_TYPE", "float"}, {"INPUTS_NUM", "2"}};
    RenameKernel(code, "20");
    EXPECT_EQ(code.body, "ReadPixel(input20##n, 0, 0); input203_Res; input2012;");
    EXPECT_THAT(code.definitions,
                ElementsAre(Pair("input200_Res", "1"), Pair("input201_COMP_TYPE", "float"), Pair("INPUTS_NUM20", "2")));
}

TEST(InlineFunction, ReturnsThePixelInsteadOfWritingIt) {
    const TovKernelCode code = kernel({{"srcBuffer", "srcBufferType"}, {"dstBuffer", "dstBufferType"}, {"c", "float"}},
                                      "\n    int2 coord;\n    GET_COORD(coord, min(a, GET_BUFFER_SIZE(dstBuffer)));\n"
                                      "    WritePixel(dstBuffer, coord.x, coord.y, result);\n");
    EXPECT_EQ(InlineFunctionText(code),
              "\ninline float4 Kernel(\n   srcBufferType(srcBuffer),\n   float c,\n   int xidx, \n   int yidx)\n{\n"
              "\n    int2 coord;\n    coord = (int2)(xidx, yidx);\n    return result;\n}\n");
}

TEST(Merging, PutsTheInnerInputsInThePlaceOfTheImage) {
    TovKernelCode outer = kernel({{"a", "int"}, {"srcBuffer", "srcBufferType"}, {"b", "int"}}, "");
    TovKernelCode inner = kernel({{"src10", "srcBufferType"}, {"dst10", "dstBufferType"}, {"k10", "float"}}, "");
    inner.name = "Inner10";
    inner.definitions = {{"src10_Res", "1"}};
    MergeImageArgument(outer, 1, inner);
    std::vector<std::string> names;
    for (const TovKernelVariable& argument : outer.arguments) names.push_back(argument.name);
    EXPECT_THAT(names, ElementsAre("a", "src10", "k10", "b"));
    EXPECT_THAT(outer.definitions,
                ElementsAre(Pair("ReadPixel_srcBuffer_COMP_TYPE_srcBuffer_COMP_NUM(buffer, bufferSize, x, y)",
                                 "Inner10(src10, k10, x, y)"),
                            Pair("srcBuffer_Res", "0"), Pair("src10_Res", "1")));
    EXPECT_THAT(outer.helpers, HasSubstr("inline float4 Inner10("));
}

TEST(GeneratedText, IncludesDefinesAndDeclaresTheKernel) {
    TovKernelCode code = kernel({{"srcBuffer", "srcBufferType"}, {"c", "float"}}, "\n    body;\n");
    code.definitions = {{"X64", "X64"}, {"n_COMP_NUM", ""}};
    EXPECT_EQ(GenerateSource(code),
              "#include \"common.cl\"\n\n#define X64 X64\n#define n_COMP_NUM \n\n__kernel\nvoid Kernel(\n"
              "   srcBufferType(srcBuffer),\n   float c)\n{\n\n    body;\n\n}");
}

}  // namespace
