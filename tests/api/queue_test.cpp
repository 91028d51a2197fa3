// Command queues: order, failures, callbacks, attachment and the rectangles.
#include <cmath>
#include <stdexcept>
#include <thread>

#include "fixture.h"

namespace apitest {
namespace {

Picture constant(double value) {
    return painted(7, 5, kFloat4, [&](uint32_t, uint32_t) { return Rgba{value, value, value, 1.0}; });
}

void count(void* calls) {
    ++*static_cast<int*>(calls);
}

class Queues : public DeviceTest {
 protected:
    Handle queue_ = newQueue();
    Handle a_ = newImage(constant(3.0));
    Handle b_ = newImage(constant(0.0));
    Handle c_ = newImage(constant(0.0));

    static Handle scaleBy(float factor) { return newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", factor}}); }
    int32_t attach(tov_image_filter filter, tov_image input, tov_image output) {
        return tovCommandQueueAttachImageFilter(queue_, filter, input, output);
    }
    int32_t execute(tov_command_queue queue, int* calls = nullptr) {
        return tovContextExecuteCommandQueue(context(), queue, calls != nullptr ? count : nullptr, calls);
    }
    static double value(tov_image image) { return read(image, Picture(7, 5)).at(6, 4)[1]; }
};

TEST_F(Queues, RunFiltersInOrderAndCallBackOnce) {
    const Handle doubled = scaleBy(2.0f);
    const Handle squareRoot = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.0f}});
    const Handle tripled = scaleBy(3.0f);
    ASSERT_EQ(attach(doubled, a_, b_), TOV_SUCCESS);
    ASSERT_EQ(attach(squareRoot, b_, c_), TOV_SUCCESS);
    ASSERT_EQ(attach(tripled, c_, b_), TOV_SUCCESS);
    int calls = 0;
    EXPECT_EQ(execute(queue_, &calls), TOV_SUCCESS);
    EXPECT_EQ(calls, 1);
    EXPECT_NEAR(value(b_), 3.0 * std::sqrt(6.0), 1e-4);
    ASSERT_EQ(tovCommandQueueDetachImageFilter(queue_, squareRoot), TOV_SUCCESS);
    ASSERT_EQ(tovCommandQueueDetachImageFilter(queue_, squareRoot), TOV_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(tovImageFilterSetParameterImage(tripled, "srcBuffer", b_), TOV_SUCCESS);
    EXPECT_EQ(execute(queue_, &calls), TOV_SUCCESS);
    EXPECT_EQ(calls, 2);
    EXPECT_EQ(value(b_), 18.0) << "the first and then the third";
}

TEST_F(Queues, AnEmptyQueueCallsBackAndANullCallbackIsFine) {
    int calls = 0;
    EXPECT_EQ(execute(queue_, &calls), TOV_SUCCESS);
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(execute(queue_), TOV_SUCCESS);
}

TEST_F(Queues, StopAtTheFirstFailureWithoutCallingBack) {
    const Handle first = scaleBy(2.0f);
    const Handle second = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 0.0f}});
    const Handle third = scaleBy(5.0f);
    ASSERT_EQ(attach(first, a_, b_), TOV_SUCCESS);
    ASSERT_EQ(attach(second, b_, c_), TOV_SUCCESS);
    ASSERT_EQ(attach(third, a_, c_), TOV_SUCCESS);
    int calls = 0;
    EXPECT_EQ(execute(queue_, &calls), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(calls, 0);
    EXPECT_EQ(value(b_), 6.0);
    EXPECT_EQ(value(c_), 0.0);
    ASSERT_EQ(setParameter(second, {"cGamma", 1.0f}), TOV_SUCCESS);
    EXPECT_EQ(execute(queue_, &calls), TOV_SUCCESS) << "the queue is usable afterwards";
    EXPECT_EQ(value(c_), 15.0);
}

TEST_F(Queues, CallBackOnTheCallingThreadAndContainWhatItThrows) {
    std::thread::id thread;
    const auto remember = [](void* where) { *static_cast<std::thread::id*>(where) = std::this_thread::get_id(); };
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, remember, &thread), TOV_SUCCESS);
    EXPECT_EQ(thread, std::this_thread::get_id());
    const auto fail = [](void*) { throw std::runtime_error("from the host"); };
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, fail, nullptr), TOV_ERROR_INTERNAL_ERROR);
    const auto remove = [](void* queue) { tovObjectDelete(queue); };
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, remove, queue_), TOV_SUCCESS)
        << "a callback may delete the queue";
    *queue_.out() = nullptr;
}

TEST_F(Queues, AttachingTwiceKeepsOneEntryWithTheLatestImages) {
    const Handle filter = scaleBy(2.0f);
    ASSERT_EQ(attach(filter, a_, b_), TOV_SUCCESS);
    EXPECT_EQ(attach(filter, b_, b_), TOV_ERROR_INVALID_PARAMETER);
    const Handle twice = newImage(constant(1.0));
    EXPECT_EQ(attach(filter, twice, twice), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(execute(queue_), TOV_SUCCESS);
    EXPECT_EQ(value(twice), 2.0) << "in place and once";
    EXPECT_EQ(value(b_), 0.0);
}

TEST_F(Queues, OneFilterInTwoQueuesUsesItsLatestImagesInBoth) {
    const Handle filter = scaleBy(2.0f);
    const Handle other = newQueue();
    ASSERT_EQ(attach(filter, a_, b_), TOV_SUCCESS);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(other, filter, a_, c_), TOV_SUCCESS);
    EXPECT_EQ(execute(queue_), TOV_SUCCESS);
    EXPECT_EQ(value(b_), 0.0);
    EXPECT_EQ(value(c_), 6.0);
}

TEST_F(Queues, AttachmentChecksInputOutputAndTheirGeometry) {
    const Handle filter = scaleBy(1.0f);
    const Handle resample = newFilter(TOV_IMAGE_FILTER_RESAMPLE);
    const Handle inner = newFilter(TOV_IMAGE_FILTER_SOBEL);
    const Handle taller = newImage(Picture(7, 6));
    const Handle bytes = newImage(Picture(7, 5, {1, TOV_COMPONENT_TYPE_UINT8}));
    const auto varied = [](uint32_t depth, uint32_t rowPitch, uint32_t slicePitch) {
        return newImage(tov_image_desc{7, 5, depth, rowPitch, slicePitch, 4, TOV_COMPONENT_TYPE_FLOAT32});
    };
    const Handle deep = varied(7, 0, 0);
    const Handle samePitch = varied(1, 7, 35);
    const Handle wide = varied(1, 8, 0);
    const Handle slice = varied(1, 0, 123);
    struct Row {
        const char* what;
        tov_image_filter filter;
        tov_object input;
        tov_object output;
        int32_t expected;
    };
    const Row rows[] = {
        {"no input", filter, nullptr, b_, TOV_ERROR_INVALID_IMAGE},
        {"no output", filter, a_, nullptr, TOV_ERROR_INVALID_IMAGE},
        {"queue as input", filter, queue_, b_, TOV_ERROR_INVALID_IMAGE},
        {"context as output", filter, a_, context(), TOV_ERROR_INVALID_IMAGE},
        {"filter as output", filter, a_, inner, TOV_ERROR_INVALID_PARAMETER},
        {"another height", filter, a_, taller, TOV_ERROR_INVALID_OPERATION},
        {"another depth", filter, a_, deep, TOV_ERROR_INVALID_OPERATION},
        {"another row pitch", filter, a_, wide, TOV_ERROR_INVALID_OPERATION},
        {"another slice pitch", filter, a_, slice, TOV_ERROR_INVALID_OPERATION},
        {"resampling in place", resample, a_, a_, TOV_ERROR_INVALID_OPERATION},
        {"resampling to another size", resample, a_, taller, TOV_SUCCESS},
        {"pitches spelt out", filter, a_, samePitch, TOV_SUCCESS},
    };
    for (const Row& row : rows) EXPECT_EQ(attach(row.filter, row.input, row.output), row.expected) << row.what;
    const Handle another = scaleBy(1.0f);
    EXPECT_EQ(attach(another, a_, bytes), TOV_SUCCESS) << "another layout";
    EXPECT_EQ(tovCommandQueueDetachImageFilter(queue_, inner), TOV_ERROR_INVALID_PARAMETER);
}

TEST_F(Queues, ARectangleLimitsTheRunUntilTheNextBindingAndNeverLeavesTheOutput) {
    const Picture input = noise(20, 19);
    const Handle source = newImage(input);
    const Handle destination = newImage(Picture(20, 19));
    const Handle filter = scaleBy(1.0f);
    ASSERT_EQ(attach(filter, source, destination), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", 8, 8), TOV_SUCCESS);
    ASSERT_EQ(execute(queue_), TOV_SUCCESS);
    const Picture part = read(destination, input);
    for (uint32_t y = 0; y < 19; ++y)
        for (uint32_t x = 0; x < 20; ++x)
            EXPECT_EQ(part.at(x, y), x < 8 && y < 8 ? input.at(x, y) : Rgba{}) << x << ", " << y;

    for (const uint32_t beyond : {21u, 100000u, 0x7fffffffu, 0xffffffffu}) {
        ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", beyond, beyond), TOV_SUCCESS);
        ASSERT_EQ(tovImageFilterSetParameter2u(filter, "srcRec", beyond, beyond), TOV_SUCCESS);
        EXPECT_EQ(execute(queue_), TOV_SUCCESS) << beyond;
        EXPECT_EQ(maxDifference(read(destination, input), input), 0.0) << beyond;
    }
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", 1, 1), TOV_SUCCESS);
    const Handle fresh = newImage(Picture(20, 19));
    ASSERT_EQ(tovImageFilterSetParameterImage(filter, "dstBuffer", fresh), TOV_SUCCESS);
    ASSERT_EQ(execute(queue_), TOV_SUCCESS);
    EXPECT_EQ(maxDifference(read(fresh, input), input), 0.0) << "a binding takes the image's size again";
}

TEST_F(Queues, AQueueRunsUnderAnyContext) {
    const Handle other = newContext();
    const Handle filter = scaleBy(2.0f);
    ASSERT_EQ(attach(filter, a_, b_), TOV_SUCCESS);
    EXPECT_EQ(tovContextExecuteCommandQueue(other, queue_, nullptr, nullptr), TOV_SUCCESS);
    EXPECT_EQ(value(b_), 6.0);
}

}  // namespace
}  // namespace apitest
