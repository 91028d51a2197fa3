// Command queues: order, failures, callbacks, attachment and the rectangles.
#include <stdexcept>

#include "fixture.h"

namespace apitest {
namespace {

Picture constant(double value) {
    return mapped(Picture(7, 5), kFloat4, [=](const Rgba&) { return Rgba{value, value, value, 1}; });
}

class Queues : public DeviceTest {
 protected:
    static Handle scaleBy(float factor) { return newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", factor}}); }
    int32_t attach(tov_image_filter filter, tov_image input, tov_image output) {
        return tovCommandQueueAttachImageFilter(queue_, filter, input, output);
    }
    int32_t execute() {
        const auto count = [](void* calls) { ++*static_cast<int*>(calls); };
        return tovContextExecuteCommandQueue(context(), queue_, count, &calls_);
    }
    static double value(tov_image image) { return read(image, Picture(7, 5)).at(6, 4)[1]; }

    Handle queue_ = newQueue();
    const Handle a_ = newImage(constant(3));
    const Handle b_ = newImage(constant(0));
    const Handle c_ = newImage(constant(0));
    int calls_ = 0;
};

TEST_F(Queues, RunTheirFiltersInOrderUpToTheFirstFailureAndCallBackAfterSuccess) {
    EXPECT_EQ(execute(), TOV_SUCCESS) << "of none";
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, nullptr, nullptr), TOV_SUCCESS);
    const Handle first = scaleBy(2.0f);
    const Handle second = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 0.0f}});
    const Handle third = scaleBy(5.0f);
    ASSERT_EQ(attach(first, a_, b_), TOV_SUCCESS);
    ASSERT_EQ(attach(second, b_, c_), TOV_SUCCESS);
    ASSERT_EQ(attach(third, b_, b_), TOV_SUCCESS);
    const auto expectRun = [&](int32_t code, double b, double c, int calls) {
        EXPECT_EQ(execute(), code);
        EXPECT_EQ(value(b_), b);
        EXPECT_EQ(value(c_), c);
        EXPECT_EQ(calls_, calls);
    };
    expectRun(TOV_ERROR_INVALID_PARAMETER, 6, 0, 1);
    ASSERT_EQ(setParameter(second, {"cGamma", 1.0f}), TOV_SUCCESS);
    expectRun(TOV_SUCCESS, 30, 6, 2);
    ASSERT_EQ(tovCommandQueueDetachImageFilter(queue_, second), TOV_SUCCESS);
    EXPECT_EQ(tovCommandQueueDetachImageFilter(queue_, second), TOV_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(setParameter(first, {"cKey", 1.0f}), TOV_SUCCESS);
    expectRun(TOV_SUCCESS, 15, 6, 3);
}

TEST_F(Queues, ContainWhatTheirCallbackThrowsAndMayBeDeletedByIt) {
    const auto fail = [](void*) { throw std::runtime_error("from the host"); };
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, fail, nullptr), TOV_ERROR_INTERNAL_ERROR);
    const auto remove = [](void* queue) { static_cast<Handle*>(queue)->remove(); };
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, remove, &queue_), TOV_SUCCESS);
}

TEST_F(Queues, AFilterRunsOnItsLatestImagesInEveryQueueAndOnceInEach) {
    const Handle filter = scaleBy(2.0f);
    const Handle other = newQueue();
    ASSERT_EQ(attach(filter, a_, b_), TOV_SUCCESS);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(other, filter, a_, c_), TOV_SUCCESS);
    EXPECT_EQ(attach(filter, a_, a_), TOV_ERROR_INVALID_PARAMETER) << "attached already, but bound";
    EXPECT_EQ(execute(), TOV_SUCCESS);
    EXPECT_EQ(value(a_), 6.0);
    EXPECT_EQ(value(b_), 0.0);
    EXPECT_EQ(value(c_), 0.0);
}

TEST_F(Queues, AttachmentChecksInputOutputAndTheirGeometry) {
    const Handle filter = scaleBy(1.0f);
    const Handle resample = newFilter(TOV_IMAGE_FILTER_RESAMPLE);
    const Handle taller = newImage(Picture(7, 6));
    EXPECT_EQ(attach(filter, nullptr, b_), TOV_ERROR_INVALID_IMAGE);
    EXPECT_EQ(attach(filter, queue_, b_), TOV_ERROR_INVALID_IMAGE);
    EXPECT_EQ(attach(filter, a_, nullptr), TOV_ERROR_INVALID_IMAGE);
    EXPECT_EQ(attach(filter, a_, taller), TOV_ERROR_INVALID_OPERATION);
    EXPECT_EQ(attach(resample, a_, a_), TOV_ERROR_INVALID_OPERATION);
    EXPECT_EQ(attach(resample, a_, taller), TOV_SUCCESS);
    // Depth, row pitch and slice pitch; a pitch of 0 is the width or the area, and the layout may be another.
    for (const auto& [depth, row, slice] : {std::array{7u, 0u, 0u}, {1u, 8u, 0u}, {1u, 0u, 123u}, {1u, 7u, 35u}}) {
        const Handle output = newImage(tov_image_desc{7, 5, depth, row, slice, 1, TOV_COMPONENT_TYPE_UINT8});
        EXPECT_EQ(attach(filter, a_, output), row == 7 ? TOV_SUCCESS : TOV_ERROR_INVALID_OPERATION) << depth << row;
    }
}

TEST_F(Queues, ARectangleLimitsTheRunUntilTheNextBinding) {
    const Picture input = noise(20, 19);
    const Handle source = newImage(input);
    const Handle destination = newImage(Picture(20, 19));
    const Handle filter = scaleBy(1.0f);
    ASSERT_EQ(attach(filter, source, destination), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", 8, 8), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "srcRec", UINT32_MAX, UINT32_MAX), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    const auto corner = [&](uint32_t x, uint32_t y) { return x < 8 && y < 8 ? input.at(x, y) : Rgba{}; };
    EXPECT_EQ(maxDifference(read(destination, input), painted(20, 19, kFloat4, corner)), 0.0);
    ASSERT_EQ(tovImageFilterSetParameterImage(filter, "dstBuffer", destination), TOV_SUCCESS);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_EQ(maxDifference(read(destination, input), input), 0.0);
}

}  // namespace
}  // namespace apitest
