#include "device_option.h"

#include <charconv>
#include <stdexcept>

#include "handle.h"

namespace bench {
namespace {

uint32_t deviceCount(uint32_t type) {
    uint32_t count = 0;
    check(tovGetDeviceCount(TOV_BACKEND_API_OPENCL, type, &count), "tovGetDeviceCount");
    return count;
}

uint32_t parseIndex(std::string_view text) {
    uint32_t index = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), index);
    if (error != std::errc{} || end != text.data() + text.size())
        throw std::runtime_error("--device takes gpu or cpu, and after a colon a device index");
    return index;
}

uint32_t parseType(std::string_view text) {
    if (text == "gpu") return TOV_DEVICE_TYPE_GPU;
    if (text == "cpu") return TOV_DEVICE_TYPE_CPU;
    throw std::runtime_error("--device takes gpu or cpu, and after a colon a device index");
}

DeviceChoice firstDevice() {
    for (const uint32_t type : {uint32_t{TOV_DEVICE_TYPE_GPU}, uint32_t{TOV_DEVICE_TYPE_CPU}})
        if (deviceCount(type) > 0) return {type, 0};
    throw std::runtime_error("There is no OpenCL device; on Debian, pocl-opencl-icd makes the processor one");
}

}  // namespace

std::string DeviceChoice::text() const {
    return (type == TOV_DEVICE_TYPE_GPU ? "gpu:" : "cpu:") + std::to_string(index);
}

DeviceChoice chooseDevice(std::string_view option) {
    if (option.empty()) return firstDevice();
    const size_t colon = option.find(':');
    const uint32_t type = parseType(option.substr(0, colon));
    const uint32_t index = colon == std::string_view::npos ? 0 : parseIndex(option.substr(colon + 1));
    if (index >= deviceCount(type)) throw std::runtime_error("There is no OpenCL device " + std::string(option));
    return {type, index};
}

}  // namespace bench
