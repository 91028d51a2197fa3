#include "fused_chain.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <array>
#include <memory>
#include <string>
#include <vector>

#include "filter_run.h"
#include "measure.h"

namespace bench {
namespace {

constexpr double kMinSeconds = 0.4;
constexpr PictureLayout kLayouts[] = {{3840, 2160, false}, {3840, 2160, true}, {8, 8, false}};

using Chain = std::array<const char*, 3>;  // filter cases, the first one reads the picture
constexpr Chain kChains[] = {
    {"linear_tonemap", "color_space", "normalization"},
    {"linear_tonemap", "color_space", "gamma"},
    {"reinhard_tonemap", "color_space", "gamma"},
};

// The filters of a chain feeding each other, over the images of another run.
class FusedRun {
 public:
    FusedRun(tov_context context, const Chain& chain, const FilterRun& images) : context_(context) {
        tov_image source = images.inputImage();
        for (const char* name : chain) {
            tov_image_filter filter = nullptr;
            check(tovContextCreateImageFilter(context, filterCase(name).type, &filter), name);
            filters_.emplace_back(filter);
            applySettings(filterCase(name), filter);
            check(tovImageFilterSetParameterImage(filter, "srcBuffer", source), "srcBuffer");
            source = filter;
        }
        tov_command_queue queue = nullptr;
        check(tovContextCreateCommandQueue(context, &queue), "tovContextCreateCommandQueue");
        queue_.reset(queue);
        check(tovCommandQueueAttachImageFilter(queue, filters_.back().get(), filters_[chain.size() - 2].get(),
                                               images.outputImage()),
              "tovCommandQueueAttachImageFilter");
    }

    void execute() {
        check(tovContextExecuteCommandQueue(context_, queue_.get(), nullptr, nullptr), "tovContextExecuteCommandQueue");
    }

 private:
    tov_context context_;
    std::vector<Handle> filters_;
    Handle queue_;
};

// Seconds of a run, on the wall clock and of the processor.
struct Samples {
    std::vector<double> wall;
    std::vector<double> processor;

    template <class Run>
    double add(Run& run) {
        const Timing timing = timingOf([&] { run.execute(); });
        wall.push_back(timing.wall);
        processor.push_back(timing.processor);
        return timing.wall;
    }
};

void report(benchmark::State& state, const Samples& fused, const std::vector<Samples>& single) {
    std::vector<double> walls;
    double sum = 0.0;
    double processor = 0.0;
    for (const Samples& samples : single) {
        walls.push_back(median(samples.wall));
        sum += walls.back();
        processor += median(samples.processor);
    }
    const double dearest = *std::max_element(walls.begin(), walls.end());
    const double together = median(fused.wall);
    state.counters["fused_ms"] = together * 1e3;
    state.counters["dearest_ms"] = dearest * 1e3;
    state.counters["sum_ms"] = sum * 1e3;
    state.counters["fused_over_dearest"] = together / dearest;
    state.counters["fused_over_sum"] = together / sum;
    state.counters["fused_processor_ms"] = median(fused.processor) * 1e3;
    state.counters["sum_processor_ms"] = processor * 1e3;
}

void measure(benchmark::State& state, tov_context context, const Chain& chain, const PictureLayout& layout) {
    try {
        std::vector<std::unique_ptr<FilterRun>> single;
        for (const char* name : chain) {
            single.push_back(std::make_unique<FilterRun>(nullptr, context, filterCase(name), layout));
            single.back()->execute();
        }
        FusedRun fused(context, chain, *single.front());
        fused.execute();
        Samples together;
        std::vector<Samples> apart(chain.size());
        for (auto _ : state) {
            for (size_t i = 0; i < chain.size(); ++i) apart[i].add(*single[i]);
            state.SetIterationTime(together.add(fused));
        }
        report(state, together, apart);
    } catch (const std::exception& failure) {
        state.SkipWithError(failure.what());
    }
}

std::string nameOf(const Chain& chain, const PictureLayout& layout) {
    return std::string("fusion/") + chain[0] + "+" + chain[1] + "+" + chain[2] + "/" + std::to_string(layout.width) +
           "x" + std::to_string(layout.height) + (layout.bytes ? "/uint8x4" : "/float4");
}

}  // namespace

void registerFusedChains(tov_context context) {
    for (const Chain& chain : kChains) {
        for (const PictureLayout& layout : kLayouts) {
            benchmark::RegisterBenchmark(
                nameOf(chain, layout).c_str(),
                [context, &chain, &layout](benchmark::State& state) { measure(state, context, chain, layout); })
                ->UseManualTime()
                ->MinTime(kMinSeconds)
                ->Unit(benchmark::kMillisecond);
        }
    }
}

}  // namespace bench
