// Which devices are counted, listed and chosen, and what initialisation prints and releases.
#include "fixture.h"

using standin::cpu;
using standin::gpu;
using testing::HasSubstr;
using testing::Not;

class Discovery : public OnStandin {
 protected:
    std::string chosenName(uint32_t index, uint32_t mask = zor::kAllVendors) {
        const DeviceOwner device = makeDevice({.deviceIndex = index, .vendorMask = mask});
        return opencl(device).deviceName();
    }
};

TEST(ClassifyVendor, ComparesTheWholeText) {
    EXPECT_EQ(zor::classifyVendor("NVIDIA Corporation"), zor::VENDOR_NVIDIA);
    EXPECT_EQ(zor::classifyVendor("Quarrion, Inc."), zor::VENDOR_QUARRION);
    EXPECT_EQ(zor::classifyVendor("Intel(R) Corporation"), zor::VENDOR_INTEL);
    EXPECT_EQ(zor::classifyVendor("Apple"), zor::VENDOR_APPLE);
    EXPECT_EQ(zor::classifyVendor("Apple "), zor::VENDOR_UNKNOWN);
    EXPECT_EQ(zor::classifyVendor(""), zor::VENDOR_UNKNOWN);
}

TEST_F(Discovery, CountsTheTypeOverAllAdmittedPlatforms) {
    driver().platforms = {
        {"Apple", {gpu("a"), cpu("b"), gpu("c")}}, {"Else", {gpu("d")}}, {"Intel(R) Corporation", {}}};
    EXPECT_EQ(zor::getDeviceCount(false, zor::kAllVendors), 3u);
    EXPECT_EQ(zor::getDeviceCount(true, zor::kAllVendors), 1u);
    EXPECT_EQ(zor::getDeviceCount(false, zor::VENDOR_UNKNOWN), 1u);
    EXPECT_EQ(zor::getDeviceCount(false, zor::VENDOR_NVIDIA), 0u);
}

TEST_F(Discovery, ASecondQuarrionPlatformIsWarnedOfAndCountsNothing) {
    driver().platforms = {{"Quarrion, Inc.", {gpu("a")}}, {"Quarrion, Inc.", {gpu("b"), gpu("c")}}};
    uint32_t count = 0;
    const std::string line = printed([&] { count = zor::getDeviceCount(false, zor::kAllVendors); });
    EXPECT_EQ(count, 1u);
    EXPECT_EQ(line, "WARNING : the system has more than 1 QUARRION platform installed\n");
    EXPECT_EQ(chosenName(9), "a");
    EXPECT_THAT(lines, HasSubstr("CL: 1 device (Quarrion, Inc.)\nCL: 0 device (Quarrion, Inc.)\n"));
}

TEST_F(Discovery, InitialisationMarksAQuarrionPlatformAlsoWhenItHasNoDevice) {
    driver().platforms = {{"Quarrion, Inc.", {cpu("x")}}, {"Quarrion, Inc.", {gpu("b")}}};
    const DeviceOwner device = makeDevice();
    EXPECT_FALSE(device->isInitialized());
    EXPECT_THAT(lines, HasSubstr("CL: 0 device (Quarrion, Inc.)\nCL: 0 device (Quarrion, Inc.)\n"));
    driver().platforms[1].vendor = "Else";
    EXPECT_EQ(chosenName(0, ~zor::VENDOR_QUARRION), "b");
    EXPECT_FALSE(makeDevice({.vendorMask = zor::VENDOR_QUARRION})->isInitialized());
}

TEST_F(Discovery, NoPlatformMeansNoDeviceAndNoError) {
    driver().platforms.clear();
    EXPECT_EQ(zor::getDeviceCount(false, zor::kAllVendors), 0u);
    const DeviceOwner device = makeDevice();
    EXPECT_FALSE(device->isInitialized());
    EXPECT_EQ(lines, "> CL Initialization\nCL 0 platforms\n");
}

TEST_F(Discovery, OtherFailuresToListPlatformsAreBrokenInvariants) {
    driver().fail("clGetPlatformIDs", CL_OUT_OF_HOST_MEMORY, 1, 2);
    EXPECT_THROW(zor::getDeviceCount(false, zor::kAllVendors), zor::Error);
    EXPECT_THROW(makeDevice(), zor::Error);
    driver().platforms.assign(16, {"Else", {gpu("a")}});
    EXPECT_THROW(zor::getDeviceCount(false, zor::kAllVendors), zor::Error);
    EXPECT_THROW(makeDevice(), zor::Error);
    driver().platforms.pop_back();
    EXPECT_EQ(zor::getDeviceCount(false, zor::kAllVendors), 15u);
}

TEST_F(Discovery, ADeviceCountWhoseQueryFailsIsZero) {
    driver().platforms = {{"A", {gpu("a")}}, {"B", {gpu("b")}}};
    driver().fail("clGetDeviceIDs", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(zor::getDeviceCount(false, zor::kAllVendors), 1u);
    driver().fail("clGetDeviceIDs", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(chosenName(0), "b");
}

TEST_F(Discovery, DevicesAreIndexedAcrossPlatformsAndTheLastOneServesBeyond) {
    driver().platforms = {{"A", {gpu("a"), cpu("x"), gpu("b")}}, {"B", {gpu("c")}}};
    EXPECT_EQ(chosenName(0), "a");
    EXPECT_EQ(chosenName(1), "b");
    EXPECT_EQ(chosenName(2), "c");
    EXPECT_EQ(chosenName(3), "c");
    EXPECT_EQ(chosenName(0x7FFFFFFF), "c");
    EXPECT_EQ(chosenName(0xFFFFFFFF), "a") << "-1, which callers do not pass";
    EXPECT_EQ(opencl(makeDevice({.deviceType = 7})).deviceName(), "x") << "any type but 0 is the CPU";
}

TEST_F(Discovery, ThirtyTwoDevicesAreListedAndOneMoreIsTooMany) {
    driver().platforms = {{"A", std::vector(20, gpu("a"))}, {"B", std::vector(12, gpu("b"))}};
    EXPECT_EQ(chosenName(31), "b");
    driver().platforms[1].devices.push_back(gpu("b"));
    EXPECT_THROW(makeDevice(), zor::Error);
}

TEST_F(Discovery, NoDeviceOfTheTypeLeavesAnEmptyDeviceThatRefusesWork) {
    driver().platforms = {{"A", {cpu("x")}}};
    const DeviceOwner device = makeDevice();
    EXPECT_EQ(lines, "> CL Initialization\nCL 1 platforms\nCL: 0 device (A)\n");
    EXPECT_EQ(device->getContext(), nullptr);
    EXPECT_THROW(device->finish(), zor::Error);
    EXPECT_THROW(device->flush(), zor::Error);
    EXPECT_THROW(device->getKernel({.fileName = "f", .kernelName = "k"}), zor::Error);
    EXPECT_THROW(device->queryGlobalMemorySize(), zor::Error);
    char text[zor::kDeviceTextBytes] = "#";
    EXPECT_THROW(device->getDeviceName(text), zor::Error);
    device->getBoardName(text);
    EXPECT_STREQ(text, "");
    const zor::Buffer<char> buffer(*device, 16, zor::BUFFER_DEFAULT);
    EXPECT_FALSE(buffer.hasMemory());
}

TEST_F(Discovery, PrintsTheStepsOfInitialisation) {
    driver().platforms = {{"Apple", {gpu("  Big one")}}};
    firstDevice().workItemSizes = {256, 128, 64};
    firstDevice().workGroupSize = 256;
    const DeviceOwner device = makeDevice();
    EXPECT_EQ(lines,
              "> CL Initialization\nCL 1 platforms\nCL: 1 device (Apple)\n[  Big one]\n"
              "CL_DEVICE_MAX_WORK_ITEM_SIZES  : 256, 128, 64\nCL_DEVICE_MAX_WORK_GROUP_SIZE  : 256\n"
              "CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS : 3\n< CL Initialization\n");
    EXPECT_EQ(driver().lastCall("clCreateCommandQueue").numbers, std::vector<uint64_t>{CL_QUEUE_PROFILING_ENABLE});
    EXPECT_EQ(device->getTotalMemory(), firstDevice().globalMemory);
    EXPECT_EQ(opencl(device).maxAllocation(), firstDevice().maxAllocation);
}

// Whatever call of initialisation fails, everything that was made before is released: TearDown counts the objects.
TEST_F(Discovery, AFailureHalfWayReleasesWhatWasMade) {
    const char* const required[] = {"clGetPlatformInfo", "clCreateContext", "clCreateCommandQueue"};
    for (const char* call : required) {
        driver().fail(call, CL_OUT_OF_RESOURCES);
        EXPECT_THROW(makeDevice(), zor::Error) << call;
    }
    makeDevice();
    const auto queries = static_cast<uint32_t>(driver().callCount("clGetDeviceInfo"));
    uint32_t thrown = 0;
    for (uint32_t at = 1; at <= queries; ++at) {
        driver().fail("clGetDeviceInfo", CL_OUT_OF_RESOURCES, at);
        try {
            makeDevice();
        } catch (const zor::Error&) {
            ++thrown;
        }
        EXPECT_EQ(driver().liveObjects(), 0u) << "query " << at;
    }
    EXPECT_GE(thrown, 8u) << "all but the driver's version must be had";
    EXPECT_LT(thrown, queries);
}

TEST_F(Discovery, SharesTheContextWithOpenGlWhereThatRunsOnTheChosenDevice) {
    driver().platforms = {{"A", {gpu("a"), gpu("b")}}};
    const cl_context_properties pairs[] = {CL_GL_CONTEXT_KHR, 77, 0};
    driver().glDevice = 1;
    {
        const DeviceOwner device = makeDevice({.deviceIndex = 1, .contextProperties = pairs});
        EXPECT_TRUE(device->isGlShared());
        const auto list = driver().lastCall("clCreateContext").numbers;
        ASSERT_EQ(list.size(), 4u);
        EXPECT_EQ(list[0], uint64_t{CL_GL_CONTEXT_KHR});
        EXPECT_EQ(list[1], 77u);
        EXPECT_EQ(list[2], 0x1084u);
        EXPECT_EQ(driver().lastCall("clGetGLContextInfoKHR").numbers, list);
    }
    const DeviceOwner other = makeDevice({.deviceIndex = 0, .contextProperties = pairs});
    EXPECT_FALSE(other->isGlShared()) << "another device drives OpenGL";
    EXPECT_TRUE(driver().lastCall("clCreateContext").numbers.empty());
    EXPECT_LE(driver().callCount("clGetExtensionFunctionAddress"), 1u) << "looked up once per process";
}

TEST_F(Discovery, FallsBackToAPlainContextWhenTheSharedOneFails) {
    const cl_context_properties pairs[] = {CL_GL_CONTEXT_KHR, 77, 0};
    driver().fail("clCreateContext", CL_INVALID_PROPERTY);
    const DeviceOwner device = makeDevice({.contextProperties = pairs});
    EXPECT_TRUE(device->isInitialized());
    EXPECT_FALSE(device->isGlShared());
    EXPECT_EQ(driver().callCount("clCreateContext"), 2u);
    driver().fail("clGetGLContextInfoKHR", CL_INVALID_OPERATION);
    EXPECT_FALSE(makeDevice({.contextProperties = pairs})->isGlShared());
}

TEST_F(Discovery, AssumesTheChosenDeviceWhereTheDriverCannotTellOpenGls) {
    zor::unloadOpenCL();  // with it the remembered address
    driver().hasGlContextInfo = false;
    driver().glDevice = 99;
    const cl_context_properties pairs[] = {CL_GL_CONTEXT_KHR, 77, 0};
    EXPECT_TRUE(makeDevice({.contextProperties = pairs})->isGlShared());
    EXPECT_TRUE(makeDevice({.contextProperties = pairs})->isGlShared());
    EXPECT_EQ(driver().callCount("clGetExtensionFunctionAddress"), 1u);
    zor::unloadOpenCL();
    ASSERT_EQ(zor::loadOpenCL(), 0);
}

TEST_F(Discovery, AContextTakesThirtyTwoPropertiesAndNoMore) {
    std::vector<cl_context_properties> pairs(28, CL_GL_CONTEXT_KHR);
    pairs.push_back(0);
    EXPECT_TRUE(makeDevice({.contextProperties = pairs.data()})->isGlShared());
    pairs.insert(pairs.begin(), 2, CL_GL_CONTEXT_KHR);
    EXPECT_THROW(makeDevice({.contextProperties = pairs.data()}), zor::Error);
}
