#include "zor/device_info.h"

#include <algorithm>

#include "zor/device.h"

namespace zor {

int32_t readDeviceText(cl_device_id device, cl_device_info key, std::string& text) {
    text.clear();
    if (device == nullptr) return CL_INVALID_DEVICE;
    const auto query = [&](size_t capacity, void* out, size_t* size) {
        return cl().clGetDeviceInfo(device, key, capacity, out, size);
    };
    return readText(query, text);
}

int32_t readPlatformText(cl_platform_id platform, cl_platform_info key, std::string& text) {
    const auto query = [&](size_t capacity, void* out, size_t* size) {
        return cl().clGetPlatformInfo(platform, key, capacity, out, size);
    };
    return readText(query, text);
}

int32_t readDeviceBytes(cl_device_id device, cl_device_info key, void* value, size_t size) {
    if (device == nullptr) return CL_INVALID_DEVICE;
    return cl().clGetDeviceInfo(device, key, size, value, nullptr);
}

std::string_view withoutLeadingBlanks(std::string_view text) noexcept {
    return text.substr(std::min(text.find_first_not_of(' '), text.size()));
}

void copyDeviceText(std::string_view text, char* out) noexcept {
    const size_t length = std::min(text.size(), kDeviceTextBytes - 1);
    text.copy(out, length);
    out[length] = '\0';
}

}  // namespace zor
