// Device types, counts and contexts.
#include "devices.h"

#include <array>

#include "failure.h"
#include "streams.h"
#include "text.h"

namespace tool {

namespace {

struct DeviceType {
    const char* name;
    uint32_t type;
};

constexpr std::array kTypes = {DeviceType{"gpu", TOV_DEVICE_TYPE_GPU}, DeviceType{"cpu", TOV_DEVICE_TYPE_CPU}};
constexpr size_t kTextBytes = 128;  // of a device's name and vendor

uint32_t deviceCount(uint32_t type) {
    uint32_t count = 0;
    check(tovGetDeviceCount(TOV_BACKEND_API_OPENCL, type, &count), "counting devices");
    return count;
}

Failure noDevice() {
    return {ExitStatus::kNoDevice,
            "there is no OpenCL device. Install a driver: for the processor Debian's package pocl-opencl-icd, for a "
            "graphics card its vendor's OpenCL driver"};
}

// The wanted device is not there: says what is.
Failure noSuchDevice(const DeviceChoice& wanted) {
    std::string present;
    for (const DeviceType& type : kTypes) {
        const uint32_t count = deviceCount(type.type);
        for (uint32_t i = 0; i < count; ++i) {
            present += (present.empty() ? "" : ", ") + deviceName({type.type, i});
        }
    }
    if (present.empty()) return noDevice();
    return {ExitStatus::kNoDevice, "there is no device " + deviceName(wanted) + "; the devices are " + present};
}

}  // namespace

DeviceChoice parseDevice(std::string_view text) {
    const size_t colon = text.find(':');
    for (const DeviceType& type : kTypes) {
        if (text.substr(0, colon) != type.name) continue;
        if (colon == std::string_view::npos) return {type.type, 0};
        return {type.type, parseUint(text.substr(colon + 1), "--device " + std::string(text))};
    }
    throw usageFailure("--device: \"" + std::string(text) + "\" is not gpu, cpu, gpu:INDEX or cpu:INDEX");
}

std::string deviceName(const DeviceChoice& choice) {
    return (choice.type == TOV_DEVICE_TYPE_GPU ? "gpu:" : "cpu:") + std::to_string(choice.index);
}

DeviceChoice chooseDevice(const std::optional<DeviceChoice>& wanted) {
    if (wanted) {
        if (wanted->index < deviceCount(wanted->type)) return *wanted;
        throw noSuchDevice(*wanted);
    }
    for (const DeviceType& type : kTypes) {
        if (deviceCount(type.type) > 0) return {type.type, 0};
    }
    throw noDevice();
}

Handle openDevice(const DeviceChoice& choice, const char* cachePath) {
    tov_context context = nullptr;
    check(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, choice.type, static_cast<int32_t>(choice.index),
                           cachePath, &context),
          "opening the device " + deviceName(choice));
    return Handle(context);
}

std::string describeDevice(tov_context context) {
    uint32_t type = 0;
    std::array<char, kTextBytes> name{};
    std::array<char, kTextBytes> vendor{};
    check(tovContextGetDeviceInfo(context, &type, name.data(), 0, vendor.data()), "describing the device");
    return std::string(name.data()) + " (" + vendor.data() + ")";
}

std::string listDevices() {
    std::string lines;
    for (const DeviceType& type : kTypes) {
        const uint32_t count = deviceCount(type.type);
        for (uint32_t i = 0; i < count; ++i) {
            const DeviceChoice choice{type.type, i};
            const Handle context = openDevice(choice, nullptr);
            lines += deviceName(choice) + "  " + describeDevice(context.get()) + "\n";
        }
    }
    if (lines.empty()) throw noDevice();
    return lines;
}

}  // namespace tool
