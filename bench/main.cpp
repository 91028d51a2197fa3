// Benchmarks of the library on one OpenCL device. docs/benchmarks.md says what they measure.
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <optional>
#include <string_view>

#include "child.h"
#include "denoisers.h"
#include "fused_chain.h"
#include "handle.h"
#include "host_cost.h"
#include "opencl.h"
#include "report.h"
#include "startup.h"
#include "throughput.h"

namespace {

using namespace bench;

struct Options {
    std::string device;
    std::optional<std::string> child;
    std::vector<std::string> childArguments;
};

constexpr char kUsage[] =
    "usage: tov_bench [--device=gpu|cpu[:INDEX]] [--benchmark_filter=REGEX] [--benchmark_out=FILE.json] ...\n"
    "Without a device: the first GPU, else the first CPU. Groups: throughput/, fusion/, arithmetic/, "
    "first_frame/, startup/, creation/, host/.\n"
    "Exit status: 0 done; 1 a benchmark failed, or the filter matches none.\n";

Options parse(int count, char** texts) {
    Options options;
    for (int i = 1; i < count; ++i) {
        const std::string_view text = texts[i];
        if (text.rfind("--device=", 0) == 0) {
            options.device = text.substr(9);
        } else if (text.rfind("--child=", 0) == 0) {
            options.child = text.substr(8);
            options.childArguments = {*options.child};
        } else if (options.child) {
            options.childArguments.emplace_back(text);
        } else {
            throw std::runtime_error("Unknown argument " + std::string(text) + "\n" + kUsage);
        }
    }
    return options;
}

// The library prints its lines to standard output: it gets standard error instead, results keep a copy.
std::FILE* keepStandardOutput() {
    const int kept = dup(STDOUT_FILENO);
    if (kept < 0 || dup2(STDERR_FILENO, STDOUT_FILENO) < 0) throw std::runtime_error("No file descriptor is left");
    return fdopen(kept, "w");
}

Handle adoptContext(const OpenCL& opencl, const std::string& cache) {
    tov_context context = nullptr;
    check(tovCreateContextFromOpenClContext(TOV_API_VERSION, opencl.context(), opencl.device(), opencl.queue(),
                                            cache.c_str(), &context),
          "tovCreateContextFromOpenClContext");
    return Handle(context);
}

int runAll(const std::string& deviceOption) {
    std::FILE* out = keepStandardOutput();
    const DeviceChoice choice = chooseDevice(deviceOption);
    const TemporaryDirectory cache;
    const OpenCL opencl(choice);
    const Handle context = adoptContext(opencl, cache.path());
    registerThroughput(opencl, context.get());
    registerFusedChains(context.get());
    registerDenoisers(opencl, context.get());
    registerStartup(choice);
    registerHostCost(opencl, context.get(), cache.path());
    TableReporter reporter(out, choice.text() + ", " + opencl.deviceText());
    const size_t matched = benchmark::RunSpecifiedBenchmarks(&reporter);
    releaseThroughput();
    std::fclose(out);
    return matched > 0 && !reporter.hasFailures() ? 0 : 1;
}

}  // namespace

int main(int count, char** texts) {
    try {
        benchmark::Initialize(&count, texts);
        const Options options = parse(count, texts);
        if (options.child) return runStartupChild(options.childArguments, chooseDevice(options.device));
        return runAll(options.device);
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "tov_bench: %s\n", failure.what());
        return 1;
    }
}
