#include "zor/buffer.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <new>
#include <utility>

#include "zor/device_cl.h"
#include "zor/device_info.h"
#include "zor/number_text.h"

namespace zor {
namespace {

constexpr std::align_val_t kPageAlignment{4096};

cl_mem_flags memoryFlags(BufferKind kind) noexcept {
    switch (kind) {
        case BUFFER_WRITE_ONLY:
            return CL_MEM_WRITE_ONLY;
        case BUFFER_HOST_VISIBLE:
            return CL_MEM_READ_WRITE | CL_MEM_ALLOC_HOST_PTR;
        default:
            return CL_MEM_READ_WRITE;
    }
}

std::string mebibytes(uint64_t bytes) {
    return twoDecimals(static_cast<float>(bytes) / 1024.0f / 1024.0f);
}

void printAllocationFailure(uint64_t size, uint64_t used) {
    std::printf("CL Memory Allocation Failure: %sMB, Total used memory: %sMB\n", mebibytes(size).c_str(),
                mebibytes(used).c_str());
}

// Each comparison is made so that no sum wraps. Below 256 MiB of memory in all the budget itself wraps and admits
// everything; the driver then decides.
bool fitsBudget(const DeviceCL& device, uint64_t size) noexcept {
    const uint64_t budget = device.getTotalMemory() - kReservedDeviceMemory;
    const uint64_t used = device.getUsedMemory();
    return size <= device.maxAllocation() && size <= budget && used <= budget - size;
}

MemoryHandle createBuffer(const DeviceCL& device, cl_mem_flags flags, uint64_t size, void* host) {
    int32_t status = CL_SUCCESS;
    MemoryHandle memory(cl().clCreateBuffer(device.getContext(), flags, size_t{size}, host, &status));
    return status == CL_SUCCESS ? std::move(memory) : nullptr;
}

void printMaxAllocation(const DeviceCL& device) {
    cl_ulong bytes = 0;
    readDeviceBytes(device.id(), CL_DEVICE_MAX_MEM_ALLOC_SIZE, &bytes, sizeof bytes);
    std::printf("CL Max Memory Allocation Size: %sMB\n", mebibytes(bytes).c_str());
}

std::byte* newPages(uint64_t size) noexcept {
    return static_cast<std::byte*>(::operator new (size_t{size}, kPageAlignment, std::nothrow));
}

// Unmaps when it goes, whatever happens in between; a failure of that is the device's and shows at its next call.
class MappedBytes {
 public:
    MappedBytes(BufferBase& buffer, uint64_t size) : buffer_(buffer), bytes_(buffer.map(size)) {}
    MappedBytes(const MappedBytes&) = delete;
    MappedBytes& operator=(const MappedBytes&) = delete;
    ~MappedBytes() {
        if (bytes_ == nullptr) return;
        try {
            unmap();
        } catch (const Error&) {  // already printed
        }
    }
    void* bytes() const noexcept { return bytes_; }
    void unmap() { buffer_.unmap(std::exchange(bytes_, nullptr)); }

 private:
    BufferBase& buffer_;
    void* bytes_;
};

}  // namespace

void BufferBase::PagesDeleter::operator()(std::byte* pages) const noexcept {
    ::operator delete(pages, kPageAlignment);
}

BufferBase::BufferBase(Device& device, uint64_t size, BufferKind kind) : device_(device), size_(size) {
    if (size == 0 || kind == BUFFER_NO_ALLOCATION) return;
    if (device.kind() == DEVICE_KIND_HOST) {
        allocateOnHost();
    } else {
        allocateOnDevice(kind);
    }
}

BufferBase::~BufferBase() {
    if (counted_ == 0) return;
    try {
        device_.countRelease(counted_);
    } catch (const Error&) {  // already printed; a destructor cannot pass it on
    }
}

void BufferBase::allocateOnHost() {
    host_.reset(newPages(size_));
    require(host_ != nullptr, "BufferBase", "out of host memory");
}

void BufferBase::allocateOnDevice(BufferKind kind) {
    const DeviceCL& device = requireOpenCL(device_, "BufferBase");
    const uint64_t size = std::exchange(size_, 0);
    if (!fitsBudget(device, size)) {
        printAllocationFailure(size, device.getUsedMemory());
        return;
    }
    if (size == device.maxAllocation()) {
        host_.reset(newPages(size));
        if (host_ != nullptr) owned_ = createBuffer(device, CL_MEM_READ_WRITE | CL_MEM_USE_HOST_PTR, size, host_.get());
    } else {
        owned_ = createBuffer(device, memoryFlags(kind), size, nullptr);
    }
    if (owned_ == nullptr) {
        host_.reset();
        printAllocationFailure(size, device.getUsedMemory());
        printMaxAllocation(device);
        return;
    }
    memory_ = owned_.get();
    size_ = size;
    counted_ = size;
    device_.countAllocation(size);
}

Device& BufferBase::device() const noexcept {
    return device_;
}

uint64_t BufferBase::size() const noexcept {
    return size_;
}

cl_mem BufferBase::memory() const noexcept {
    return memory_;
}

void* BufferBase::hostMemory() const noexcept {
    return device_.kind() == DEVICE_KIND_HOST ? host_.get() : nullptr;
}

bool BufferBase::hasMemory() const noexcept {
    return memory_ != nullptr || hostMemory() != nullptr;
}

void BufferBase::adopt(cl_mem memory, uint64_t size, bool owned) {
    requireOpenCL(device_, "adopt");
    require(!hasMemory(), "adopt", "the buffer has memory already");
    require(memory != nullptr, "adopt", "no memory object");
    if (owned) owned_.reset(memory);
    memory_ = memory;
    size_ = size;
}

void* BufferBase::map(uint64_t size) {
    require(hasMemory(), "map", "the buffer has no memory");
    const uint64_t bytes = size == kWholeBuffer ? size_ : size;
    require(bytes <= size_, "map", "more bytes than the buffer has");
    if (device_.kind() == DEVICE_KIND_HOST) return host_.get();
    const DeviceCL& device = requireOpenCL(device_, "map");
    int32_t status = CL_SUCCESS;
    void* const pointer =
        cl().clEnqueueMapBuffer(device.queue(), memory_, cl_bool{CL_FALSE}, cl_map_flags{CL_MAP_READ | CL_MAP_WRITE},
                                size_t{0}, size_t{bytes}, cl_uint{0}, nullptr, nullptr, &status);
    check(status, "clEnqueueMapBuffer");
    const int32_t finished = cl().clFinish(device.queue());
    if (finished != CL_SUCCESS)
        cl().clEnqueueUnmapMemObject(device.queue(), memory_, pointer, cl_uint{0}, nullptr, nullptr);
    check(finished, "clFinish");
    return pointer;
}

void BufferBase::unmap(void* pointer) {
    if (device_.kind() == DEVICE_KIND_HOST) return;
    require(hasMemory(), "unmap", "the buffer has no memory");
    const DeviceCL& device = requireOpenCL(device_, "unmap");
    check(cl().clEnqueueUnmapMemObject(device.queue(), memory_, pointer, cl_uint{0}, nullptr, nullptr),
          "clEnqueueUnmapMemObject");
    device_.finish();
}

void BufferBase::copyFrom(const BufferBase& other, uint64_t bytes) {
    require(&device_ == &other.device_, "copyFrom", "the buffers are on different devices");
    require(hasMemory() && other.hasMemory(), "copyFrom", "a buffer has no memory");
    require(bytes <= size_ && bytes <= other.size_, "copyFrom", "more bytes than the buffers have");
    if (bytes == 0 || &other == this || (memory_ != nullptr && memory_ == other.memory_)) return;
    if (device_.kind() == DEVICE_KIND_HOST || !cl().clEnqueueCopyBuffer) return copyThroughHost(other, bytes);
    const DeviceCL& device = requireOpenCL(device_, "copyFrom");
    check(cl().clEnqueueCopyBuffer(device.queue(), other.memory_, memory_, size_t{0}, size_t{0}, size_t{bytes},
                                   cl_uint{0}, nullptr, nullptr),
          "clEnqueueCopyBuffer");
    device_.finish();
}

void BufferBase::copyThroughHost(const BufferBase& other, uint64_t bytes) {
    MappedBytes source(const_cast<BufferBase&>(other), bytes);  // mapping leaves the other's bytes as they are
    MappedBytes destination(*this, bytes);
    std::memcpy(destination.bytes(), source.bytes(), size_t{bytes});
    destination.unmap();
    source.unmap();
}

}  // namespace zor
