// Questions to an OpenCL device or platform: texts of any length, plain values.
#pragma once

#include "zor/opencl.h"

#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>

namespace zor {

// Asks query(capacity, output, requiredSize) for the size of a text, then for the text, which ends at its first zero
// byte. Returns the status of the first failing call, and then leaves the text empty.
template <class Query>
int32_t readText(const Query& query, std::string& text) {
    text.clear();
    size_t size = 0;
    int32_t status = query(size_t{0}, static_cast<void*>(nullptr), &size);
    if (status != CL_SUCCESS || size == 0) return status;
    text.resize(size);
    status = query(size, static_cast<void*>(text.data()), static_cast<size_t*>(nullptr));
    text.resize(status == CL_SUCCESS ? std::min(text.find('\0'), size) : 0);
    return status;
}

// A null device gives CL_INVALID_DEVICE without a call.
int32_t readDeviceText(cl_device_id device, cl_device_info key, std::string& text);
int32_t readPlatformText(cl_platform_id platform, cl_platform_info key, std::string& text);
int32_t readDeviceBytes(cl_device_id device, cl_device_info key, void* value, size_t size);

// The value must be had; a failure is a broken invariant.
template <class Value>
Value deviceValue(cl_device_id device, cl_device_info key) {
    Value value{};
    check(readDeviceBytes(device, key, &value, sizeof value), "clGetDeviceInfo");
    return value;
}

std::string_view withoutLeadingBlanks(std::string_view text) noexcept;

// Into a buffer of kDeviceTextBytes bytes: cut where longer, always zero-terminated.
void copyDeviceText(std::string_view text, char* out) noexcept;

}  // namespace zor
