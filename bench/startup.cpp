#include "startup.h"

#include <benchmark/benchmark.h>

#include <iterator>
#include <optional>
#include <stdexcept>

#include "child.h"
#include "filter_run.h"
#include "measure.h"

namespace bench {
namespace {

constexpr PictureLayout kSmallPicture = {64, 64, false};  // the pixels' own time must not matter
constexpr int kRepeats = 3;
constexpr int kLaterCreations = 50;
constexpr const char* kCompiledLine = "Cached file created";

// One filter of each embedded program.
constexpr const char* kStarters[] = {"gamma",       "weighted_sum", "resample_bicubic",      "gaussian_blur_5",
                                     "bilateral_3", "mlaa",         "temporal_accumulation", "eaw_denoise",
                                     "lwr_denoise"};

// By filter type.
constexpr const char* kTypeNames[] = {"math_test",
                                      "color_space",
                                      "normalization",
                                      "gamma",
                                      "resample",
                                      "gaussian_blur",
                                      "simple_tonemap",
                                      "reinhard_tonemap",
                                      "exponential_tonemap",
                                      "linear_tonemap",
                                      "drago_tonemap",
                                      "bilateral_denoise",
                                      "lwr_denoise",
                                      "eaw_denoise",
                                      "sobel",
                                      "weighted_sum",
                                      "multiply",
                                      "mlaa",
                                      "motion_buffer",
                                      "temporal_accumulation",
                                      "shadow_catcher"};

Handle createContext(const DeviceChoice& device, const std::string& cache) {
    tov_context context = nullptr;
    check(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, device.type, static_cast<int32_t>(device.index),
                           cache.c_str(), &context),
          "tovCreateContext");
    return Handle(context);
}

// Seconds for the context; then for images and filter, from their creation to the end of the first execution.
std::vector<double> measureStart(const FilterCase& what, const DeviceChoice& device, const std::string& cache) {
    Handle context;
    const double contextSeconds = secondsOf([&] { context = createContext(device, cache); });
    std::optional<FilterRun> run;
    const double startSeconds = secondsOf([&] {
        run.emplace(nullptr, context.get(), what, kSmallPicture);
        run->execute();
    });
    return {contextSeconds, startSeconds};
}

double creationSeconds(tov_context context, uint32_t type) {
    Handle filter;
    return secondsOf([&] {
        tov_image_filter created = nullptr;
        check(tovContextCreateImageFilter(context, type, &created), "tovContextCreateImageFilter");
        filter.reset(created);
    });
}

// The first creation of the type in the process and the median of later ones.
std::vector<double> measureCreation(uint32_t type, const DeviceChoice& device, const std::string& cache) {
    const Handle context = createContext(device, cache);
    const double first = creationSeconds(context.get(), type);
    std::vector<double> later;
    for (int i = 0; i < kLaterCreations; ++i) later.push_back(creationSeconds(context.get(), type));
    return {first, median(later)};
}

// Several children with the same caches; each counts what it compiled.
struct Starts {
    std::vector<double> context;
    std::vector<double> start;
    size_t compiled = 0;
};

void addStart(Starts& starts, const FilterCase& what, const DeviceChoice& device, const std::string& cache,
              const std::string& driverCache) {
    const ChildResult child =
        runChild({"--child=start", std::string(what.name), cache, "--device=" + device.text()}, driverCache);
    if (child.values.size() != 2) throw std::runtime_error("The child process printed something else");
    starts.context.push_back(child.values[0]);
    starts.start.push_back(child.values[1]);
    starts.compiled += linesWith(child.output, kCompiledLine);
}

void measureStarts(benchmark::State& state, const FilterCase& what, const DeviceChoice& device) {
    const TemporaryDirectory caches;
    const std::string library = caches.path() + "/library";
    const TemporaryDirectory coldDriver;
    Starts cold;
    Starts warm;
    Starts second;
    for (auto _ : state) {
        addStart(cold, what, device, library, coldDriver.path());
        for (int i = 0; i < kRepeats; ++i) {
            const TemporaryDirectory emptyDriver;
            addStart(warm, what, device, library, emptyDriver.path());
        }
        for (int i = 0; i < kRepeats; ++i) addStart(second, what, device, library, coldDriver.path());
        state.SetIterationTime(median(cold.start));
    }
    state.counters["context_ms"] = median(warm.context) * 1e3;
    state.counters["cold_ms"] = median(cold.start) * 1e3;
    state.counters["warm_ms"] = median(warm.start) * 1e3;
    state.counters["warm_over_cold"] = median(warm.start) / median(cold.start);
    state.counters["second_ms"] = median(second.start) * 1e3;
    state.counters["cold_compiled"] = static_cast<double>(cold.compiled);
    state.counters["warm_compiled"] = static_cast<double>(warm.compiled);
    state.counters["second_compiled"] = static_cast<double>(second.compiled);
}

void measureCreations(benchmark::State& state, uint32_t type, const DeviceChoice& device) {
    const TemporaryDirectory caches;
    std::vector<double> first;
    std::vector<double> later;
    for (auto _ : state) {
        for (int i = 0; i < kRepeats; ++i) {
            const ChildResult child = runChild(
                {"--child=create", std::to_string(type), caches.path(), "--device=" + device.text()}, caches.path());
            if (child.values.size() != 2) throw std::runtime_error("The child process printed something else");
            first.push_back(child.values[0]);
            later.push_back(child.values[1]);
        }
        state.SetIterationTime(median(first));
    }
    state.counters["first_us"] = median(first) * 1e6;
    state.counters["later_us"] = median(later) * 1e6;
}

template <class Measure>
void registerOnce(const std::string& name, Measure measure) {
    benchmark::RegisterBenchmark(name.c_str(),
                                 [measure](benchmark::State& state) {
                                     try {
                                         measure(state);
                                     } catch (const std::exception& failure) {
                                         state.SkipWithError(failure.what());
                                     }
                                 })
        ->UseManualTime()
        ->Iterations(1)
        ->Unit(benchmark::kMillisecond);
}

}  // namespace

void registerStartup(const DeviceChoice& device) {
    for (const char* name : kStarters) {
        const FilterCase& what = filterCase(name);
        registerOnce(std::string("startup/") + name,
                     [&what, device](benchmark::State& state) { measureStarts(state, what, device); });
    }
    for (uint32_t type = 0; type < std::size(kTypeNames); ++type) {
        registerOnce(std::string("creation/") + kTypeNames[type],
                     [type, device](benchmark::State& state) { measureCreations(state, type, device); });
    }
}

int runStartupChild(const std::vector<std::string>& arguments, const DeviceChoice& device) {
    if (arguments.size() != 3) throw std::runtime_error("A child takes three arguments");
    if (arguments[0] == "start") {
        printChildResult(measureStart(filterCase(arguments[1]), device, arguments[2]));
    } else {
        printChildResult(measureCreation(static_cast<uint32_t>(std::stoul(arguments[1])), device, arguments[2]));
    }
    return 0;
}

}  // namespace bench
