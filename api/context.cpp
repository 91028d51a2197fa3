// Devices, contexts and deletion.
#include "api/guard.h"
#include "api/tov/tov.h"
#include "zor/device_cl.h"

namespace {

// Back end 1 has no implementation; every further one is plain host memory. Neither has devices.
uint32_t deviceKind(uint32_t backend) {
    switch (backend) {
        case TOV_BACKEND_API_OPENCL:
            return zor::DEVICE_KIND_CL;
        case 1:
            return 1;
        default:
            return zor::DEVICE_KIND_HOST;
    }
}

uint32_t countDevices(uint32_t backend, uint32_t deviceType) {
    if (!zor::isDeviceKindAvailable(deviceKind(backend))) return 0;
    if (deviceType != TOV_DEVICE_TYPE_GPU && deviceType != TOV_DEVICE_TYPE_CPU) return 0;
    return zor::getDeviceCount(deviceType == TOV_DEVICE_TYPE_CPU, zor::kAllVendors);
}

}  // namespace

int32_t tovGetDeviceCount(uint32_t backend, uint32_t deviceType, uint32_t* outCount) {
    return guarded([&] {
        require(outCount != nullptr, TOV_ERROR_INVALID_PARAMETER);
        *outCount = countDevices(backend, deviceType);
    });
}

int32_t tovCreateContext(uint32_t apiVersion, uint32_t backend, uint32_t deviceType, int32_t deviceIndex,
                         const char* cachePath, tov_context* outContext) {
    return guarded([&] {
        require(apiVersion == TOV_API_VERSION, TOV_ERROR_INVALID_API_VERSION);
        require(outContext != nullptr, TOV_ERROR_INVALID_PARAMETER);
        const uint32_t count = countDevices(backend, deviceType);
        require(deviceIndex >= 0 && static_cast<uint32_t>(deviceIndex) < count, TOV_ERROR_INVALID_CONTEXT);
        const zor::DeviceConfig config = {.deviceType = deviceType != TOV_DEVICE_TYPE_GPU ? 1u : 0u,
                                          .deviceIndex = static_cast<uint32_t>(deviceIndex)};
        DevicePointer device = ownDevice(zor::createDevice(deviceKind(backend), config));
        require(device != nullptr, TOV_ERROR_INTERNAL_ERROR);
        handOut(std::make_unique<TovContext>(std::move(device), cachePath), outContext);
    });
}

int32_t tovCreateContextFromOpenClContext(uint32_t apiVersion, struct _cl_context* clContext,
                                          struct _cl_device_id* clDevice, struct _cl_command_queue* clQueue,
                                          const char* cachePath, tov_context* outContext) {
    return guarded([&] {
        require(apiVersion == TOV_API_VERSION, TOV_ERROR_INVALID_API_VERSION);
        require(clContext != nullptr && clDevice != nullptr && clQueue != nullptr && outContext != nullptr,
                TOV_ERROR_INVALID_PARAMETER);
        require(zor::loadOpenCL() == 0, TOV_ERROR_INTERNAL_ERROR);
        DevicePointer device = ownDevice(zor::createDevice(zor::DEVICE_KIND_CL, {}));
        static_cast<zor::DeviceCL&>(*device).adopt(clContext, clDevice, clQueue);
        handOut(std::make_unique<TovContext>(std::move(device), cachePath), outContext);
    });
}

int32_t tovContextGetDeviceInfo(tov_context context, uint32_t* outDeviceType, char* outName, uint32_t /*reserved*/,
                                char* outVendor) {
    return guarded([&] {
        const TovContext& source = requireContext(context);
        require(outDeviceType != nullptr && outName != nullptr && outVendor != nullptr, TOV_ERROR_INVALID_PARAMETER);
        char name[zor::kDeviceTextBytes] = {};
        char vendor[zor::kDeviceTextBytes] = {};
        source.device()->getDeviceName(name);
        source.device()->getVendorName(vendor);
        std::memcpy(outName, name, sizeof name);
        std::memcpy(outVendor, vendor, sizeof vendor);
        *outDeviceType = source.device()->processorType() == 0 ? TOV_DEVICE_TYPE_GPU : TOV_DEVICE_TYPE_CPU;
    });
}

int32_t tovObjectDelete(tov_object object) {
    return guarded([&] {
        require(object != nullptr, TOV_ERROR_INVALID_PARAMETER);
        const std::ptrdiff_t index = registry::find(object);
        require(index >= 0, TOV_ERROR_INVALID_PARAMETER);
        registry::remove(index);
    });
}
