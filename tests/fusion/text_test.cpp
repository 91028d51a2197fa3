// What fusion makes of texts, without a device.
#include <gmock/gmock.h>

#include "kernelgen/fusion.h"
#include "kernelgen/option_text.h"

namespace {

using testing::ElementsAre;
using testing::Pair;

TovKernelCode kernel(std::vector<TovKernelVariable> arguments, std::string body) {
    TovKernelCode code;
    code.name = "Kernel";
    code.arguments = std::move(arguments);
    code.body = std::move(body);
    return code;
}

TEST(Definitions, AreReadFromAnOptionTextInOrder) {
    TovKernelCode code;
    ParseDefinitions(code,
                     " -D offset=1  -D FIRST_LEVEL -Werror -cl-std=CL1.2 -I .  -D a=-1.5 -D b_Res=(int2)(-2,-3)"
                     " -D c=1e-05 -I../x -D n_COMP_NUM= ");
    EXPECT_THAT(code.definitions,
                ElementsAre(Pair("offset", "1"), Pair("FIRST_LEVEL", "FIRST_LEVEL"), Pair("a", "-1.5"),
                            Pair("b_Res", "(int2)(-2,-3)"), Pair("c", "1e-05"), Pair("n_COMP_NUM", "")));
}

TEST(Renaming, ReplacesWholeIdentifiersTheirLayoutEndingsAndElementsOfArrays) {
    TovKernelCode code = kernel({{"weight", "float"}, {"image", "srcBufferType"}, {"input", "IMAGE_ARRAY"}},
                                " weights = weight * image_Res.x + myimage + image2 + image_COMP_TYPE; radius + 1;"
                                " ReadPixel(input##n, 0, 0); input3_Res; input12;");
    code.definitions = {
        {"radius", "radius"}, {"image_Res", "(int2)(1,1)"}, {"image_COMP_NUM", "4"}, {"input0_Res", "1"}};
    RenameKernel(code, "10");
    EXPECT_EQ(code.name, "Kernel10");
    EXPECT_EQ(code.body,
              " weights = weight10 * image10_Res.x + myimage + image2 + image10_COMP_TYPE; radius10 + 1;"
              " ReadPixel(input10##n, 0, 0); input103_Res; input1012;");
    EXPECT_EQ(code.arguments[1].text(), "srcBufferType(image10)");
    EXPECT_THAT(code.definitions, ElementsAre(Pair("radius10", "radius"), Pair("image10_Res", "(int2)(1,1)"),
                                              Pair("image10_COMP_NUM", "4"), Pair("input100_Res", "1")));
}

// The inner kernel as a function, its inputs in place of the outer kernel's image, and reads of that redirected.
TEST(Merging, GivesOneTextWithTheInnerKernelAsAFunction) {
    TovKernelCode outer = kernel({{"a", "int"}, {"srcBuffer", "srcBufferType"}, {"b", "int"}}, "\n    body;\n");
    outer.definitions = {{"X64", "X64"}};
    TovKernelCode inner = kernel({{"src10", "srcBufferType"}, {"dst10", "dstBufferType"}, {"k10", "float"}},
                                 "\n    int2 coord;\n    GET_COORD(coord, min(a, GET_BUFFER_SIZE(dst10)));\n"
                                 "    WritePixel(dst10, coord.x, coord.y, result);\n");
    inner.name = "Inner10";
    inner.definitions = {{"src10_Res", "1"}};
    MergeImageArgument(outer, 1, inner);
    EXPECT_EQ(
        GenerateSource(outer),
        "#include \"common.cl\"\n\n#define X64 X64\n"
        "#define ReadPixel_srcBuffer_COMP_TYPE_srcBuffer_COMP_NUM(buffer, bufferSize, x, y) "
        "Inner10(src10, k10, x, y)\n#define srcBuffer_Res 0\n#define src10_Res 1\n"
        "\ninline float4 Inner10(\n   srcBufferType(src10),\n   float k10,\n   int xidx, \n   int yidx)\n{\n"
        "\n    int2 coord;\n    coord = (int2)(xidx, yidx);\n    return result;\n}\n"
        "\n__kernel\nvoid Kernel(\n   int a,\n   srcBufferType(src10),\n   float k10,\n   int b)\n{\n\n    body;\n\n}");
}

TEST(SourceHash, NamesTheTextInTheOptionsAndTakesBytesAsSigned) {
    EXPECT_EQ(HashSource("", 0), 294921u);
    EXPECT_EQ(HashSource("abc", 3), 1307784515u);
    EXPECT_EQ(HashSource("\xE9", 1), 785720697u);
}

}  // namespace
