// The OpenCL library of these tests: Oclgrind's run-time library with one call in front of it. The library under test
// maps buffers for reading and writing to fill them, and Oclgrind takes only what is mapped for writing alone as
// initialised by the host.
#define CL_TARGET_OPENCL_VERSION 120
#include <CL/cl.h>
#include <dlfcn.h>

void* clEnqueueMapBuffer(cl_command_queue q, cl_mem buffer, cl_bool wait, cl_map_flags flags, size_t at, size_t size,
                         cl_uint n, const cl_event* list, cl_event* event, cl_int* status) {
    static void* const runtime = dlopen(OCLGRIND_RUNTIME, RTLD_NOW);
    static auto* const map = reinterpret_cast<decltype(&clEnqueueMapBuffer)>(dlsym(runtime, "clEnqueueMapBuffer"));
    return map(q, buffer, wait, flags & ~cl_map_flags{CL_MAP_READ}, at, size, n, list, event, status);
}
