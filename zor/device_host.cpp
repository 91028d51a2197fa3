#include "zor/device_host.h"

namespace zor {

void DeviceHost::initialize(const DeviceConfig& /*config*/) {}

void DeviceHost::release() {}

void DeviceHost::waitForEvent(EventHolder& /*holder*/) {}

void DeviceHost::finish() {}

bool DeviceHost::isComplete(EventHolder* /*holder*/) {
    return true;
}

void DeviceHost::flush() {}

}  // namespace zor
