#include "throughput.h"

#include <benchmark/benchmark.h>

#include <memory>
#include <optional>
#include <string>

#include "filter_run.h"
#include "measure.h"

namespace bench {
namespace {

constexpr PictureLayout kLayouts[] = {{1920, 1080, false}, {1920, 1080, true}, {3840, 2160, false}, {3840, 2160, true}};
constexpr uint32_t kDenoiserWidth = 1920;
constexpr double kMinSeconds = 0.4;

constexpr char kCopySource[] = R"(
__kernel void CopyGrid(__global const PIXEL* source, __global PIXEL* target) {
    const int x = (int)get_global_id(0);
    const int y = (int)get_global_id(1);
    if (x >= WIDTH || y >= HEIGHT) return;
    target[(size_t)y * WIDTH + (size_t)x] = source[(size_t)y * WIDTH + (size_t)x];
}
__kernel void CopyLine(__global const PIXEL* source, __global PIXEL* target) {
    const size_t i = get_global_id(0);
    if (i >= (size_t)WIDTH * HEIGHT) return;
    target[i] = source[i];
}
)";

// The copy kernel on images of the run's own size, so that both see the same memory.
class Copy {
 public:
    Copy(const OpenCL& opencl, bool line, const PictureLayout& layout)
        : opencl_(opencl),
          shape_(launchShape(line, layout.width, layout.height)),
          bytes_(2.0 * layout.pixels() * layout.bytesPerPixel()),
          source_(opencl.buffer(size_t{layout.pixels()} * layout.bytesPerPixel())),
          target_(opencl.buffer(size_t{layout.pixels()} * layout.bytesPerPixel())),
          program_(opencl.build(kCopySource, options(layout))),
          kernel_(opencl.kernel(program_.get(), line ? "CopyLine" : "CopyGrid")) {
        Arguments arguments(kernel_.get());
        arguments.add(source_.get());
        arguments.add(target_.get());
    }

    void run() const { opencl_.run(kernel_.get(), shape_); }
    double bytesMoved() const noexcept { return bytes_; }

 private:
    static std::string options(const PictureLayout& layout) {
        return std::string("-cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2 -D PIXEL=") +
               (layout.bytes ? "uchar4" : "float4") + " -D WIDTH=" + std::to_string(layout.width) +
               " -D HEIGHT=" + std::to_string(layout.height);
    }

    const OpenCL& opencl_;
    LaunchShape shape_;
    double bytes_;
    ClBuffer source_;
    ClBuffer target_;
    ClProgram program_;
    ClKernel kernel_;
};

// One benchmark's objects. The benchmark library calls a benchmark several times until it has run long enough; the
// objects are kept meanwhile, and only those of the latest benchmark exist.
struct Prepared {
    std::string name;
    std::unique_ptr<FilterRun> filter;
    std::unique_ptr<Copy> copy;
};
std::optional<Prepared> prepared;

Prepared& prepare(const std::string& name, const OpenCL& opencl, tov_context context, const FilterCase& what,
                  const PictureLayout& layout) {
    if (prepared && prepared->name == name) return *prepared;
    prepared.reset();
    Prepared fresh{name, std::make_unique<FilterRun>(&opencl, context, what, layout),
                   std::make_unique<Copy>(opencl, what.line, layout)};
    for (uint32_t i = 0; i < what.settling; ++i) fresh.filter->execute();
    fresh.copy->run();
    prepared.emplace(std::move(fresh));
    return *prepared;
}

struct Samples {
    std::vector<double> filter;
    std::vector<double> copy;
    std::vector<double> fraction;  // of the copy's rate, from neighbouring runs, which share what else the machine does
    std::vector<double> processor;
    std::vector<double> copyProcessor;
};

void report(benchmark::State& state, const Prepared& objects, const Samples& samples, double work) {
    state.counters["median_ms"] = median(samples.filter) * 1e3;
    state.counters["min_ms"] = minimum(samples.filter) * 1e3;
    state.counters["GB_per_s"] = objects.filter->bytesMoved() / median(samples.filter) * 1e-9;
    state.counters["copy_GB_per_s"] = objects.copy->bytesMoved() / median(samples.copy) * 1e-9;
    state.counters["fraction_of_copy"] = median(samples.fraction);
    state.counters["processor_ms"] = median(samples.processor) * 1e3;
    state.counters["copy_processor_ms"] = median(samples.copyProcessor) * 1e3;
    state.counters["processor_fraction_of_copy"] = work * median(samples.copyProcessor) / median(samples.processor);
}

void measure(benchmark::State& state, const std::string& name, const OpenCL& opencl, tov_context context,
             const FilterCase& what, const PictureLayout& layout) {
    try {
        Prepared& objects = prepare(name, opencl, context, what, layout);
        const double work = objects.filter->bytesMoved() / objects.copy->bytesMoved();
        Samples samples;
        for (auto _ : state) {
            const Timing copy = timingOf([&] { objects.copy->run(); });
            const Timing filter = timingOf([&] { objects.filter->execute(); });
            state.SetIterationTime(filter.wall);
            samples.copy.push_back(copy.wall);
            samples.filter.push_back(filter.wall);
            samples.fraction.push_back(work * copy.wall / filter.wall);
            samples.processor.push_back(filter.processor);
            samples.copyProcessor.push_back(copy.processor);
        }
        report(state, objects, samples, work);
    } catch (const std::exception& failure) {
        state.SkipWithError(failure.what());
    }
}

void registerOne(const OpenCL& opencl, tov_context context, const FilterCase& what, const PictureLayout& layout) {
    const std::string name = std::string("throughput/") + what.name + "/" + std::to_string(layout.width) + "x" +
                             std::to_string(layout.height) + (layout.bytes ? "/uint8x4" : "/float4");
    benchmark::RegisterBenchmark(
        name.c_str(),
        [=, &opencl, &what](benchmark::State& state) { measure(state, name, opencl, context, what, layout); })
        ->UseManualTime()
        ->MinTime(kMinSeconds)
        ->Unit(benchmark::kMillisecond);
}

}  // namespace

void registerThroughput(const OpenCL& opencl, tov_context context) {
    for (const FilterCase& what : filterCases()) {
        for (const PictureLayout& layout : kLayouts) {
            if (layout.bytes && !what.bytes) continue;
            if (what.denoiser && layout.width > kDenoiserWidth) continue;
            registerOne(opencl, context, what, layout);
        }
    }
}

void releaseThroughput() noexcept {
    prepared.reset();
}

}  // namespace bench
