// What the command line refuses, with which message and which exit status.
#include <gmock/gmock.h>

#include "process.h"

namespace tooltest {

namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;

struct Refusal {
    const char* what;
    std::vector<std::string> arguments;
    int status;
    std::vector<const char*> messages;
};

const std::string kRender = TOV_DATA "/render.exr";

void PrintTo(const Refusal& refusal, std::ostream* out) {
    *out << refusal.what;
}

class RefusedCommandLine : public testing::TestWithParam<Refusal> {};

TEST_P(RefusedCommandLine, EndsWithItsStatusAndAMessageAndWritesNothing) {
    const TemporaryDirectory directory;
    const Outcome outcome = runTool(GetParam().arguments, {.directory = directory.path()});
    EXPECT_EQ(outcome.status, GetParam().status);
    for (const char* message : GetParam().messages) EXPECT_THAT(outcome.err, HasSubstr(message));
    EXPECT_THAT(outcome.out, IsEmpty());
    EXPECT_THAT(directory.list(), IsEmpty());
}

Refusal stage(const char* what, const char* text, std::vector<const char*> messages) {
    return {what, {"run", kRender, "-f", text, "-o", "out.exr"}, 2, std::move(messages)};
}

Refusal run(const char* what, std::vector<std::string> more, int status, std::vector<const char*> messages) {
    std::vector<std::string> arguments{"run", kRender, "-f", "sobel"};
    arguments.insert(arguments.end(), more.begin(), more.end());
    return {what, arguments, status, std::move(messages)};
}

INSTANTIATE_TEST_SUITE_P(
    Commands, RefusedCommandLine,
    testing::Values(Refusal{"none", {}, 2, {"devices, filters, run, denoise"}},
                    Refusal{"unknown", {"rnu"}, 2, {"\"rnu\"", "did you mean run?", "devices, filters, run, denoise"}},
                    Refusal{"no input", {"run"}, 2, {"INPUT"}},
                    Refusal{"no filter", {"run", kRender, "-o", "out.png"}, 2, {"--filter"}},
                    Refusal{"unknown option", {"devices", "--fast"}, 2, {"--fast"}},
                    Refusal{"unknown filter to list", {"filters", "sobl"}, 2, {"\"sobl\"", "did you mean sobel?"}}));

INSTANTIATE_TEST_SUITE_P(
    Stages, RefusedCommandLine,
    testing::Values(
        stage("misspelt filter", "gama_correction", {"did you mean gamma_correction?", "drago_tonemap", "sobel"}),
        stage("no name", ":cGamma=1", {"name of the filter is missing"}),
        stage("nothing after the colon", "gamma_correction:", {"param=value"}),
        stage("no equals sign", "gamma_correction:cGamma", {"param=value"}),
        stage("no value", "gamma_correction:cGamma=", {"cGamma= has no value"}),
        stage("parameter given twice", "gamma_correction:cGamma=1,cGamma=2", {"cGamma is given twice"}),
        stage("misspelt parameter", "gamma_correction:cgama=2", {"did you mean cGamma?", "parameters are cGamma"}),
        stage("parameter of a filter without any", "sobel:x=1", {"it has none at all"}),
        stage("image that the filter writes", "temporal_accumulation:outVarianceImg=a.exr", {"written by the filter"}),
        stage("list with a gap", "weighted_sum:inputs=a.exr++b.exr", {"names no file beside a +"}),
        stage("too many pictures", "multiply:inputs=a+b+c+d+e+f+g", {"7 pictures are given, at most 6"}),
        stage("more weights than pictures", "weighted_sum:inputs=a.exr+b.exr,weights=1+2+3",
              {"inputs has 2 pictures", "the list of numbers has 3"}),
        stage("size of another filter", "sobel:size=3x3", {"sobel has no parameter \"size\""}),
        stage("size without a cross", "resample:size=30", {"\"30\" is not of the form WIDTHxHEIGHT"}),
        stage("size given twice", "resample:size=3x3,size=4x4", {"size is given twice"})));

INSTANTIATE_TEST_SUITE_P(
    Values, RefusedCommandLine,
    testing::Values(stage("unit after a number", "gamma_correction:cGamma=1.5x", {"\"1.5x\" is not a number"}),
                    stage("decimal comma", "gamma_correction:cGamma=1,5", {"param=value"}),
                    stage("blank before a number", "gamma_correction:cGamma= 2", {"not a number"}),
                    stage("too large a float", "gamma_correction:cGamma=1e99", {"does not fit a 32-bit float"}),
                    stage("not finite", "gamma_correction:cGamma=nan", {"not a finite number"}),
                    stage("negative for unsigned", "simple_tonemap:cApplyToneMap=-1", {"not a whole number"}),
                    stage("fraction for unsigned", "simple_tonemap:cApplyToneMap=0.5", {"not a whole number"}),
                    stage("too large for unsigned", "simple_tonemap:cApplyToneMap=4294967296", {"out of range"}),
                    stage("empty size", "resample:size=0x5", {"has no pixels"}),
                    stage("size beyond any image", "resample:size=20000x20000", {"too large", "268435455 pixels"}),
                    stage("unknown interpolation", "resample:interpOperator=bicubical",
                          {"did you mean bicubic?", "box (0), bilinear (1), bicubic (2)"}),
                    stage("misspelt colour space", "color_space:srcColorSpace=rec2021",
                          {"did you mean rec2020?", "srgb (1), adobe_rgb (2), rec2020 (3), dcip3 (4)"}),
                    stage("unknown colour space", "color_space:dstColorSpace=5", {"srgb (1)"}),
                    stage("too few numbers of a matrix", "motion_buffer:viewProjMatrix=1+0+0", {"16 numbers"})));

INSTANTIATE_TEST_SUITE_P(
    Places, RefusedCommandLine,
    testing::Values(run("unknown extension", {"-o", "out.foo"}, 5, {"\".foo\"", "exr", "png"}),
                    run("size without a resample stage", {"-o", "out.png", "--size", "8x8"}, 2, {"resample stage"}),
                    run("no extension", {"-o", "out"}, 5, {"no extension"}),
                    run("extension of a writer that writes nothing", {"-o", "out.null"}, 5, {"\".null\""}),
                    run("missing directory", {"-o", "missing/out.png"}, 5, {"No such file or directory"}),
                    run("directory as output", {"-o", "/tmp"}, 5, {"it is a directory"}),
                    run("device as output", {"-o", "/dev/null"}, 5, {"no extension"}),
                    run("unknown device", {"-o", "out.png", "--device", "tpu"}, 2, {"gpu, cpu, gpu:INDEX"}),
                    run("negative device index", {"-o", "out.png", "--device", "cpu:-1"}, 2, {"cpu:-1"}),
                    run("device that is not there", {"-o", "out.png", "--device", "cpu:99"}, 3, {"cpu:99", "cpu:0"}),
                    run("empty cache path", {"-o", "out.png", "--cache", ""}, 2, {"--cache"}),
                    run("cache path of 128 bytes", {"-o", "out.png", "--cache", std::string(128, 'c')}, 2,
                        {"128 bytes", "127"}),
                    run("file as cache", {"-o", "out.png", "--cache", kRender}, 1, {"Not a directory"})));

TEST(CommandLine, HelpAndVersionGoToStandardOutput) {
    for (const char* command : {"", "devices", "filters", "run", "denoise"}) {
        std::vector<std::string> arguments;
        if (*command != '\0') arguments.emplace_back(command);
        arguments.emplace_back("--help");
        const Outcome help = runTool(arguments);
        EXPECT_EQ(help.status, 0) << command;
        EXPECT_THAT(help.out, HasSubstr(*command != '\0' ? std::string("tov ") + command : "Examples:")) << command;
        arguments.back() = "--version";
        EXPECT_EQ(runTool(arguments).out, "tov " TOV_TEST_VERSION "\n") << command;
    }
}

TEST(CommandLine, WithoutAnyDeviceSaysWhatToInstall) {
    const Setting noDriver{.environment = {{"OCL_ICD_VENDORS", "/nonexistent"}}};
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"devices"}, {"filters"}, {"run", kRender, "-f", "sobel", "-o", "/tmp/never.png"}}) {
        const Outcome outcome = runTool(arguments, noDriver);
        EXPECT_EQ(outcome.status, 3) << arguments[0];
        EXPECT_THAT(outcome.err, HasSubstr("pocl-opencl-icd")) << arguments[0];
    }
}

}  // namespace

}  // namespace tooltest
