// What the tests of the device layer share: a fresh stand-in driver, a folder of their own, the printed lines.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <string>

#include "standin.h"
#include "zor/device_cl.h"
#include "zor/kernel.h"
#include "zor/kernel_builder.h"

namespace fs = std::filesystem;

struct DestroyDevice {
    void operator()(zor::Device* device) const { zor::destroyDevice(device); }
};
using DeviceOwner = std::unique_ptr<zor::Device, DestroyDevice>;

// Runs the body and returns what it printed.
template <class Body>
std::string printed(Body body) {
    testing::internal::CaptureStdout();
    try {
        body();
    } catch (...) {
        testing::internal::GetCapturedStdout();
        throw;
    }
    return testing::internal::GetCapturedStdout();
}

inline std::string readText(const fs::path& path) {
    std::ostringstream text;
    text << std::ifstream(path, std::ios::binary).rdbuf();
    return text.str();
}
inline void writeText(const fs::path& path, const std::string& text) {
    std::ofstream(path, std::ios::binary | std::ios::trunc) << text;
}

// A private folder is the working directory while the test runs.
class OnStandin : public testing::Test {
 protected:
    void SetUp() override {
        std::string pattern = (fs::temp_directory_path() / "zor-test-XXXXXX").string();
        ASSERT_NE(mkdtemp(pattern.data()), nullptr);
        fs::current_path(folder = pattern);
        zor::setCacheDirectory("cache");
        ASSERT_NE(standin::findState(), nullptr) << "libOpenCL.so.1 is not the stand-in";
        driver().reset();
        ASSERT_EQ(zor::loadOpenCL(), 0);
        device = makeDevice();
    }
    void TearDown() override {
        device.reset();
        EXPECT_EQ(driver().liveObjects(), 0u) << "an object was not released";
        EXPECT_TRUE(driver().maps.empty()) << "a buffer was not unmapped";
        EXPECT_THAT(driver().misuse, testing::IsEmpty());
        driver().live.clear();
        driver().maps.clear();
        fs::current_path("/");
        fs::remove_all(folder);
    }

    // A device of the configuration; what creating it printed goes to lines.
    DeviceOwner makeDevice(const zor::DeviceConfig& config = {}) {
        zor::Device* made = nullptr;
        lines = printed([&] { made = zor::createDevice(zor::DEVICE_KIND_CL, config); });
        return DeviceOwner(made);
    }
    static zor::DeviceCL& opencl(const DeviceOwner& owner) { return dynamic_cast<zor::DeviceCL&>(*owner); }
    static standin::State& driver() { return standin::state(); }
    static standin::Device& firstDevice() { return driver().platforms.at(0).devices.at(0); }

    fs::path folder;
    DeviceOwner device;
    std::string lines;
};
