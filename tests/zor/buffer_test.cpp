// Device memory: the budget, the kinds, mapping and copying.
#include "fixture.h"

using testing::ElementsAre;
using zor::Buffer;

constexpr uint64_t kMiB = 1 << 20;

class Buffers : public OnStandin {
 protected:
    void SetUp() override {
        OnStandin::SetUp();
        remake(1024 * kMiB, 700 * kMiB);
    }
    void remake(uint64_t memory, uint64_t maxAllocation) {
        firstDevice().globalMemory = memory;
        firstDevice().maxAllocation = maxAllocation;
        device = makeDevice();
    }
    std::unique_ptr<Buffer<char>> make(uint64_t size, zor::BufferKind kind = zor::BUFFER_DEFAULT) {
        std::unique_ptr<Buffer<char>> buffer;
        lines = printed([&] { buffer = std::make_unique<Buffer<char>>(*device, size, kind); });
        EXPECT_EQ(buffer->hasMemory(), lines.empty() && size > 0);
        return buffer;
    }
};

TEST_F(Buffers, KeepAQuarterGibibyteOfTheDeviceFree) {
    auto first = make(600 * kMiB);
    EXPECT_EQ(make(169 * kMiB)->size(), 0u);
    EXPECT_EQ(lines, "CL Memory Allocation Failure: 169.00MB, Total used memory: 600.00MB\n");
    for (const uint64_t tooMuch : {168 * kMiB + 1, UINT64_MAX - 500, UINT64_MAX})
        EXPECT_FALSE(make(tooMuch)->hasMemory());
    EXPECT_TRUE(make(168 * kMiB)->hasMemory()) << "768 MiB exactly";
    EXPECT_THROW(zor::destroyDevice(device.get()), zor::Error) << "memory is in use";
    first.reset();
    EXPECT_EQ(device->getUsedMemory(), 0u);
    EXPECT_EQ(device->getPeakUsedMemory(), 768 * kMiB);
    driver().fail("clCreateBuffer", CL_MEM_OBJECT_ALLOCATION_FAILURE);
    EXPECT_EQ(make(3 * kMiB / 2)->size(), 0u);
    EXPECT_EQ(lines,
              "CL Memory Allocation Failure: 1.50MB, Total used memory: 0.00MB\n"
              "CL Max Memory Allocation Size: 700.00MB\n");
    remake(100 * kMiB, 700 * kMiB);
    EXPECT_TRUE(make(200 * kMiB)->hasMemory()) << "a device of less than the reserve decides itself";
}

TEST_F(Buffers, KindsGiveTheirFlagsAndTheExactMaximumPageAlignedHostMemory) {
    const std::pair<zor::BufferKind, uint64_t> kinds[] = {
        {zor::BUFFER_DEFAULT, CL_MEM_READ_WRITE},
        {zor::BUFFER_WRITE_ONLY, CL_MEM_WRITE_ONLY},
        {zor::BUFFER_HOST_VISIBLE, CL_MEM_READ_WRITE | CL_MEM_ALLOC_HOST_PTR}};
    for (const auto& [kind, flags] : kinds) {
        make(100, kind);
        EXPECT_THAT(driver().lastCall("clCreateBuffer").numbers, ElementsAre(flags, 100, 0));
    }
    remake(1024 * kMiB, 10000);
    const auto exact = make(10000, zor::BUFFER_WRITE_ONLY);
    const auto numbers = driver().lastCall("clCreateBuffer").numbers;
    EXPECT_THAT(numbers, ElementsAre(CL_MEM_READ_WRITE | CL_MEM_USE_HOST_PTR, 10000, testing::Ne(0)));
    EXPECT_EQ(numbers.back() % 4096, 0u);
    EXPECT_FALSE(make(10001)->hasMemory());
}

TEST_F(Buffers, MapAllOrTheFirstBytesAndUndoAMapThatCannotBeWaitedFor) {
    const auto buffer = make(64);
    buffer->unmap(buffer->map());
    EXPECT_THAT(driver().lastCall("clEnqueueMapBuffer").numbers,
                ElementsAre(CL_FALSE, CL_MAP_READ | CL_MAP_WRITE, 0, 64));
    EXPECT_EQ(driver().callCount("clFinish"), 2u);
    buffer->unmap(buffer->map(16));
    EXPECT_EQ(driver().lastCall("clEnqueueMapBuffer").numbers[3], 16u);
    EXPECT_THROW(buffer->map(65), zor::Error);
    EXPECT_THROW(make(0)->map(), zor::Error);
    driver().fail("clFinish", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(buffer->map(), zor::Error);
    EXPECT_TRUE(driver().maps.empty());
}

TEST_F(Buffers, CopyOnTheDeviceWithinBothOfThem) {
    const auto from = make(64);
    const auto to = make(32);
    std::memcpy(standin::bytesOf(from->memory()), "abcdef", 6);
    to->copyFrom(*from, 4);
    EXPECT_EQ(std::memcmp(standin::bytesOf(to->memory()), "abcd\0", 6), 0);
    to->copyFrom(*from, 0);
    to->copyFrom(*to, 32);
    EXPECT_EQ(driver().callCount("clEnqueueCopyBuffer"), 1u);
    EXPECT_THROW(to->copyFrom(*from, 33), zor::Error);
    const DeviceOwner other = makeDevice();
    EXPECT_THROW(Buffer<char>(*other, 64, zor::BUFFER_DEFAULT).copyFrom(*from, 1), zor::Error);
}
