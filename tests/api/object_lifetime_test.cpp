// Deletion in any order, and handles that outlive their object.
#include <cstring>

#include "fixture.h"

namespace apitest {
namespace {

constexpr tov_image_desc kDesc = {7, 5, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};

// AddressSanitizer keeps freed memory aside, so no address comes back.
#if defined(__SANITIZE_ADDRESS__)
constexpr bool kAddressesRepeat = false;
#elif defined(__has_feature)
constexpr bool kAddressesRepeat = !__has_feature(address_sanitizer);
#else
constexpr bool kAddressesRepeat = true;
#endif

class ObjectLifetime : public DeviceTest {
 protected:
    // Creates objects until one receives the address, which the deleted object's memory makes likely.
    template <class Make>
    static bool reuseAddress(void* address, std::vector<Handle>& kept, Make&& make) {
        for (int i = 0; i < 2000; ++i) {
            kept.push_back(make());
            if (static_cast<void*>(kept.back()) == address) return true;
        }
        return false;
    }
    static int32_t execute(tov_command_queue queue) {
        return tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr);
    }
};

TEST_F(ObjectLifetime, DeletingTheMiddleOfThreeLeavesTheOthers) {
    std::vector<Handle> images;
    for (int i = 0; i < 3; ++i) images.push_back(newImage(kDesc));
    const tov_object middle = images[1].remove();
    uint64_t bytes = 0;
    uint64_t size = 0;
    EXPECT_EQ(tovImageGetInfo(images[0], TOV_IMAGE_DATA_SIZE, 8, &bytes, &size), TOV_SUCCESS);
    EXPECT_EQ(tovImageGetInfo(images[2], TOV_IMAGE_DATA_SIZE, 8, &bytes, &size), TOV_SUCCESS);
    EXPECT_EQ(tovImageGetInfo(middle, TOV_IMAGE_DATA_SIZE, 8, &bytes, &size), TOV_ERROR_INVALID_IMAGE);
}

TEST_F(ObjectLifetime, ImagesAndQueuesSurviveTheirContextButFiltersDoNotRun) {
    Handle owner = newContext();
    const Picture picture = noise(7, 5);
    const Handle input = newImage(picture, owner);
    const Handle output = newImage(picture, owner);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, owner);
    const Handle queue = newQueue(owner);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
    const tov_context dead = owner.remove();

    EXPECT_EQ(maxDifference(read(input, picture), picture), 0.0) << "the image was lost with its context";
    EXPECT_EQ(tovContextExecuteCommandQueue(dead, queue, nullptr, nullptr), TOV_ERROR_INVALID_CONTEXT);
    EXPECT_EQ(execute(queue), TOV_ERROR_INVALID_CONTEXT) << "through another live context";
    EXPECT_EQ(setParameter(filter, {"cKey", 2.0f}), TOV_SUCCESS);
    void* unused = nullptr;
    EXPECT_EQ(tovContextCreateImageFilter(dead, 0, &unused), TOV_ERROR_INVALID_CONTEXT);
}

TEST_F(ObjectLifetime, DeletingAMappedImageUnmapsItAndDeletingItsContextFirstIsSafe) {
    Handle owner = newContext();
    Handle image = newImage(kDesc, nullptr, owner);
    void* first = nullptr;
    void* second = nullptr;
    ASSERT_EQ(tovImageMap(image, 0, &first), TOV_SUCCESS);
    ASSERT_EQ(tovImageMap(image, 0, &second), TOV_SUCCESS);
    owner.remove();
    std::memset(first, 0, 7 * 5 * 16);
    EXPECT_EQ(tovObjectDelete(image), TOV_SUCCESS);
    *image.out() = nullptr;
}

TEST_F(ObjectLifetime, ABoundImageThatWasDeletedIsRecognisedAlsoAtAnAddressInUseAgain) {
    const Handle output = newImage(kDesc);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    const Handle queue = newQueue();
    Handle input = newImage(noise(7, 5));
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
    const tov_object address = input.remove();
    EXPECT_EQ(execute(queue), TOV_ERROR_INVALID_IMAGE);

    if (!kAddressesRepeat) return;
    std::vector<Handle> others;
    ASSERT_TRUE(reuseAddress(address, others, [] { return newImage(kDesc); }));
    EXPECT_EQ(execute(queue), TOV_ERROR_INVALID_IMAGE);
    ASSERT_EQ(tovImageFilterSetParameterImage(filter, "srcBuffer", address), TOV_SUCCESS);
    EXPECT_EQ(execute(queue), TOV_SUCCESS) << "bound afresh, the same address is the new image";
}

TEST_F(ObjectLifetime, AnAttachedFilterThatWasDeletedIsRecognisedAlsoAtAnAddressInUseAgain) {
    const Handle image = newImage(noise(7, 5));
    const Handle queue = newQueue();
    Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, image, image), TOV_SUCCESS);
    const tov_object address = filter.remove();
    EXPECT_EQ(execute(queue), TOV_ERROR_INVALID_FILTER);

    if (!kAddressesRepeat) return;
    std::vector<Handle> others;
    ASSERT_TRUE(reuseAddress(address, others, [] { return newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP); }));
    EXPECT_EQ(execute(queue), TOV_ERROR_INVALID_FILTER);
    EXPECT_EQ(tovCommandQueueDetachImageFilter(queue, address), TOV_ERROR_INVALID_PARAMETER)
        << "the new filter was never attached";
    EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, address, image, image), TOV_SUCCESS)
        << "the new filter is not the one in the list";
}

TEST_F(ObjectLifetime, DeletedArrayElementsAndOptionalImagesGiveTheImageCode) {
    const Handle image = newImage(noise(7, 5));
    Handle element = newImage(noise(7, 5));
    std::vector<tov_image> elements = {image, element};
    const Handle product = newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", 2u}});
    ASSERT_EQ(tovImageFilterSetParameterImageArray(product, "inputs", elements.data(), 2), TOV_SUCCESS);
    Handle normals = newImage(noise(7, 5));
    const Handle wavelets = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE, {{"normalsImg", tov_image{normals}}});
    element.remove();
    normals.remove();
    EXPECT_EQ(DeviceTest::execute(product, image, image), TOV_ERROR_INVALID_IMAGE);
    EXPECT_EQ(DeviceTest::execute(wavelets, image, image), TOV_ERROR_INVALID_IMAGE);
}

TEST_F(ObjectLifetime, ADeletedFilterBoundAsInputGivesTheFilterCode) {
    const Handle image = newImage(noise(7, 5));
    Handle inner = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    const Handle outer = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION);
    const Handle queue = newQueue();
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, outer, inner, image), TOV_SUCCESS);
    inner.remove();
    EXPECT_EQ(execute(queue), TOV_ERROR_INVALID_FILTER);
}

}  // namespace
}  // namespace apitest
