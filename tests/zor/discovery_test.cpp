// Opening the OpenCL library and what it may lack, which devices are counted, listed and chosen, and which contexts are
// made for OpenGL. This program's own dlopen stands before the system's.
#include <dlfcn.h>

#include "fixture.h"

static bool hasLibrary = true;
static std::string opened;

extern "C" void* dlopen(const char* name, int flags) {
    using Open = void*(const char*, int);
    static auto* const real = reinterpret_cast<Open*>(dlsym(RTLD_NEXT, "dlopen"));
    if (name == nullptr || std::strncmp(name, "libOpenCL", 9) != 0) return real(name, flags);
    opened.append(name).append(" ");
    return hasLibrary ? real(name, flags) : nullptr;
}

class Discovery : public OnStandin {};

static uint32_t count(uint32_t mask = zor::kAllVendors) {
    return zor::getDeviceCount(false, mask);
}

TEST_F(Discovery, OpensTheLibraryOnceByItsNameAndGivesUpAfterTheSecond) {
    device.reset();
    const auto reload = [](bool there) {
        zor::unloadOpenCL();
        opened.clear();
        hasLibrary = there;
        return zor::loadOpenCL();
    };
    EXPECT_EQ(reload(false), -1);
    EXPECT_EQ(opened, "libOpenCL.so.1 libOpenCL.so ");
    EXPECT_EQ(count(), 0u);
    EXPECT_THROW(makeDevice(), zor::Error);
    EXPECT_EQ(reload(true), 0);
    EXPECT_EQ(opened, "libOpenCL.so.1 ");
}

TEST_F(Discovery, NamesTheCallThatTheLibraryLacksAndTheStatusOfOneThatFailed) {
    EXPECT_STREQ(zor::openCLErrorString(-68), "CL_INVALID_DEVICE_PARTITION_COUNT");
    for (const int32_t status : {-69, 1, INT32_MIN})
        EXPECT_STREQ(zor::openCLErrorString(status), "Unknown OpenCL error");
    printed();
    EXPECT_THROW(zor::check(-5, "clFinish"), zor::Error);
    EXPECT_THROW(device->flush(), zor::Error);
    EXPECT_EQ(printed(), "clFinish: CL_OUT_OF_RESOURCES (-5)\nclFlush: missing from the OpenCL library\n");
}

TEST_F(Discovery, CountsAndIndexesTheDevicesOfTheAdmittedPlatforms) {
    driver().platforms = {{"Apple", {{"a"}, {"x", CL_DEVICE_TYPE_CPU}, {"b"}}}, {"Apple ", {{"c"}}}, {"NVIDIA", {}}};
    EXPECT_EQ(count(), 3u);
    EXPECT_EQ(zor::getDeviceCount(true, zor::kAllVendors), 1u);
    EXPECT_EQ(count(zor::VENDOR_APPLE), 2u);
    EXPECT_EQ(count(zor::VENDOR_UNKNOWN), 1u) << "texts are compared whole";
    EXPECT_EQ(count(zor::VENDOR_INTEL | zor::VENDOR_NVIDIA), 0u);
    const auto chosen = [](const zor::DeviceConfig& config) { return opencl(makeDevice(config)).deviceName(); };
    for (const auto& [index, name] : {std::pair{0u, "a"}, {1u, "b"}, {2u, "c"}, {3u, "c"}, {0x7FFFFFFFu, "c"}})
        EXPECT_EQ(chosen({.deviceIndex = index}), name);
    EXPECT_EQ(chosen({.deviceType = 7}), "x") << "any type but 0 is the CPU";
    EXPECT_EQ(chosen({.vendorMask = ~zor::VENDOR_APPLE}), "c");
    driver().fail("clGetDeviceIDs", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(count(), 1u) << "a platform whose query fails has none";
    driver().platforms.assign(2, {"Quarrion, Inc.", {{"a"}}});
    EXPECT_EQ(count(), 1u) << "of this vendor one platform is taken";
    EXPECT_THAT(printed(), testing::EndsWith("WARNING : the system has more than 1 QUARRION platform installed\n"));
}

TEST_F(Discovery, MoreThanTheListsHoldIsABrokenInvariant) {
    driver().platforms = {{"A", std::vector(31, standin::Device{"a"})}, {"B", {{"b"}}}};
    EXPECT_EQ(opencl(makeDevice({.deviceIndex = 31})).deviceName(), "b");
    driver().platforms[1].devices.push_back({});
    EXPECT_THROW(makeDevice(), zor::Error);
    driver().platforms.assign(15, {"A", {{"a"}}});
    EXPECT_EQ(count(), 15u);
    driver().platforms.push_back({});
    EXPECT_THROW(count(), zor::Error);
    EXPECT_THROW(makeDevice(), zor::Error);
}

TEST_F(Discovery, SharesTheContextWithOpenGlWhereThatRunsOnTheChosenDevice) {
    driver().platforms = {{"A", {{"a"}, {"b"}}}};
    driver().glDevice = 1;
    std::vector<cl_context_properties> pairs = {CL_GL_CONTEXT_KHR, 77, 0};
    const auto shares = [&](uint32_t index) {
        return makeDevice({.deviceIndex = index, .contextProperties = pairs.data()})->isGlShared();
    };
    EXPECT_TRUE(shares(1));
    EXPECT_THAT(driver().lastCall("clCreateContext").numbers,
                testing::ElementsAre(CL_GL_CONTEXT_KHR, 77, 0x1084, testing::_));
    EXPECT_FALSE(shares(0)) << "another device runs OpenGL";
    driver().fail("clCreateContext", CL_INVALID_OPERATION);
    EXPECT_FALSE(shares(1)) << "a plain context in its place";
    pairs.assign(32, CL_GL_CONTEXT_KHR);
    EXPECT_THROW(shares(1), zor::Error) << "more than the list holds";
}
