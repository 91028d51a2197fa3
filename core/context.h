// The root object: a device, the scratch buffer that its filters share and the directory of compiled kernels.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "api/tov/types.h"
#include "core/object.h"
#include "zor/buffer.h"
#include "zor/device.h"

// Shared by a context and everything made from it: the device is destroyed when the last of them is gone.
using DevicePointer = std::shared_ptr<zor::Device>;

// Takes ownership; an empty pointer for null.
DevicePointer ownDevice(zor::Device* device);

// The buffer that filters share. It only grows, is replaced whole and never cleared.
struct ScratchHolder {
    DevicePointer device;
    std::unique_ptr<zor::Buffer<char>> buffer;
    uint64_t capacity = 0;  // bytes
};

class TovContext final : public TovObject {
 public:
    static constexpr uint32_t kType = TOV_OBJECT_CONTEXT;
    static constexpr int32_t kInvalidHandle = TOV_ERROR_INVALID_CONTEXT;

    // cachePath is copied; null means "kernelsCache".
    TovContext(DevicePointer device, const char* cachePath);

    const DevicePointer& device() const noexcept { return device_; }
    const std::string& cachePath() const noexcept { return cachePath_; }

    // Ensures that the scratch buffer holds at least size bytes. Throws the internal error, and tries again the next
    // time, when the device refuses.
    void reserveScratch(uint64_t size);
    const zor::Buffer<char>* scratchBuffer() const noexcept { return scratch_.buffer.get(); }
    const ScratchHolder& scratch() const noexcept { return scratch_; }

 private:
    DevicePointer device_;
    std::string cachePath_;
    ScratchHolder scratch_;
};
