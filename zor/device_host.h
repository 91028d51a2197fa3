// A device of plain host memory: buffers, but no kernels.
#pragma once

#include "zor/device.h"

namespace zor {

class DeviceHost final : public Device {
 public:
    DeviceHost() noexcept : Device(DEVICE_KIND_HOST) {}
    ~DeviceHost() override = default;

    void initialize(const DeviceConfig& config) override;
    void release() override;
    void waitForEvent(EventHolder& holder) override;
    void finish() override;
    bool isComplete(EventHolder* holder) override;
    void flush() override;
};

}  // namespace zor
