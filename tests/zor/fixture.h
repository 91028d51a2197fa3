// What the tests of the device layer share: a fresh stand-in driver, a folder of their own, the printed lines.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <iostream>

#include "standin.h"
#include "zor/device_cl.h"
#include "zor/kernel.h"
#include "zor/kernel_builder.h"

namespace fs = std::filesystem;

// A private folder is the working directory while the test runs.
class OnStandin : public testing::Test {
 protected:
    using DeviceOwner = std::shared_ptr<zor::Device>;

    void SetUp() override {
        std::string pattern = (fs::temp_directory_path() / "zor-test-XXXXXX").string();
        ASSERT_NE(mkdtemp(pattern.data()), nullptr);
        fs::current_path(folder = pattern);
        zor::setCacheDirectory("cache");
        ASSERT_NE(standin::findState(), nullptr) << "libOpenCL.so.1 is not the stand-in";
        driver().reset();
        ASSERT_EQ(zor::loadOpenCL(), 0);
        testing::internal::CaptureStdout();
        device = makeDevice();
    }
    void TearDown() override {
        device.reset();
        printed();
        testing::internal::GetCapturedStdout();
        EXPECT_EQ(driver().liveObjects(), 0u) << "an object was not released";
        EXPECT_TRUE(driver().maps.empty()) << "a buffer was not unmapped";
        EXPECT_THAT(driver().misuse, testing::IsEmpty());
        fs::current_path("/");
        fs::remove_all(folder);
    }

    // What was printed since the last call; failures of the test are in it.
    static std::string printed() {
        const std::string text = testing::internal::GetCapturedStdout();
        if (HasFailure()) std::cerr << text;
        testing::internal::CaptureStdout();
        return text;
    }
    static DeviceOwner makeDevice(const zor::DeviceConfig& config = {}) {
        return {zor::createDevice(zor::DEVICE_KIND_CL, config), zor::destroyDevice};
    }
    static zor::DeviceCL& opencl(const DeviceOwner& owner) { return dynamic_cast<zor::DeviceCL&>(*owner); }
    static standin::State& driver() { return standin::state(); }
    static standin::Device& firstDevice() { return driver().platforms.at(0).devices.at(0); }

    fs::path folder;
    DeviceOwner device;
};
