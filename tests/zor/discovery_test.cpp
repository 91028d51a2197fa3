// Which devices are counted, listed and chosen, what initialisation prints, and which contexts are made for OpenGL.
#include "fixture.h"

using standin::cpu;
using standin::gpu;

class Discovery : public OnStandin {
 protected:
    std::string chosen(const zor::DeviceConfig& config) { return opencl(makeDevice(config)).deviceName(); }
    static uint32_t count(uint32_t mask = zor::kAllVendors, bool ofCpus = false) {
        return zor::getDeviceCount(ofCpus, mask);
    }
};

TEST_F(Discovery, CountsAndIndexesTheDevicesOfTheAdmittedPlatforms) {
    driver().platforms = {
        {"Apple", {gpu("a"), cpu("x"), gpu("b")}}, {"Apple ", {gpu("c")}}, {"Intel(R) Corporation", {}}};
    EXPECT_EQ(count(), 3u);
    EXPECT_EQ(count(zor::kAllVendors, true), 1u);
    EXPECT_EQ(count(zor::VENDOR_APPLE), 2u);
    EXPECT_EQ(count(zor::VENDOR_UNKNOWN), 1u) << "texts are compared whole";
    EXPECT_EQ(count(zor::VENDOR_INTEL | zor::VENDOR_NVIDIA), 0u);
    const std::pair<uint32_t, const char*> names[] = {{0, "a"}, {1, "b"}, {2, "c"}, {3, "c"}, {0x7FFFFFFF, "c"}};
    for (const auto& [index, name] : names) EXPECT_EQ(chosen({.deviceIndex = index}), name);
    EXPECT_EQ(chosen({.deviceType = 7}), "x") << "any type but 0 is the CPU";
    EXPECT_EQ(chosen({.vendorMask = ~zor::VENDOR_APPLE}), "c");
    driver().fail("clGetDeviceIDs", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(count(), 1u) << "a platform whose query fails has none";
}

TEST_F(Discovery, PrintsWhatItFindsAndTakesOneQuarrionPlatform) {
    driver().platforms = {{"Quarrion, Inc.", {gpu("  Big")}}, {"Quarrion, Inc.", {gpu("b")}}};
    makeDevice();
    EXPECT_EQ(lines,
              "> CL Initialization\nCL 2 platforms\nCL: 1 device (Quarrion, Inc.)\nCL: 0 device (Quarrion, Inc.)\n"
              "[  Big]\nCL_DEVICE_MAX_WORK_ITEM_SIZES  : 1024, 1024, 64\nCL_DEVICE_MAX_WORK_GROUP_SIZE  : 1024\n"
              "CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS : 3\n< CL Initialization\n");
    EXPECT_EQ(printed([&] { EXPECT_EQ(count(), 1u); }),
              "WARNING : the system has more than 1 QUARRION platform installed\n");
    driver().platforms.clear();
    EXPECT_FALSE(makeDevice()->isInitialized());
    EXPECT_EQ(lines, "> CL Initialization\nCL 0 platforms\n");
    EXPECT_EQ(count(), 0u);
}

TEST_F(Discovery, MoreThanTheListsHoldAndOtherFailuresAreBrokenInvariants) {
    driver().platforms = {{"A", std::vector(20, gpu("a"))}, {"B", std::vector(12, gpu("b"))}};
    EXPECT_EQ(chosen({.deviceIndex = 31}), "b");
    driver().platforms[1].devices.push_back(gpu("b"));
    EXPECT_THROW(makeDevice(), zor::Error);
    driver().platforms.assign(15, {"A", {gpu("a")}});
    EXPECT_EQ(count(), 15u);
    driver().platforms.push_back({"A", {}});
    EXPECT_THROW(count(), zor::Error);
    EXPECT_THROW(makeDevice(), zor::Error);
    driver().fail("clGetPlatformIDs", CL_OUT_OF_HOST_MEMORY);
    EXPECT_THROW(count(), zor::Error);
}

TEST_F(Discovery, SharesTheContextWithOpenGlWhereThatRunsOnTheChosenDevice) {
    driver().platforms = {{"A", {gpu("a"), gpu("b")}}};
    driver().glDevice = 1;
    const cl_context_properties pairs[] = {CL_GL_CONTEXT_KHR, 77, 0};
    const auto shares = [&](uint32_t index) {
        const DeviceOwner made = makeDevice({.deviceIndex = index, .contextProperties = pairs});
        EXPECT_TRUE(made->isInitialized());
        return made->isGlShared();
    };
    EXPECT_TRUE(shares(1));
    EXPECT_THAT(driver().lastCall("clCreateContext").numbers,
                testing::ElementsAre(CL_GL_CONTEXT_KHR, 77, 0x1084, testing::_));
    EXPECT_FALSE(shares(0)) << "another device runs OpenGL";
    for (const char* call : {"clGetGLContextInfoKHR", "clCreateContext"}) {
        driver().fail(call, CL_INVALID_OPERATION);
        EXPECT_FALSE(shares(1)) << call << " fails: a plain context";
    }
    const std::vector<cl_context_properties> many(32, CL_GL_CONTEXT_KHR);
    EXPECT_THROW(makeDevice({.contextProperties = many.data()}), zor::Error) << "more than the list holds";
}
