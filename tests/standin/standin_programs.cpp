// Programs, kernels and launches of the stand-in. A binary is a mark, the options, a zero byte and the source.
#include "standin_objects.h"

namespace standin {
namespace {

const std::string kMark = "stand-in program\n";

std::string binaryOf(const _cl_program& program) {
    return kMark + program.options + '\0' + program.source;
}

bool readBinary(const std::string& binary, _cl_program& program) {
    if (binary.compare(0, kMark.size(), kMark) != 0) return false;
    const size_t end = binary.find('\0', kMark.size());
    if (end == std::string::npos) return false;
    program.options = binary.substr(kMark.size(), end - kMark.size());
    program.source = binary.substr(end + 1);
    program.fromBinary = true;
    return true;
}

cl_int failWith(cl_int code, cl_int* binaryStatus) {
    if (binaryStatus != nullptr) *binaryStatus = code;
    return code;
}

}  // namespace
}  // namespace standin

using namespace standin;

// text: the sources joined; numbers: their lengths.
STANDIN_API cl_program clCreateProgramWithSource(cl_context context, cl_uint count, const char** texts,
                                                 const size_t* lengths, cl_int* status) {
    auto program = std::make_unique<_cl_program>();
    std::vector<uint64_t> numbers;
    for (cl_uint i = 0; i < count; ++i) {
        const bool bounded = lengths != nullptr && lengths[i] != 0;
        program->source += bounded ? std::string(texts[i], lengths[i]) : std::string(texts[i]);
        numbers.push_back(bounded ? lengths[i] : 0);
    }
    const int32_t failure = enter("clCreateProgramWithSource", program->source, std::move(numbers));
    if (failure != CL_SUCCESS) return refuse(failure, status);
    if (count == 0) return refuse(CL_INVALID_VALUE, status);
    if (!isLive(context, "context")) return complain("clCreateProgramWithSource"), refuse(CL_INVALID_CONTEXT, status);
    return give(add(std::move(program), "program"), status);
}

// text: the first binary.
STANDIN_API cl_program clCreateProgramWithBinary(cl_context context, cl_uint, const cl_device_id*, const size_t* sizes,
                                                 const unsigned char** binaries, cl_int* binaryStatus, cl_int* status) {
    const std::string binary(reinterpret_cast<const char*>(binaries[0]), sizes[0]);
    const int32_t failure = enter("clCreateProgramWithBinary", binary);
    if (failure != CL_SUCCESS) return refuse(failWith(failure, binaryStatus), status);
    if (!isLive(context, "context")) return complain("clCreateProgramWithBinary"), refuse(CL_INVALID_CONTEXT, status);
    auto program = std::make_unique<_cl_program>();
    if (script().refuseBinaries || !readBinary(binary, *program))
        return refuse(failWith(CL_INVALID_BINARY, binaryStatus), status);
    if (binaryStatus != nullptr) *binaryStatus = CL_SUCCESS;
    return give(add(std::move(program), "program"), status);
}

// text: the option text.
STANDIN_API cl_int clBuildProgram(cl_program program, cl_uint, const cl_device_id*, const char* options,
                                  void(CL_CALLBACK*)(cl_program, void*), void*) {
    if (const int32_t status = enter("clBuildProgram", options != nullptr ? options : "")) return status;
    if (!isLive(program, "program")) return complain("clBuildProgram"), CL_INVALID_PROGRAM;
    const bool hasError = !script().ignoreErrorLines && program->source.find("#error") != std::string::npos;
    if (!program->fromBinary && (script().failBuilds || hasError)) {
        program->log = script().buildLog;
        return CL_BUILD_PROGRAM_FAILURE;
    }
    program->options = options != nullptr ? options : "";
    program->built = true;
    return CL_SUCCESS;
}

STANDIN_API cl_int clReleaseProgram(cl_program program) {
    return release("clReleaseProgram", program, "program", CL_INVALID_PROGRAM);
}

STANDIN_API cl_int clGetProgramInfo(cl_program program, cl_program_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter("clGetProgramInfo", {}, {key})) return status;
    if (!isLive(program, "program")) return complain("clGetProgramInfo"), CL_INVALID_PROGRAM;
    const std::string binary = binaryOf(*program);
    if (key == CL_PROGRAM_BINARY_SIZES) return answerValue(binary.size(), capacity, out, size);
    if (key != CL_PROGRAM_BINARIES) return CL_INVALID_VALUE;
    binary.copy(static_cast<char**>(out)[0], binary.size());
    return CL_SUCCESS;
}

STANDIN_API cl_int clGetProgramBuildInfo(cl_program program, cl_device_id, cl_program_build_info key, size_t capacity,
                                         void* out, size_t* size) {
    if (const int32_t status = enter("clGetProgramBuildInfo", {}, {key})) return status;
    if (!isLive(program, "program")) return complain("clGetProgramBuildInfo"), CL_INVALID_PROGRAM;
    return key == CL_PROGRAM_BUILD_LOG ? answer(program->log, capacity, out, size) : CL_INVALID_VALUE;
}

// text: the kernel's name, which must stand in the source.
STANDIN_API cl_kernel clCreateKernel(cl_program program, const char* name, cl_int* status) {
    if (const int32_t failure = enter("clCreateKernel", name)) return refuse(failure, status);
    if (!isLive(program, "program")) return complain("clCreateKernel"), refuse(CL_INVALID_PROGRAM, status);
    if (!program->built) return refuse(CL_INVALID_PROGRAM_EXECUTABLE, status);
    if (program->source.find(name) == std::string::npos) return refuse(CL_INVALID_KERNEL_NAME, status);
    auto kernel = std::make_unique<_cl_kernel>();
    kernel->launch.kernel = name;
    kernel->launch.options = program->options;
    kernel->launch.source = program->source;
    kernel->launch.fromBinary = program->fromBinary;
    return give(add(std::move(kernel), "kernel"), status);
}

STANDIN_API cl_int clReleaseKernel(cl_kernel kernel) {
    return release("clReleaseKernel", kernel, "kernel", CL_INVALID_KERNEL);
}

// text: the kernel; numbers: index and size. The value is kept for the launch.
STANDIN_API cl_int clSetKernelArg(cl_kernel kernel, cl_uint index, size_t bytes, const void* value) {
    const bool live = isLive(kernel, "kernel");
    if (const int32_t status = enter("clSetKernelArg", live ? kernel->launch.kernel : "", {index, bytes}))
        return status;
    if (!live) return complain("clSetKernelArg"), CL_INVALID_KERNEL;
    Argument& argument = kernel->launch.arguments[index];
    const auto* const first = static_cast<const unsigned char*>(value);
    argument.size = bytes;
    argument.bytes = first != nullptr ? std::vector<unsigned char>(first, first + bytes) : std::vector<unsigned char>{};
    return CL_SUCCESS;
}

// text: the kernel; numbers: dimensions, global sizes, local sizes.
STANDIN_API cl_int clEnqueueNDRangeKernel(cl_command_queue queue, cl_kernel kernel, cl_uint dimensions, const size_t*,
                                          const size_t* global, const size_t* local, cl_uint, const cl_event*,
                                          cl_event*) {
    std::vector<uint64_t> numbers{dimensions};
    numbers.insert(numbers.end(), global, global + dimensions);
    if (local != nullptr) numbers.insert(numbers.end(), local, local + dimensions);
    const bool live = isLive(kernel, "kernel");
    const std::string name = live ? kernel->launch.kernel : "";
    if (const int32_t status = enter("clEnqueueNDRangeKernel", name, std::move(numbers))) return status;
    if (!isLive(queue, "queue")) return complain("clEnqueueNDRangeKernel"), CL_INVALID_COMMAND_QUEUE;
    if (!live) return complain("clEnqueueNDRangeKernel"), CL_INVALID_KERNEL;
    Launch launch = kernel->launch;
    launch.global.assign(global, global + dimensions);
    if (local != nullptr) launch.local.assign(local, local + dimensions);
    script().launches.push_back(launch);
    if (script().onLaunch) script().onLaunch(launch);
    return CL_SUCCESS;
}
