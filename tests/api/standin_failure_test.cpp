// Failures of the driver: any call, at any time, gives a code, leaks nothing and leaves the queue usable. And what no
// real machine offers: no platform, and a driver that counts what is left behind.
#include <algorithm>

#include "standin_fixture.h"

namespace apitest {
namespace {

constexpr tov_image_desc kDesc = {20, 9, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};

// A host that makes, runs and deletes everything, and goes on where a call fails; it runs once more after the failure.
void runSession(uint32_t type, const std::string& call, uint32_t at) {
    const std::vector<unsigned char> pixels(size_t{20} * 9 * 16, 1);
    void *context = nullptr, *image = nullptr, *filter = nullptr, *queue = nullptr, *mapped = nullptr;
    const auto expectKnown = [](int32_t code) {
        EXPECT_THAT(code, testing::AnyOf(TOV_SUCCESS, TOV_ERROR_INTERNAL_ERROR, TOV_ERROR_INVALID_CONTEXT));
    };
    expectKnown(tovCreateContext(TOV_API_VERSION, 0, TOV_DEVICE_TYPE_GPU, 0, kNoCache, &context));
    expectKnown(tovContextCreateImage(context, &kDesc, pixels.data(), &image));
    expectKnown(tovContextCreateImageFilter(context, type, &filter));
    expectKnown(tovContextCreateCommandQueue(context, &queue));
    if (filter != nullptr && queue != nullptr && image != nullptr) {
        tovImageFilterSetParameter1f(filter, "sigma", 1.0f);
        tovImageFilterSetParameterImage(filter, "positionsImg", image);
        expectKnown(tovCommandQueueAttachImageFilter(queue, filter, image, image));
        expectKnown(tovContextExecuteCommandQueue(context, queue, nullptr, nullptr));
        expectKnown(tovImageMap(image, 0, &mapped));
        if (mapped != nullptr) expectKnown(tovImageUnmap(image, mapped));
        if (standin::state().callCount(call) >= at) {
            EXPECT_EQ(tovContextExecuteCommandQueue(context, queue, nullptr, nullptr), TOV_SUCCESS);
        }
    }
    for (void* object : {queue, filter, image, context})
        if (object != nullptr) tovObjectDelete(object);
}

class DriverFailures : public StandinTest, public testing::WithParamInterface<const char*> {};

TEST_P(DriverFailures, GiveACodeLeakNothingAndLeaveTheQueueUsable) {
    const std::string call = GetParam();
    // A driver that fails to release an object keeps it; whatever else we leave behind is our leak.
    const size_t kept = call.find("clRelease") == 0 ? 1 : 0;
    uint32_t failures = 0;
    for (const uint32_t type :
         {TOV_IMAGE_FILTER_GAMMA_CORRECTION, TOV_IMAGE_FILTER_GAUSSIAN_BLUR, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION}) {
        for (uint32_t at = 1; at < 200; ++at) {
            SCOPED_TRACE(testing::Message() << "type " << type << ", call number " << at);
            driver().reset();
            driver().fail(call, CL_OUT_OF_RESOURCES, at);
            testing::internal::CaptureStdout();  // the lines that name each failure
            runSession(type, call, at);
            testing::internal::GetCapturedStdout();
            EXPECT_LE(driver().liveObjects(), kept);
            EXPECT_THAT(driver().misuse, testing::IsEmpty());
            driver().live.clear();
            driver().maps.clear();
            if (driver().callCount(call) < at) break;  // the whole session has fewer such calls
            ++failures;
        }
    }
    EXPECT_GT(failures, 0u) << "no session makes that call";
}

INSTANTIATE_TEST_SUITE_P(All, DriverFailures,
                         testing::Values("clGetPlatformIDs", "clGetPlatformInfo", "clGetDeviceIDs", "clGetDeviceInfo",
                                         "clCreateContext", "clCreateCommandQueue", "clCreateBuffer",
                                         "clCreateProgramWithSource", "clBuildProgram", "clGetProgramInfo",
                                         "clCreateKernel", "clSetKernelArg", "clEnqueueNDRangeKernel",
                                         "clEnqueueMapBuffer", "clEnqueueUnmapMemObject", "clEnqueueCopyBuffer",
                                         "clFinish", "clReleaseMemObject", "clReleaseKernel", "clReleaseProgram",
                                         "clReleaseCommandQueue", "clReleaseContext"));

class DriverOffers : public StandinTest {};

TEST_F(DriverOffers, NoPlatformMeansNoDevicesAndNoError) {
    driver().platforms = {};
    uint32_t count = 77;
    EXPECT_EQ(tovGetDeviceCount(0, TOV_DEVICE_TYPE_GPU, &count), TOV_SUCCESS);
    EXPECT_EQ(count, 0u);
    EXPECT_EQ(tovCreateContext(1, 0, TOV_DEVICE_TYPE_GPU, 0, kNoCache, &context_), TOV_ERROR_INVALID_CONTEXT);
}

TEST_F(DriverOffers, ObjectsAreDeletedInAnyOrderWithoutALeakOrAUseAfterwards) {
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
