// The abstract compute device, its configuration and the factory that makes, counts and destroys devices.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "zor/opencl.h"

namespace zor {

class Kernel;

enum DeviceKind : uint32_t {
    DEVICE_KIND_CL = 0,    // OpenCL
    DEVICE_KIND_HOST = 3,  // plain host memory, no kernels
};

// Platform vendors, one bit each.
enum Vendor : uint32_t {
    VENDOR_QUARRION = 1,
    VENDOR_INTEL = 2,
    VENDOR_NVIDIA = 4,
    VENDOR_APPLE = 8,
    VENDOR_UNKNOWN = 0x80000000u,
};

// The code of a platform's or device's vendor text, by exact comparison.
Vendor classifyVendor(std::string_view vendor) noexcept;

inline constexpr uint32_t kAllVendors = 0xFFFFFFFFu;
inline constexpr size_t kDeviceTextBytes = 128;  // capacity of the buffers that the text queries fill

struct DeviceConfig {
    uint32_t deviceType = 0;   // 0: GPU devices; anything else: CPU devices
    uint32_t deviceIndex = 0;  // used as signed; beyond the last device means the last one
    uint32_t vendorMask = kAllVendors;
    const cl_context_properties* contextProperties = nullptr;  // key/value pairs ended by a zero key
};

// Holds the event of a command until someone waits for it. The system's own launches use none.
struct EventHolder {
    EventHandle event;
};

// What a kernel is looked up by. The views must live for the call only.
struct KernelRequest {
    std::string_view fileName{};  // nominal source file, without ".cl"
    std::string_view kernelName{};
    std::optional<std::string_view> options{};         // compiler options
    std::span<const std::string_view> sources{};       // source texts; none: read fileName + ".cl" from disk
    std::span<const std::string_view> dependencies{};  // files that a cached binary must be newer than
    bool keepInCache = true;                           // may reuse the map's kernel and the cached binary
    // The texts differ from request to request: an option text that only holds their hash does not tell them apart.
    bool generatedSources = false;
    // Write a compiled program to the cache when the kernel has run, not at once: drivers that compile for the group
    // size of a launch then put that, too, into the binary, and a later process has nothing left to compile.
    bool writeAfterRun = false;
};

// All text operations write at most kDeviceTextBytes bytes, zero-terminated.
class Device {
 public:
    Device(const Device&) = delete;
    Device& operator=(const Device&) = delete;
    virtual ~Device() = default;

    virtual bool isInitialized() const { return false; }
    virtual cl_context getContext() const { return nullptr; }
    virtual void initialize(const DeviceConfig& config) = 0;
    virtual void release() = 0;
    virtual void waitForEvent(EventHolder& holder) = 0;
    virtual void finish() = 0;
    // True for no holder or no event; a completed event is released and the holder cleared.
    virtual bool isComplete(EventHolder* holder) = 0;
    virtual void flush() = 0;
    virtual void getDeviceName(char* out) const { *out = '\0'; }
    virtual void getBoardName(char* out) const { *out = '\0'; }
    virtual void getVendorName(char* out) const { *out = '\0'; }
    virtual void getDeviceVersion(char* out) const { *out = '\0'; }
    // The compiled kernel, owned by the device, or null when it could not be built (the log has been printed).
    virtual Kernel* getKernel(const KernelRequest& request);
    virtual uint64_t getUsedMemory() const { return usedMemory_; }
    virtual uint64_t getTotalMemory() const { return totalMemory_; }
    virtual uint64_t getPeakUsedMemory() const { return peakUsedMemory_; }
    virtual uint64_t queryGlobalMemorySize() const { return 0; }
    virtual uint64_t queryMaxAllocationSize() const { return ~uint64_t{0}; }
    virtual void setQueuePriority(bool /*high*/) {}

    uint32_t kind() const noexcept { return kind_; }
    // The deviceType of the configuration that initialised the device: 0 GPU, otherwise CPU.
    uint32_t processorType() const noexcept { return processorType_; }
    uint32_t binaryVersion() const noexcept { return binaryVersion_; }
    // Made for an OpenGL context.
    bool isGlShared() const noexcept { return glShared_; }

    // Accounting of allocated device memory, in bytes; for zor::Buffer.
    void countAllocation(uint64_t bytes) noexcept;
    void countRelease(uint64_t bytes);

 protected:
    explicit Device(uint32_t kind) noexcept : kind_(kind) {}

    uint32_t kind_;
    uint32_t processorType_ = 0;
    uint64_t usedMemory_ = 0;
    uint64_t totalMemory_ = 0;
    uint64_t peakUsedMemory_ = 0;
    bool glShared_ = false;
    uint32_t binaryVersion_ = 0;
};

// False for every kind but DEVICE_KIND_CL; for that one takes a reference on the OpenCL library and tells whether it
// is loaded.
bool isDeviceKindAvailable(uint32_t kind);

// Devices of the type over all admitted platforms; 0 when the platforms cannot be listed (no platform installed).
uint32_t getDeviceCount(bool cpu, uint32_t vendorMask);

// A new device, initialised with the configuration; null for a kind without a class. An OpenCL device whose
// initialisation found no device is returned without context and queue.
Device* createDevice(uint32_t kind, const DeviceConfig& config);

// Releases and deletes. Every buffer must have been freed. Of an adopted device only what is our own is released
// (kernels, the object itself), never the caller's context, device or queue. Null is ignored.
void destroyDevice(Device* device);

}  // namespace zor
