// Device memory: the budget, buffers of the exact maximum, mapping and copying.
#include "fixture.h"

using testing::ElementsAre;
using zor::Buffer;

constexpr uint64_t kMiB = 1 << 20;

class Buffers : public OnStandin {
 protected:
    void remake(uint64_t memory, uint64_t maxAllocation) {
        firstDevice().globalMemory = memory;
        firstDevice().maxAllocation = maxAllocation;
        device = makeDevice();
    }
    std::unique_ptr<Buffer<char>> make(uint64_t size, zor::BufferKind kind = zor::BUFFER_DEFAULT) {
        return std::make_unique<Buffer<char>>(*device, size, kind);
    }
};

TEST_F(Buffers, KeepAQuarterGibibyteOfTheDeviceFree) {
    remake(1024 * kMiB, 700 * kMiB);
    auto first = make(600 * kMiB);
    printed();
    for (const uint64_t tooMuch : {169 * kMiB, 168 * kMiB + 1, UINT64_MAX - 500, UINT64_MAX})
        EXPECT_FALSE(make(tooMuch)->hasMemory());
    EXPECT_THAT(printed(), testing::StartsWith("CL Memory Allocation Failure: 169.00MB, Total used memory: 600.00MB"));
    EXPECT_TRUE(make(168 * kMiB)->hasMemory()) << "768 MiB exactly";
    EXPECT_THROW(zor::destroyDevice(device.get()), zor::Error) << "memory is in use";
    first.reset();
    EXPECT_EQ(device->getUsedMemory(), 0u);
    EXPECT_EQ(device->getPeakUsedMemory(), 768 * kMiB);
    driver().fail("clCreateBuffer", CL_MEM_OBJECT_ALLOCATION_FAILURE);
    EXPECT_EQ(make(kMiB)->size(), 0u);
    remake(100 * kMiB, 700 * kMiB);
    EXPECT_TRUE(make(200 * kMiB)->hasMemory()) << "a device of less than the reserve decides itself";
}

TEST_F(Buffers, OfTheExactMaximumLieInPageAlignedHostMemory) {
    remake(1024 * kMiB, 10000);
    const auto exact = make(10000, zor::BUFFER_WRITE_ONLY);
    const auto numbers = driver().lastCall("clCreateBuffer").numbers;
    EXPECT_EQ(numbers[0], uint64_t{CL_MEM_READ_WRITE | CL_MEM_USE_HOST_PTR});
    EXPECT_EQ(numbers[2] % 4096, 0u) << "the host's address";
    EXPECT_FALSE(make(10001)->hasMemory());
    make(100, zor::BUFFER_HOST_VISIBLE);
    EXPECT_EQ(driver().lastCall("clCreateBuffer").numbers[0], uint64_t{CL_MEM_READ_WRITE | CL_MEM_ALLOC_HOST_PTR});
}

TEST_F(Buffers, MapAllOrTheFirstBytesAndUndoAMapThatCannotBeWaitedFor) {
    const auto buffer = make(64);
    for (const uint64_t bytes : {64u, 16u}) {
        buffer->unmap(buffer->map(bytes));
        EXPECT_THAT(driver().lastCall("clEnqueueMapBuffer").numbers,
                    ElementsAre(CL_FALSE, CL_MAP_READ | CL_MAP_WRITE, 0, bytes));
    }
    EXPECT_THROW(buffer->map(65), zor::Error);
    EXPECT_THROW(make(0)->map(), zor::Error);
    driver().fail("clFinish", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(buffer->map(), zor::Error);
}

TEST_F(Buffers, CopyOnTheDeviceOrThroughTheHostWithinBothOfThem) {
    const auto copied = [](zor::Device& on) {
        Buffer<char> from(on, 64, zor::BUFFER_DEFAULT);
        Buffer<char> to(on, 32, zor::BUFFER_DEFAULT);
        std::memset(to.map(), '-', 32);
        std::memcpy(from.map(), "abcdef", 6);
        to.copyFrom(from, 4);
        EXPECT_THROW(to.copyFrom(from, 33), zor::Error);
        return std::string(static_cast<char*>(to.map()), 6);
    };
    EXPECT_EQ(copied(*device), "abcd--");
    const DeviceOwner host(zor::createDevice(zor::DEVICE_KIND_HOST, {}), zor::destroyDevice);
    EXPECT_EQ(copied(*host), "abcd--");
    EXPECT_THROW(host->getKernel({}), zor::Error);
    auto& entryPoints = const_cast<zor::EntryPoints&>(zor::cl());
    const zor::EntryPoints all = entryPoints;
    entryPoints.clEnqueueCopyBuffer.set(nullptr);
    EXPECT_EQ(copied(*device), "abcd--");
    entryPoints = all;
    EXPECT_EQ(driver().callCount("clEnqueueCopyBuffer"), 1u) << "of the first";
    EXPECT_EQ(std::exchange(driver().maps, {}).size(), 6u) << "this test's own";
}
