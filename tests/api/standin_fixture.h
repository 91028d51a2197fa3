// A context on the stand-in driver, and objects in it whose memory tells them apart.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <tov/tov.h>

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "standin.h"

namespace apitest {

// No directory can be made there, so every program is compiled and nothing is stored.
inline constexpr char kNoCache[] = "/dev/null/none";

// First byte of the memory of an image, and the letter that stands for it.
enum Mark : unsigned char { SOURCE = 'S', DESTINATION = 'D', AUXILIARY = 'A' };

class StandinTest : public testing::Test {
 protected:
    void SetUp() override {
        ASSERT_NE(standin::findState(), nullptr) << "another OpenCL library answers to the name";
        driver().reset();
    }
    void TearDown() override {
        EXPECT_EQ(driver().liveObjects(), 0u);
        EXPECT_TRUE(driver().maps.empty()) << "something is still mapped";
        EXPECT_THAT(driver().misuse, testing::IsEmpty());
    }
    static standin::State& driver() { return standin::state(); }

    static tov_context newContext(const char* cachePath = kNoCache) {
        tov_context context = nullptr;
        EXPECT_EQ(
            tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_GPU, 0, cachePath, &context),
            TOV_SUCCESS);
        return context;
    }
    static tov_image newImage(tov_context context, const tov_image_desc& desc, Mark mark) {
        tov_image image = nullptr;
        EXPECT_EQ(tovContextCreateImage(context, &desc, nullptr, &image), TOV_SUCCESS);
        void* pixels = nullptr;
        if (tovImageMap(image, 0, &pixels) == TOV_SUCCESS) {
            *static_cast<unsigned char*>(pixels) = mark;
            EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
        }
        return image;
    }
};

}  // namespace apitest
