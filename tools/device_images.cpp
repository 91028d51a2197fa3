// Creation, transfer, and measuring of the free memory.
#include "device_images.h"

#include <algorithm>
#include <cstring>

#include "failure.h"

namespace tool {

namespace {

constexpr uint64_t kPixelBytes = kComponents * sizeof(float);

tov_image_desc descriptor(uint32_t width, uint32_t height) {
    return {width, height, 1, 0, 0, static_cast<uint32_t>(kComponents), TOV_COMPONENT_TYPE_FLOAT32};
}

struct Creation {
    int32_t code;
    Handle image;
    bool refused;  // for want of memory
};

// Without data the library creates an image even where storage was refused, so its lines have to be read.
Creation create(Streams& streams, tov_context context, const tov_image_desc& desc, const void* data) {
    streams.takeLibraryLines();
    tov_image image = nullptr;
    const int32_t code = tovContextCreateImage(context, &desc, data, &image);
    return {code, Handle(code == TOV_SUCCESS ? image : nullptr), tellOfMissingMemory(streams.takeLibraryLines())};
}

// Whether `count` images of so many pixels fit at once.
bool fits(Streams& streams, tov_context context, size_t count, uint64_t pixels) {
    std::vector<Handle> images;
    for (size_t i = 0; i < count; ++i) {
        Creation made = create(streams, context, descriptor(static_cast<uint32_t>(pixels), 1), nullptr);
        if (made.code != TOV_SUCCESS || made.refused) return false;
        images.push_back(std::move(made.image));
    }
    return true;
}

Failure tooBig(Streams& streams, tov_context context, const Picture& picture, uint64_t bytesEach) {
    const uint64_t available = availableBytes(streams, context, 2, bytesEach);
    return {ExitStatus::kFailed, "the picture is too big for the device: " + std::to_string(picture.width) + " x " +
                                     std::to_string(picture.height) + " pixels need " + std::to_string(2 * bytesEach) +
                                     " bytes (two images of " + std::to_string(bytesEach) + "); " +
                                     std::to_string(2 * available) + " bytes are available (two images of " +
                                     std::to_string(available) + ")"};
}

}  // namespace

DeviceImages::DeviceImages(Streams& streams, tov_context context, const Picture& picture)
    : bytesEach_(picture.pixelCount() * kPixelBytes) {
    const tov_image_desc desc = descriptor(picture.width, picture.height);
    Creation input = create(streams, context, desc, picture.pixels.data());
    if (!input.refused) check(input.code, "moving the picture to the device");
    Creation output = input.refused ? Creation{} : create(streams, context, desc, nullptr);
    if (input.refused || output.refused) {
        input.image.reset();
        output.image.reset();
        throw tooBig(streams, context, picture, bytesEach_);
    }
    check(output.code, "making an image on the device");
    current_ = std::move(input.image);
    other_ = std::move(output.image);
}

void DeviceImages::inspect(const std::function<void(const float*)>& look) const {
    void* mapped = nullptr;
    check(tovImageMap(current(), 0, &mapped), "reading the picture back");
    look(static_cast<const float*>(mapped));
    check(tovImageUnmap(current(), mapped), "releasing the picture");
}

void DeviceImages::download(std::vector<float>& pixels) const {
    inspect([&](const float* mapped) { std::memcpy(pixels.data(), mapped, pixels.size() * sizeof(float)); });
}

bool tellOfMissingMemory(const std::string& libraryLines) {
    return libraryLines.find("CL Memory Allocation Failure") != std::string::npos;
}

uint64_t availableBytes(Streams& streams, tov_context context, size_t count, uint64_t limit) {
    uint64_t accepted = 0;
    uint64_t refused = limit / kPixelBytes + 1;
    constexpr uint64_t kPrecisionPixels = 4096;
    while (refused - accepted > kPrecisionPixels) {
        const uint64_t middle = accepted + (refused - accepted) / 2;
        (fits(streams, context, count, middle) ? accepted : refused) = middle;
    }
    return accepted * kPixelBytes;
}

}  // namespace tool
