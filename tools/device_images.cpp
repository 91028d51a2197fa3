// Creation, transfer, and measuring of the free memory.
#include "device_images.h"

#include "failure.h"

namespace tool {

namespace {

constexpr uint64_t kPixelBytes = kComponents * sizeof(float);

tov_image_desc descriptor(const PixelSize& size) {
    return {size.width, size.height, 1, 0, 0, static_cast<uint32_t>(kComponents), TOV_COMPONENT_TYPE_FLOAT32};
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
        Creation made = create(streams, context, descriptor({static_cast<uint32_t>(pixels), 1}), nullptr);
        if (made.code != TOV_SUCCESS || made.refused) return false;
        images.push_back(std::move(made.image));
    }
    return true;
}

uint64_t bytesOf(const PixelSize& size) {
    return uint64_t{size.width} * size.height * kPixelBytes;
}

}  // namespace

DeviceImages::DeviceImages(Streams& streams, tov_context context, const Picture& picture)
    : streams_(&streams), context_(context) {
    const PixelSize size{picture.width, picture.height};
    Creation input = create(streams, context, descriptor(size), picture.pixels.data());
    if (!input.refused) check(input.code, "moving the picture to the device");
    if (input.refused) tellTooBig(size, size);
    current_ = {size, std::move(input.image)};
    setOtherSize(size);
}

void DeviceImages::setOtherSize(const PixelSize& size) {
    if (other_.image && other_.size == size) return;
    other_.image.reset();
    Creation made = create(*streams_, context_, descriptor(size), nullptr);
    if (made.refused) tellTooBig(current_.size, size);
    check(made.code, "making an image on the device");
    other_ = {size, std::move(made.image)};
}

void DeviceImages::tellTooBig(const PixelSize& input, const PixelSize& output) {
    current_.image.reset();
    const uint64_t needed = bytesOf(input) + bytesOf(output);
    if (input != output) {
        const uint64_t available = availableBytes(*streams_, context_, 1, needed);
        throw Failure(ExitStatus::kFailed, "the picture is too big for the device: images of " + describe(input) +
                                               " and " + describe(output) + " pixels need " + std::to_string(needed) +
                                               " bytes; " + std::to_string(available) + " bytes are available to one");
    }
    const uint64_t available = availableBytes(*streams_, context_, 2, bytesOf(input));
    throw Failure(ExitStatus::kFailed, "the picture is too big for the device: " + describe(input) + " pixels need " +
                                           std::to_string(needed) + " bytes (two images of " +
                                           std::to_string(bytesOf(input)) + "); " + std::to_string(2 * available) +
                                           " bytes are available (two images of " + std::to_string(available) + ")");
}

void DeviceImages::inspect(const std::function<void(std::span<const float>)>& look) const {
    void* mapped = nullptr;
    check(tovImageMap(current(), 0, &mapped), "reading the picture back");
    look({static_cast<const float*>(mapped), bytesOf(current_.size) / sizeof(float)});
    check(tovImageUnmap(current(), mapped), "releasing the picture");
}

void DeviceImages::download(Picture& picture) const {
    inspect([&](std::span<const float> mapped) { picture.pixels.assign(mapped.begin(), mapped.end()); });
    if (size() == PixelSize{picture.width, picture.height}) return;
    picture.width = size().width;
    picture.height = size().height;
    picture.window = {};
}

uint64_t DeviceImages::bytes() const noexcept {
    return bytesOf(current_.size) + bytesOf(other_.size);
}

Handle uploadPicture(Streams& streams, tov_context context, const Picture& picture, const std::string& name) {
    const PixelSize size{picture.width, picture.height};
    Creation made = create(streams, context, descriptor(size), picture.pixels.data());
    if (made.refused) {
        made.image.reset();
        const uint64_t available = availableBytes(streams, context, 1, bytesOf(size));
        throw Failure(ExitStatus::kFailed, name + " is too big for the device: its " + describe(size) +
                                               " pixels need " + std::to_string(bytesOf(size)) + " bytes; " +
                                               std::to_string(available) + " bytes are available");
    }
    check(made.code, "moving " + name + " to the device");
    return std::move(made.image);
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
