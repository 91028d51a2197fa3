// What all devices share, and the factory.
#include "zor/device.h"

#include <algorithm>
#include <memory>

#include "zor/device_cl.h"
#include "zor/device_host.h"

namespace zor {
namespace {

std::unique_ptr<Device> makeDevice(uint32_t kind) {
    if (kind == DEVICE_KIND_CL) return std::make_unique<DeviceCL>();
    if (kind == DEVICE_KIND_HOST) return std::make_unique<DeviceHost>();
    return nullptr;
}

}  // namespace

Kernel* Device::getKernel(const KernelRequest& /*request*/) {
    breakInvariant("getKernel", "this kind of device has no kernels");
}

void Device::countAllocation(uint64_t bytes) noexcept {
    usedMemory_ += bytes;
    peakUsedMemory_ = std::max(peakUsedMemory_, usedMemory_);
}

void Device::countRelease(uint64_t bytes) {
    require(bytes <= usedMemory_, "countRelease", "more memory released than allocated");
    usedMemory_ -= bytes;
}

bool isDeviceKindAvailable(uint32_t kind) {
    if (kind != DEVICE_KIND_CL || loadOpenCL() != 0) return false;
    addOpenCLReference();
    return true;
}

Device* createDevice(uint32_t kind, const DeviceConfig& config) {
    std::unique_ptr<Device> device = makeDevice(kind);
    if (device != nullptr) device->initialize(config);
    return device.release();
}

void destroyDevice(Device* device) {
    if (device == nullptr) return;
    require(device->getUsedMemory() == 0, "destroyDevice", "device memory is still in use");
    const std::unique_ptr<Device> owner(device);
    owner->release();
}

}  // namespace zor
