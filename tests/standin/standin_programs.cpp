// Programs, kernels and launches of the stand-in. A binary is the options, a zero byte and the source.
#include "standin_objects.h"

using namespace standin;

// text: the sources joined.
STANDIN_API cl_program clCreateProgramWithSource(cl_context context, cl_uint count, const char** texts,
                                                 const size_t* lengths, cl_int* out) {
    std::string source;
    for (cl_uint i = 0; i < count; ++i) source += lengths[i] != 0 ? std::string(texts[i], lengths[i]) : texts[i];
    return give(out, enter({"clCreateProgramWithSource", source}, context), _cl_program{source, {}});
}

// text: the binary.
STANDIN_API cl_program clCreateProgramWithBinary(cl_context context, cl_uint, const cl_device_id*, const size_t* sizes,
                                                 const unsigned char** binaries, cl_int* accepted, cl_int* out) {
    const std::string binary(reinterpret_cast<const char*>(binaries[0]), sizes[0]);
    *accepted = enter({"clCreateProgramWithBinary", binary}, context);
    return give(out, *accepted, _cl_program{binary.substr(binary.find('\0') + 1), {}});
}

// text: the option text.
STANDIN_API cl_int clBuildProgram(cl_program program, cl_uint, const cl_device_id*, const char* options,
                                  void(CL_CALLBACK*)(cl_program, void*), void*) {
    if (const int32_t status = enter({"clBuildProgram", options}, program)) return status;
    program->options = options;
    return CL_SUCCESS;
}

STANDIN_RELEASE(clReleaseProgram, cl_program)

STANDIN_API cl_int clGetProgramInfo(cl_program program, cl_program_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter({"clGetProgramInfo"}, program)) return status;
    const std::string binary = program->options + '\0' + program->source;
    if (key != CL_PROGRAM_BINARIES)
        return answer({{CL_PROGRAM_BINARY_SIZES, bytesOfValue(binary.size())}}, key, capacity, out, size);
    binary.copy(static_cast<char**>(out)[0], binary.size());
    return CL_SUCCESS;
}

STANDIN_API cl_int clGetProgramBuildInfo(cl_program program, cl_device_id, cl_program_build_info key, size_t capacity,
                                         void* out, size_t* size) {
    if (const int32_t status = enter({"clGetProgramBuildInfo"}, program)) return status;
    return answer({{CL_PROGRAM_BUILD_LOG, script().buildLog + '\0'}}, key, capacity, out, size);
}

// The kernel's name must stand in the source.
STANDIN_API cl_kernel clCreateKernel(cl_program program, const char* name, cl_int* out) {
    int32_t status = enter({"clCreateKernel"}, program);
    if (status == CL_SUCCESS && program->source.find(name) == std::string::npos) status = CL_INVALID_KERNEL_NAME;
    return give(out, status, _cl_kernel{{.kernel = name, .options = program->options}});
}

STANDIN_RELEASE(clReleaseKernel, cl_kernel)

// The value is kept for the launch.
STANDIN_API cl_int clSetKernelArg(cl_kernel kernel, cl_uint index, size_t bytes, const void* value) {
    if (const int32_t status = enter({"clSetKernelArg"}, kernel)) return status;
    const auto* const first = static_cast<const unsigned char*>(value);
    kernel->launch.arguments[index] = {bytes, {first, first + (first != nullptr ? bytes : 0)}};
    return CL_SUCCESS;
}

STANDIN_API cl_int clEnqueueNDRangeKernel(cl_command_queue queue, cl_kernel kernel, cl_uint dimensions, const size_t*,
                                          const size_t* global, const size_t* local, STANDIN_EVENTS) {
    if (const int32_t status = enter({"clEnqueueNDRangeKernel"}, queue, kernel)) return status;
    Launch launch = kernel->launch;
    launch.global.assign(global, global + dimensions);
    launch.local.assign(local, local + dimensions);
    script().launches.push_back(launch);
    return CL_SUCCESS;
}
