// Pictures in the device's memory, and what to say when they do not fit.
#ifndef TOV_TOOLS_DEVICE_IMAGES_H
#define TOV_TOOLS_DEVICE_IMAGES_H

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <utility>

#include "handle.h"
#include "picture.h"
#include "stage.h"
#include "streams.h"

namespace tool {

// Two images: the current one, read by the next filter, and the other, which it writes.
class DeviceImages {
 public:
    // Uploads the picture. Throws kFailed; a picture too big for the device with the needed and the available bytes.
    DeviceImages(Streams& streams, tov_context context, const Picture& picture);

    tov_image current() const noexcept { return current_.image.get(); }
    tov_image other() const noexcept { return other_.image.get(); }
    PixelSize size() const noexcept { return current_.size; }
    // Makes the other image anew where it has another size. Throws likewise.
    void setOtherSize(const PixelSize& size);
    void swap() noexcept { std::swap(current_, other_); }

    // Lets `look` see the current image's RGBA floats.
    void inspect(const std::function<void(std::span<const float>)>& look) const;
    // The current image replaces the picture's pixels.
    void download(Picture& picture) const;

    // Bytes of both.
    uint64_t bytes() const noexcept;

 private:
    struct SizedImage {
        PixelSize size;
        Handle image;
    };

    [[noreturn]] void tellTooBig(const PixelSize& input, const PixelSize& output);

    Streams* streams_;
    tov_context context_;
    SizedImage current_;
    SizedImage other_;
};

// A picture that filters read beside their input. Throws kFailed as above; `name` is for the message.
Handle uploadPicture(Streams& streams, tov_context context, const Picture& picture, const std::string& name);

// Whether the library's lines say that the device's memory was not enough.
bool tellOfMissingMemory(const std::string& libraryLines);

// The largest size at which the device now accepts `count` images together, in bytes of one of them, up to `limit`.
uint64_t availableBytes(Streams& streams, tov_context context, size_t count, uint64_t limit);

}  // namespace tool

#endif
