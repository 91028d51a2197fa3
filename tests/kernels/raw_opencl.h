// The OpenCL device of this machine without the library in between: what the kernel tests need to build one embedded
// text and run one of its kernels. Every failed call throws std::runtime_error with its name, status and compiler log.
#pragma once

#ifndef CL_TARGET_OPENCL_VERSION
#define CL_TARGET_OPENCL_VERSION 120
#endif
#include <CL/cl.h>

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace raw {

template <auto Release>
struct Releaser {
    template <class Object>
    void operator()(Object* object) const noexcept {
        Release(object);
    }
};
using ContextHandle = std::unique_ptr<_cl_context, Releaser<clReleaseContext>>;
using QueueHandle = std::unique_ptr<_cl_command_queue, Releaser<clReleaseCommandQueue>>;
using MemoryHandle = std::unique_ptr<_cl_mem, Releaser<clReleaseMemObject>>;
using ProgramHandle = std::unique_ptr<_cl_program, Releaser<clReleaseProgram>>;
using KernelHandle = std::unique_ptr<_cl_kernel, Releaser<clReleaseKernel>>;

// The first device of the first platform that has one.
class Device {
 public:
    Device();

    std::string platformName() const;
    // The device's limit on the items of one work group.
    size_t maxGroupSize() const;

    ProgramHandle build(const std::string& source, const std::string& options) const;
    KernelHandle kernel(const ProgramHandle& program, const char* name) const;
    // A buffer of that many bytes, a copy of `data` unless it is null.
    MemoryHandle buffer(size_t bytes, const void* data) const;
    // A four-component float image of 2 dimensions, a copy of `data` unless it is null.
    MemoryHandle image(size_t width, size_t height, const void* data) const;

    void read(const MemoryHandle& buffer, size_t bytes, void* data) const;
    void readImage(const MemoryHandle& image, size_t width, size_t height, void* data) const;

    // Runs a kernel over a grid, each side rounded up to whole groups, and waits for it. Sizes of 0 end the dimensions.
    void run(const KernelHandle& kernel, size_t width, size_t height, size_t groupWidth, size_t groupHeight) const;

 private:
    cl_platform_id platform_ = nullptr;
    cl_device_id device_ = nullptr;
    ContextHandle context_;
    QueueHandle queue_;
};

template <class Value>
void setArgument(const KernelHandle& kernel, cl_uint index, const Value& value);
template <>
void setArgument(const KernelHandle& kernel, cl_uint index, const MemoryHandle& memory);

void setArgumentBytes(const KernelHandle& kernel, cl_uint index, size_t bytes, const void* value);

template <class Value>
void setArgument(const KernelHandle& kernel, cl_uint index, const Value& value) {
    setArgumentBytes(kernel, index, sizeof value, &value);
}

// Sets all arguments of a kernel, in order.
template <class... Values>
void setArguments(const KernelHandle& kernel, const Values&... values) {
    cl_uint index = 0;
    (setArgument(kernel, index++, values), ...);
}

}  // namespace raw
