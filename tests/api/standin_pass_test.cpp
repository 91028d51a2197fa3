// What reaches the driver when each of the 21 filters runs: the exact option texts, arguments and launch sizes.
#include <bit>
#include <charconv>
#include <clocale>
#include <locale>
#include <regex>

#include "fixture.h"
#include "standin_fixture.h"

namespace apitest {
namespace {

// The images bound: S the source, D the destination, A every auxiliary image and array element.
constexpr tov_image_desc kSource = {1007, 5, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
constexpr tov_image_desc kDestination = {1007, 5, 1, 0, 0, 3, TOV_COMPONENT_TYPE_UINT8};
constexpr tov_image_desc kAuxiliary = {1007, 5, 1, 0, 0, 2, TOV_COMPONENT_TYPE_FLOAT16};

// Type, kernel, definitions and arguments of each pass. "name:4float" are the definitions of an image, "name:-" those
// of an absent one. Arguments are an image's letter, other memory by its bytes (#80560), a matrix of three padded rows
// (M), floats (0.1f) and whole numbers.
constexpr char kPasses[] = R"(
0 MathTestKernel | srcBuffer:4float dstBuffer:3uint | S D
1 ColorSpaceKernel | srcBuffer:4float dstBuffer:3uint | S D M M
2 NormalizationKernel | srcBuffer:4float dstBuffer:3uint | S D
3 GammaCorrectionKernel | srcBuffer:4float dstBuffer:3uint | S D 1f
4 ResampleKernel | srcBuffer:4float dstBuffer:3uint -D CRATIO_X=1 -D CRATIO_Y=1 -D INTERPOLATION_OPERATOR=1 | S D 1007,5 1007,5 1f,1f
5 GaussBlurHorKernel | srcBuffer:4float -D cRadius=1 -D COEFFS={0.274069f,0.451863f,0.274069f} -D TILED=0 dstBuffer:3uint | S #80560
5 GaussBlurVertKernel | dstBuffer:3uint -D cRadius=1 -D COEFFS={0.274069f,0.451863f,0.274069f} -D TILED=0 srcBuffer:3uint | #80560 D
6 SimpleToneMappingKernel | srcBuffer:4float dstBuffer:3uint | S D 0 1f 0
7 ReinhardToneMappingKernel | srcBuffer:4float dstBuffer:3uint | S D 1f 0 0.1f
8 ExponentialToneMappingKernel | srcBuffer:4float dstBuffer:3uint | S D 1f 1f
9 LinearToneMappingKernel | srcBuffer:4float dstBuffer:3uint | S D 1f
10 DragoToneMappingKernel | srcBuffer:4float dstBuffer:3uint | S D 1f 0.5f 4f
11 BilateralFilterKernel | srcBuffer:4float dstBuffer:3uint input0:2half input1:2half -D radius=5 -D INPUTS_NUM=2 | S D A A 0.25f 0.75f
12 LWRDenoiserFirstPass | srcBuffer:4float vColorBuff:- transBuff:- vTransBuff:- normalsBuff:2half vNormalsBuff:- depthBuff:- vDepthBuff:- dstBuffer:3uint | S 0 0 0 A 0 0 0 4 4 1f D
13 EAWDenoiserKernel | -D offset=1  -D FIRST_LEVEL  srcBuffer:4float dstBuffer:4float srcBuffer:4float normalsBuff:2half depthBuff:- transBuff:- vColorBuff:- dstBuffer:4float | S A 0 0 0 0.1f 0.1f 0.1f 0.1f D #120840
13 EAWDenoiserKernel | -D offset=2  -D ODD  srcBuffer:4float dstBuffer:4float srcBuffer:4float normalsBuff:2half depthBuff:- transBuff:- vColorBuff:- | D A 0 0 0 0.1f 0.1f 0.1f 0.1f #120840 #120840
13 EAWDenoiserKernel | -D offset=4  srcBuffer:4float dstBuffer:4float normalsBuff:2half depthBuff:- transBuff:- vColorBuff:- dstBuffer:4float | #120840 A 0 0 0 0.1f 0.1f 0.1f 0.1f D #120840
13 EAWDenoiserKernel | -D offset=8  -D ODD  srcBuffer:4float dstBuffer:4float srcBuffer:4float normalsBuff:2half depthBuff:- transBuff:- vColorBuff:- | D A 0 0 0 0.1f 0.1f 0.1f 0.1f #120840 #120840
13 EAWDenoiserKernel | -D offset=16  srcBuffer:4float dstBuffer:4float normalsBuff:2half depthBuff:- transBuff:- vColorBuff:- dstBuffer:4float | #120840 A 0 0 0 0.1f 0.1f 0.1f 0.1f D #120840
14 SobelOperatorKernel | srcBuffer:4float dstBuffer:3uint | S D
15 WeightedSumKernel | srcBuffer:4float dstBuffer:3uint input0:2half input1:2half -D INPUTS_NUM=2 | S D A A 0.25f 0.75f
16 MultiplicationKernel | srcBuffer:4float dstBuffer:3uint input0:2half input1:2half -D INPUTS_NUM=2 | S D A A
17 EdgeDetectionMLAA | -D EDGE_DETECTION  colorTex:4float mesh_id:- normal:2half depthTex:- | S 0 A 0 #161120 0.05f 0.9238795f 0.1f
17 BlendingWeightCalculationMLAA | -D WEIGH_CALC  | #161120 #54450 1007,5 #161120
17 NeighborhoodBlendingMLAA | -D BLENDING  colorTex:4float out_buffer:3uint | S D #161120
18 GenerateMotionBuffer | -D MOTION_BUFFER  positions:4float motion:3uint | S D 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f
19 GenerateMotionBuffer | -D MOTION_BUFFER  positions:2half motion:3uint | A D 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f
19 TemporalAccumulation | -D TEMPORAL_ACCUMULATION  colors:4float positions:2half normals:2half meshIds:- motions:3uint outVariances:- outColors:3uint | S A A 0 D 0 D #563920
19 SwapOutToIn | -D COPY  positions:2half normals:2half meshIds:- | A A 0 #563920
20 ShadowCatcherKernel | srcBuffer:4float dstBuffer:3uint | S D
)";

std::string definitionsOf(const std::string& options) {
    const std::regex image(R"(-D (\w+)_Res=\(int2\)\(1007,5\) -D \1_COMP_NUM=(\d) -D \1_COMP_TYPE=(\w+))");
    const std::regex absent(R"(-D (\w+)_COMP_NUM=none -D \1_COMP_TYPE=none -D \1_Res=\(int2\)1\b)");
    return std::regex_replace(std::regex_replace(options, image, "$1:$2$3"), absent, "$1:-");
}

std::string textOf(const standin::Argument& argument) {
    if (argument.size == 48) return " M";
    const auto memory = argument.as<cl_mem>();
    size_t size = 0;
    if (memory != nullptr && standin::state().live.contains(memory)) {
        const char mark = static_cast<char>(*standin::bytesOf(memory, &size));
        return mark >= 'A' ? std::string(" ") + mark : " #" + std::to_string(size);
    }
    std::string text;
    for (size_t i = 0; i < argument.bytes.size(); i += 4) {
        std::array<char, 16> digits{};
        uint32_t word = 0;
        std::memcpy(&word, &argument.bytes[i], 4);
        const bool isFloat = word > 0xffff;
        if (isFloat) std::to_chars(digits.begin(), digits.end(), std::bit_cast<float>(word));
        text += (i == 0 ? " " : ",") + (isFloat ? digits.data() + std::string("f") : std::to_string(word));
    }
    return text;
}

// A host's numbers, of which 1007.5 would be 1.007,5.
struct Grouped : std::numpunct<char> {
    char do_decimal_point() const override { return ','; }
    char do_thousands_sep() const override { return '.'; }
    std::string do_grouping() const override { return "\3"; }
};

std::string textOf(const standin::Launch& launch) {
    using Sizes = std::vector<size_t>;
    const bool is2D = launch.kernel.find("GaussBlur") != 0;
    const std::string start = std::string("-Werror -cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2 -I .  -D X64  ") +
                              (is2D ? "-D GROUP_DIM_2D  " : "-D GROUP_DIM_1D  ");
    const std::string end = " -I../Tovkit/Impl/CL/";
    EXPECT_THAT(launch.options, testing::AllOf(testing::StartsWith(start), testing::EndsWith(end)));
    EXPECT_EQ(launch.local, is2D ? (Sizes{8, 8}) : (Sizes{32, 1}));
    EXPECT_EQ(launch.global, is2D ? (Sizes{1008, 8}) : (Sizes{5056, 1}));
    const std::string options = launch.options.substr(start.size(), launch.options.size() - start.size() - end.size());
    std::string text = launch.kernel + " | " + definitionsOf(options) + " |";
    for (const auto& [index, argument] : launch.arguments) text += textOf(argument);
    return text + "\n";
}

using Passes = StandinTest;

TEST_F(Passes, OfEveryFilterReachTheDriverWithTheirOptionsArgumentsAndSizesInAnyLocale) {
    open();
    const tov_image source = newImage(kSource, 'S');
    const tov_image sameLayout = newImage(kSource, 'D');  // which the wavelets need
    const tov_image destination = newImage(kDestination, 'D');
    const std::vector<tov_image> auxiliary(2, newImage(kAuxiliary, 'A'));
    std::string text = "\n";
    std::setlocale(LC_ALL, "de_DE.UTF-8");  // where it is installed
    const std::locale plain = std::locale::global(std::locale(std::locale::classic(), new Grouped));
    for (uint32_t type = 0; type <= TOV_IMAGE_FILTER_SHADOW_CATCHER; ++type) {
        const tov_image_filter filter = newFilter(type);
        setAll(filter, auxiliary);
        const tov_image output = type == TOV_IMAGE_FILTER_EAW_DENOISE ? sameLayout : destination;
        EXPECT_EQ(attachAndExecute(filter, source, output), TOV_SUCCESS) << type;
        const size_t compiled = driver().callCount("clBuildProgram");
        driver().launches.clear();
        EXPECT_EQ(execute(), TOV_SUCCESS) << type;
        EXPECT_EQ(driver().callCount("clBuildProgram"), compiled) << "an unchanged run compiles nothing";
        for (const standin::Launch& launch : driver().launches) text += std::to_string(type) + " " + textOf(launch);
        EXPECT_EQ(tovCommandQueueDetachImageFilter(queue_, filter), TOV_SUCCESS);
    }
    std::locale::global(plain);
    std::setlocale(LC_ALL, "C");
    EXPECT_EQ(text, kPasses);
}

TEST_F(Passes, CoverTheRectangleButNoMoreThanTheOutputUntilTheNextBindingAndHaveTheVendorsFlag) {
    driver().platforms.at(0).devices.at(0).vendor = "Quarrion, Inc.";
    open();
    const tov_image_filter filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    const tov_image image = newImage({20, 9, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32});
    ASSERT_EQ(attachAndExecute(filter, image, image), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "srcRec", UINT32_MAX, UINT32_MAX), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", UINT32_MAX, 1), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImage(filter, "dstBuffer", image), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    for (size_t i = 0; i < 3; ++i)
        EXPECT_EQ(driver().launches[i].global, (std::vector<size_t>{24, i == 1 ? 8u : 16u})) << i;
    EXPECT_THAT(driver().launches[0].options, testing::HasSubstr("-I .  -D QUARRION  -D X64 "));
}

}  // namespace
}  // namespace apitest
