#include "core/context.h"

#include "core/exception.h"

DevicePointer ownDevice(zor::Device* device) {
    if (device == nullptr) return {};
    return {device, [](zor::Device* last) {
                try {
                    zor::destroyDevice(last);
                } catch (...) {
                    // Whoever deletes the last handle can do nothing about a driver that refuses; its line has been
                    // printed.
                }
            }};
}

TovContext::TovContext(DevicePointer device, const char* cachePath)
    : TovObject(kType),
      device_(std::move(device)),
      cachePath_(cachePath == nullptr ? "kernelsCache" : cachePath),
      scratch_{device_, nullptr, 0} {}

void TovContext::reserveScratch(uint64_t size) {
    if (scratch_.buffer && size <= scratch_.capacity) return;
    scratch_.buffer.reset();
    scratch_.capacity = 0;
    auto buffer = std::make_unique<zor::Buffer<char>>(*device_, size, zor::BUFFER_DEFAULT);
    if (size > 0 && !buffer->hasMemory()) throw TovException{TOV_ERROR_INTERNAL_ERROR};
    scratch_.buffer = std::move(buffer);
    scratch_.capacity = size;
}
