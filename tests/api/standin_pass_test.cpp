// What reaches the driver when each of the 21 filters runs: the exact option texts, arguments and launch sizes.
#include <cmath>
#include <locale>

#include "standin_fixture.h"

namespace apitest {
namespace {

constexpr uint32_t kFloat = TOV_COMPONENT_TYPE_FLOAT32;
constexpr tov_image_desc kSource = {7, 5, 1, 0, 0, 4, kFloat};
constexpr tov_image_desc kDestination = {7, 5, 1, 0, 0, 3, TOV_COMPONENT_TYPE_UINT8};
constexpr tov_image_desc kAuxiliary = {7, 5, 1, 0, 0, 2, TOV_COMPONENT_TYPE_FLOAT16};

// ---- Expected texts ----

std::string layoutOf(const std::string& name, const tov_image_desc& desc) {
    const char* const types[] = {"", "uint", "half", "float"};
    return " -D " + name + "_Res=(int2)(" + std::to_string(desc.image_width) + "," + std::to_string(desc.image_height) +
           ") -D " + name + "_COMP_NUM=" + std::to_string(desc.num_components) + " -D " + name +
           "_COMP_TYPE=" + types[desc.type];
}
std::string src(const std::string& name) {
    return layoutOf(name, kSource);
}
std::string dst(const std::string& name) {
    return layoutOf(name, kDestination);
}
std::string aux(const std::string& name) {
    return layoutOf(name, kAuxiliary);
}
std::string none(const std::string& name) {
    return " -D " + name + "_COMP_NUM=none -D " + name + "_COMP_TYPE=none -D " + name + "_Res=(int2)1";
}
std::string flag(const std::string& text) {
    return " -D " + text + " ";
}

// ---- Expected arguments ----

// A memory object by its letter (X the scratch, T the state buffer, ? any matrix of 48 bytes), or a value.
struct Expected {
    char memory = 0;
    std::vector<unsigned char> bytes;

    Expected(char letter) : memory(letter) {}  // NOLINT(google-explicit-constructor): a list reads as the signature
    template <class Value>
    requires(!std::is_same_v<Value, char>) Expected(const Value& value)
        : bytes(sizeof value) {  // NOLINT(google-explicit-constructor): likewise
        std::memcpy(bytes.data(), &value, sizeof value);
    }
};
using Floats2 = std::array<float, 2>;
using Uints2 = std::array<uint32_t, 2>;
using Matrix = std::array<float, 16>;
constexpr Matrix kIdentity = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
constexpr int32_t kAbsent = 0;

struct Pass {
    const char* kernel;
    std::string definitions;
    std::vector<Expected> arguments;
    bool grid2D = true;
};

struct Case {
    uint32_t type;
    std::vector<Pass> passes;
    uint64_t scratchBytes = 0;
    uint64_t stateBytes = 0;
};

std::vector<Case> allCases() {
    const std::string both = src("srcBuffer") + dst("dstBuffer");
    const std::string arrays = both + aux("input0") + aux("input1");
    const std::string blur = " -D cRadius=1 -D COEFFS={0.274069f,0.451863f,0.274069f} -D TILED=0";
    const float normalThreshold = std::cos(3.14159265f / 8.0f);
    std::vector<Case> cases = {
        {0, {{"MathTestKernel", both, {'S', 'D'}}}},
        {1, {{"ColorSpaceKernel", both, {'S', 'D', '?', '?'}}}},
        {2, {{"NormalizationKernel", both, {'S', 'D'}}}},
        {3, {{"GammaCorrectionKernel", both, {'S', 'D', 1.0f}}}},
        {4,
         {{"ResampleKernel",
           both + " -D CRATIO_X=1 -D CRATIO_Y=1 -D INTERPOLATION_OPERATOR=1",
           {'S', 'D', Uints2{7, 5}, Uints2{7, 5}, Floats2{1, 1}}}}},
        {5,
         {{"GaussBlurHorKernel", src("srcBuffer") + blur + dst("dstBuffer"), {'S', 'X'}, false},
          {"GaussBlurVertKernel", dst("dstBuffer") + blur + dst("srcBuffer"), {'X', 'D'}, false}},
         16 * 35},
        {6, {{"SimpleToneMappingKernel", both, {'S', 'D', 0.0f, 1.0f, 0u}}}},
        {7, {{"ReinhardToneMappingKernel", both, {'S', 'D', 1.0f, 0.0f, 0.1f}}}},
        {8, {{"ExponentialToneMappingKernel", both, {'S', 'D', 1.0f, 1.0f}}}},
        {9, {{"LinearToneMappingKernel", both, {'S', 'D', 1.0f}}}},
        {10, {{"DragoToneMappingKernel", both, {'S', 'D', 1.0f, 0.5f, 4.0f}}}},
        {11, {{"BilateralFilterKernel", arrays + " -D radius=5 -D INPUTS_NUM=2", {'S', 'D', 'A', 'A', 0.25f, 0.75f}}}},
        {12,
         {{"LWRDenoiserFirstPass",
           src("srcBuffer") + none("vColorBuff") + none("transBuff") + none("vTransBuff") + aux("normalsBuff") +
               none("vNormalsBuff") + none("depthBuff") + none("vDepthBuff") + dst("dstBuffer"),
           {'S', kAbsent, kAbsent, kAbsent, 'A', kAbsent, kAbsent, kAbsent, 4u, 4u, 1.0f, 'D'}}}},
        {14, {{"SobelOperatorKernel", both, {'S', 'D'}}}},
        {15, {{"WeightedSumKernel", arrays + " -D INPUTS_NUM=2", {'S', 'D', 'A', 'A', 0.25f, 0.75f}}}},
        {16, {{"MultiplicationKernel", arrays + " -D INPUTS_NUM=2", {'S', 'D', 'A', 'A'}}}},
        {17,
         {{"EdgeDetectionMLAA",
           flag("EDGE_DETECTION") + src("colorTex") + none("mesh_id") + aux("normal") + none("depthTex"),
           {'S', kAbsent, 'A', kAbsent, 'X', 0.05f, normalThreshold, 0.1f}},
          {"BlendingWeightCalculationMLAA", flag("WEIGH_CALC"), {'X', 'T', Uints2{7, 5}, 'X'}},
          {"NeighborhoodBlendingMLAA", flag("BLENDING") + src("colorTex") + dst("out_buffer"), {'S', 'D', 'X'}}},
         32 * 35,
         54450},
        {18,
         {{"GenerateMotionBuffer",
           flag("MOTION_BUFFER") + src("positions") + dst("motion"),
           {'S', 'D', kIdentity, kIdentity}}}},
        {19,
         {{"GenerateMotionBuffer",
           flag("MOTION_BUFFER") + aux("positions") + dst("motion"),
           {'A', 'D', kIdentity, kIdentity}},
          {"TemporalAccumulation",
           flag("TEMPORAL_ACCUMULATION") + src("colors") + aux("positions") + none("normals") + none("meshIds") +
               dst("motions") + none("outVariances") + dst("outColors"),
           {'S', 'A', kAbsent, kAbsent, 'D', kAbsent, 'D', 'T'}},
          {"SwapOutToIn",
           flag("COPY") + aux("positions") + none("normals") + none("meshIds"),
           {'A', kAbsent, kAbsent, 'T'}}},
         0,
         112 * 35},
        {20, {{"ShadowCatcherKernel", both, {'S', 'D'}}}},
    };
    Case wavelets{13, {}, 24 * 35};
    for (int level = 1; level <= 5; ++level) {
        const bool even = level % 2 == 0;
        const std::string flags = flag("offset=" + std::to_string(1 << (level - 1))) + (level == 1 ? flag("FIRST_LEVEL")
                                                                                        : even     ? flag("ODD")
                                                                                                   : "");
        // Both layouts are those of the input first, then again those of the images really bound.
        const std::string definitions = flags + src("srcBuffer") + src("dstBuffer") +
                                        (level == 1 || even ? src("srcBuffer") : "") + aux("normalsBuff") +
                                        none("depthBuff") + none("transBuff") + none("vColorBuff") +
                                        (even ? "" : src("dstBuffer"));
        const char input = level == 1 ? 'S' : even ? 'D' : 'X';
        wavelets.passes.push_back(
            {"EAWDenoiserKernel",
             definitions,
             {input, 'A', kAbsent, kAbsent, kAbsent, 0.1f, 0.1f, 0.1f, 0.1f, even ? 'X' : 'D', 'X'}});
    }
    cases.push_back(wavelets);
    return cases;
}

std::string nameOf(const testing::TestParamInfo<Case>& info) {
    return "Type" + std::to_string(info.param.type);
}

class EveryPass : public StandinTest, public testing::WithParamInterface<Case> {
 protected:
    void SetUp() override {
        StandinTest::SetUp();
        context_ = newContext();
        source_ = newImage(context_, kSource, SOURCE);
        // The wavelets need one layout for input and output.
        destination_ = newImage(context_, GetParam().type == 13 ? kSource : kDestination, DESTINATION);
        auxiliary_ = newImage(context_, kAuxiliary, AUXILIARY);
        ASSERT_EQ(tovContextCreateImageFilter(context_, GetParam().type, &filter_), TOV_SUCCESS);
        ASSERT_EQ(tovContextCreateCommandQueue(context_, &queue_), TOV_SUCCESS);
        setParameters();
    }
    void TearDown() override {
        for (void* object : {queue_, filter_, auxiliary_, destination_, source_, context_})
            EXPECT_EQ(tovObjectDelete(object), TOV_SUCCESS);
        StandinTest::TearDown();
    }

    // Each name exists in some of the filters; the others answer that they lack it.
    void setParameters() {
        inputs_ = {auxiliary_, auxiliary_};
        tovImageFilterSetParameterImageArray(filter_, "inputs", inputs_.data(), 2);
        for (const char* name : {"weights", "sigmas"})
            tovImageFilterSetParameterFloatArray(filter_, name, floats_.data(), 2);
        tovImageFilterSetParameter1u(filter_, "inputsNum", 2);
        for (const char* name : {"normalsImg", "positionsImg"}) {
            const bool wanted = GetParam().type != 19 || std::string(name) == "positionsImg";
            if (wanted) tovImageFilterSetParameterImage(filter_, name, auxiliary_);
        }
        tovImageFilterSetParameter1f(filter_, "sigma", 1.0f);
        tovImageFilterSetParameter1f(filter_, "avLum", 0.5f);
        tovImageFilterSetParameter1f(filter_, "maxLum", 4.0f);
    }

    char letterOf(const standin::Argument& argument) const {
        const auto memory = argument.as<cl_mem>();
        const auto live = driver().live.find(memory);
        if (live == driver().live.end() || live->second != "memory") return '-';
        size_t size = 0;
        const unsigned char* bytes = standin::bytesOf(memory, &size);
        if (*bytes == SOURCE || *bytes == DESTINATION || *bytes == AUXILIARY) return static_cast<char>(*bytes);
        return size == GetParam().scratchBytes ? 'X' : size == GetParam().stateBytes ? 'T' : '-';
    }
    void expectArgument(const standin::Argument& argument, const Expected& expected, const std::string& where) {
        if (expected.memory == '?') {
            EXPECT_EQ(argument.size, 48u) << where;
        } else if (expected.memory != 0) {
            ASSERT_EQ(argument.size, sizeof(cl_mem)) << where;
            EXPECT_EQ(letterOf(argument), expected.memory) << where;
        } else {
            EXPECT_EQ(argument.bytes, expected.bytes) << where;
        }
    }
    void expectLaunch(const standin::Launch& launch, const Pass& pass) {
        EXPECT_EQ(launch.kernel, pass.kernel);
        EXPECT_EQ(launch.options, "-Werror -cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2 -I .  -D X64 " +
                                      std::string(pass.grid2D ? " -D GROUP_DIM_2D " : " -D GROUP_DIM_1D ") +
                                      pass.definitions + " -I../Tovkit/Impl/CL/")
            << pass.kernel;
        using Sizes = std::vector<size_t>;
        EXPECT_EQ(launch.local, pass.grid2D ? (Sizes{8, 8}) : (Sizes{32, 1})) << pass.kernel;
        EXPECT_EQ(launch.global, pass.grid2D ? (Sizes{8, 8}) : (Sizes{64, 1})) << pass.kernel;
        ASSERT_EQ(launch.arguments.size(), pass.arguments.size()) << pass.kernel;
        for (uint32_t i = 0; i < pass.arguments.size(); ++i)
            expectArgument(launch.arguments.at(i), pass.arguments[i],
                           std::string(pass.kernel) + ", argument " + std::to_string(i));
    }
    void expectRun() {
        driver().launches.clear();
        ASSERT_EQ(tovContextExecuteCommandQueue(context_, queue_, nullptr, nullptr), TOV_SUCCESS);
        ASSERT_EQ(driver().launches.size(), GetParam().passes.size());
        for (size_t i = 0; i < driver().launches.size(); ++i) expectLaunch(driver().launches[i], GetParam().passes[i]);
    }

    tov_context context_ = nullptr;
    tov_image source_ = nullptr;
    tov_image destination_ = nullptr;
    tov_image auxiliary_ = nullptr;
    tov_image_filter filter_ = nullptr;
    tov_command_queue queue_ = nullptr;
    std::array<tov_image, 2> inputs_{};
    std::array<float, 2> floats_ = {0.25f, 0.75f};
};

TEST_P(EveryPass, ReachesTheDriverWithItsOptionsArgumentsAndSizes) {
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue_, filter_, source_, destination_), TOV_SUCCESS);
    expectRun();
    const size_t compiled = driver().callCount("clBuildProgram");
    expectRun();
    EXPECT_EQ(driver().callCount("clBuildProgram"), compiled) << "an unchanged run compiles nothing";
}

INSTANTIATE_TEST_SUITE_P(All, EveryPass, testing::ValuesIn(allCases()), nameOf);

// ---- Values that change from run to run ----

class PassValues : public StandinTest {
 protected:
    void SetUp() override {
        StandinTest::SetUp();
        context_ = newContext();
        ASSERT_EQ(tovContextCreateCommandQueue(context_, &queue_), TOV_SUCCESS);
    }
    void TearDown() override {
        for (void* object : objects_) EXPECT_EQ(tovObjectDelete(object), TOV_SUCCESS);
        EXPECT_EQ(tovObjectDelete(queue_), TOV_SUCCESS);
        EXPECT_EQ(tovObjectDelete(context_), TOV_SUCCESS);
        StandinTest::TearDown();
    }
    tov_image image(uint32_t width, uint32_t height) {
        objects_.push_back(newImage(context_, {width, height, 1, 0, 0, 4, kFloat}, SOURCE));
        return objects_.back();
    }
    tov_image_filter attached(uint32_t type, tov_image input, tov_image output) {
        tov_image_filter filter = nullptr;
        EXPECT_EQ(tovContextCreateImageFilter(context_, type, &filter), TOV_SUCCESS);
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue_, filter, input, output), TOV_SUCCESS);
        objects_.push_back(filter);
        return filter;
    }
    int32_t execute() { return tovContextExecuteCommandQueue(context_, queue_, nullptr, nullptr); }
    standin::Launch latest() { return driver().launches.empty() ? standin::Launch{} : driver().launches.back(); }

    tov_context context_ = nullptr;
    tov_command_queue queue_ = nullptr;
    std::vector<void*> objects_;
};

TEST_F(PassValues, ViewProjectionMatricesArePreviousAndCurrentAndAFailedRunDoesNotCount) {
    const tov_image_filter filter = attached(TOV_IMAGE_FILTER_MOTION_BUFFER, image(7, 5), image(7, 5));
    const auto matrix = [](float value) {
        Matrix m{};
        m.fill(value);
        return m;
    };
    const auto set = [&](float value) {
        ASSERT_EQ(tovImageFilterSetParameter16f(filter, "viewProjMatrix", matrix(value).data()), TOV_SUCCESS);
    };
    const auto expectPair = [&](float previous, float current) {
        ASSERT_EQ(execute(), TOV_SUCCESS);
        EXPECT_EQ(latest().arguments.at(2).as<Matrix>(), matrix(previous));
        EXPECT_EQ(latest().arguments.at(3).as<Matrix>(), matrix(current));
    };
    set(1);
    expectPair(1, 1);
    set(2);
    expectPair(1, 2);
    expectPair(2, 2);
    set(3);
    driver().fail("clEnqueueNDRangeKernel", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(execute(), TOV_ERROR_INTERNAL_ERROR);
    expectPair(2, 3);
}

TEST_F(PassValues, ResamplingRatiosMapEndsOntoEndsAndCountWholePixels) {
    struct Row {
        uint32_t source[2];
        uint32_t destination[2];
        float ratio[2];
        const char* definitions;
    };
    const Row rows[] = {
        {{100, 100}, {50, 50}, {99.0f / 49.0f, 99.0f / 49.0f}, " -D CRATIO_X=2 -D CRATIO_Y=2 "},
        {{192, 108}, {64, 36}, {191.0f / 63.0f, 107.0f / 35.0f}, " -D CRATIO_X=3 -D CRATIO_Y=3 "},
        {{4, 4}, {9, 5}, {3.0f / 8.0f, 3.0f / 4.0f}, " -D CRATIO_X=0 -D CRATIO_Y=0 "},
        {{8, 8}, {1, 1}, {0, 0}, " -D CRATIO_X=8 -D CRATIO_Y=8 "},
    };
    for (const Row& row : rows) {
        const tov_image_filter filter = attached(TOV_IMAGE_FILTER_RESAMPLE, image(row.source[0], row.source[1]),
                                                 image(row.destination[0], row.destination[1]));
        ASSERT_EQ(execute(), TOV_SUCCESS);
        const auto ratio = latest().arguments.at(4).as<std::array<float, 2>>();
        EXPECT_FLOAT_EQ(ratio[0], row.ratio[0]);
        EXPECT_FLOAT_EQ(ratio[1], row.ratio[1]);
        EXPECT_THAT(latest().options, testing::HasSubstr(row.definitions));
        EXPECT_EQ(tovCommandQueueDetachImageFilter(queue_, filter), TOV_SUCCESS);
    }
}

TEST_F(PassValues, ColourMatricesAreThreePaddedRowsInverseToEachOther) {
    const tov_image_filter filter = attached(TOV_IMAGE_FILTER_COLOR_SPACE, image(7, 5), image(7, 5));
    using Rows = std::array<float, 12>;
    ASSERT_EQ(execute(), TOV_SUCCESS);
    const auto toXyz = latest().arguments.at(2).as<Rows>();
    const auto fromXyz = latest().arguments.at(3).as<Rows>();
    const Rows srgb = {0.4124f, 0.3576f, 0.1805f, 0, 0.2126f, 0.7152f, 0.0722f, 0, 0.0193f, 0.1192f, 0.9505f, 0};
    const Rows inverse = {3.2410f, -1.5374f, -0.4986f, 0, -0.9692f, 1.8760f, 0.0416f, 0, 0.0556f, -0.2040f, 1.0570f, 0};
    for (size_t i = 0; i < 12; ++i) {
        EXPECT_NEAR(toXyz[i], srgb[i], 6e-5) << i;  // published with four digits
        EXPECT_NEAR(fromXyz[i], inverse[i], 6e-5) << i;
    }
    ASSERT_EQ(tovImageFilterSetParameter1u(filter, "srcColorSpace", TOV_COLOR_SPACE_REC2020), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    const Rows wide = {0.6370f, 0.1446f, 0.1689f, 0, 0.2627f, 0.6780f, 0.0593f, 0, 0, 0.0281f, 1.0610f, 0};
    const auto wideToXyz = latest().arguments.at(2).as<Rows>();
    for (size_t i = 0; i < 12; ++i) EXPECT_NEAR(wideToXyz[i], wide[i], 6e-5) << i;
}

TEST_F(PassValues, BlurCoefficientsAreNormalisedAndOfAnyRadius) {
    const tov_image_filter filter = attached(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, image(7, 5), image(7, 5));
    ASSERT_EQ(tovImageFilterSetParameter1f(filter, "sigma", 7.5f), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter1u(filter, "radius", 0), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_THAT(latest().options, testing::HasSubstr(" -D COEFFS={1.000000f} -D"));
    for (const uint32_t radius : {100u, 4096u}) {
        ASSERT_EQ(tovImageFilterSetParameter1u(filter, "radius", radius), TOV_SUCCESS);
        ASSERT_EQ(execute(), TOV_SUCCESS);
        const std::string options = latest().options;
        const size_t start = options.find("COEFFS={");
        ASSERT_NE(start, std::string::npos);
        const std::string list = options.substr(start, options.find('}', start) - start);
        EXPECT_EQ(std::count(list.begin(), list.end(), 'f'), 2 * radius + 1);
    }
}

TEST_F(PassValues, ARectangleBeyondTheOutputLaunchesNoMoreThanTheOutput) {
    const tov_image_filter filter = attached(TOV_IMAGE_FILTER_LINEAR_TONEMAP, image(20, 9), image(20, 9));
    using Sizes = std::vector<size_t>;
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", 0xffffffff, 0xffffffff), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_EQ(latest().global, (Sizes{24, 16}));
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", 9, 1), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_EQ(latest().global, (Sizes{16, 8}));
}

TEST_F(PassValues, TextsDoNotDependOnTheLocale) {
    struct Grouped : std::numpunct<char> {
        char do_decimal_point() const override { return ','; }
        char do_thousands_sep() const override { return '.'; }
        std::string do_grouping() const override { return "\3"; }
    };
    const tov_image_filter filter = attached(TOV_IMAGE_FILTER_GAUSSIAN_BLUR, image(1920, 3), image(1920, 3));
    ASSERT_EQ(tovImageFilterSetParameter1f(filter, "sigma", 0.5f), TOV_SUCCESS);
    const std::locale before = std::locale::global(std::locale(std::locale::classic(), new Grouped));
    const char* const cLocale = std::setlocale(LC_ALL, "de_DE.UTF-8");  // where it is installed
    const int32_t code = execute();
    std::locale::global(before);
    if (cLocale != nullptr) std::setlocale(LC_ALL, "C");
    ASSERT_EQ(code, TOV_SUCCESS);
    EXPECT_THAT(latest().options, testing::HasSubstr("=(int2)(1920,3)"));
    EXPECT_THAT(latest().options, testing::HasSubstr("COEFFS={0.106507f,0.786986f,0.106507f}"));
}

TEST_F(PassValues, AVendorThatNeedsIt_GetsItsFlag) {
    EXPECT_THAT(driver().platforms.at(0).devices.at(0).vendor, testing::Not(testing::HasSubstr("uarrion")));
    attached(TOV_IMAGE_FILTER_NORMALIZATION, image(7, 5), image(7, 5));
    for (const char* vendor : {"Quarrion, Inc.", "the QUARRION people", "Quarrio"}) {
        driver().platforms.at(0).devices.at(0).vendor = vendor;
        const bool flagged = std::string(vendor) != "Quarrio";
        ASSERT_EQ(execute(), TOV_SUCCESS);
        EXPECT_EQ(latest().options.find("-I .  -D QUARRION  -D X64 ") != std::string::npos, flagged) << vendor;
        EXPECT_EQ(latest().options.find("QUARRION") != std::string::npos, flagged) << vendor;
    }
}

}  // namespace
}  // namespace apitest
