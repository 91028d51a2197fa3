#include "zor/discovery.h"

#include <cstdio>
#include <string>

#include "zor/device_info.h"

namespace zor {
namespace {

constexpr int32_t kNoPlatform = -1001;  // the loader's status where no driver is installed

struct VendorName {
    std::string_view text;
    Vendor code;
};
constexpr VendorName kVendors[] = {
    {"NVIDIA Corporation", VENDOR_NVIDIA},
    {"Quarrion, Inc.", VENDOR_QUARRION},
    {"Intel(R) Corporation", VENDOR_INTEL},
    {"Apple", VENDOR_APPLE},
};

std::vector<cl_platform_id> listPlatforms(bool announce) {
    cl_uint count = 0;
    const int32_t status = cl().clGetPlatformIDs(cl_uint{0}, nullptr, &count);
    if (status != CL_SUCCESS) count = 0;
    if (announce) std::printf("CL %u platforms\n", count);
    if (status == kNoPlatform) return {};
    check(status, "clGetPlatformIDs");
    require(count <= kMaxPlatforms, "clGetPlatformIDs", "more platforms than are supported");
    std::vector<cl_platform_id> platforms(count);
    if (count > 0) check(cl().clGetPlatformIDs(count, platforms.data(), nullptr), "clGetPlatformIDs");
    return platforms;
}

std::string platformVendor(cl_platform_id platform) {
    std::string text;
    check(readPlatformText(platform, CL_PLATFORM_VENDOR, text), "clGetPlatformInfo");
    return text;
}

uint32_t countDevices(cl_platform_id platform, cl_device_type type) {
    cl_uint count = 0;
    const int32_t status = cl().clGetDeviceIDs(platform, type, cl_uint{0}, nullptr, &count);
    return status == CL_SUCCESS ? count : 0;
}

void appendDevices(std::vector<FoundDevice>& list, cl_platform_id platform, cl_device_type type, uint32_t count) {
    if (count == 0) return;
    require(count <= kMaxDevices && list.size() + count <= kMaxDevices, "clGetDeviceIDs",
            "more devices than are supported");
    std::vector<cl_device_id> ids(count);
    check(cl().clGetDeviceIDs(platform, type, count, ids.data(), nullptr), "clGetDeviceIDs");
    for (cl_device_id id : ids) list.push_back({platform, id});
}

}  // namespace

Vendor classifyVendor(std::string_view vendor) noexcept {
    for (const VendorName& known : kVendors)
        if (known.text == vendor) return known.code;
    return VENDOR_UNKNOWN;
}

cl_device_type openCLDeviceType(uint32_t deviceType) noexcept {
    return deviceType != 0 ? cl_device_type{CL_DEVICE_TYPE_CPU} : cl_device_type{CL_DEVICE_TYPE_GPU};
}

uint32_t getDeviceCount(bool cpu, uint32_t vendorMask) {
    if (loadOpenCL() != 0) return 0;
    uint32_t sum = 0;
    bool quarrionCounted = false;
    for (cl_platform_id platform : listPlatforms(false)) {
        const Vendor vendor = classifyVendor(platformVendor(platform));
        if ((vendorMask & vendor) == 0) continue;
        if (vendor == VENDOR_QUARRION) {
            if (quarrionCounted) {
                std::printf("WARNING : the system has more than 1 QUARRION platform installed\n");
                continue;
            }
            quarrionCounted = true;
        }
        sum += countDevices(platform, openCLDeviceType(cpu ? 1 : 0));
    }
    return sum;
}

std::vector<FoundDevice> listDevices(const DeviceConfig& config) {
    const cl_device_type type = openCLDeviceType(config.deviceType);
    const std::vector<cl_platform_id> platforms = listPlatforms(true);
    std::vector<uint32_t> counts;
    bool quarrionSeen = false;
    for (cl_platform_id platform : platforms) {
        const std::string vendorText = platformVendor(platform);
        const Vendor vendor = classifyVendor(vendorText);
        uint32_t count = countDevices(platform, type);
        if ((config.vendorMask & vendor) == 0) count = 0;
        if (vendor == VENDOR_QUARRION) {
            if (quarrionSeen) count = 0;
            quarrionSeen = true;
        }
        std::printf("CL: %u device (%s)\n", count, vendorText.c_str());
        counts.push_back(count);
    }
    std::vector<FoundDevice> list;
    for (size_t i = 0; i < platforms.size(); ++i) appendDevices(list, platforms[i], type, counts[i]);
    return list;
}

}  // namespace zor
