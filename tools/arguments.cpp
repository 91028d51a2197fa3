// CLI11's options turned into commands.
#include "arguments.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <algorithm>

#include "denoise_defaults.h"
#include "failure.h"
#include "filter_names.h"
#include "text.h"
#include "tov/tov.h"

namespace tool {

namespace {

constexpr const char* kVersion = "tov " TOV_VERSION_STRING;
constexpr const char* kDescription = "Filters rendered pictures on an OpenCL device.";

constexpr const char* kMainFooter =
    "Examples:\n"
    "  tov devices\n"
    "  tov filters reinhard_tonemap\n"
    "  tov run render.exr -f reinhard_tonemap -f gamma_correction:cGamma=2.2 -o picture.png\n"
    "  tov denoise noisy.exr --albedo albedo.exr --normal normal.exr -o clean.exr\n"
    "\n"
    "Exit status: 0 done; 1 the library or the device failed; 2 wrong arguments, names or values;\n"
    "3 no such device; 4 a picture cannot be read; 5 a result cannot be written.\n"
    "\n"
    "Results go to standard output, everything else to standard error.";

constexpr const char* kRunFooter =
    "Stages run in the order given. `tov filters` lists their names and parameters.\n"
    "\n"
    "Values are worked on and written as they are stored: no colour management. A linear render needs a\n"
    "gamma_correction stage before it looks right in an 8-bit format. Pictures of 8 bits are 0 ... 1 while they are\n"
    "worked on. OpenEXR is written as half or float like the input, TIFF and Radiance HDR as float, everything else\n"
    "with 8 bits, clamped and rounded. The output is written whole or not at all.\n"
    "\n"
    "drago_tonemap measures avLum and maxLum on its input where they are not given.\n"
    "Colour spaces have names: color_space:srcColorSpace=srgb,dstColorSpace=rec2020. So have the ways to interpolate:\n"
    "resample:interpOperator=box|bilinear|bicubic,size=WxH.\n"
    "\n"
    "Images are files, or layers of OpenEXR files: normalsImg=normal.exr, normalsImg=render.exr:Normal. Lists are\n"
    "joined with +: inputs=a.exr+b.exr,weights=0.25+0.75; @ is the picture that the stage is given. They must be as\n"
    "large as that picture. One channel is read into red, green and blue alike.\n"
    "\n"
    "Examples:\n"
    "  tov run render.exr -f reinhard_tonemap:cKey=0.5 -f gamma_correction:cGamma=2.2 -o picture.png\n"
    "  tov run render.exr -f drago_tonemap:cBias=0.85 -f gamma_correction:cGamma=2.2 -o picture.jpg\n"
    "  tov run render.exr -f resample:interpOperator=bicubic --size 960x540 -o half.exr\n"
    "  tov run render.exr -f bilateral_denoise:radius=4,inputs=@+normal.exr,sigmas=0.5+0.1 -o smooth.exr\n"
    "  tov run layers.exr -f mlaa:normalsImg=layers.exr:Normal,depthImg=layers.exr:Depth -o smooth.png\n"
    "  tov run render.exr -f linear_tonemap:cKey=2 -f gamma_correction:cGamma=2.2 --fuse -o picture.png\n"
    "  tov run wide.exr -f color_space:srcColorSpace=rec2020,dstColorSpace=srgb -o narrow.exr --device cpu";

constexpr const char* kDenoiseFooter =
    "The settings are chosen from the picture's noise. Albedo, normals and depth (each without noise, if possible)\n"
    "keep edges and textures; without a variance one is estimated, guided by them. Of an OpenEXR file with layers\n"
    "those are used that carry the names which renderers give: Noisy Image, Combined, beauty or rgba; Denoising\n"
    "Albedo, Albedo or DiffCol; Denoising Normal, Normal or N; Depth or Z; Variance. Options take precedence. Depths\n"
    "of 1e9 and more, and infinite ones, are taken as sky. Values stay linear and alpha stays as it is.\n"
    "\n"
    "Examples:\n"
    "  tov denoise layers.exr -o clean.exr\n"
    "  tov denoise noisy.exr --albedo albedo.exr --normal normal.exr --depth depth.exr -o clean.exr\n"
    "  tov denoise noisy.exr --normal passes.exr:Normal --variance variance.exr --method lwr -o clean.exr";

// What CLI11 fills in before it is judged.
struct RawArguments {
    std::string filter;
    bool markdown = false;
    std::string input;
    std::vector<std::string> stages;
    std::string output;
    std::string device;
    std::string cache;
    bool verbose = false;
    std::string size;
    bool fuse = false;
    std::string albedo;
    std::string normal;
    std::string depth;
    std::string variance;
    std::string method;
    std::string samples;
};

void addFilters(CLI::App& app, RawArguments& raw) {
    CLI::App* const filters = app.add_subcommand("filters", "List filters with their parameters and defaults");
    filters->add_option("NAME", raw.filter, "Only this filter");
    filters->add_flag("--markdown", raw.markdown, "Print Markdown");
}

void addInput(CLI::App& command, RawArguments& raw) {
    command.add_option("INPUT", raw.input, "Picture: EXR, HDR, TIFF, PNG, JPEG ...")->required();
}

// The options of WorkArguments; after those of the command's own, for --help keeps the order.
void addWork(CLI::App& command, RawArguments& raw) {
    command.add_option("-o,--output", raw.output, "Picture to write; its extension tells the format")
        ->required()
        ->type_name("FILE");
    command.add_option("--device", raw.device, "gpu, cpu, gpu:INDEX or cpu:INDEX (default: the first GPU, else CPU)")
        ->type_name("DEVICE");
    command.add_option("--cache", raw.cache, "Directory for compiled kernels (default: tov in your cache directory)")
        ->type_name("DIR");
    command.add_flag("--verbose", raw.verbose, "Tell what is done, and show the library's own lines");
}

void addRun(CLI::App& app, RawArguments& raw) {
    CLI::App* const run = app.add_subcommand("run", "Filter a picture");
    addInput(*run, raw);
    run->add_option("-f,--filter", raw.stages, "Filter with its parameters: NAME[:param=value[,param=value...]]")
        ->required()
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll)
        ->type_name("STAGE");
    run->add_option("--size", raw.size, "Size of what the resample stage makes, say 960x540")->type_name("WxH");
    run->add_flag("--fuse", raw.fuse, "Compute neighbouring stages in one kernel where they can be");
    addWork(*run, raw);
    run->footer(kRunFooter);
}

void addDenoise(CLI::App& app, RawArguments& raw) {
    CLI::App* const denoise = app.add_subcommand("denoise", "Remove the noise of a rendered picture");
    addInput(*denoise, raw);
    const auto feature = [&](const char* name, std::string& value, const char* text) {
        denoise->add_option(name, value, text)->type_name("FILE[:LAYER]");
    };
    feature("--albedo", raw.albedo, "The surfaces' own colours");
    feature("--normal", raw.normal, "Normals, -1 ... 1");
    feature("--depth", raw.depth, "Distances from the camera, 0 where nothing is hit");
    feature("--variance", raw.variance, "Variance of the picture's pixels (default: estimated)");
    denoise->add_option("--method", raw.method, "eaw (fast, the default) or lwr (regression)")->type_name("METHOD");
    denoise->add_option("--samples", raw.samples, "Samples per pixel of the render, 2 ... 65536, for lwr")
        ->type_name("N");
    addWork(*denoise, raw);
    denoise->footer(kDenoiseFooter);
}

// CLI11 would only say that a subcommand is required, or that a name was not expected.
void refuseUnknownCommand(const CLI::App& app, int argc, const char* const* argv) {
    std::vector<std::string> names;
    for (const CLI::App* const command : app.get_subcommands({})) names.push_back(command->get_name());
    if (argc < 2)
        throw usageFailure("the command is missing; the commands are " + join(names, ", ") + "; see tov --help");
    if (argv[1][0] == '-') return;
    if (std::ranges::find(names, argv[1]) != names.end()) return;
    throw usageFailure("there is no command \"" + std::string(argv[1]) + "\"" + suggestion(argv[1], names) +
                       "; the commands are " + join(names, ", "));
}

// For the last resample stage without a size of its own.
void setSize(std::vector<Stage>& stages, const PixelSize& size) {
    const auto wanted = [](const Stage& stage) { return stage.filter == kResampleFilter && !stage.size; };
    const auto found = std::find_if(stages.rbegin(), stages.rend(), wanted);
    if (found == stages.rend()) {
        throw usageFailure("--size wants a resample stage without a size of its own: -f resample");
    }
    found->size = size;
}

WorkArguments makeWork(const CLI::App& command, const RawArguments& raw) {
    WorkArguments work{raw.input, raw.output, std::nullopt, std::nullopt, raw.verbose};
    if (work.input.empty()) throw usageFailure("INPUT is empty");
    if (work.output.empty()) throw usageFailure("--output is empty");
    if (command.count("--device") > 0) work.device = parseDevice(raw.device);
    if (command.count("--cache") > 0) work.cache = raw.cache;
    return work;
}

RunCommand makeRun(const CLI::App& run, const RawArguments& raw) {
    RunCommand command{makeWork(run, raw), {}, raw.fuse};
    for (const std::string& text : raw.stages) {
        command.stages.push_back(parseStage(text));
        filterType(command.stages.back().filter);
    }
    if (run.count("--size") > 0) setSize(command.stages, parsePixelSize(raw.size, "--size"));
    return command;
}

DenoiseMethod parseMethod(const std::string& text) {
    if (text == "eaw") return DenoiseMethod::kWavelet;
    if (text == "lwr") return DenoiseMethod::kRegression;
    throw usageFailure("--method: \"" + text + "\" is not one of eaw, lwr");
}

uint32_t parseSamples(const std::string& text) {
    const uint32_t samples = parseUint(text, "--samples");
    if (samples < kFewestSamples) throw usageFailure("--samples: at least " + std::to_string(kFewestSamples));
    if (samples > kMostSamples) throw usageFailure("--samples: at most " + std::to_string(kMostSamples));
    return samples;
}

DenoiseCommand makeDenoise(const CLI::App& denoise, const RawArguments& raw) {
    DenoiseCommand command{makeWork(denoise, raw), {}};
    DenoiseOptions& options = command.options;
    const auto give = [&](const char* name, const std::string& value, std::string& option) {
        if (denoise.count(name) > 0 && value.empty()) throw usageFailure(std::string(name) + " is empty");
        option = value;
    };
    give("--albedo", raw.albedo, options.albedo);
    give("--normal", raw.normal, options.normal);
    give("--depth", raw.depth, options.depth);
    give("--variance", raw.variance, options.variance);
    if (denoise.count("--method") > 0) options.method = parseMethod(raw.method);
    if (denoise.count("--samples") == 0) return command;
    options.samples = parseSamples(raw.samples);
    if (options.method != DenoiseMethod::kRegression) throw usageFailure("--samples goes with --method lwr");
    return command;
}

FiltersCommand makeFilters(const CLI::App& filters, const RawArguments& raw) {
    if (filters.count("NAME") == 0) return {std::nullopt, raw.markdown};
    filterType(raw.filter);
    return {raw.filter, raw.markdown};
}

}  // namespace

Command parseArguments(int argc, const char* const* argv) {
    CLI::App app(kDescription, "tov");
    RawArguments raw;
    app.add_subcommand("devices", "List the OpenCL devices");
    addFilters(app, raw);
    addRun(app, raw);
    addDenoise(app, raw);
    app.require_subcommand(1);
    app.footer(kMainFooter);
    app.set_version_flag("--version", kVersion);
    for (CLI::App* const command : app.get_subcommands({})) command->set_version_flag("--version", kVersion);
    refuseUnknownCommand(app, argc, argv);
    try {
        app.parse(argc, argv);
    } catch (const CLI::CallForHelp&) {
        return PrintCommand{app.help()};
    } catch (const CLI::CallForVersion&) {
        return PrintCommand{std::string(kVersion) + "\n"};
    } catch (const CLI::ParseError& error) {
        throw usageFailure(std::string(error.what()) + "; see tov --help");
    }
    if (app.got_subcommand("run")) return makeRun(*app.get_subcommand("run"), raw);
    if (app.got_subcommand("denoise")) return makeDenoise(*app.get_subcommand("denoise"), raw);
    if (app.got_subcommand("filters")) return makeFilters(*app.get_subcommand("filters"), raw);
    return DevicesCommand{};
}

}  // namespace tool
