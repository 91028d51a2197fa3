// Which OpenCL devices there are, over all platforms.
#pragma once

#include "zor/device.h"

#include <vector>

namespace zor {

inline constexpr uint32_t kMaxPlatforms = 15;
inline constexpr uint32_t kMaxDevices = 32;

struct FoundDevice {
    cl_platform_id platform;
    cl_device_id device;
};

// CL_DEVICE_TYPE_CPU or CL_DEVICE_TYPE_GPU for a configuration's deviceType.
cl_device_type openCLDeviceType(uint32_t deviceType) noexcept;

// The devices of the configuration's type on the admitted platforms, in platform order; prints what it finds. Empty
// where no platform is installed.
std::vector<FoundDevice> listDevices(const DeviceConfig& config);

}  // namespace zor
