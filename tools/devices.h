// Finding OpenCL devices and opening one.
#ifndef TOV_TOOLS_DEVICES_H
#define TOV_TOOLS_DEVICES_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "handle.h"

namespace tool {

struct DeviceChoice {
    uint32_t type;  // TOV_DEVICE_TYPE_...
    uint32_t index;
};

// "gpu", "cpu", "gpu:1". Throws a usage failure for anything else.
DeviceChoice parseDevice(std::string_view text);

// "gpu:0"
std::string deviceName(const DeviceChoice& choice);

// The wanted device if it is there, otherwise the first GPU, otherwise the first CPU. Throws kNoDevice.
DeviceChoice chooseDevice(const std::optional<DeviceChoice>& wanted);

// A context on the device; cachePath as for tovCreateContext.
Handle openDevice(const DeviceChoice& choice, const char* cachePath);

// "NAME (VENDOR)" of a context's device.
std::string describeDevice(tov_context context);

// One line for each device, "gpu:0  NAME (VENDOR)\n". Throws kNoDevice when there is none.
std::string listDevices();

}  // namespace tool

#endif
