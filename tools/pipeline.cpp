// Each group of stages is a queue of its own, so that a filter can be given values measured on its very input.
#include "pipeline.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <span>
#include <string_view>

#include "device_images.h"
#include "failure.h"
#include "filter_info.h"
#include "luminance.h"
#include "stage_groups.h"
#include "text.h"

namespace tool {

namespace {

struct MeasuredParameter {
    const char* name;
    float Luminance::*value;
};

constexpr std::array kMeasuredParameters = {MeasuredParameter{"avLum", &Luminance::average},
                                            MeasuredParameter{"maxLum", &Luminance::maximum}};

// Filters take the length of all four components of some of these.
constexpr std::array<std::string_view, 5> kVarianceParameters = {"colorVar", "vColorImg", "vTransImg", "vNormalsImg",
                                                                 "vDepthImg"};

// Black stays black whatever the luminance is taken to be, so a black picture, say of a fade, is no failure.
void setMeasured(const PreparedStage& prepared, Luminance luminance) {
    const bool usable = luminance.usable();
    if (!usable) luminance = {1.0f, 1.0f};
    std::string text;
    for (const MeasuredParameter& parameter : kMeasuredParameters) {
        if (prepared.stage.sets(parameter.name)) continue;
        const float value = luminance.*parameter.value;
        check(tovImageFilterSetParameter1f(prepared.filter.get(), parameter.name, value), "setting measured luminance");
        text += (text.empty() ? "" : ", ") + std::string(parameter.name) + "=" + formatFloat(value);
    }
    note(prepared.stage.filter +
         (usable ? ": measured on its input: " : ": its input is black, nothing to measure; taken: ") + text);
}

void measure(const PreparedStage& prepared, const DeviceImages& images) {
    Luminance luminance{};
    images.inspect([&](std::span<const float> pixels) { luminance = measureLuminance(pixels); });
    setMeasured(prepared, luminance);
}

bool isVariance(std::string_view parameter) {
    return std::ranges::find(kVarianceParameters, parameter) != kVarianceParameters.end();
}

// Binds the pictures beside the input; `input` is an image or the filter before.
void bindImages(PreparedStage& prepared, tov_image input) {
    for (size_t i = 0; i < prepared.data.images.size(); ++i) {
        const ImageAssignment& assignment = prepared.data.images[i];
        std::vector<tov_image>& images = prepared.images[i];
        for (size_t k = 0; k < images.size(); ++k) {
            if (assignment.sources[k] == kStageInput) images[k] = input;
        }
        const char* const name = assignment.parameter.c_str();
        const int32_t code = assignment.array
                                 ? tovImageFilterSetParameterImageArray(prepared.filter.get(), name, images.data(),
                                                                        static_cast<uint32_t>(images.size()))
                                 : tovImageFilterSetParameterImage(prepared.filter.get(), name, images.front());
        check(code, "binding " + assignment.parameter + " of " + prepared.stage.filter);
    }
}

// Stages that run at once, and how the user calls them.
using Group = std::span<PreparedStage>;

std::string namesOf(const Group& group) {
    std::string names;
    for (const PreparedStage& prepared : group) names += (names.empty() ? "" : ", ") + prepared.stage.filter;
    return names;
}

// Filters ask for scratch memory of their own when they run.
void checkRun(Streams& streams, tov_context context, int32_t code, const std::string& names,
              const DeviceImages& images) {
    const std::string lines = streams.takeLibraryLines();
    if (code != TOV_ERROR_INTERNAL_ERROR || !tellOfMissingMemory(lines)) return check(code, "running " + names);
    const uint64_t available = availableBytes(streams, context, 1, images.bytes());
    throw Failure(ExitStatus::kFailed, "the picture is too big for the device: " + names +
                                           " needs more memory beside the " + std::to_string(images.bytes()) +
                                           " bytes of its input and output than the " + std::to_string(available) +
                                           " bytes still available (" + lines.substr(0, lines.find('\n')) + ")");
}

// Makes every filter of the group the input of the next. Returns the input of the last, which is still to be attached,
// and sets `size` to the size of its output.
tov_image bindGroup(const Group& group, tov_image input, PixelSize& size) {
    for (PreparedStage& prepared : group) {
        size = prepared.stage.size.value_or(size);
        bindImages(prepared, input);
        if (&prepared == &group.back()) break;
        tov_image_filter const filter = prepared.filter.get();
        check(tovImageFilterSetParameterImage(filter, "srcBuffer", input), "feeding " + prepared.stage.filter);
        if (prepared.stage.filter == kResampleFilter) {
            check(tovImageFilterSetParameter2u(filter, "dstRec", size.width, size.height), "setting a size");
        }
        input = filter;
    }
    return input;
}

void runGroup(Streams& streams, tov_context context, const Group& group, DeviceImages& images) {
    const std::string names = namesOf(group);
    PixelSize size = images.size();
    const tov_image input = bindGroup(group, images.current(), size);
    images.setOtherSize(size);
    tov_command_queue queue = nullptr;
    check(tovContextCreateCommandQueue(context, &queue), "making a command queue");
    const Handle owner(queue);
    check(tovCommandQueueAttachImageFilter(queue, group.back().filter.get(), input, images.other()),
          "attaching " + group.back().stage.filter);
    checkRun(streams, context, tovContextExecuteCommandQueue(context, queue, nullptr, nullptr), names, images);
    images.swap();
}

// A person waiting at a terminal wants to see that something happens.
bool showsProgress(const Streams& streams, const Picture& picture) {
    constexpr size_t kManyPixels = size_t{8} << 20U;
    return streams.verbose() || (picture.pixelCount() >= kManyPixels && ::isatty(STDERR_FILENO) == 1);
}

}  // namespace

std::vector<PreparedStage> prepareStages(tov_context context, const std::vector<Stage>& stages) {
    std::vector<PreparedStage> prepared;
    for (const Stage& stage : stages) {
        PreparedStage next{stage, {}, {}, createFilter(context, stage.filter)};
        next.data = setParameters(next.filter.get(), stage);
        prepared.push_back(std::move(next));
    }
    return prepared;
}

void readImages(std::vector<PreparedStage>& stages, AuxiliaryImages& auxiliary, PixelSize size,
                const std::string& name) {
    std::string pictureName = name;
    for (PreparedStage& prepared : stages) {
        for (const ImageAssignment& assignment : prepared.data.images) {
            const MissingAlpha alpha = isVariance(assignment.parameter) ? MissingAlpha::kZero : MissingAlpha::kOne;
            std::vector<tov_image>& images = prepared.images.emplace_back();
            for (const std::string& source : assignment.sources) {
                images.push_back(source == kStageInput ? nullptr : auxiliary.get(source, alpha, size, pictureName));
            }
        }
        if (!prepared.stage.size) continue;
        size = *prepared.stage.size;
        pictureName = name + ", resampled,";
    }
}

void runStages(Streams& streams, tov_context context, std::vector<PreparedStage>& stages, bool fuse, Picture& picture) {
    using Clock = std::chrono::steady_clock;
    const bool progress = showsProgress(streams, picture);
    DeviceImages images(streams, context, picture);
    std::vector<Stage> plain;
    for (const PreparedStage& prepared : stages) plain.push_back(prepared.stage);
    size_t first = 0;
    for (const size_t count : groupStages(plain, fuse)) {
        const Group group = std::span(stages).subspan(first, count);
        if (measuresInput(group.front().stage)) measure(group.front(), images);
        const Clock::time_point start = Clock::now();
        runGroup(streams, context, group, images);
        const std::chrono::duration<double, std::milli> elapsed = Clock::now() - start;
        const std::string number = std::to_string(first + 1);
        first += count;
        if (!progress) continue;
        const std::string numbers =
            count == 1 ? "stage " + number : "stages " + number + " to " + std::to_string(first);
        note(numbers + " of " + std::to_string(stages.size()) + (count == 1 ? ": " : ", fused: ") + namesOf(group) +
             ", " + formatTenths(elapsed.count()) + " ms");
    }
    images.download(picture);
}

}  // namespace tool
