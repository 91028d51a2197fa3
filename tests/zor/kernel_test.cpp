// The kernel map and launches.
#include "fixture.h"

class Kernels : public OnStandin {
 protected:
    zor::Kernel* get(zor::KernelRequest request = {}) {
        if (request.fileName.empty()) request.fileName = "Math";
        if (request.kernelName.empty()) request.kernelName = "AddKernel";
        request.sources = {&source, 1};
        zor::Kernel* kernel = nullptr;
        lines = printed([&] { kernel = device->getKernel(request); });
        return kernel;
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
    EXPECT_EQ(driver().liveObjects("program"), 0u) << "the kernel keeps its program alive";
    source = "kernel void AddKernel() { other(); }";
    get(requests[4]);
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, source) << "generated texts are compared";
    get({.options = " -D B", .keepInCache = false});
    EXPECT_EQ(driver().callCount("clReleaseKernel"), 2u) << "the old ones are dropped";
}

TEST_F(Kernels, ACompilerErrorPrintsItsLogAndTheDeviceStaysUsable) {
    driver().buildLog = std::string(3 << 20, 'x') + "END";
    driver().fail("clBuildProgram", CL_BUILD_PROGRAM_FAILURE);
    EXPECT_EQ(get(), nullptr);
    EXPECT_EQ(lines, "File not found " + std::string(zor::binaryFileName(opencl(device), "Math", {})) +
                         "\nclBuildProgram: CL_BUILD_PROGRAM_FAILURE (-11)\nCL Kernel Load Failure: 0\n" +
                         driver().buildLog + "\n" + driver().buildLog + "\n");
    driver().fail("clBuildProgram", CL_BUILD_PROGRAM_FAILURE);
    driver().fail("clGetProgramBuildInfo", CL_INVALID_VALUE);
    EXPECT_THROW(get(), zor::Error);
    EXPECT_EQ(get({.kernelName = "NoKernel"}), nullptr);
    EXPECT_THAT(lines, testing::HasSubstr("clCreateKernel: CL_INVALID_KERNEL_NAME (-46), kernel NoKernel\n"));
    EXPECT_NE(get(), nullptr);
}

TEST_F(Kernels, TextsHaveNoFixedMaximumAndNeedNoZeroByte) {
    const std::string options = " -D LONG=" + std::string(100000, '7');
    const std::string name = "Kernel" + std::string(5000, 'k');
    const std::string whole = "kernel void " + name + ";tail";
    const std::string_view texts[] = {{whole.data(), 7}, {whole.data(), 0}, {whole.data() + 7, whole.size() - 12}};
    const std::string file = "some/long/" + std::string(3000, 'p') + "/Math";
    ASSERT_NE(device->getKernel({.fileName = file, .kernelName = name, .options = options, .sources = texts}), nullptr);
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, options);
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, "kernel void " + name);
    const std::vector<std::string_view> tooMany(128, "x");
    EXPECT_THROW(device->getKernel({.kernelName = "k", .sources = tooMany}), zor::Error);
}

TEST_F(Kernels, LaunchWholeGroupsWithinTheDevicesLimits) {
    using Sizes = std::vector<size_t>;
    const struct {
        Sizes limits;  // per dimension, and of a group
        std::array<int32_t, 4> wish;
        Sizes global, local;
    } cases[] = {
        {{1024, 1024, 1024}, {0, 0, 8, 4}, {8, 4}, {8, 4}},
        {{1024, 1024, 1024}, {INT32_MAX, 1, 64, 1}, {size_t{1} << 31, 1}, {64, 1}},
        {{48, size_t{3} << 30, size_t{1} << 40}, {100, 100, 64, 8}, {144, 104}, {48, 8}},
        {{48, size_t{3} << 30, size_t{1} << 40}, {10, 10, -1, 0}, {48, 10}, {48, 1}},  // as unsigned, and at least 1
        {{1024, 1024, 256}, {100, 100, 64, 16}, {112, 112}, {16, 16}},
    };
    for (const auto& [limits, wish, global, local] : cases) {
        firstDevice().workItemSizes = {limits[0], limits[1], 1};
        firstDevice().workGroupSize = limits[2];
        device = makeDevice();
        zor::Launcher(*device, *get()).launch2D(wish[0], wish[1], wish[2], wish[3]);
        EXPECT_EQ(driver().launches.back().global, global) << wish[0] << " " << wish[2];
        EXPECT_EQ(driver().launches.back().local, local) << wish[0] << " " << wish[2];
    }
    EXPECT_THROW(zor::Launcher(*device, *get()).launch2D(1, INT32_MIN, 8, 8), zor::Error);
}

TEST_F(Kernels, TakeSixtyFourArgumentsAndNoBufferWithoutMemory) {
    zor::Launcher launcher(*device, *get());
    EXPECT_THROW(launcher.arg(zor::Buffer<char>(*device, 0, zor::BUFFER_DEFAULT)), zor::Error);
    for (int i = 0; i < 64; ++i) launcher.arg(i);
    EXPECT_THROW(launcher.arg(64), zor::Error);
    launcher.launch1D(1, 1);
    EXPECT_EQ(driver().launches.back().arguments.at(63).as<int>(), 63);
}
