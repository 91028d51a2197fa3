// Failures of the driver: any call, at any time, gives a code, leaks nothing and leaves the queue usable. And what no
// real machine offers: no platform, and a driver that counts what is left behind.
#include <algorithm>
#include <set>

#include "fixture.h"
#include "standin_fixture.h"

namespace apitest {
namespace {

constexpr tov_image_desc kDesc = {20, 9, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};

// Without them nothing can be right, so their failures must reach the host.
const std::set<std::string> kNeeded = {"clBuildProgram",     "clCreateBuffer",         "clCreateKernel",
                                       "clEnqueueMapBuffer", "clEnqueueNDRangeKernel", "clFinish",
                                       "clSetKernelArg"};

// A host that makes, runs and deletes everything, and goes on where a call fails; it runs once more after the failure.
void runSession(uint32_t type, const std::string& call, uint32_t at) {
    const std::vector<unsigned char> pixels(size_t{20} * 9 * 16, 1);
    void *context = nullptr, *image = nullptr, *filter = nullptr, *queue = nullptr, *mapped = nullptr;
    std::vector<int32_t> codes = {tovCreateContext(1, 0, TOV_DEVICE_TYPE_GPU, 0, kNoCache, &context),
                                  tovContextCreateImage(context, &kDesc, pixels.data(), &image),
                                  tovContextCreateImageFilter(context, type, &filter),
                                  tovContextCreateCommandQueue(context, &queue)};
    const auto isReached = [&] { return standin::state().callCount(call) >= at; };
    if (filter != nullptr && queue != nullptr && image != nullptr) {
        tovImageFilterSetParameter1f(filter, "sigma", 1.0f);
        tovImageFilterSetParameterImage(filter, "positionsImg", image);
        codes.push_back(tovCommandQueueAttachImageFilter(queue, filter, image, image));
        codes.push_back(tovContextExecuteCommandQueue(context, queue, nullptr, nullptr));
        codes.push_back(tovImageMap(image, 0, &mapped));
        if (mapped != nullptr) codes.push_back(tovImageUnmap(image, mapped));
        if (isReached()) {
            EXPECT_EQ(tovContextExecuteCommandQueue(context, queue, nullptr, nullptr), TOV_SUCCESS);
        }
    }
    EXPECT_THAT(codes, testing::Each(testing::AnyOf(TOV_SUCCESS, TOV_ERROR_INTERNAL_ERROR, TOV_ERROR_INVALID_CONTEXT)));
    if (kNeeded.contains(call) && isReached()) {
        EXPECT_THAT(codes, testing::Contains(testing::Lt(0)));
    }
    for (void* object : {queue, filter, image, context})
        if (object != nullptr) tovObjectDelete(object);
}

using DriverFailures = StandinTest;

TEST_F(DriverFailures, GiveACodeLeakNothingAndLeaveTheQueueUsable) {
    for (const uint32_t type : {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION}) {
        driver().reset();
        runSession(type, "", 1);
        std::map<std::string, uint32_t> counts;
        for (const standin::Call& call : driver().calls) ++counts[call.name];
        EXPECT_GE(counts.size(), 22u);
        for (const auto& [call, count] : counts) {
            for (uint32_t at = 1; at <= count; ++at) {
                SCOPED_TRACE(testing::Message() << call << " number " << at << ", type " << type);
                driver().reset();
                driver().fail(call, CL_OUT_OF_RESOURCES, at);
                printedBy([&, &name = call] { runSession(type, name, at); });  // the lines that name each failure
                // A driver that fails to release an object keeps it; whatever else we leave behind is our leak.
                EXPECT_LE(driver().liveObjects(), call.starts_with("clRelease") ? 1u : 0u);
                EXPECT_THAT(driver().misuse, testing::IsEmpty());
                driver().live.clear();
                driver().maps.clear();
            }
        }
    }
}

TEST_F(DriverFailures, NoPlatformMeansNoDevicesAndNoError) {
    driver().platforms = {};
    uint32_t count = 77;
    EXPECT_EQ(tovGetDeviceCount(0, TOV_DEVICE_TYPE_GPU, &count), TOV_SUCCESS);
    EXPECT_EQ(count, 0u);
    EXPECT_EQ(tovCreateContext(1, 0, TOV_DEVICE_TYPE_GPU, 0, kNoCache, &context_), TOV_ERROR_INVALID_CONTEXT);
}

TEST_F(DriverFailures, ObjectsAreDeletedInAnyOrderWithoutALeakOrAUseAfterwards) {
    std::array<size_t, 5> order = {0, 1, 2, 3, 4};
    do {
        open();
        const tov_image input = newImage(kDesc);
        const tov_image output = newImage(kDesc);
        ASSERT_EQ(attachAndExecute(newFilter(TOV_IMAGE_FILTER_MLAA), input, output), TOV_SUCCESS);
        void* pixels = nullptr;
        ASSERT_EQ(tovImageMap(output, 0, &pixels), TOV_SUCCESS);
        for (const size_t index : order) {
            EXPECT_EQ(tovObjectDelete(objects_[index]), TOV_SUCCESS);
            EXPECT_LT(execute(), 0) << "something that it needs is gone";
        }
        objects_.clear();
        ASSERT_EQ(driver().liveObjects() + driver().maps.size(), 0u) << testing::PrintToString(order);
    } while (std::next_permutation(order.begin(), order.end()));
}

}  // namespace
}  // namespace apitest
