// What the tests of the device layer share: a fresh stand-in driver, a folder of their own, the printed lines.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
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
    std::fflush(stdout);
    return testing::internal::GetCapturedStdout();
}

inline std::string readText(const fs::path& path) {
    std::ifstream file(path, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

inline void writeText(const fs::path& path, const std::string& text) {
    std::ofstream(path, std::ios::binary | std::ios::trunc) << text;
}

// A private folder, the working directory while the test runs.
class InOwnFolder : public testing::Test {
 protected:
    void SetUp() override {
        std::string pattern = (fs::temp_directory_path() / "zor-test-XXXXXX").string();
        ASSERT_NE(mkdtemp(pattern.data()), nullptr);
        folder = pattern;
        before_ = fs::current_path();
        fs::current_path(folder);
        zor::setCacheDirectory("cache");
    }
    void TearDown() override {
        if (folder.empty()) return;
        fs::current_path(before_);
        std::error_code ignored;
        fs::remove_all(folder, ignored);
    }

    // Names of the files in the cache directory, sorted.
    std::vector<std::string> cacheFiles() const {
        std::vector<std::string> names;
        std::error_code none;
        for (const auto& file : fs::directory_iterator(folder / zor::cacheDirectory(), none))
            names.push_back(file.path().filename().string());
        std::sort(names.begin(), names.end());
        return names;
    }

    fs::path folder;

 private:
    fs::path before_;
};

class OnStandin : public InOwnFolder {
 protected:
    void SetUp() override {
        InOwnFolder::SetUp();
        ASSERT_NE(standin::findState(), nullptr) << "libOpenCL.so.1 is not the stand-in";
        standin::state().reset();
        ASSERT_EQ(zor::loadOpenCL(), 0);
    }
    void TearDown() override {
        standin::State& driver = standin::state();
        EXPECT_EQ(driver.liveObjects(), 0u) << "an object was not released";
        EXPECT_TRUE(driver.maps.empty()) << "a buffer was not unmapped";
        EXPECT_THAT(driver.misuse, testing::IsEmpty());
        driver.live.clear();
        driver.maps.clear();
        InOwnFolder::TearDown();
    }

    // A device of the configuration; what creating it printed goes to lines.
    DeviceOwner makeDevice(const zor::DeviceConfig& config = {}) {
        zor::Device* device = nullptr;
        lines = printed([&] { device = zor::createDevice(zor::DEVICE_KIND_CL, config); });
        return DeviceOwner(device);
    }
    static zor::DeviceCL& opencl(const DeviceOwner& device) { return dynamic_cast<zor::DeviceCL&>(*device); }

    standin::State& driver() { return standin::state(); }
    standin::Device& firstDevice() { return driver().platforms.at(0).devices.at(0); }

    std::string lines;
};

template <class Query>
std::string deviceText(Query query) {
    // One byte past the promised capacity, which must stay as it is.
    char text[zor::kDeviceTextBytes + 1];
    std::fill(std::begin(text), std::end(text), '#');
    query(text);
    EXPECT_EQ(text[zor::kDeviceTextBytes], '#');
    return text;
}
