// Operations are counted from the kernels' sources: an addition or a multiplication each one, a division or root one,
// logarithms and powers as the polynomials that they are; addresses, comparisons and shuffles do not count.
//
// The a-trous filter with all features takes, for each of 24 taps, 17 operations for the normals, 14 for their
// logarithm, 9 for the depth, 24 for the transition colour, 20 for the colour, 13 for the exponential and 11 for the
// sums; with some 100 for the centre 2700 a level, five levels.
// The regression filter in windows of n = 81 pixels and r = 7 kept directions: 3 walks of 20, 40 and 170 operations a
// pixel, then for the estimate 144 of the reduced coordinates and 560 of the sums, for half of the five candidates 144
// and 2.5 * 330, for the final fit 144 and 180, some 2000 a pixel of the window, and 30 000 for the decompositions.
// This is an estimate: how many pixels the narrow candidates reject depends on the picture.
#include "denoisers.h"

#include <benchmark/benchmark.h>

#include <memory>
#include <string>

#include "filter_run.h"
#include "measure.h"

namespace bench {
namespace {

constexpr PictureLayout kLayout = {1920, 1080, false};
constexpr double kPeakOperations = 256.0 * 8.0 * 8.0 * 2.0;  // steps, chains, lanes, multiply and add

struct Counted {
    const char* name;
    double operationsPerPixel;
};
constexpr Counted kCounted[] = {{"eaw_denoise", 5.0 * 2700.0}, {"lwr_denoise", 81.0 * 2000.0 + 30000.0}};

constexpr char kPeakSource[] = R"(
__kernel void Peak(__global float* target, float a, float b) {
    float8 v0 = (float8)(get_global_id(0)), v1 = v0 + 1.0f, v2 = v0 + 2.0f, v3 = v0 + 3.0f;
    float8 v4 = v0 + 4.0f, v5 = v0 + 5.0f, v6 = v0 + 6.0f, v7 = v0 + 7.0f;
    for (int i = 0; i < 256; ++i) {
        v0 = v0 * a + b; v1 = v1 * a + b; v2 = v2 * a + b; v3 = v3 * a + b;
        v4 = v4 * a + b; v5 = v5 * a + b; v6 = v6 * a + b; v7 = v7 * a + b;
    }
    const float8 sum = v0 + v1 + v2 + v3 + v4 + v5 + v6 + v7;
    const float4 low = sum.lo + sum.hi;
    target[get_global_id(0)] = low.x + low.y + low.z + low.w;
}
)";

// What a processor as device spends; other devices' time passes on the wall clock.
double spent(const OpenCL& opencl, const Timing& timing) {
    cl_device_type type = CL_DEVICE_TYPE_CPU;
    clGetDeviceInfo(opencl.device(), CL_DEVICE_TYPE, sizeof type, &type, nullptr);
    return (type & CL_DEVICE_TYPE_CPU) != 0 ? timing.processor : timing.wall;
}

// The device's multiply-adds in vectors of eight, operations a second: the best of several runs.
double measurePeak(const OpenCL& opencl) {
    constexpr size_t kItems = size_t{1} << 17;
    const ClBuffer target = opencl.buffer(kItems * sizeof(float));
    const ClProgram program = opencl.build(kPeakSource, "-cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2");
    const ClKernel kernel = opencl.kernel(program.get(), "Peak");
    Arguments arguments(kernel.get());
    arguments.add(target.get());
    arguments.add(0.999f);
    arguments.add(0.001f);
    std::vector<double> seconds;
    for (int i = 0; i < 8; ++i)
        seconds.push_back(spent(opencl, timingOf([&] { opencl.run(kernel.get(), {{32, 1}, {kItems, 1}}); })));
    return kPeakOperations * static_cast<double>(kItems) / minimum(seconds);
}

void measureFilter(benchmark::State& state, const OpenCL& opencl, tov_context context, const Counted& counted) {
    try {
        FilterRun filter(&opencl, context, filterCase(counted.name), kLayout);
        filter.execute();
        std::vector<double> wall;
        std::vector<double> work;
        for (auto _ : state) {
            const Timing timing = timingOf([&] { filter.execute(); });
            state.SetIterationTime(timing.wall);
            wall.push_back(timing.wall);
            work.push_back(spent(opencl, timing));
        }
        const double rate = counted.operationsPerPixel * kLayout.pixels() / minimum(work);
        state.counters["median_ms"] = median(wall) * 1e3;
        state.counters["min_ms"] = minimum(wall) * 1e3;
        state.counters["processor_ms"] = minimum(work) * 1e3;
        state.counters["GFLOP_per_processor_s"] = rate * 1e-9;
        state.counters["fraction_of_peak"] = rate / measurePeak(opencl);
    } catch (const std::exception& failure) {
        state.SkipWithError(failure.what());
    }
}

// A filter of its own each time: the kernels are compiled, its history is empty.
void measureFirstFrame(benchmark::State& state, const OpenCL& opencl, tov_context context) {
    try {
        const auto newRun = [&] {
            return std::make_unique<FilterRun>(&opencl, context, filterCase("temporal_accumulation"), kLayout);
        };
        newRun()->execute();
        std::vector<double> wall;
        std::vector<double> work;
        for (auto _ : state) {
            const std::unique_ptr<FilterRun> run = newRun();
            const Timing timing = timingOf([&] { run->execute(); });
            state.SetIterationTime(timing.wall);
            wall.push_back(timing.wall);
            work.push_back(spent(opencl, timing));
        }
        state.counters["median_ms"] = median(wall) * 1e3;
        state.counters["min_ms"] = minimum(wall) * 1e3;
        state.counters["processor_ms"] = minimum(work) * 1e3;
    } catch (const std::exception& failure) {
        state.SkipWithError(failure.what());
    }
}

}  // namespace

void registerDenoisers(const OpenCL& opencl, tov_context context) {
    benchmark::RegisterBenchmark("arithmetic/peak", [&opencl](benchmark::State& state) {
        double rate = 0.0;
        for (auto _ : state) rate = measurePeak(opencl);
        state.counters["GFLOP_per_processor_s"] = rate * 1e-9;
    })->Iterations(1);
    for (const Counted& counted : kCounted) {
        const std::string name = std::string("arithmetic/") + counted.name + "/1920x1080";
        benchmark::RegisterBenchmark(
            name.c_str(),
            [&opencl, context, &counted](benchmark::State& state) { measureFilter(state, opencl, context, counted); })
            ->UseManualTime()
            ->MinTime(0.4)
            ->Unit(benchmark::kMillisecond);
    }
    benchmark::RegisterBenchmark(
        "first_frame/temporal_accumulation/1920x1080",
        [&opencl, context](benchmark::State& state) { measureFirstFrame(state, opencl, context); })
        ->UseManualTime()
        ->Iterations(5)
        ->Unit(benchmark::kMillisecond);
}

}  // namespace bench
