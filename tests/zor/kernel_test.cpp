// The kernel map and launches.
#include "fixture.h"

class Kernels : public OnStandin {
 protected:
    zor::Kernel* get(zor::KernelRequest request = {}) {
        if (request.kernelName.empty()) request.kernelName = "AddKernel";
        request.sources = {&source, 1};
        return device->getKernel(request);
    }
    std::string_view source = "kernel void AddKernel() {} kernel void MulKernel() {}";
};

TEST_F(Kernels, AreBuiltOnceForEachFileKernelOptionTextAndGeneratedText) {
    const zor::KernelRequest requests[] = {{.options = " -D A"},
                                           {.options = " -D B"},
                                           {.kernelName = "MulKernel", .options = " -D A"},
                                           {.fileName = "Path", .options = " -D A"},
                                           {.fileName = "Fused", .generatedSources = true}};
    std::set<zor::Kernel*> kernels;
    for (int round = 0; round < 2; ++round)
        for (const zor::KernelRequest& request : requests) kernels.insert(get(request));
    EXPECT_EQ(kernels.size(), std::size(requests));
    EXPECT_EQ(driver().callCount("clCreateKernel"), std::size(requests));
    EXPECT_EQ(driver().callCount("clReleaseProgram"), std::size(requests)) << "the kernel keeps its program alive";
    source = "kernel void AddKernel() { other(); }";
    get(requests[4]);
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, source) << "generated texts are compared";
    get({.options = " -D B", .keepInCache = false});
    EXPECT_EQ(driver().callCount("clReleaseKernel"), 2u) << "the old ones are dropped";
}

TEST_F(Kernels, ACompilerErrorPrintsItsLogAndTheDeviceStaysUsable) {
    driver().buildLog = std::string(1 << 20, 'x') + "END";
    driver().fail("clBuildProgram", CL_BUILD_PROGRAM_FAILURE);
    EXPECT_EQ(get(), nullptr);
    EXPECT_THAT(printed(), testing::HasSubstr("CL Kernel Load Failure: 0\n" + driver().buildLog + "\n"));
    driver().fail("clBuildProgram", CL_BUILD_PROGRAM_FAILURE);
    driver().fail("clGetProgramBuildInfo", CL_INVALID_VALUE);
    EXPECT_THROW(get(), zor::Error);
    EXPECT_EQ(get({.kernelName = "NoKernel"}), nullptr);
    EXPECT_NE(get(), nullptr);
}

TEST_F(Kernels, TextsHaveNoFixedMaximumAndNeedNoZeroByte) {
    const std::string options = " -D LONG=" + std::string(100000, '7');
    const std::string name = "Kernel" + std::string(5000, 'k');
    const std::string whole = "kernel void " + name + ";tail";
    const std::string_view texts[] = {{}, {whole.data(), whole.size() - 5}};
    ASSERT_NE(device->getKernel({.fileName = name, .kernelName = name, .options = options, .sources = texts}), nullptr);
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, options);
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, "kernel void " + name);
    const std::vector<std::string_view> tooMany(128, "x");
    EXPECT_THROW(device->getKernel({.kernelName = "k", .sources = tooMany}), zor::Error);
}

TEST_F(Kernels, LaunchWholeGroupsWithinTheDevicesLimits) {
    using Sizes = std::vector<size_t>;
    // The limits per dimension and of a group; size and wished group; global size and group.
    const std::tuple<Sizes, std::array<int32_t, 4>, Sizes, Sizes> cases[] = {
        {{1024, 1024, 1024}, {0, 0, 8, 4}, {8, 4}, {8, 4}},
        {{1024, 1024, 1024}, {INT32_MAX, 1, 64, 1}, {size_t{1} << 31, 1}, {64, 1}},
        {{48, size_t{3} << 30, size_t{1} << 40}, {10, 100, -1, 0}, {48, 100}, {48, 1}},  // as unsigned, and at least 1
        {{1024, 1024, 256}, {100, 100, 64, 16}, {112, 112}, {16, 16}},
    };
    for (const auto& [limits, wish, global, local] : cases) {
        SCOPED_TRACE(testing::PrintToString(wish));
        firstDevice().workItemSizes = {limits[0], limits[1], 1};
        firstDevice().workGroupSize = limits[2];
        device = makeDevice();
        zor::Launcher(*device, *get()).launch2D(wish[0], wish[1], wish[2], wish[3]);
        EXPECT_EQ(driver().launches.back().global, global);
        EXPECT_EQ(driver().launches.back().local, local);
    }
    EXPECT_THROW(zor::Launcher(*device, *get()).launch2D(1, INT32_MIN, 8, 8), zor::Error);
}

TEST_F(Kernels, TakeSixtyFourArgumentsAndNoBufferWithoutMemory) {
    zor::Launcher launcher(*device, *get());
    EXPECT_THROW(launcher.arg(zor::Buffer<char>(*device, 0, zor::BUFFER_DEFAULT)), zor::Error);
    for (int i = 0; i < 64; ++i) launcher.arg(i);
    EXPECT_THROW(launcher.arg(64), zor::Error);
}
