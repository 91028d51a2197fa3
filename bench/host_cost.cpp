#include "host_cost.h"

#include <benchmark/benchmark.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <stdexcept>

#include "filter_run.h"
#include "measure.h"

namespace bench {
namespace {

constexpr PictureLayout kSmallPicture = {64, 64, false};
constexpr size_t kScratchBytes = size_t{112} * kSmallPicture.width * kSmallPicture.height;
constexpr double kMinSeconds = 0.3;

struct Bindings {
    const FilterRun& run;
    cl_mem scratch;
    cl_mem zeros;
};

// One launch of a filter: where its compiled kernel is found, and its arguments, in order.
struct BarePass {
    const char* program;  // first part of the cache file's name
    const char* option;   // stands in the option text of this pass alone
    const char* kernel;
    std::function<void(Arguments&, const Bindings&)> bind;
};

struct HostCase {
    const char* filter;  // a filter case
    bool line;
    std::vector<BarePass> passes;
};

void bindColorSpace(Arguments& arguments, const Bindings& bindings) {
    constexpr std::array<float, 12> kIdentity = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0};
    arguments.add(bindings.run.input());
    arguments.add(bindings.run.output());
    arguments.add(kIdentity);
    arguments.add(kIdentity);
}

void bindSum(Arguments& arguments, const Bindings& bindings) {
    arguments.add(bindings.run.input());
    arguments.add(bindings.run.output());
    for (size_t i = 0; i < 2; ++i) arguments.add(bindings.run.feature(i));
    for (size_t i = 0; i < 2; ++i) arguments.add(0.5f);
}

void bindEdges(Arguments& arguments, const Bindings& bindings) {
    arguments.add(bindings.run.input());
    for (size_t i = 0; i < 3; ++i) arguments.add(bindings.run.feature(i));
    arguments.add(bindings.scratch);
    for (const float threshold : {0.05f, 0.92388f, 0.1f}) arguments.add(threshold);
}

// The area table is all zeros here; the kernel reads it at the same places.
void bindWeights(Arguments& arguments, const Bindings& bindings) {
    constexpr cl_int2 kSize = {{static_cast<cl_int>(kSmallPicture.width), static_cast<cl_int>(kSmallPicture.height)}};
    arguments.add(bindings.scratch);
    arguments.add(bindings.zeros);
    arguments.add(kSize);
    arguments.add(bindings.scratch);
}

void bindBlending(Arguments& arguments, const Bindings& bindings) {
    arguments.add(bindings.run.input());
    arguments.add(bindings.run.output());
    arguments.add(bindings.scratch);
}

const std::vector<HostCase>& hostCases() {
    static const std::vector<HostCase> cases = {
        {"gamma",
         false,
         {{"Filters", "", "GammaCorrectionKernel",
           [](Arguments& arguments, const Bindings& bindings) {
               arguments.add(bindings.run.input());
               arguments.add(bindings.run.output());
               arguments.add(2.2f);
           }}}},
        {"color_space", false, {{"Filters", "", "ColorSpaceKernel", bindColorSpace}}},
        {"weighted_sum", false, {{"Math", "", "WeightedSumKernel", bindSum}}},
        {"gaussian_blur_5",
         true,
         {{"GaussBlur", "-D srcBuffer_COMP_TYPE=", "GaussBlurHorKernel",
           [](Arguments& arguments, const Bindings& bindings) {
               arguments.add(bindings.run.input());
               arguments.add(bindings.scratch);
           }},
          {"GaussBlur", "-D dstBuffer_COMP_TYPE=", "GaussBlurVertKernel",
           [](Arguments& arguments, const Bindings& bindings) {
               arguments.add(bindings.scratch);
               arguments.add(bindings.run.output());
           }}}},
        {"mlaa",
         false,
         {{"MLAA", "EDGE_DETECTION", "EdgeDetectionMLAA", bindEdges},
          {"MLAA", "WEIGH_CALC", "BlendingWeightCalculationMLAA", bindWeights},
          {"MLAA", "BLENDING", "NeighborhoodBlendingMLAA", bindBlending}}}};
    return cases;
}

std::string contentOf(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

struct CachedProgram {
    std::string binary;
    std::string options;
};

// Whether an option text can be that of a pass over the small picture. Passes over buffers alone name no size.
bool fits(const std::string& options, const BarePass& pass) {
    const std::string size = "_Res=(int2)(";
    const std::string wanted = size + std::to_string(kSmallPicture.width) + ",";
    return options.find(pass.option) != std::string::npos &&
           (options.find(size) == std::string::npos || options.find(wanted) != std::string::npos);
}

// The option text is the first line of the file beside a binary.
CachedProgram findCached(const std::string& cache, const BarePass& pass) {
    for (const auto& entry : std::filesystem::directory_iterator(cache)) {
        if (entry.path().extension() != ".options") continue;
        if (entry.path().filename().string().rfind(pass.program, 0) != 0) continue;
        const std::string side = contentOf(entry.path());
        const std::string options = side.substr(0, side.find('\n'));
        if (!fits(options, pass)) continue;
        std::filesystem::path binary = entry.path();
        return {contentOf(binary.replace_extension()), options};
    }
    throw std::runtime_error("The cache directory holds no program for " + std::string(pass.kernel));
}

struct BareKernel {
    ClProgram program;
    ClKernel kernel;
};

std::vector<BareKernel> bareKernels(const OpenCL& opencl, const std::string& cache, const HostCase& what,
                                    const Bindings& bindings) {
    std::vector<BareKernel> kernels;
    for (const BarePass& pass : what.passes) {
        const CachedProgram cached = findCached(cache, pass);
        BareKernel bare;
        bare.program = opencl.load(cached.binary, cached.options);
        bare.kernel = opencl.kernel(bare.program.get(), pass.kernel);
        Arguments arguments(bare.kernel.get());
        pass.bind(arguments, bindings);
        kernels.push_back(std::move(bare));
    }
    return kernels;
}

void measureHost(benchmark::State& state, const OpenCL& opencl, tov_context context, const std::string& cache,
                 const HostCase& what) {
    FilterRun run(&opencl, context, filterCase(what.filter), kSmallPicture);
    run.execute();
    const ClBuffer scratch = opencl.buffer(kScratchBytes);
    const ClBuffer zeros = opencl.buffer(kScratchBytes);
    const std::vector<BareKernel> kernels = bareKernels(opencl, cache, what, {run, scratch.get(), zeros.get()});
    const LaunchShape shape = launchShape(what.line, kSmallPicture.width, kSmallPicture.height);
    const auto runBare = [&] {
        for (const BareKernel& bare : kernels) opencl.run(bare.kernel.get(), shape);
    };
    runBare();
    std::vector<double> whole;
    std::vector<double> bare;
    for (auto _ : state) {
        bare.push_back(secondsOf(runBare));
        whole.push_back(secondsOf([&] { run.execute(); }));
        state.SetIterationTime(whole.back());
    }
    const auto passes = static_cast<double>(kernels.size());
    state.counters["passes"] = passes;
    state.counters["execute_us"] = median(whole) * 1e6;
    state.counters["bare_us"] = median(bare) * 1e6;
    state.counters["added_per_pass_us"] = (median(whole) - median(bare)) / passes * 1e6;
    state.counters["least_added_us"] = (minimum(whole) - minimum(bare)) / passes * 1e6;
}

}  // namespace

void registerHostCost(const OpenCL& opencl, tov_context context, const std::string& cache) {
    for (const HostCase& what : hostCases()) {
        benchmark::RegisterBenchmark((std::string("host/") + what.filter).c_str(),
                                     [&opencl, context, cache, &what](benchmark::State& state) {
                                         try {
                                             measureHost(state, opencl, context, cache, what);
                                         } catch (const std::exception& failure) {
                                             state.SkipWithError(failure.what());
                                         }
                                     })
            ->UseManualTime()
            ->MinTime(kMinSeconds)
            ->Unit(benchmark::kMicrosecond);
    }
}

}  // namespace bench
