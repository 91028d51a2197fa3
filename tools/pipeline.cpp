// Each stage is a queue of its own, so that a filter can be given values measured on its very input.
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
#include "text.h"

namespace tool {

namespace {

struct MeasuredParameter {
    const char* name;
    float Luminance::*value;
};

constexpr const char* kMeasuredFilter = "drago_tonemap";
constexpr std::array kMeasuredParameters = {MeasuredParameter{"avLum", &Luminance::average},
                                            MeasuredParameter{"maxLum", &Luminance::maximum}};

// Filters take the length of all four components of some of these.
constexpr std::array<std::string_view, 5> kVarianceParameters = {"colorVar", "vColorImg", "vTransImg", "vNormalsImg",
                                                                 "vDepthImg"};

bool needsMeasuring(const Stage& stage) {
    if (stage.filter != kMeasuredFilter) return false;
    return !stage.sets(kMeasuredParameters[0].name) || !stage.sets(kMeasuredParameters[1].name);
}

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

// Filters ask for scratch memory of their own when they run.
void checkRun(Streams& streams, tov_context context, int32_t code, const Stage& stage, const DeviceImages& images) {
    const std::string lines = streams.takeLibraryLines();
    if (code != TOV_ERROR_INTERNAL_ERROR || !tellOfMissingMemory(lines)) return check(code, "running " + stage.filter);
    const uint64_t available = availableBytes(streams, context, 1, images.bytes());
    throw Failure(ExitStatus::kFailed, "the picture is too big for the device: " + stage.filter +
                                           " needs more memory beside the " + std::to_string(images.bytes()) +
                                           " bytes of its input and output than the " + std::to_string(available) +
                                           " bytes still available (" + lines.substr(0, lines.find('\n')) + ")");
}

void runStage(Streams& streams, tov_context context, PreparedStage& prepared, DeviceImages& images) {
    images.setOtherSize(prepared.stage.size.value_or(images.size()));
    bindImages(prepared, images.current());
    tov_command_queue queue = nullptr;
    check(tovContextCreateCommandQueue(context, &queue), "making a command queue");
    const Handle owner(queue);
    check(tovCommandQueueAttachImageFilter(queue, prepared.filter.get(), images.current(), images.other()),
          "attaching " + prepared.stage.filter);
    checkRun(streams, context, tovContextExecuteCommandQueue(context, queue, nullptr, nullptr), prepared.stage, images);
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

void runStages(Streams& streams, tov_context context, std::vector<PreparedStage>& stages, Picture& picture) {
    using Clock = std::chrono::steady_clock;
    const bool progress = showsProgress(streams, picture);
    DeviceImages images(streams, context, picture);
    for (size_t i = 0; i < stages.size(); ++i) {
        if (needsMeasuring(stages[i].stage)) measure(stages[i], images);
        const Clock::time_point start = Clock::now();
        runStage(streams, context, stages[i], images);
        const std::chrono::duration<double, std::milli> elapsed = Clock::now() - start;
        if (progress) {
            note("stage " + std::to_string(i + 1) + " of " + std::to_string(stages.size()) + ": " +
                 stages[i].stage.filter + ", " + formatTenths(elapsed.count()) + " ms");
        }
    }
    images.download(picture);
}

}  // namespace tool
