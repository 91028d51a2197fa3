// What reaches the driver when each of the 21 filters runs: the exact option texts, arguments and launch sizes.
#include <bit>
#include <charconv>
#include <clocale>
#include <locale>
#include <memory>
#include <regex>

#include "standin_fixture.h"

namespace apitest {
namespace {

// The images bound: S the source, D the destination, A every auxiliary image and array element.
constexpr tov_image_desc kSource = {1007, 5, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
constexpr tov_image_desc kDestination = {1007, 5, 1, 0, 0, 3, TOV_COMPONENT_TYPE_UINT8};
constexpr tov_image_desc kAuxiliary = {1007, 5, 1, 0, 0, 2, TOV_COMPONENT_TYPE_FLOAT16};

// Type, kernel, definitions and arguments of each pass. "name:X" are the definitions of an image, of an absent one with
// "-". Arguments are an image's letter, other memory by its bytes (#80560), a matrix of three padded rows (M), floats
// (0.1f) and whole numbers.
constexpr char kPasses[] = R"(
0 MathTestKernel | srcBuffer:S dstBuffer:D | S D
1 ColorSpaceKernel | srcBuffer:S dstBuffer:D | S D M M
2 NormalizationKernel | srcBuffer:S dstBuffer:D | S D
3 GammaCorrectionKernel | srcBuffer:S dstBuffer:D | S D 1f
4 ResampleKernel | srcBuffer:S dstBuffer:D -D CRATIO_X=1 -D CRATIO_Y=1 -D INTERPOLATION_OPERATOR=1 | S D 1007,5 1007,5 1f,1f
5 GaussBlurHorKernel | srcBuffer:S -D cRadius=1 -D COEFFS={0.274069f,0.451863f,0.274069f} -D TILED=0 dstBuffer:D | S #80560
5 GaussBlurVertKernel | dstBuffer:D -D cRadius=1 -D COEFFS={0.274069f,0.451863f,0.274069f} -D TILED=0 srcBuffer:D | #80560 D
6 SimpleToneMappingKernel | srcBuffer:S dstBuffer:D | S D 0 1f 0
7 ReinhardToneMappingKernel | srcBuffer:S dstBuffer:D | S D 1f 0 0.1f
8 ExponentialToneMappingKernel | srcBuffer:S dstBuffer:D | S D 1f 1f
9 LinearToneMappingKernel | srcBuffer:S dstBuffer:D | S D 1f
10 DragoToneMappingKernel | srcBuffer:S dstBuffer:D | S D 1f 0.5f 4f
11 BilateralFilterKernel | srcBuffer:S dstBuffer:D input0:A input1:A -D radius=5 -D INPUTS_NUM=2 | S D A A 0.25f 0.75f
12 LWRDenoiserFirstPass | srcBuffer:S vColorBuff:- transBuff:- vTransBuff:- normalsBuff:A vNormalsBuff:- depthBuff:- vDepthBuff:- dstBuffer:D | S 0 0 0 A 0 0 0 4 4 1f D
13 EAWDenoiserKernel | -D offset=1  -D FIRST_LEVEL  srcBuffer:S dstBuffer:S srcBuffer:S normalsBuff:A depthBuff:- transBuff:- vColorBuff:- dstBuffer:S | S A 0 0 0 0.1f 0.1f 0.1f 0.1f D #120840
13 EAWDenoiserKernel | -D offset=2  -D ODD  srcBuffer:S dstBuffer:S srcBuffer:S normalsBuff:A depthBuff:- transBuff:- vColorBuff:- | D A 0 0 0 0.1f 0.1f 0.1f 0.1f #120840 #120840
13 EAWDenoiserKernel | -D offset=4  srcBuffer:S dstBuffer:S normalsBuff:A depthBuff:- transBuff:- vColorBuff:- dstBuffer:S | #120840 A 0 0 0 0.1f 0.1f 0.1f 0.1f D #120840
13 EAWDenoiserKernel | -D offset=8  -D ODD  srcBuffer:S dstBuffer:S srcBuffer:S normalsBuff:A depthBuff:- transBuff:- vColorBuff:- | D A 0 0 0 0.1f 0.1f 0.1f 0.1f #120840 #120840
13 EAWDenoiserKernel | -D offset=16  srcBuffer:S dstBuffer:S normalsBuff:A depthBuff:- transBuff:- vColorBuff:- dstBuffer:S | #120840 A 0 0 0 0.1f 0.1f 0.1f 0.1f D #120840
14 SobelOperatorKernel | srcBuffer:S dstBuffer:D | S D
15 WeightedSumKernel | srcBuffer:S dstBuffer:D input0:A input1:A -D INPUTS_NUM=2 | S D A A 0.25f 0.75f
16 MultiplicationKernel | srcBuffer:S dstBuffer:D input0:A input1:A -D INPUTS_NUM=2 | S D A A
17 EdgeDetectionMLAA | -D EDGE_DETECTION  colorTex:S mesh_id:- normal:A depthTex:- | S 0 A 0 #161120 0.05f 0.9238795f 0.1f
17 BlendingWeightCalculationMLAA | -D WEIGH_CALC  | #161120 #54450 1007,5 #161120
17 NeighborhoodBlendingMLAA | -D BLENDING  colorTex:S out_buffer:D | S D #161120
18 GenerateMotionBuffer | -D MOTION_BUFFER  positions:S motion:D | S D 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f
19 GenerateMotionBuffer | -D MOTION_BUFFER  positions:A motion:D | A D 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f 1f,0,0,0,0,1f,0,0,0,0,1f,0,0,0,0,1f
19 TemporalAccumulation | -D TEMPORAL_ACCUMULATION  colors:S positions:A normals:- meshIds:- motions:D outVariances:- outColors:D | S A 0 0 D 0 D #563920
19 SwapOutToIn | -D COPY  positions:A normals:- meshIds:- | A 0 0 #563920
20 ShadowCatcherKernel | srcBuffer:S dstBuffer:D | S D
)";

std::string definitionsOf(std::string options) {
    const std::pair<const char*, const char*> forms[] = {
        {R"(-D (\w+)_COMP_NUM=none -D \1_COMP_TYPE=none -D \1_Res=\(int2\)1\b)", "$1:-"},
        {R"(-D (\w+)_Res=\(int2\)\(1007,5\) -D \1_COMP_NUM=4 -D \1_COMP_TYPE=float\b)", "$1:S"},
        {R"(-D (\w+)_Res=\(int2\)\(1007,5\) -D \1_COMP_NUM=3 -D \1_COMP_TYPE=uint\b)", "$1:D"},
        {R"(-D (\w+)_Res=\(int2\)\(1007,5\) -D \1_COMP_NUM=2 -D \1_COMP_TYPE=half\b)", "$1:A"},
    };
    for (const auto& [definitions, shortForm] : forms)
        options = std::regex_replace(options, std::regex(definitions), shortForm);
    return options;
}

std::string textOf(const standin::Argument& argument) {
    const auto memory = argument.as<cl_mem>();
    if (argument.size == 48) return " M";
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

// A host's locale, under which 1007.5 would be written 1.007,5.
class CommaLocale {
 public:
    CommaLocale() { std::setlocale(LC_ALL, "de_DE.UTF-8"); }  // where it is installed
    ~CommaLocale() {
        std::setlocale(LC_ALL, "C");
        std::locale::global(before_);
    }

 private:
    struct Grouped : std::numpunct<char> {
        char do_decimal_point() const override { return ','; }
        char do_thousands_sep() const override { return '.'; }
        std::string do_grouping() const override { return "\3"; }
    };
    const std::locale before_ = std::locale::global(std::locale(std::locale::classic(), new Grouped));
};

class Passes : public StandinTest {
 protected:
    // Each name exists in some of the filters; the others answer that they lack it.
    void setParameters(tov_image_filter filter, uint32_t type, tov_image auxiliary) {
        images_ = {auxiliary, auxiliary};
        tovImageFilterSetParameterImageArray(filter, "inputs", images_.data(), 2);
        for (const char* name : {"weights", "sigmas"})
            tovImageFilterSetParameterFloatArray(filter, name, floats_.data(), 2);
        tovImageFilterSetParameter1u(filter, "inputsNum", 2);
        if (type != 19) tovImageFilterSetParameterImage(filter, "normalsImg", auxiliary);
        tovImageFilterSetParameterImage(filter, "positionsImg", auxiliary);
        for (const auto& [name, value] : {std::pair{"sigma", 1.0f}, {"avLum", 0.5f}, {"maxLum", 4.0f}})
            tovImageFilterSetParameter1f(filter, name, value);
    }
    static std::string textOf(const standin::Launch& launch) {
        using Sizes = std::vector<size_t>;
        const std::string start =
            "-Werror -cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2 -I .  -D X64  -D GROUP_DIM_";
        const std::string end = " -I../Tovkit/Impl/CL/";
        const bool is2D = launch.kernel.find("GaussBlur") != 0;
        EXPECT_THAT(launch.options, testing::StartsWith(start + (is2D ? "2D  " : "1D  ")));
        EXPECT_THAT(launch.options, testing::EndsWith(end));
        EXPECT_EQ(launch.local, is2D ? (Sizes{8, 8}) : (Sizes{32, 1}));
        EXPECT_EQ(launch.global, is2D ? (Sizes{1008, 8}) : (Sizes{5056, 1}));
        const std::string options =
            launch.options.substr(start.size() + 4, launch.options.size() - start.size() - end.size() - 4);
        std::string text = launch.kernel + " | " + definitionsOf(options) + " |";
        for (const auto& [index, argument] : launch.arguments) text += apitest::textOf(argument);
        return text + "\n";
    }

    std::vector<tov_image> images_;
    std::vector<float> floats_ = {0.25f, 0.75f};
};

TEST_F(Passes, OfEveryFilterReachTheDriverWithTheirOptionsArgumentsAndSizes) {
    open();
    const tov_image source = newImage(kSource, 'S');
    const tov_image sameLayout = newImage(kSource, 'D');  // which the wavelets need
    const tov_image destination = newImage(kDestination, 'D');
    const tov_image auxiliary = newImage(kAuxiliary, 'A');
    std::string text = "\n";
    for (uint32_t type = 0; type <= TOV_IMAGE_FILTER_SHADOW_CATCHER; ++type) {
        const tov_image_filter filter = newFilter(type);
        setParameters(filter, type, auxiliary);
        const tov_image output = type == TOV_IMAGE_FILTER_EAW_DENOISE ? sameLayout : destination;
        auto locale = std::make_unique<CommaLocale>();
        ASSERT_EQ(attachAndExecute(filter, source, output), TOV_SUCCESS) << type;
        const size_t compiled = driver().callCount("clBuildProgram");
        driver().launches.clear();
        ASSERT_EQ(execute(), TOV_SUCCESS) << type;
        EXPECT_EQ(driver().callCount("clBuildProgram"), compiled) << "an unchanged run compiles nothing";
        locale.reset();
        for (const standin::Launch& launch : driver().launches) text += std::to_string(type) + " " + textOf(launch);
        ASSERT_EQ(tovCommandQueueDetachImageFilter(queue_, filter), TOV_SUCCESS);
    }
    EXPECT_EQ(text, kPasses);
}

TEST_F(Passes, CoverNoMoreThanTheOutputWhateverTheRectangleAndHaveTheVendorsFlag) {
    driver().platforms.at(0).devices.at(0).vendor = "Quarrion, Inc.";
    open();
    const tov_image_filter filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    const tov_image image = newImage({20, 9, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32});
    ASSERT_EQ(attachAndExecute(filter, image, image), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", UINT32_MAX, 1), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_EQ(driver().launches[0].global, (std::vector<size_t>{24, 16}));
    EXPECT_EQ(driver().launches[1].global, (std::vector<size_t>{24, 8}));
    EXPECT_THAT(driver().launches[0].options, testing::HasSubstr("-I .  -D QUARRION  -D X64 "));
}

}  // namespace
}  // namespace apitest
