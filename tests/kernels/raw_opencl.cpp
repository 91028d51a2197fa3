#include "raw_opencl.h"

#include <stdexcept>

namespace raw {
namespace {

void check(cl_int status, const std::string& call) {
    if (status != CL_SUCCESS) throw std::runtime_error(call + " failed with " + std::to_string(status));
}

size_t roundUp(size_t size, size_t multiple) {
    return (size + multiple - 1) / multiple * multiple;
}

}  // namespace

Device::Device() {
    cl_uint count = 0;
    check(clGetPlatformIDs(0, nullptr, &count), "clGetPlatformIDs");
    std::vector<cl_platform_id> platforms(count);
    check(clGetPlatformIDs(count, platforms.data(), nullptr), "clGetPlatformIDs");
    for (cl_platform_id platform : platforms) {
        if (clGetDeviceIDs(platform, CL_DEVICE_TYPE_ALL, 1, &device_, nullptr) == CL_SUCCESS) {
            platform_ = platform;
            break;
        }
    }
    if (platform_ == nullptr) throw std::runtime_error("no OpenCL device");
    cl_int status = CL_SUCCESS;
    context_.reset(clCreateContext(nullptr, 1, &device_, nullptr, nullptr, &status));
    check(status, "clCreateContext");
    queue_.reset(clCreateCommandQueue(context_.get(), device_, 0, &status));
    check(status, "clCreateCommandQueue");
}

std::string Device::platformName() const {
    size_t bytes = 0;
    check(clGetPlatformInfo(platform_, CL_PLATFORM_NAME, 0, nullptr, &bytes), "clGetPlatformInfo");
    std::string name(bytes, '\0');
    check(clGetPlatformInfo(platform_, CL_PLATFORM_NAME, bytes, name.data(), nullptr), "clGetPlatformInfo");
    return name.c_str();
}

size_t Device::maxGroupSize() const {
    size_t size = 0;
    check(clGetDeviceInfo(device_, CL_DEVICE_MAX_WORK_GROUP_SIZE, sizeof size, &size, nullptr), "clGetDeviceInfo");
    return size;
}

ProgramHandle Device::build(const std::string& source, const std::string& options) const {
    const char* text = source.c_str();
    cl_int status = CL_SUCCESS;
    ProgramHandle program(clCreateProgramWithSource(context_.get(), 1, &text, nullptr, &status));
    check(status, "clCreateProgramWithSource");
    status = clBuildProgram(program.get(), 1, &device_, options.c_str(), nullptr, nullptr);
    if (status != CL_SUCCESS) {
        size_t bytes = 0;
        clGetProgramBuildInfo(program.get(), device_, CL_PROGRAM_BUILD_LOG, 0, nullptr, &bytes);
        std::string log(bytes, '\0');
        clGetProgramBuildInfo(program.get(), device_, CL_PROGRAM_BUILD_LOG, bytes, log.data(), nullptr);
        check(status, "clBuildProgram (" + options + ")\n" + log + "\n");
    }
    return program;
}

KernelHandle Device::kernel(const ProgramHandle& program, const char* name) const {
    cl_int status = CL_SUCCESS;
    KernelHandle kernel(clCreateKernel(program.get(), name, &status));
    check(status, std::string("clCreateKernel ") + name);
    return kernel;
}

MemoryHandle Device::buffer(size_t bytes, const void* data) const {
    const cl_mem_flags flags = CL_MEM_READ_WRITE | (data != nullptr ? CL_MEM_COPY_HOST_PTR : 0);
    cl_int status = CL_SUCCESS;
    MemoryHandle memory(clCreateBuffer(context_.get(), flags, bytes, const_cast<void*>(data), &status));
    check(status, "clCreateBuffer");
    return memory;
}

MemoryHandle Device::image(size_t width, size_t height, const void* data) const {
    const cl_mem_flags flags = CL_MEM_READ_WRITE | (data != nullptr ? CL_MEM_COPY_HOST_PTR : 0);
    const cl_image_format format = {CL_RGBA, CL_FLOAT};
    cl_image_desc desc = {};
    desc.image_type = CL_MEM_OBJECT_IMAGE2D;
    desc.image_width = width;
    desc.image_height = height;
    cl_int status = CL_SUCCESS;
    MemoryHandle memory(clCreateImage(context_.get(), flags, &format, &desc, const_cast<void*>(data), &status));
    check(status, "clCreateImage");
    return memory;
}

void Device::read(const MemoryHandle& buffer, size_t bytes, void* data) const {
    check(clEnqueueReadBuffer(queue_.get(), buffer.get(), CL_TRUE, 0, bytes, data, 0, nullptr, nullptr),
          "clEnqueueReadBuffer");
}

void Device::readImage(const MemoryHandle& image, size_t width, size_t height, void* data) const {
    const size_t origin[3] = {0, 0, 0};
    const size_t region[3] = {width, height, 1};
    check(clEnqueueReadImage(queue_.get(), image.get(), CL_TRUE, origin, region, 0, 0, data, 0, nullptr, nullptr),
          "clEnqueueReadImage");
}

void Device::run(const KernelHandle& kernel, size_t width, size_t height, size_t groupWidth, size_t groupHeight) const {
    const cl_uint dimensions = height == 0 ? 1 : 2;
    const size_t global[2] = {roundUp(width, groupWidth), height == 0 ? 1 : roundUp(height, groupHeight)};
    const size_t local[2] = {groupWidth, height == 0 ? 1 : groupHeight};
    check(clEnqueueNDRangeKernel(queue_.get(), kernel.get(), dimensions, nullptr, global, local, 0, nullptr, nullptr),
          "clEnqueueNDRangeKernel");
    check(clFinish(queue_.get()), "clFinish");
}

template <>
void setArgument(const KernelHandle& kernel, cl_uint index, const MemoryHandle& memory) {
    cl_mem object = memory.get();
    setArgumentBytes(kernel, index, sizeof object, &object);
}

void setArgumentBytes(const KernelHandle& kernel, cl_uint index, size_t bytes, const void* value) {
    check(clSetKernelArg(kernel.get(), index, bytes, value), "clSetKernelArg " + std::to_string(index));
}

}  // namespace raw
