// The device that --device names.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace bench {

struct DeviceChoice {
    uint32_t type;   // TOV_DEVICE_TYPE_GPU or TOV_DEVICE_TYPE_CPU
    uint32_t index;  // among the devices of that type, in platform order

    std::string text() const;  // "gpu:0"
};

// "gpu", "cpu", "gpu:1" ...; an empty text means the first GPU, else the first CPU. Throws with a message for people.
DeviceChoice chooseDevice(std::string_view option);

}  // namespace bench
