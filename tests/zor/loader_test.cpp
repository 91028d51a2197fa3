// Opening the OpenCL library and naming its errors.
#include <dlfcn.h>

#include "fixture.h"
#include "hooks.h"

using testing::ElementsAre;

class Loader : public OnStandin {
 protected:
    void SetUp() override {
        OnStandin::SetUp();
        zor::unloadOpenCL();
        hooks::state() = {};
    }
    void TearDown() override {
        hooks::state() = {};
        zor::unloadOpenCL();
        EXPECT_EQ(zor::loadOpenCL(), 0);
        OnStandin::TearDown();
    }
};

TEST_F(Loader, OpensTheLibraryOnceByItsNameAndRegistersOneExitHook) {
    EXPECT_FALSE(zor::cl().clFinish);
    EXPECT_EQ(zor::loadOpenCL(), 0);
    EXPECT_EQ(zor::loadOpenCL(), 0);
    EXPECT_THAT(hooks::state().opened, ElementsAre("libOpenCL.so.1"));
    EXPECT_THAT(hooks::state().flags, ElementsAre(RTLD_NOW | RTLD_LOCAL));
    EXPECT_EQ(hooks::state().atexitCalls, 1);
    EXPECT_TRUE(zor::cl().clFinish);
}

TEST_F(Loader, TriesTheSecondNameThenGivesUp) {
    hooks::state().paths = {{"libOpenCL.so.1", ""}, {"libOpenCL.so", ""}};
    EXPECT_EQ(zor::loadOpenCL(), -1);
    EXPECT_THAT(hooks::state().opened, ElementsAre("libOpenCL.so.1", "libOpenCL.so"));
    EXPECT_EQ(hooks::state().atexitCalls, 0);
    EXPECT_FALSE(zor::isDeviceKindAvailable(zor::DEVICE_KIND_CL));
    EXPECT_EQ(zor::getDeviceCount(false, zor::kAllVendors), 0u);
    EXPECT_THROW(makeDevice(), zor::Error);
}

TEST_F(Loader, FreesTheLibraryAgainWhenTheExitHookCannotBeRegistered) {
    hooks::state().refuseAtexit = true;
    EXPECT_EQ(zor::loadOpenCL(), -2);
    EXPECT_EQ(hooks::state().closed, 1);
    EXPECT_FALSE(zor::cl().clFinish);
}

TEST_F(Loader, ForgetsTheLibraryButLeavesItMapped) {
    ASSERT_EQ(zor::loadOpenCL(), 0);
    zor::unloadOpenCL();
    EXPECT_EQ(hooks::state().closed, 0);
    EXPECT_THROW(zor::cl().clFinish(nullptr), zor::Error);
    EXPECT_EQ(zor::loadOpenCL(), 0);
    EXPECT_EQ(hooks::state().atexitCalls, 2) << "once per load";
}

TEST_F(Loader, ObjectsThatOutliveTheLibraryAreLeftAlone) {
    DeviceOwner device = makeDevice();
    cl_context const context = device->getContext();
    cl_command_queue const queue = opencl(device).queue();
    zor::unloadOpenCL();
    device.reset();
    EXPECT_EQ(driver().liveObjects(), 2u) << "context and queue belong to a library that is gone";
    standin::function<decltype(clReleaseCommandQueue)>("clReleaseCommandQueue")(queue);
    standin::function<decltype(clReleaseContext)>("clReleaseContext")(context);
}

TEST_F(Loader, CountsAReferenceForEachSuccessfulQuestion) {
    EXPECT_TRUE(zor::isDeviceKindAvailable(zor::DEVICE_KIND_CL));
    EXPECT_TRUE(zor::isDeviceKindAvailable(zor::DEVICE_KIND_CL));
    EXPECT_FALSE(zor::isDeviceKindAvailable(zor::DEVICE_KIND_HOST));
    EXPECT_FALSE(zor::isDeviceKindAvailable(1));
    EXPECT_EQ(zor::openCLReferences(), 2u);
}

TEST_F(Loader, AnEntryPointThatTheLibraryLacksIsABrokenInvariantAndNoCrash) {
    hooks::state().paths = {{"libOpenCL.so.1", STANDIN_BARE_PATH}};
    ASSERT_EQ(zor::loadOpenCL(), 0);
    EXPECT_FALSE(zor::cl().clEnqueueCopyBuffer);
    std::string line;
    try {
        line = printed([] { EXPECT_THROW(zor::cl().clGetExtensionFunctionAddress("any"), zor::Error); });
    } catch (const zor::Error&) {}
    EXPECT_EQ(line, "clGetExtensionFunctionAddress: missing from the OpenCL library\n");
    EXPECT_EQ(zor::glContextInfo(), nullptr);
}

TEST_F(Loader, CopiesBuffersThroughTheHostWhereTheLibraryCannot) {
    hooks::state().paths = {{"libOpenCL.so.1", STANDIN_BARE_PATH}};
    const DeviceOwner device = makeDevice();
    zor::Buffer<char> from(*device, 64, zor::BUFFER_DEFAULT);
    zor::Buffer<char> to(*device, 64, zor::BUFFER_DEFAULT);
    auto* bytes = static_cast<char*>(from.map());
    std::fill_n(bytes, 64, 'a');
    from.unmap(bytes);
    to.copyFrom(from, 10);
    bytes = static_cast<char*>(to.map());
    EXPECT_EQ(std::string(bytes, 12), std::string(10, 'a') + std::string(2, '\0'));
    to.unmap(bytes);
}

TEST(OpenCLErrorString, NamesTheStatusCodes) {
    const std::pair<int32_t, const char*> names[] = {
        {0, "CL_SUCCESS"},
        {-1, "CL_DEVICE_NOT_FOUND"},
        {-11, "CL_BUILD_PROGRAM_FAILURE"},
        {-19, "CL_KERNEL_ARG_INFO_NOT_AVAILABLE"},
        {-20, ""},
        {-29, ""},
        {-30, "CL_INVALID_VALUE"},
        {-54, "CL_INVALID_WORK_GROUP_SIZE"},
        {-68, "CL_INVALID_DEVICE_PARTITION_COUNT"},
        {-69, "Unknown OpenCL error"},
        {1, "Unknown OpenCL error"},
        {INT32_MIN, "Unknown OpenCL error"},
        {-1001, "CL_PLATFORM_NOT_FOUND_KHR"},
    };
    for (const auto& [status, name] : names) EXPECT_STREQ(zor::openCLErrorString(status), name) << status;
}

TEST(Check, PrintsOneLineAndThrowsTheSameText) {
    testing::internal::CaptureStdout();
    std::string thrown;
    try {
        zor::check(CL_SUCCESS, "clFinish");
        zor::check(-5, "clFinish");
    } catch (const zor::Error& error) {
        thrown = error.what();
    }
    EXPECT_EQ(thrown, "clFinish: CL_OUT_OF_RESOURCES (-5)");
    EXPECT_EQ(testing::internal::GetCapturedStdout(), thrown + "\n");
}
