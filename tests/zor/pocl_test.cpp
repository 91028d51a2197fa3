// The device layer on a real OpenCL library: the CPU device of whatever driver is installed.
#include "fixture.h"
#include "self_process.h"

using testing::HasSubstr;
using testing::Not;

namespace {

constexpr std::string_view kSource = R"(
kernel void CountKernel(global uint* items, uint step, float2 pair) {
    atomic_add(items, step);
    if (get_global_id(0) == 0 && get_global_id(1) == 0) {
        items[1] = get_global_size(0);
        items[2] = get_global_size(1);
        items[3] = get_local_size(0);
        items[4] = get_local_size(1);
        items[5] = (uint)(pair.x * 10.0f + pair.y);
    }
}
)";

struct Float2 {
    float x, y;
};

}  // namespace

class RealDevice : public InOwnFolder {
 protected:
    void SetUp() override {
        InOwnFolder::SetUp();
        ASSERT_TRUE(zor::isDeviceKindAvailable(zor::DEVICE_KIND_CL));
        ASSERT_GE(zor::getDeviceCount(true, zor::kAllVendors), 1u) << "no OpenCL driver for the CPU is installed";
        device.reset(zor::createDevice(zor::DEVICE_KIND_CL, {.deviceType = 1}));
        ASSERT_TRUE(device->isInitialized());
    }
    zor::Kernel* get(std::string_view options, std::string_view source = kSource) {
        zor::Kernel* kernel = nullptr;
        lines = printed([&] {
            kernel = device->getKernel(
                {.fileName = "Count", .kernelName = "CountKernel", .options = options, .sources = {&source, 1}});
        });
        return kernel;
    }
    std::vector<uint32_t> launch(zor::Kernel& kernel, int32_t gx, int32_t gy, int32_t lx, int32_t ly) {
        zor::Buffer<char> buffer(*device, 6 * sizeof(uint32_t), zor::BUFFER_DEFAULT);
        auto* items = static_cast<uint32_t*>(buffer.map());
        std::fill_n(items, 6, 0u);
        buffer.unmap(items);
        zor::Launcher launcher(*device, kernel);
        launcher.arg(buffer);
        launcher.arg(uint32_t{1});
        launcher.arg(Float2{2.5f, 4.0f});
        launcher.launch2D(gx, gy, lx, ly);
        items = static_cast<uint32_t*>(buffer.map());
        const std::vector<uint32_t> result(items, items + 6);
        buffer.unmap(items);
        return result;
    }

    DeviceOwner device;
    std::string lines;
};

TEST_F(RealDevice, CompilesAndRunsOneWorkItemPerRoundedSize) {
    zor::Kernel* const kernel = get(" -Werror");
    ASSERT_NE(kernel, nullptr);
    EXPECT_EQ(launch(*kernel, 37, 23, 8, 8), (std::vector<uint32_t>{40 * 24, 40, 24, 8, 8, 29}));
    EXPECT_EQ(launch(*kernel, 1000, 1, 64, 1), (std::vector<uint32_t>{1024, 1024, 1, 64, 1, 29}));
    const auto huge = launch(*kernel, 1, 1, INT32_MAX, INT32_MAX);
    EXPECT_LE(uint64_t{huge[3]} * huge[4], zor::requireOpenCL(*device, "test").maxWorkGroupSize());
}

TEST_F(RealDevice, CopiesAndMapsEveryKindOfBuffer) {
    zor::Buffer<char> from(*device, 64, zor::BUFFER_HOST_VISIBLE);
    void* bytes = from.map();
    std::memset(bytes, 'z', 64);
    from.unmap(bytes);
    zor::Buffer<char> to(*device, 64, zor::BUFFER_WRITE_ONLY);
    to.copyFrom(from, 64);
    bytes = to.map();
    EXPECT_EQ(std::string(static_cast<char*>(bytes), 64), std::string(64, 'z'));
    to.unmap(bytes);
    EXPECT_EQ(device->getUsedMemory(), 128u);
}

TEST_F(RealDevice, ACompilerErrorPrintsItsLogAndTheDeviceStaysUsable) {
    EXPECT_EQ(get("", "kernel void CountKernel() { undeclared_name = 1; }"), nullptr);
    EXPECT_THAT(lines, HasSubstr("CL Kernel Load Failure: 0\n"));
    EXPECT_THAT(lines, HasSubstr("undeclared_name"));
    EXPECT_EQ(get(" -Werror -Wall", "kernel void CountKernel() { int unused; }"), nullptr) << "a warning is an error";
    EXPECT_NE(get(" -D NEXT"), nullptr);
}

// Run by the next test, in the folder that the environment names.
TEST_F(RealDevice, DISABLED_InAnotherProcess) {
    const char* const directory = std::getenv("ZOR_TEST_FOLDER");
    ASSERT_NE(directory, nullptr);
    fs::current_path(directory);
    zor::Kernel* const kernel = get(" -D A");
    ASSERT_NE(kernel, nullptr);
    EXPECT_EQ(launch(*kernel, 16, 16, 8, 8)[0], 256u);
    std::printf("\n%sresult: ran\n", lines.c_str());
    fs::current_path(folder);
}

TEST_F(RealDevice, ASecondProcessTakesTheProgramFromDiskAndCompilesNothing) {
    ASSERT_NE(get(" -D A"), nullptr);
    EXPECT_THAT(lines, HasSubstr("Cached file created cache/Count-"));
    // The driver keeps its own cache; an empty one shows that nothing is compiled from source.
    const std::string environment = "ZOR_TEST_FOLDER=" + folder.string();
    const std::string second = runTests("RealDevice.DISABLED_InAnotherProcess", environment);
    EXPECT_THAT(second, HasSubstr("result: ran"));
    EXPECT_THAT(second, Not(HasSubstr("Cached file created")));
    for (const std::string& name : cacheFiles())
        if (name.ends_with(".bin")) writeText(folder / "cache" / name, "not a binary");
    const std::string third = runTests("RealDevice.DISABLED_InAnotherProcess", environment);
    EXPECT_THAT(third, HasSubstr("result: ran"));
    EXPECT_THAT(third, HasSubstr("Cached file created"));
}
