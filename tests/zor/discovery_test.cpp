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

TEST_F(Discovery, PrintsWhatItFindsAndCountsOneQuarrionPlatform) {
    const std::string quarrion = "Quarrion, Inc.";
    const struct {
        std::vector<standin::Platform> platforms;
        uint32_t count;
        const char* found;
    } machines[] = {{{}, 0, "CL 0 platforms\n"},
                    {{{quarrion, {cpu("x")}}, {quarrion, {gpu("b")}}},
                     0,
                     "CL 2 platforms\nCL: 0 device (Quarrion, Inc.)\nCL: 0 device (Quarrion, Inc.)\n"},
                    {{{quarrion, {gpu("  Big")}}, {quarrion, {gpu("b")}}},
                     1,
                     "CL 2 platforms\nCL: 1 device (Quarrion, Inc.)\nCL: 0 device (Quarrion, Inc.)\n[  Big]\n"
                     "CL_DEVICE_MAX_WORK_ITEM_SIZES  : 1024, 1024, 64\nCL_DEVICE_MAX_WORK_GROUP_SIZE  : 1024\n"
                     "CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS : 3\n< CL Initialization\n"}};
    for (const auto& [platforms, devices, found] : machines) {
        driver().platforms = platforms;
        EXPECT_EQ(makeDevice()->isInitialized(), devices > 0);
        EXPECT_EQ(lines, std::string("> CL Initialization\n") + found);
        const std::string warning = printed([&, expected = devices] { EXPECT_EQ(count(), expected); });
        EXPECT_EQ(warning,
                  platforms.size() < 2 ? "" : "WARNING : the system has more than 1 QUARRION platform installed\n");
    }
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
    const cl_context_properties pairs[] = {CL_GL_CONTEXT_KHR, 77, 0};
    const struct {
        const char* what;
        size_t glDevice;
        bool canTell;
        const char* failing;
        bool shared;
    } cases[] = {{"it does", 1, true, "", true},
                 {"another device does", 0, true, "", false},
                 {"the driver cannot tell", 99, false, "", true},
                 {"the question fails", 1, true, "clGetGLContextInfoKHR", false},
                 {"the context fails", 1, true, "clCreateContext", false}};
    for (const auto& [what, glDevice, canTell, failing, shared] : cases) {
        zor::unloadOpenCL();  // with it the remembered address
        driver().reset();
        driver().platforms = {{"A", {gpu("a"), gpu("b")}}};
        driver().glDevice = glDevice;
        driver().hasGlContextInfo = canTell;
        driver().fail(failing, CL_INVALID_OPERATION);
        const DeviceOwner made = makeDevice({.deviceIndex = 1, .contextProperties = pairs});
        EXPECT_TRUE(made->isInitialized()) << what;
        EXPECT_EQ(made->isGlShared(), shared) << what;
        const std::vector<uint64_t> list = driver().lastCall("clCreateContext").numbers;
        ASSERT_EQ(list.size(), shared ? 4u : 0u) << what;
        if (!shared) continue;
        EXPECT_EQ((std::vector(list.begin(), list.begin() + 3)),
                  (std::vector<uint64_t>{CL_GL_CONTEXT_KHR, 77, 0x1084}));
    }
    const std::vector<cl_context_properties> many(32, CL_GL_CONTEXT_KHR);
    EXPECT_THROW(makeDevice({.contextProperties = many.data()}), zor::Error) << "more than the list holds";
}
