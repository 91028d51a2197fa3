// Kernels that are wrong on purpose: what shows that a clean log means something.
#include <gtest/gtest.h>

#include <string>

#include "oclgrind_log.h"
#include "raw_opencl.h"

namespace {

// The log after one run of a kernel over 8 items with a buffer of 4 floats.
std::string logOf(const std::string& body) {
    const raw::Device device;
    EXPECT_EQ(device.platformName(), "Oclgrind");
    const std::string text =
        "__kernel void Wrong(__global float* data) { const size_t i = get_global_id(0); " + body + " }";
    const raw::KernelHandle kernel = device.kernel(device.build(text, ""), "Wrong");
    const raw::MemoryHandle data = device.buffer(4 * sizeof(float), nullptr);
    raw::setArguments(kernel, data);
    device.run(kernel, 8, 0, 8, 0);
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
