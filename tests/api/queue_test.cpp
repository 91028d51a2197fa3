// Command queues: order, failures, callbacks, attachment, and handles that outlive their object.
#include <stdexcept>

#include "fixture.h"

namespace apitest {
namespace {

constexpr bool kAddressesRepeat = !TOV_SANITIZED;  // sanitizers keep freed memory aside

Picture constant(double value) {
    return painted(7, 5, kFloat4, [=](uint32_t, uint32_t) { return Rgba{value, value, value, 1}; });
}

class Queues : public DeviceTest {
 protected:
    static Handle scaleBy(float factor) { return newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", factor}}); }
    int32_t attach(tov_image_filter filter, tov_image input, tov_image output) {
        return tovCommandQueueAttachImageFilter(queue_, filter, input, output);
    }
    int32_t execute(tov_context owner = context()) {
        const auto count = [](void* calls) { ++*static_cast<int*>(calls); };
        return tovContextExecuteCommandQueue(owner, queue_, count, &calls_);
    }
    // Executes the queue; one pixel of the images a, b and c is then as expected, and so is the count of callbacks.
    void expectRun(int32_t code, const std::array<double, 3>& values, int calls) {
        EXPECT_EQ(execute(), code);
        for (size_t i = 0; i < 3; ++i) EXPECT_EQ(read(images_[i], Picture(7, 5)).at(6, 4)[1], values[i]) << i;
        EXPECT_EQ(calls_, calls);
    }
    // Deletes the object and makes others until one has its address.
    template <class Make>
    void replace(Handle& object, Make&& make) {
        const tov_object address = object.remove();
        for (int i = 0; kAddressesRepeat && i < 2000 && object != address; ++i) {
            others_.push_back(std::move(object));
            object = make();
        }
        EXPECT_TRUE(object == address || !kAddressesRepeat);
    }

    Handle queue_ = newQueue();
    std::array<Handle, 3> images_ = {newImage(constant(3)), newImage(constant(0)), newImage(constant(0))};
    const tov_image a_ = images_[0], b_ = images_[1], c_ = images_[2];
    std::vector<Handle> others_;
    int calls_ = 0;
};

TEST_F(Queues, RunTheirFiltersInOrderUpToTheFirstFailureAndCallBackAfterSuccess) {
    expectRun(TOV_SUCCESS, {3, 0, 0}, 1);  // of none
    const Handle first = scaleBy(2.0f);
    const Handle second = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 0.0f}});
    const Handle third = scaleBy(5.0f);
    ASSERT_EQ(attach(first, a_, b_), TOV_SUCCESS);
    ASSERT_EQ(attach(second, b_, c_), TOV_SUCCESS);
    ASSERT_EQ(attach(third, b_, b_), TOV_SUCCESS);
    expectRun(TOV_ERROR_INVALID_PARAMETER, {3, 6, 0}, 1);
    ASSERT_EQ(setParameter(second, {"cGamma", 1.0f}), TOV_SUCCESS);
    expectRun(TOV_SUCCESS, {3, 30, 6}, 2);
    ASSERT_EQ(tovCommandQueueDetachImageFilter(queue_, second), TOV_SUCCESS);
    EXPECT_EQ(tovCommandQueueDetachImageFilter(queue_, second), TOV_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(setParameter(first, {"cKey", 1.0f}), TOV_SUCCESS);
    expectRun(TOV_SUCCESS, {3, 15, 6}, 3);
}

TEST_F(Queues, ContainWhatTheirCallbackThrowsAndMayBeDeletedByIt) {
    const auto fail = [](void*) { throw std::runtime_error("from the host"); };
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, fail, nullptr), TOV_ERROR_INTERNAL_ERROR);
    const auto remove = [](void* queue) { static_cast<Handle*>(queue)->remove(); };
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue_, remove, &queue_), TOV_SUCCESS);
}

TEST_F(Queues, AttachmentChecksInputOutputAndTheirGeometryAndTheLatestImagesCountInEveryQueue) {
    const Handle filter = scaleBy(2.0f);
    const Handle other = newQueue();
    EXPECT_EQ(attach(filter, nullptr, b_), TOV_ERROR_INVALID_IMAGE);
    EXPECT_EQ(attach(filter, queue_, b_), TOV_ERROR_INVALID_IMAGE);
    EXPECT_EQ(attach(filter, a_, nullptr), TOV_ERROR_INVALID_IMAGE);
    // Height, depth, row pitch and slice pitch; a pitch of 0 is the width or the area, and the layout may be another.
    using Sizes = std::array<uint32_t, 4>;
    for (const auto& [height, depth, row, slice] :
         {Sizes{6, 1, 0, 0}, {5, 7, 0, 0}, {5, 1, 8, 0}, {5, 1, 0, 123}, {5, 1, 7, 35}}) {
        const Handle output = newImage(tov_image_desc{7, height, depth, row, slice, 1, TOV_COMPONENT_TYPE_UINT8});
        EXPECT_EQ(attach(filter, a_, output), row == 7 ? TOV_SUCCESS : TOV_ERROR_INVALID_OPERATION) << height << row;
    }
    ASSERT_EQ(tovCommandQueueAttachImageFilter(other, filter, a_, c_), TOV_SUCCESS);
    EXPECT_EQ(attach(filter, a_, a_), TOV_ERROR_INVALID_PARAMETER) << "attached already, but bound";
    expectRun(TOV_SUCCESS, {6, 0, 0}, 1);
}

TEST_F(Queues, DeletedObjectsStayDeletedWhenTheirAddressIsInUseAgain) {
    Handle filter = scaleBy(1.0f);
    ASSERT_EQ(attach(filter, a_, b_), TOV_SUCCESS);
    replace(images_[0], [] { return newImage(constant(5)); });
    EXPECT_EQ(execute(), TOV_ERROR_INVALID_IMAGE);
    if (kAddressesRepeat) {
        ASSERT_EQ(setParameter(filter, {"srcBuffer", a_}), TOV_SUCCESS);
        expectRun(TOV_SUCCESS, {5, 5, 0}, 1);  // bound afresh, the same address is the new image
    }
    replace(filter, [] { return scaleBy(1.0f); });
    EXPECT_EQ(execute(), TOV_ERROR_INVALID_FILTER);
    const Handle product = newFilter(TOV_IMAGE_FILTER_MULTIPLY);
    const Handle wavelets = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE);
    const std::vector<tov_image> elements = {b_, c_};
    setAll(product, elements);
    ASSERT_EQ(setParameter(wavelets, {"normalsImg", c_}), TOV_SUCCESS);
    images_[2].remove();
    EXPECT_EQ(DeviceTest::execute(product, b_, b_), TOV_ERROR_INVALID_IMAGE) << "an element of an array";
    EXPECT_EQ(DeviceTest::execute(wavelets, b_, b_), TOV_ERROR_INVALID_IMAGE) << "an optional image";
}

TEST_F(Queues, ImagesOutliveTheirContextButFiltersDoNotRun) {
    Handle owner = newContext();
    const Handle image = newImage(constant(3), owner);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, owner);
    ASSERT_EQ(attach(filter, image, image), TOV_SUCCESS);
    EXPECT_EQ(execute(), TOV_SUCCESS) << "a queue runs under any context";
    const tov_context dead = owner.remove();
    EXPECT_EQ(maxDifference(read(image, constant(3)), constant(3)), 0.0);
    EXPECT_EQ(execute(dead), TOV_ERROR_INVALID_CONTEXT);
    EXPECT_EQ(execute(), TOV_ERROR_INVALID_CONTEXT) << "through another live context";
}

}  // namespace
}  // namespace apitest
