// Byte buffers on a device, allocated under the device's memory budget.
#pragma once

#include "zor/device.h"

#include <cstddef>
#include <cstdint>
#include <memory>

namespace zor {

enum BufferKind : uint32_t {
    BUFFER_DEFAULT = 0,        // CL_MEM_READ_WRITE
    BUFFER_NO_ALLOCATION = 1,  // nothing is allocated
    BUFFER_WRITE_ONLY = 4,     // CL_MEM_WRITE_ONLY
    BUFFER_HOST_VISIBLE = 8,   // CL_MEM_READ_WRITE | CL_MEM_ALLOC_HOST_PTR
};

inline constexpr uint64_t kWholeBuffer = ~uint64_t{0};
inline constexpr uint64_t kReservedDeviceMemory = 268435456;  // bytes of a device that are never handed out (256 MiB)

class BufferBase {
 public:
    // Allocates at once. A failed allocation prints its line and leaves the buffer empty: size 0, no memory.
    BufferBase(Device& device, uint64_t size, BufferKind kind);
    BufferBase(const BufferBase&) = delete;
    BufferBase& operator=(const BufferBase&) = delete;
    virtual ~BufferBase();

    Device& device() const noexcept;
    uint64_t size() const noexcept;     // bytes; 0 when empty
    cl_mem memory() const noexcept;     // null when empty or on a host device
    void* hostMemory() const noexcept;  // host device only
    bool hasMemory() const noexcept;    // either of the two

    // Puts a foreign memory object into an empty buffer (BUFFER_NO_ALLOCATION). Its bytes are never counted against
    // the budget; with owned set the buffer releases the object when it dies.
    void adopt(cl_mem memory, uint64_t size, bool owned);

    // Host address of the first size bytes (kWholeBuffer: all), for reading and writing. Waits for the device. Empty
    // buffers and failed calls are broken invariants.
    void* map(uint64_t size = kWholeBuffer);
    void unmap(void* pointer);

    // Copies the first bytes of another buffer of the same device, on the device, and waits. Falls back to mapping
    // both where the OpenCL library has no clEnqueueCopyBuffer.
    void copyFrom(const BufferBase& other, uint64_t bytes);

 private:
    struct PagesDeleter {
        void operator()(std::byte* pages) const noexcept;
    };
    using Pages = std::unique_ptr<std::byte, PagesDeleter>;

    void allocateOnDevice(BufferKind kind);
    void allocateOnHost();
    void copyThroughHost(const BufferBase& other, uint64_t bytes);

    Device& device_;
    uint64_t size_;
    uint64_t counted_ = 0;  // bytes of the device's budget that this buffer holds
    Pages host_;            // a host device's memory, or the block behind a buffer of exactly the maximum size
    cl_mem memory_ = nullptr;
    MemoryHandle owned_;  // dies before the host block that it may lie on
};

template <class Element>
class Buffer : public BufferBase {
 public:
    using BufferBase::BufferBase;
};

}  // namespace zor
