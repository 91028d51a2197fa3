// Builds the kernel of the cache's tests in the working directory, as another process does.
#include "zor/device.h"

int main() {
    zor::Device* const device = zor::createDevice(zor::DEVICE_KIND_CL, {});
    const std::string_view source = "kernel void k() {}";
    const bool built =
        device->getKernel({.fileName = "Filters", .kernelName = "k", .options = " -D A", .sources = {&source, 1}}) !=
        nullptr;
    zor::destroyDevice(device);
    return built ? 0 : 1;
}
