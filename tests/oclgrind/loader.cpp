// The OpenCL library of these tests: Oclgrind's run-time library with one call in front of it. The library under test
// maps buffers for reading and writing to fill them, and Oclgrind takes only what is mapped for writing alone as
// initialised by the host.
#ifndef CL_TARGET_OPENCL_VERSION
#define CL_TARGET_OPENCL_VERSION 120
#endif
#include <CL/cl.h>
#include <dlfcn.h>

extern "C" __attribute__((visibility("default"))) void* clEnqueueMapBuffer(cl_command_queue queue, cl_mem buffer,
                                                                           cl_bool blocking, cl_map_flags flags,
                                                                           size_t offset, size_t size,
                                                                           cl_uint eventCount, const cl_event* events,
                                                                           cl_event* event, cl_int* status) {
    static void* const runtime = dlopen(OCLGRIND_RUNTIME, RTLD_NOW);
    static auto* const mapBuffer =
        reinterpret_cast<decltype(&clEnqueueMapBuffer)>(dlsym(runtime, "clEnqueueMapBuffer"));
    const cl_map_flags writing = flags & ~cl_map_flags{CL_MAP_READ};
    return mapBuffer(queue, buffer, blocking, writing, offset, size, eventCount, events, event, status);
}
