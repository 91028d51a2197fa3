// The OpenCL device: discovery and choice, context and queue (own or adopted), limits, information queries.
#pragma once

#include <array>
#include <cstdint>
#include <memory>
#include <string>

#include "zor/device.h"

namespace zor {

class KernelManager;

class DeviceCL final : public Device {
 public:
    DeviceCL();
    ~DeviceCL() override;

    bool isInitialized() const override;
    cl_context getContext() const override;
    void initialize(const DeviceConfig& config) override;
    void release() override;
    void waitForEvent(EventHolder& holder) override;
    void finish() override;
    bool isComplete(EventHolder* holder) override;
    void flush() override;
    void getDeviceName(char* out) const override;
    void getBoardName(char* out) const override;
    void getVendorName(char* out) const override;
    void getDeviceVersion(char* out) const override;
    Kernel* getKernel(const KernelRequest& request) override;
    uint64_t queryGlobalMemorySize() const override;
    uint64_t queryMaxAllocationSize() const override;
    void setQueuePriority(bool high) override;

    // Releases the device's own context, then its own queue (whatever of them exists), puts the caller's objects in
    // their place without retaining them, reads the limits again from the caller's device, and makes the kernel
    // map if there is none.
    void adopt(cl_context context, cl_device_id device, cl_command_queue queue);

    cl_device_id id() const noexcept;
    cl_command_queue queue() const noexcept;
    // CL_DEVICE_NAME without leading blanks and CL_DRIVER_VERSION, read once, of any length.
    const std::string& deviceName() const noexcept;
    const std::string& driverVersion() const noexcept;
    uint32_t vendor() const noexcept;                    // Vendor code of the device's vendor text
    uint32_t maxWorkItemSize(uint32_t dimension) const;  // dimensions 0 ... 2, at least 1
    uint64_t maxWorkGroupSize() const noexcept;          // work items per group, at least 1
    uint64_t maxAllocation() const noexcept;             // bytes

 private:
    void requireDevice(const char* where) const;
    void printLimits() const;
    void readLimits();

    // Released in the order queue, context, kernels.
    std::unique_ptr<KernelManager> kernels_;
    ContextHandle ownContext_;
    QueueHandle ownQueue_;

    // In use: our own, or the caller's after adopt().
    cl_context context_ = nullptr;
    cl_command_queue queue_ = nullptr;
    cl_device_id id_ = nullptr;

    std::string deviceName_;
    std::string driverVersion_;
    std::array<uint32_t, 3> maxWorkItemSizes_{1, 1, 1};
    uint32_t workItemDimensions_ = 0;
    uint64_t maxWorkGroupSize_ = 1;
    uint32_t vendor_ = VENDOR_UNKNOWN;
    uint64_t maxAllocation_ = 0;
};

// The device as an OpenCL device; any other kind is a broken invariant of the named caller.
DeviceCL& requireOpenCL(Device& device, const char* where);

}  // namespace zor
