#include "opencl.h"

#include <stdexcept>

#include "tov/tov.h"

namespace bench {
namespace {

void check(cl_int status, const char* call) {
    if (status != CL_SUCCESS) throw std::runtime_error(std::string(call) + " returned " + std::to_string(status));
}

std::vector<cl_platform_id> platforms() {
    cl_uint count = 0;
    check(clGetPlatformIDs(0, nullptr, &count), "clGetPlatformIDs");
    std::vector<cl_platform_id> ids(count);
    check(clGetPlatformIDs(count, ids.data(), nullptr), "clGetPlatformIDs");
    return ids;
}

cl_device_id findDevice(const DeviceChoice& choice) {
    const cl_device_type type = choice.type == TOV_DEVICE_TYPE_GPU ? CL_DEVICE_TYPE_GPU : CL_DEVICE_TYPE_CPU;
    std::vector<cl_device_id> found;
    for (cl_platform_id platform : platforms()) {
        cl_uint count = 0;
        if (clGetDeviceIDs(platform, type, 0, nullptr, &count) != CL_SUCCESS || count == 0) continue;
        const size_t before = found.size();
        found.resize(before + count);
        check(clGetDeviceIDs(platform, type, count, &found[before], nullptr), "clGetDeviceIDs");
    }
    if (choice.index >= found.size()) throw std::runtime_error("There is no OpenCL device " + choice.text());
    return found[choice.index];
}

std::string deviceInfo(cl_device_id device, cl_device_info key) {
    size_t size = 0;
    check(clGetDeviceInfo(device, key, 0, nullptr, &size), "clGetDeviceInfo");
    std::string text(size, '\0');
    check(clGetDeviceInfo(device, key, size, text.data(), nullptr), "clGetDeviceInfo");
    return text.substr(0, text.find('\0'));
}

ClProgram built(ClProgram program, cl_device_id device, const std::string& options) {
    check(clBuildProgram(program.get(), 1, &device, options.c_str(), nullptr, nullptr), "clBuildProgram");
    return program;
}

size_t roundedUp(size_t items, size_t group) {
    return (items + group - 1) / group * group;
}

}  // namespace

LaunchShape launchShape(bool line, uint32_t width, uint32_t height) {
    if (line) return {{32, 1}, {roundedUp(size_t{width} * height, 32), 1}};
    return {{8, 8}, {roundedUp(width, 8), roundedUp(height, 8)}};
}

OpenCL::OpenCL(const DeviceChoice& choice) : device_(findDevice(choice)) {
    cl_int status = CL_SUCCESS;
    context_.reset(clCreateContext(nullptr, 1, &device_, nullptr, nullptr, &status));
    check(status, "clCreateContext");
    queue_.reset(clCreateCommandQueue(context_.get(), device_, 0, &status));
    check(status, "clCreateCommandQueue");
}

std::string OpenCL::deviceText() const {
    cl_uint units = 0;
    check(clGetDeviceInfo(device_, CL_DEVICE_MAX_COMPUTE_UNITS, sizeof units, &units, nullptr), "clGetDeviceInfo");
    return deviceInfo(device_, CL_DEVICE_NAME) + ", driver " + deviceInfo(device_, CL_DRIVER_VERSION) + ", " +
           std::to_string(units) + " compute units";
}

ClBuffer OpenCL::buffer(size_t bytes, const void* content) const {
    cl_int status = CL_SUCCESS;
    ClBuffer buffer(clCreateBuffer(context(), CL_MEM_READ_WRITE, bytes, nullptr, &status));
    check(status, "clCreateBuffer");
    const std::vector<char> zeros(content == nullptr ? bytes : 0);
    check(clEnqueueWriteBuffer(queue(), buffer.get(), CL_TRUE, 0, bytes, content == nullptr ? zeros.data() : content, 0,
                               nullptr, nullptr),
          "clEnqueueWriteBuffer");
    return buffer;
}

ClProgram OpenCL::build(std::string_view source, const std::string& options) const {
    cl_int status = CL_SUCCESS;
    const char* text = source.data();
    const size_t length = source.size();
    ClProgram program(clCreateProgramWithSource(context(), 1, &text, &length, &status));
    check(status, "clCreateProgramWithSource");
    return built(std::move(program), device_, options);
}

ClProgram OpenCL::load(std::string_view binary, const std::string& options) const {
    cl_int status = CL_SUCCESS;
    const auto* bytes = reinterpret_cast<const unsigned char*>(binary.data());
    const size_t size = binary.size();
    ClProgram program(clCreateProgramWithBinary(context(), 1, &device_, &size, &bytes, nullptr, &status));
    check(status, "clCreateProgramWithBinary");
    return built(std::move(program), device_, options);
}

ClKernel OpenCL::kernel(cl_program program, const char* name) const {
    cl_int status = CL_SUCCESS;
    ClKernel kernel(clCreateKernel(program, name, &status));
    check(status, "clCreateKernel");
    return kernel;
}

void OpenCL::run(cl_kernel kernel, const LaunchShape& shape) const {
    check(clEnqueueNDRangeKernel(queue(), kernel, 2, nullptr, shape.global.data(), shape.local.data(), 0, nullptr,
                                 nullptr),
          "clEnqueueNDRangeKernel");
    check(clFinish(queue()), "clFinish");
}

void Arguments::set(const void* value, size_t size) {
    check(clSetKernelArg(kernel_, next_++, size, value), "clSetKernelArg");
}

}  // namespace bench
