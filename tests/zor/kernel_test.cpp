// The kernel map and launches.
#include "fixture.h"

using testing::ElementsAre;
using testing::HasSubstr;

class Kernels : public OnStandin {
 protected:
    void SetUp() override {
        OnStandin::SetUp();
        device = makeDevice();
    }
    void TearDown() override {
        device.reset();
        OnStandin::TearDown();
    }
    zor::Kernel* get(zor::KernelRequest request) {
        request.sources = {&source, 1};
        zor::Kernel* kernel = nullptr;
        lines = printed([&] { kernel = device->getKernel(request); });
        return kernel;
    }
    zor::Kernel& kernel() { return *get({.fileName = "Math", .kernelName = "AddKernel"}); }

    DeviceOwner device;
    std::string_view source = "kernel void AddKernel() {} kernel void MulKernel() {}";
};

TEST_F(Kernels, AreBuiltOnceForEachFileKernelAndOptionText) {
    zor::Kernel* const first = get({.fileName = "Math", .kernelName = "AddKernel", .options = " -D A"});
    EXPECT_EQ(get({.fileName = "Math", .kernelName = "AddKernel", .options = " -D A"}), first);
    EXPECT_EQ(driver().callCount("clCreateKernel"), 1u);
    EXPECT_NE(get({.fileName = "Math", .kernelName = "AddKernel", .options = " -D B"}), first);
    EXPECT_NE(get({.fileName = "Math", .kernelName = "MulKernel", .options = " -D A"}), first);
    EXPECT_NE(get({.fileName = "Path", .kernelName = "AddKernel", .options = " -D A"}), first);
    EXPECT_EQ(driver().callCount("clCreateKernel"), 4u);
    EXPECT_EQ(first->name(), "AddKernel");
    EXPECT_EQ(driver().liveObjects("program"), 0u) << "the kernel keeps its program alive";
}

TEST_F(Kernels, WithoutKeepInCacheTheOldOneIsDroppedAndANewOneBuilt) {
    get({.fileName = "Math", .kernelName = "AddKernel"});
    get({.fileName = "Math", .kernelName = "AddKernel", .keepInCache = false});
    EXPECT_EQ(driver().callCount("clCreateKernel"), 2u);
    EXPECT_EQ(driver().callCount("clReleaseKernel"), 1u);
    EXPECT_EQ(driver().callCount("clCreateProgramWithBinary"), 0u) << "the binary is never read";
    EXPECT_EQ(driver().callCount("clCreateProgramWithSource"), 2u);
}

TEST_F(Kernels, GeneratedTextsUnderOneKeyAreToldApart) {
    const zor::KernelRequest request{.fileName = "Fused", .kernelName = "AddKernel", .generatedSources = true};
    zor::Kernel* const first = get(request);
    EXPECT_EQ(get(request), first);
    source = "kernel void AddKernel() { other(); }";
    get(request);
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, source);
    EXPECT_EQ(driver().callCount("clCreateKernel"), 2u);
}

TEST_F(Kernels, ACompilerErrorPrintsItsLogAndTheDeviceStaysUsable) {
    driver().buildLog = std::string(3 << 20, 'x') + "END";
    source = "#error AddKernel";
    EXPECT_EQ(get({.fileName = "Math", .kernelName = "AddKernel"}), nullptr);
    EXPECT_THAT(lines, HasSubstr("clBuildProgram: CL_BUILD_PROGRAM_FAILURE (-11)\nCL Kernel Load Failure: 0\nxxx"));
    EXPECT_EQ(lines.size(), lines.find("END\nxxx") + 4 + driver().buildLog.size() + 1) << "the log twice";
    driver().buildLog.clear();
    EXPECT_EQ(get({.fileName = "Math", .kernelName = "AddKernel"}), nullptr);
    EXPECT_THAT(lines, HasSubstr("CL Kernel Load Failure: 0\n\n\n"));
    EXPECT_TRUE(cacheFiles().empty());
    source = "AddKernel";
    EXPECT_NE(get({.fileName = "Math", .kernelName = "AddKernel"}), nullptr);
}

TEST_F(Kernels, AKernelThatTheProgramLacksIsALineAndNone) {
    EXPECT_EQ(get({.fileName = "Math", .kernelName = "NoKernel"}), nullptr);
    EXPECT_THAT(lines, HasSubstr("clCreateKernel: CL_INVALID_KERNEL_NAME (-46), kernel NoKernel\n"));
    EXPECT_EQ(driver().liveObjects("program"), 0u);
    EXPECT_NE(get({.fileName = "Math", .kernelName = "AddKernel"}), nullptr);
}

TEST_F(Kernels, FailedCallsOfABuildAreBrokenInvariantsThatLeakNothing) {
    for (const char* call : {"clCreateProgramWithSource", "clGetProgramInfo"}) {
        driver().fail(call, CL_OUT_OF_HOST_MEMORY);
        EXPECT_THROW(get({.fileName = call, .kernelName = "AddKernel"}), zor::Error) << call;
        EXPECT_EQ(driver().liveObjects("program"), 0u) << call;
    }
    source = "#error";
    driver().fail("clGetProgramBuildInfo", CL_INVALID_VALUE);
    EXPECT_THROW(get({.fileName = "Math", .kernelName = "AddKernel"}), zor::Error);
}

TEST_F(Kernels, TextsHaveNoFixedMaximum) {
    const std::string options = " -D LONG=" + std::string(100000, '7');
    const std::string name = "Kernel" + std::string(5000, 'k');
    const std::string text = "kernel void " + name;
    source = text;
    const std::string file = "some/long/" + std::string(3000, 'p') + "/Math";
    ASSERT_NE(get({.fileName = file, .kernelName = name, .options = options}), nullptr);
    EXPECT_EQ(driver().lastCall("clBuildProgram").text, options);
    EXPECT_EQ(cacheFiles().size(), 2u) << "only the base name counts";
}

TEST_F(Kernels, SourceTextsAreJoinedInOrderAndNeedNoZeroByte) {
    const std::string whole = "kernel void AddKernel;tail";
    const std::string_view texts[] = {{whole.data(), 7}, {whole.data() + 3, 0}, {whole.data() + 7, 14}};
    EXPECT_NE(device->getKernel({.fileName = "Math", .kernelName = "AddKernel", .sources = texts}), nullptr);
    EXPECT_EQ(driver().lastCall("clCreateProgramWithSource").text, "kernel void AddKernel");
    const std::vector<std::string_view> tooMany(128, "x");
    EXPECT_THROW(device->getKernel({.fileName = "Many", .kernelName = "k", .sources = tooMany}), zor::Error);
}

class Launches : public Kernels {
 protected:
    // Global then local sizes of a launch.
    std::vector<size_t> sizes(int32_t gx, int32_t gy, int32_t lx, int32_t ly) {
        zor::Launcher(*device, kernel()).launch2D(gx, gy, lx, ly);
        const standin::Launch& launch = driver().launches.back();
        return {launch.global[0], launch.global[1], launch.local[0], launch.local[1]};
    }
};

TEST_F(Launches, RoundUpToWholeGroupsAndRunAtLeastOne) {
    EXPECT_THAT(sizes(1920, 1080, 8, 8), ElementsAre(1920, 1080, 8, 8));
    EXPECT_THAT(sizes(1000, 1, 64, 1), ElementsAre(1024, 1, 64, 1));
    EXPECT_THAT(sizes(0, 0, 8, 4), ElementsAre(8, 4, 8, 4));
    zor::Launcher(*device, kernel()).launch1D(0, 64);
    EXPECT_THAT(driver().lastCall("clEnqueueNDRangeKernel").numbers, ElementsAre(2, 64, 1, 64, 1));
    zor::Launcher(*device, kernel()).launch1D(INT32_MAX, 64);
    EXPECT_THAT(driver().lastCall("clEnqueueNDRangeKernel").numbers, ElementsAre(2, uint64_t{1} << 31, 1, 64, 1));
}

TEST_F(Launches, LocalSizesAreAtLeastOneAndWithinTheDevicesLimits) {
    firstDevice().workItemSizes = {48, uint64_t{3} << 30, 1};
    firstDevice().workGroupSize = size_t{1} << 40;
    device = makeDevice();
    EXPECT_THAT(sizes(100, 100, 64, 8), ElementsAre(144, 104, 48, 8)) << "reduced before rounding";
    EXPECT_THAT(sizes(100, 100, 0, 0), ElementsAre(100, 100, 1, 1));
    EXPECT_THAT(sizes(10, 10, -1, 2), ElementsAre(48, 10, 48, 2)) << "as unsigned";
}

TEST_F(Launches, AWholeGroupFitsTheDevice) {
    firstDevice().workGroupSize = 256;
    device = makeDevice();
    EXPECT_THAT(sizes(100, 100, 16, 16), ElementsAre(112, 112, 16, 16));
    EXPECT_THAT(sizes(100, 100, 64, 16), ElementsAre(112, 112, 16, 16));
    EXPECT_THAT(sizes(100, 100, 1024, 1), ElementsAre(256, 100, 256, 1));
    firstDevice().workGroupSize = 1;
    device = makeDevice();
    EXPECT_THAT(sizes(3, 3, 8, 8), ElementsAre(3, 3, 1, 1));
}

TEST_F(Launches, NegativeSizesAreBrokenInvariants) {
    EXPECT_THROW(sizes(-1, 1, 8, 8), zor::Error);
    EXPECT_THROW(sizes(1, INT32_MIN, 8, 8), zor::Error);
    EXPECT_TRUE(driver().launches.empty());
}

TEST_F(Launches, ArgumentsReachTheDriverByPositionAndValue) {
    struct Rows {
        float values[12];
    };
    const zor::Buffer<char> buffer(*device, 16, zor::BUFFER_DEFAULT);
    zor::Launcher launcher(*device, kernel());
    launcher.arg(buffer);
    launcher.arg(uint32_t{7});
    launcher.arg(Rows{{1, 2, 3}});
    launcher.arg(1.5f);
    launcher.launch1D(1, 1);
    const auto& arguments = driver().launches.back().arguments;
    EXPECT_EQ(arguments.at(0).as<cl_mem>(), buffer.memory());
    EXPECT_EQ(arguments.at(1).as<uint32_t>(), 7u);
    EXPECT_EQ(arguments.at(2).size, 48u);
    EXPECT_EQ(arguments.at(2).as<Rows>().values[1], 2.0f);
    EXPECT_EQ(arguments.at(3).as<float>(), 1.5f);
    EXPECT_EQ(launcher.argumentCount(), 4u);
}

TEST_F(Launches, TakeSixtyFourArgumentsAndNoBufferWithoutMemory) {
    zor::Launcher launcher(*device, kernel());
    EXPECT_THROW(launcher.arg(zor::Buffer<char>(*device, 0, zor::BUFFER_DEFAULT)), zor::Error);
    for (int i = 0; i < 64; ++i) launcher.arg(i);
    EXPECT_THROW(launcher.arg(64), zor::Error);
    EXPECT_EQ(driver().callCount("clSetKernelArg"), 64u);
}

TEST_F(Launches, FailedCallsAreBrokenInvariants) {
    zor::Launcher launcher(*device, kernel());
    driver().fail("clSetKernelArg", CL_INVALID_ARG_SIZE);
    EXPECT_THROW(launcher.arg(1), zor::Error);
    driver().fail("clEnqueueNDRangeKernel", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(launcher.launch1D(1, 1), zor::Error);
    driver().fail("clFinish", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(launcher.launch1D(1, 1), zor::Error);
    const DeviceOwner host(zor::createDevice(zor::DEVICE_KIND_HOST, {}));
    EXPECT_THROW(zor::Launcher(*host, kernel()), zor::Error);
}

TEST_F(Launches, AnUnchangedExecutionAsksTheDriverForNothingElse) {
    zor::Kernel* const known = &kernel();
    driver().calls.clear();
    zor::Launcher launcher(*device, *get({.fileName = "Math", .kernelName = "AddKernel"}));
    EXPECT_EQ(&kernel(), known);
    launcher.arg(1);
    launcher.launch1D(1, 1);
    ASSERT_EQ(driver().calls.size(), 3u);
    EXPECT_EQ(driver().calls[2].name, "clFinish");
}
