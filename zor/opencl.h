// The OpenCL library, opened at run time: its entry points, its error names and the handles that release what we own.
#pragma once

#ifndef CL_TARGET_OPENCL_VERSION
#define CL_TARGET_OPENCL_VERSION 120
#endif
#ifndef CL_USE_DEPRECATED_OPENCL_1_1_APIS
#define CL_USE_DEPRECATED_OPENCL_1_1_APIS  // clGetExtensionFunctionAddress
#endif
#include <CL/cl.h>
#include <CL/cl_gl.h>

#include <cstdint>
#include <memory>

#include "zor/error.h"

namespace zor {

// One function of the OpenCL library. Calling one that the library lacks is a broken invariant, not a crash.
template <class Function>
class EntryPoint;

template <class Result, class... Arguments>
class EntryPoint<Result CL_API_CALL(Arguments...)> {
 public:
    constexpr explicit EntryPoint(const char* name) noexcept : name_(name) {}

    Result operator()(Arguments... arguments) const {
        if (function_ == nullptr) breakInvariant(name_, "missing from the OpenCL library");
        return function_(arguments...);
    }
    explicit operator bool() const noexcept { return function_ != nullptr; }

    void set(void* address) noexcept { function_ = reinterpret_cast<Function>(address); }

 private:
    using Function = Result(CL_API_CALL*)(Arguments...);
    const char* name_;
    Function function_ = nullptr;
};

struct EntryPoints {
#define ZOR_CL(name) EntryPoint<decltype(::name)> name{#name};
#include "zor/entry_points.def"
#undef ZOR_CL
};

// The entry points found by the last successful loadOpenCL; all empty before.
const EntryPoints& cl() noexcept;

// 0: the OpenCL library is loaded, now or before. -1: none could be opened. -2: the exit hook could not be registered.
int32_t loadOpenCL();

// Forgets the library and its entry points. It stays mapped: the driver's threads may still be running in it.
void unloadOpenCL() noexcept;

// References taken by isDeviceKindAvailable since the library was loaded; the number only grows.
uint32_t openCLReferences() noexcept;
void addOpenCLReference() noexcept;

// clGetGLContextInfoKHR, asked of the driver once per loaded library and kept; null where it has none.
clGetGLContextInfoKHR_fn glContextInfo();

// "CL_SUCCESS" ... for 0 ... -68, "" for the codes -20 ... -29 that OpenCL does not assign, and for -1001 the name of
// the loader's own code; "Unknown OpenCL error" for anything else.
const char* openCLErrorString(int32_t status) noexcept;

// Deleters for the objects that we own.
template <auto Release>
struct Releaser {
    template <class Object>
    void operator()(Object* object) const noexcept {
        if (cl().*Release) (cl().*Release)(object);
    }
};
using ContextHandle = std::unique_ptr<_cl_context, Releaser<&EntryPoints::clReleaseContext>>;
using QueueHandle = std::unique_ptr<_cl_command_queue, Releaser<&EntryPoints::clReleaseCommandQueue>>;
using MemoryHandle = std::unique_ptr<_cl_mem, Releaser<&EntryPoints::clReleaseMemObject>>;
using ProgramHandle = std::unique_ptr<_cl_program, Releaser<&EntryPoints::clReleaseProgram>>;
using KernelHandle = std::unique_ptr<_cl_kernel, Releaser<&EntryPoints::clReleaseKernel>>;
using EventHandle = std::unique_ptr<_cl_event, Releaser<&EntryPoints::clReleaseEvent>>;

}  // namespace zor
