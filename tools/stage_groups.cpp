// The rules of grouping.
#include "stage_groups.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "parameter_values.h"
#include "text.h"

namespace tool {

namespace {

// Filters of one pass without scratch memory that do not gather from a wide neighbourhood.
constexpr std::array<std::string_view, 14> kFusable = {
    "color_space",         "normalization",  "gamma_correction", "resample", "simple_tonemap", "reinhard_tonemap",
    "exponential_tonemap", "linear_tonemap", "drago_tonemap",    "sobel",    "weighted_sum",   "multiply",
    "motion_buffer",       "shadow_catcher"};

constexpr std::string_view kMeasuringFilter = "drago_tonemap";

// A launch takes 64 arguments; input and output are two of them.
constexpr size_t kMaxArguments = 62;

bool isFusable(const Stage& stage) {
    return std::ranges::find(kFusable, stage.filter) != kFusable.end();
}

bool readsItsInputTwice(const Stage& stage) {
    return std::ranges::any_of(stage.assignments, [](const Assignment& assignment) {
        const auto parts = split(assignment.value, '+');
        return std::ranges::find(parts, kStageInput) != parts.end();
    });
}

// At least as many as the stage's kernel has beside its input.
size_t countArguments(const Stage& stage) {
    constexpr size_t kMostSingleParameters = 4;
    size_t count = kMostSingleParameters;
    for (const Assignment& assignment : stage.assignments) count += split(assignment.value, '+').size();
    return count;
}

}  // namespace

bool measuresInput(const Stage& stage) noexcept {
    return stage.filter == kMeasuringFilter && !(stage.sets("avLum") && stage.sets("maxLum"));
}

std::vector<size_t> groupStages(const std::vector<Stage>& stages, bool fuse) {
    std::vector<size_t> sizes;
    size_t arguments = 0;
    for (size_t i = 0; i < stages.size(); ++i) {
        const Stage& stage = stages[i];
        const bool joins = fuse && i > 0 && isFusable(stages[i - 1]) && isFusable(stage) && !measuresInput(stage) &&
                           !readsItsInputTwice(stage) && arguments + countArguments(stage) <= kMaxArguments;
        if (joins) {
            ++sizes.back();
        } else {
            sizes.push_back(1);
            arguments = 0;
        }
        arguments += countArguments(stage);
    }
    return sizes;
}

}  // namespace tool
