// Raw OpenCL: the context and queue that the library adopts, and kernels launched without it.
#pragma once

#define CL_TARGET_OPENCL_VERSION 120
#define CL_USE_DEPRECATED_OPENCL_1_2_APIS
#include <CL/cl.h>

#include <array>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "device_option.h"

namespace bench {

template <class Object, auto Release>
struct ClRelease {
    void operator()(Object* object) const noexcept { Release(object); }
};
using ClContext = std::unique_ptr<_cl_context, ClRelease<_cl_context, clReleaseContext>>;
using ClQueue = std::unique_ptr<_cl_command_queue, ClRelease<_cl_command_queue, clReleaseCommandQueue>>;
using ClBuffer = std::unique_ptr<_cl_mem, ClRelease<_cl_mem, clReleaseMemObject>>;
using ClProgram = std::unique_ptr<_cl_program, ClRelease<_cl_program, clReleaseProgram>>;
using ClKernel = std::unique_ptr<_cl_kernel, ClRelease<_cl_kernel, clReleaseKernel>>;

// Work items per group and in all. One-dimensional launches have 1 in the second place.
struct LaunchShape {
    std::array<size_t, 2> local;
    std::array<size_t, 2> global;
};

// The library's launch over a picture: groups of 8 x 8, or of 32 items in a line, rounded up to whole groups.
LaunchShape launchShape(bool line, uint32_t width, uint32_t height);

class OpenCL {
 public:
    explicit OpenCL(const DeviceChoice& choice);

    cl_context context() const noexcept { return context_.get(); }
    cl_device_id device() const noexcept { return device_; }
    cl_command_queue queue() const noexcept { return queue_.get(); }
    std::string deviceText() const;  // name, driver version and number of compute units

    // Filled with `bytes` from `content`, or with zeros.
    ClBuffer buffer(size_t bytes, const void* content = nullptr) const;
    ClProgram build(std::string_view source, const std::string& options) const;
    ClProgram load(std::string_view binary, const std::string& options) const;
    ClKernel kernel(cl_program program, const char* name) const;

    // Enqueues and waits until the device has finished.
    void run(cl_kernel kernel, const LaunchShape& shape) const;

 private:
    cl_device_id device_;
    ClContext context_;
    ClQueue queue_;
};

// Binds arguments by position.
class Arguments {
 public:
    explicit Arguments(cl_kernel kernel) noexcept : kernel_(kernel) {}
    template <class Value>
    void add(const Value& value) {
        static_assert(std::is_trivially_copyable_v<Value>);
        set(&value, sizeof value);
    }

 private:
    void set(const void* value, size_t size);

    cl_kernel kernel_;
    cl_uint next_ = 0;
};

}  // namespace bench
