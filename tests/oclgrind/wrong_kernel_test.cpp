// Kernels that are wrong on purpose: what shows that a clean log means something.
#include <gtest/gtest.h>

#include <array>
#include <memory>
#include <string>

#include "oclgrind_log.h"
#include "zor/kernel.h"

namespace {

// The log after one run of a kernel over 8 items with a buffer of 4 floats.
std::string logOf(const std::string& body) {
    const std::unique_ptr<zor::Device, void (*)(zor::Device*)> device(
        zor::createDevice(zor::DEVICE_KIND_CL, {.deviceType = 1}), zor::destroyDevice);
    std::array<char, zor::kDeviceTextBytes> name = {};
    device->getDeviceName(name.data());
    EXPECT_NE(std::string(name.data()).find("Oclgrind"), std::string::npos) << name.data();
    const std::string text =
        "__kernel void Wrong(__global float* data) { const size_t i = get_global_id(0); " + body + " }";
    const std::string_view source = text;
    zor::Kernel* const kernel = device->getKernel({.kernelName = "Wrong", .sources = {&source, 1}});
    if (kernel == nullptr) return "not built";
    const zor::Buffer<float> data(*device, 4 * sizeof(float), zor::BUFFER_DEFAULT);
    zor::Launcher launcher(*device, *kernel);
    launcher.arg(data);
    launcher.launch1D(8, 8);
    return oclgrindLog();
}

}  // namespace

TEST(WrongKernels, ACorrectOneLeavesTheLogEmpty) {
    EXPECT_EQ(logOf("if (i < 4) data[i] = 1.0f;"), "");
}

TEST(WrongKernels, AWriteBehindTheBufferIsFound) {
    EXPECT_NE(logOf("data[i] = 1.0f;").find("Invalid write"), std::string::npos);
}

TEST(WrongKernels, ADataRaceIsFound) {
    EXPECT_NE(logOf("data[0] = (float)i;").find("data race"), std::string::npos);
}

TEST(WrongKernels, AnUninitialisedValueIsFound) {
    EXPECT_NE(logOf("if (i < 4 && data[i] > 0.5f) data[i] = 2.0f;").find("ninitialized"), std::string::npos);
}
