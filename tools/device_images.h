// Pictures in the device's memory, and what to say when they do not fit.
#ifndef TOV_TOOLS_DEVICE_IMAGES_H
#define TOV_TOOLS_DEVICE_IMAGES_H

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

#include "handle.h"
#include "picture.h"
#include "streams.h"

namespace tool {

// Two images of one size: the current one, read by the next filter, and the other, which it writes.
class DeviceImages {
 public:
    // Uploads the picture. Throws kFailed; a picture too big for the device with the needed and the available bytes.
    DeviceImages(Streams& streams, tov_context context, const Picture& picture);

    tov_image current() const noexcept { return current_.get(); }
    tov_image other() const noexcept { return other_.get(); }
    void swap() noexcept { current_.swap(other_); }

    // Lets `look` see the current image's RGBA floats.
    void inspect(const std::function<void(const float*)>& look) const;
    void download(std::vector<float>& pixels) const;

    // Bytes of both.
    uint64_t bytes() const noexcept { return 2 * bytesEach_; }

 private:
    uint64_t bytesEach_;
    Handle current_;
    Handle other_;
};

// Whether the library's lines say that the device's memory was not enough.
bool tellOfMissingMemory(const std::string& libraryLines);

// The largest size at which the device now accepts `count` images together, in bytes of one of them, up to `limit`.
uint64_t availableBytes(Streams& streams, tov_context context, size_t count, uint64_t limit);

}  // namespace tool

#endif
