// A compiled kernel, the per-device map that owns all of them, and the launch of one kernel.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <type_traits>

#include "zor/buffer.h"
#include "zor/device_cl.h"
#include "zor/kernel_builder.h"

namespace zor {

inline constexpr uint32_t kMaxLaunchArguments = 64;
inline constexpr size_t kMaxArgumentBytes = 64;

class Kernel {
 public:
    // sourceIdentity is programIdentity of generated texts, 0 of texts that never change.
    Kernel(KernelHandle kernel, std::string name, uint64_t sourceIdentity = 0)
        : kernel_(std::move(kernel)), name_(std::move(name)), sourceIdentity_(sourceIdentity) {}

    cl_kernel handle() const noexcept { return kernel_.get(); }
    const std::string& name() const noexcept { return name_; }
    uint64_t sourceIdentity() const noexcept { return sourceIdentity_; }

    // A program to be written to the cache by the first hasRun(), which a launcher calls after each launch.
    void setUnwritten(std::optional<UnwrittenProgram> program) noexcept { unwritten_ = std::move(program); }
    void hasRun();

 private:
    KernelHandle kernel_;
    std::string name_;
    uint64_t sourceIdentity_;
    std::optional<UnwrittenProgram> unwritten_;
};

// Key text to kernel. Nothing is evicted while the device lives.
class KernelManager {
 public:
    Kernel* find(const std::string& mapName) const;
    Kernel* insert(std::string mapName, std::unique_ptr<Kernel> kernel);
    void remove(const std::string& mapName);
    size_t size() const noexcept { return kernels_.size(); }

 private:
    std::map<std::string, std::unique_ptr<Kernel>> kernels_;
};

// Binds arguments by position and launches once. Every failure is a broken invariant.
class Launcher {
 public:
    // The device must be an OpenCL device.
    Launcher(Device& device, Kernel& kernel);

    // The next argument, by value: numbers, float2 pairs, matrices.
    template <class Value>
    requires(!std::is_base_of_v<BufferBase, Value>) void arg(const Value& value) {
        static_assert(std::is_trivially_copyable_v<Value> && !std::is_pointer_v<Value>);
        static_assert(sizeof(Value) <= kMaxArgumentBytes);
        setNext(&value, sizeof value);
    }
    // The next argument: a buffer's memory object.
    void arg(const BufferBase& buffer);

    // Local sizes are clamped to 1 ... the device's limits, the global size rounded up to whole groups (at least one).
    // Returns when the kernel has run.
    void launch1D(int32_t globalSize, int32_t localSize);
    void launch2D(int32_t globalX, int32_t globalY, int32_t localX, int32_t localY);

 private:
    void setNext(const void* value, size_t size);

    DeviceCL& device_;
    Kernel& kernel_;
    uint32_t next_ = 0;
};

}  // namespace zor
