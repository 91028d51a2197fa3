#include "filter_run.h"

#include <algorithm>
#include <cmath>

namespace bench {
namespace {

// Reproducible noise in 0 ... 1.
class Noise {
 public:
    float next() noexcept {
        state_ = state_ * 1664525u + 1013904223u;
        return static_cast<float>(state_ >> 8) * (1.0f / 16777216.0f);
    }

 private:
    uint32_t state_ = 1;
};

struct Pixel {
    float x, y, z, w;
};

// A noisy picture of tilted squares, 64 pixels wide, each an object with a normal and a depth of its own.
Pixel pixelOf(Content content, float u, float v, float object, Noise& noise) {
    const auto noisy = [&](float value) { return value * (0.5f + noise.next()); };
    switch (content) {
        case Content::Normals:
            return {std::sin(object), std::cos(object), 0.2f, 0.0f};
        case Content::Depth:
            return {1.0f + object + u, 1.0f + object + u, 1.0f + object + u, 0.0f};
        case Content::Positions:
            return {2.0f * u - 1.0f, 2.0f * v - 1.0f, 0.5f, 1.0f};
        case Content::MeshIds:
            return {object, object, object, 1.0f};
        case Content::Variance:
            return {0.05f * noise.next(), 0.05f * noise.next(), 0.05f * noise.next(), 1.0f};
        default:
            return {noisy(u), noisy(v), noisy(0.5f + 0.1f * object), 0.9f};
    }
}

std::vector<float> floatPicture(Content content, uint32_t width, uint32_t height) {
    std::vector<float> values;
    values.reserve(size_t{4} * width * height);
    Noise noise;
    for (uint32_t y = 0; y < height; ++y) {
        for (uint32_t x = 0; x < width; ++x) {
            const auto object = static_cast<float>((x / 64 + 3 * (y / 64)) % 7);
            const float u = static_cast<float>(x) / static_cast<float>(width);
            const float v = static_cast<float>(y) / static_cast<float>(height);
            const Pixel pixel = pixelOf(content, u, v, object, noise);
            values.insert(values.end(), {pixel.x, pixel.y, pixel.z, pixel.w});
        }
    }
    return values;
}

std::vector<uint8_t> bytePicture(const std::vector<float>& values) {
    std::vector<uint8_t> bytes(values.size());
    std::transform(values.begin(), values.end(), bytes.begin(),
                   [](float value) { return static_cast<uint8_t>(std::clamp(value, 0.0f, 1.0f) * 255.0f); });
    return bytes;
}

bool isColor(Content content) noexcept {
    return content == Content::Color || content == Content::HalfSizeColor;
}

}  // namespace

void applySettings(const FilterCase& what, tov_image_filter filter) {
    for (const Setting& setting : what.settings) {
        const auto* whole = std::get_if<uint32_t>(&setting.value);
        check(whole != nullptr ? tovImageFilterSetParameter1u(filter, setting.name, *whole)
                               : tovImageFilterSetParameter1f(filter, setting.name, std::get<float>(setting.value)),
              setting.name);
    }
}

FilterRun::FilterRun(const OpenCL* opencl, tov_context context, const FilterCase& what, const PictureLayout& layout)
    : opencl_(opencl), context_(context), what_(what), layout_(layout) {
    tov_image input = addImage(what.input);
    if (!what.readsInput) bytesMoved_ = 0;
    tov_image output = addImage(Content::Color);
    tov_image_filter filter = nullptr;
    check(tovContextCreateImageFilter(context, what.type, &filter), "tovContextCreateImageFilter");
    filter_.reset(filter);
    applySettings(what, filter);
    bindFeatures();
    bindArrays();
    tov_command_queue queue = nullptr;
    check(tovContextCreateCommandQueue(context, &queue), "tovContextCreateCommandQueue");
    queue_.reset(queue);
    check(tovCommandQueueAttachImageFilter(queue, filter, input, output), "tovCommandQueueAttachImageFilter");
}

void FilterRun::execute() {
    check(tovContextExecuteCommandQueue(context_, queue_.get(), nullptr, nullptr), "tovContextExecuteCommandQueue");
}

tov_image FilterRun::addImage(Content content) {
    const uint32_t divisor = content == Content::HalfSizeColor ? 2 : 1;
    const uint32_t width = layout_.width / divisor;
    const uint32_t height = layout_.height / divisor;
    const bool bytes = layout_.bytes && isColor(content);
    const std::vector<float> values = floatPicture(content, width, height);
    const uint32_t size = width * height * (bytes ? 4u : 16u);
    const tov_image_desc desc = {
        width, height, 1, 0, 0, 4, bytes ? uint32_t{TOV_COMPONENT_TYPE_UINT8} : uint32_t{TOV_COMPONENT_TYPE_FLOAT32}};
    images_.push_back(bytes ? makeImage(desc, size, bytePicture(values).data()) : makeImage(desc, size, values.data()));
    bytesMoved_ += size;
    return images_.back().handle.get();
}

FilterRun::Image FilterRun::makeImage(const tov_image_desc& desc, size_t bytes, const void* pixels) const {
    Image image;
    tov_image handle = nullptr;
    if (opencl_ == nullptr) {
        check(tovContextCreateImage(context_, &desc, pixels, &handle), "tovContextCreateImage");
    } else {
        image.memory = opencl_->buffer(bytes, pixels);
        check(tovContextCreateImageFromOpenClMemory(context_, &desc, image.memory.get(), 0, &handle),
              "tovContextCreateImageFromOpenClMemory");
    }
    image.handle.reset(handle);
    return image;
}

void FilterRun::bindFeatures() {
    for (const Feature& feature : what_.features)
        check(tovImageFilterSetParameterImage(filter_.get(), feature.parameter, addImage(feature.content)),
              feature.parameter);
}

void FilterRun::bindArrays() {
    if (what_.arrayInputs == 0) return;
    for (uint32_t i = 0; i < what_.arrayInputs; ++i) arrayImages_.push_back(addImage(Content::Color));
    check(tovImageFilterSetParameterImageArray(filter_.get(), "inputs", arrayImages_.data(), what_.arrayInputs),
          "inputs");
    if (what_.arrayFloats == nullptr) return;
    arrayFloats_.assign(what_.arrayInputs, 0.5f);
    check(
        tovImageFilterSetParameterFloatArray(filter_.get(), what_.arrayFloats, arrayFloats_.data(), what_.arrayInputs),
        what_.arrayFloats);
}

}  // namespace bench
