// Objects on the stand-in driver, deleted after each test, and images whose memory tells them apart.
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

class StandinTest : public testing::Test {
 protected:
    void SetUp() override {
        ASSERT_NE(standin::findState(), nullptr) << "another OpenCL library answers to the name";
        driver().reset();
    }
    void TearDown() override {
        for (void* object : objects_) EXPECT_EQ(tovObjectDelete(object), TOV_SUCCESS);
        EXPECT_EQ(driver().liveObjects(), 0u);
        EXPECT_TRUE(driver().maps.empty()) << "something is still mapped";
        EXPECT_THAT(driver().misuse, testing::IsEmpty());
    }
    static standin::State& driver() { return standin::state(); }

    static tov_context newContext() {
        tov_context context = nullptr;
        EXPECT_EQ(tovCreateContext(TOV_API_VERSION, 0, TOV_DEVICE_TYPE_GPU, 0, kNoCache, &context), TOV_SUCCESS);
        return context;
    }
    // Opens the GPU as it is scripted by then.
    void open() {
        context_ = objects_.emplace_back(newContext());
        EXPECT_EQ(tovContextCreateCommandQueue(context_, &queue_), TOV_SUCCESS);
        objects_.push_back(queue_);
    }
    // An image of zeros but for its first byte.
    tov_image newImage(const tov_image_desc& desc, char mark = 'S') {
        std::vector<char> bytes(size_t{desc.image_width} * desc.image_height * 16, 0);
        bytes[0] = mark;
        EXPECT_EQ(tovContextCreateImage(context_, &desc, bytes.data(), &objects_.emplace_back()), TOV_SUCCESS);
        return objects_.back();
    }
    tov_image_filter newFilter(uint32_t type) {
        EXPECT_EQ(tovContextCreateImageFilter(context_, type, &objects_.emplace_back()), TOV_SUCCESS);
        return objects_.back();
    }
    int32_t execute() { return tovContextExecuteCommandQueue(context_, queue_, nullptr, nullptr); }
    int32_t attachAndExecute(tov_image_filter filter, tov_image input, tov_image output) {
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue_, filter, input, output), TOV_SUCCESS);
        return execute();
    }

    tov_context context_ = nullptr;
    tov_command_queue queue_ = nullptr;
    std::vector<void*> objects_;
};

}  // namespace apitest
