// Objects on the stand-in driver, deleted after each test, and images whose memory tells them apart.
#pragma once

#include <gmock/gmock.h>
#include <tov/tov.h>

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
        EXPECT_EQ(driver().liveObjects() + driver().maps.size(), 0u);
        EXPECT_THAT(driver().misuse, testing::IsEmpty());
    }
    static standin::State& driver() { return standin::state(); }

    static tov_context newContext() {
        tov_context context = nullptr;
        EXPECT_EQ(tovCreateContext(1, 0, TOV_DEVICE_TYPE_GPU, 0, kNoCache, &context), TOV_SUCCESS);
        return context;
    }
    // A new object, deleted after the test.
    template <class Create, class... Arguments>
    void* created(Create* create, Arguments... arguments) {
        EXPECT_EQ(create(arguments..., &objects_.emplace_back()), TOV_SUCCESS);
        return objects_.back();
    }
    // Opens the GPU as it is scripted by then.
    void open() {
        context_ = objects_.emplace_back(newContext());
        queue_ = created(tovContextCreateCommandQueue, context_);
    }
    // An image of zeros but for its first byte.
    tov_image newImage(const tov_image_desc& desc, char mark = 'S') {
        std::vector<char> bytes(size_t{desc.image_width} * desc.image_height * 16, 0);
        bytes[0] = mark;
        return created(tovContextCreateImage, context_, &desc, bytes.data());
    }
    tov_image_filter newFilter(uint32_t type) { return created(tovContextCreateImageFilter, context_, type); }
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
