// Handles that outlive their object.
#include "fixture.h"

namespace apitest {
namespace {

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
    // Deletes the object and makes others until one has its address.
    template <class Make>
    tov_object replace(Handle& object, Make&& make) {
        const tov_object address = object.remove();
        for (int i = 0; kAddressesRepeat && i < 2000 && object != address; ++i) {
            others_.push_back(std::move(object));
            object = make();
        }
        EXPECT_TRUE(object == address || !kAddressesRepeat);
        return kAddressesRepeat ? address : nullptr;
    }
    int32_t executeQueue() { return tovContextExecuteCommandQueue(context(), queue_, nullptr, nullptr); }

    const Picture picture_ = noise(7, 5);
    const Handle queue_ = newQueue();
    const Handle output_ = newImage(picture_);
    Handle input_ = newImage(picture_);
    Handle filter_ = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP);
    std::vector<Handle> others_;
};

TEST_F(ObjectLifetime, DeletedObjectsStayDeletedWhenTheirAddressIsInUseAgain) {
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue_, filter_, input_, output_), TOV_SUCCESS);
    const tov_object image = replace(input_, [&] { return newImage(picture_); });
    EXPECT_EQ(executeQueue(), TOV_ERROR_INVALID_IMAGE);
    if (image != nullptr) {
        ASSERT_EQ(tovImageFilterSetParameterImage(filter_, "srcBuffer", image), TOV_SUCCESS);
        EXPECT_EQ(executeQueue(), TOV_SUCCESS) << "bound afresh, the same address is the new image";
    }
    const tov_object filter = replace(filter_, [] { return newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP); });
    EXPECT_EQ(executeQueue(), TOV_ERROR_INVALID_FILTER);
    if (filter == nullptr) return;
    EXPECT_EQ(tovCommandQueueDetachImageFilter(queue_, filter), TOV_ERROR_INVALID_PARAMETER) << "never attached";
    EXPECT_EQ(tovCommandQueueAttachImageFilter(queue_, filter, input_, output_), TOV_SUCCESS);
}

TEST_F(ObjectLifetime, DeletedArrayElementsAndOptionalImagesGiveTheImageCode) {
    Handle gone = newImage(picture_);
    const Parameters elements = {{"inputs", std::vector<tov_image>{output_, gone}}, {"inputsNum", 2u}};
    const Handle product = newFilter(TOV_IMAGE_FILTER_MULTIPLY, elements);
    const Handle wavelets = newFilter(TOV_IMAGE_FILTER_EAW_DENOISE, {{"normalsImg", tov_image{gone}}});
    gone.remove();
    EXPECT_EQ(execute(product, input_, output_), TOV_ERROR_INVALID_IMAGE);
    EXPECT_EQ(execute(wavelets, input_, output_), TOV_ERROR_INVALID_IMAGE);
}

TEST_F(ObjectLifetime, ImagesOutliveTheirContextButFiltersDoNotRun) {
    Handle owner = newContext();
    const Handle image = newImage(picture_, owner);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, owner);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue_, filter, image, image), TOV_SUCCESS);
    EXPECT_EQ(executeQueue(), TOV_SUCCESS) << "a queue runs under any context";
    const tov_context dead = owner.remove();
    EXPECT_EQ(maxDifference(read(image, picture_), picture_), 0.0);
    EXPECT_EQ(tovContextExecuteCommandQueue(dead, queue_, nullptr, nullptr), TOV_ERROR_INVALID_CONTEXT);
    EXPECT_EQ(executeQueue(), TOV_ERROR_INVALID_CONTEXT) << "through another live context";
}

}  // namespace
}  // namespace apitest
