// Device memory: the budget, the kinds, mapping, copying and wrapped memory.
#include "fixture.h"

using testing::ElementsAre;
using zor::Buffer;

constexpr uint64_t kMiB = 1 << 20;

class Buffers : public OnStandin {
 protected:
    void SetUp() override {
        OnStandin::SetUp();
        firstDevice().globalMemory = 1024 * kMiB;
        firstDevice().maxAllocation = 700 * kMiB;
        device = makeDevice();
    }
    void TearDown() override {
        device.reset();
        OnStandin::TearDown();
    }
    void remake() {
        device.reset();
        device = makeDevice();
    }
    std::unique_ptr<Buffer<char>> make(uint64_t size, zor::BufferKind kind = zor::BUFFER_DEFAULT) {
        std::unique_ptr<Buffer<char>> buffer;
        lines = printed([&] { buffer = std::make_unique<Buffer<char>>(*device, size, kind); });
        return buffer;
    }

    DeviceOwner device;
};

TEST_F(Buffers, KindsGiveTheirFlags) {
    const std::pair<zor::BufferKind, uint64_t> kinds[] = {
        {zor::BUFFER_DEFAULT, CL_MEM_READ_WRITE},
        {zor::BUFFER_WRITE_ONLY, CL_MEM_WRITE_ONLY},
        {zor::BUFFER_HOST_VISIBLE, CL_MEM_READ_WRITE | CL_MEM_ALLOC_HOST_PTR},
    };
    for (const auto& [kind, flags] : kinds) {
        EXPECT_TRUE(make(100, kind)->hasMemory());
        EXPECT_THAT(driver().lastCall("clCreateBuffer").numbers, ElementsAre(flags, 100, 0));
    }
}

TEST_F(Buffers, AnEmptyOneAllocatesAndCountsNothing) {
    const auto zero = make(0);
    const auto none = make(50, zor::BUFFER_NO_ALLOCATION);
    EXPECT_FALSE(zero->hasMemory());
    EXPECT_FALSE(none->hasMemory());
    EXPECT_EQ(none->size(), 50u);
    EXPECT_EQ(device->getUsedMemory(), 0u);
    EXPECT_EQ(driver().callCount("clCreateBuffer"), 0u);
    EXPECT_THROW(zero->map(), zor::Error);
    EXPECT_THROW(none->map(), zor::Error);
    EXPECT_THROW(none->unmap(nullptr), zor::Error);
}

TEST_F(Buffers, KeepAQuarterGibibyteOfTheDeviceFree) {
    auto first = make(600 * kMiB);
    ASSERT_TRUE(first->hasMemory());
    const auto refused = make(169 * kMiB);
    EXPECT_FALSE(refused->hasMemory());
    EXPECT_EQ(refused->size(), 0u);
    EXPECT_EQ(lines, "CL Memory Allocation Failure: 169.00MB, Total used memory: 600.00MB\n");
    EXPECT_FALSE(make(168 * kMiB + 1)->hasMemory());
    EXPECT_TRUE(make(168 * kMiB)->hasMemory()) << "768 MiB exactly";
    first.reset();
    EXPECT_EQ(device->getUsedMemory(), 0u);
    EXPECT_EQ(device->getPeakUsedMemory(), 768 * kMiB);
}

TEST_F(Buffers, ASizeThatWouldWrapTheSumIsRefused) {
    const auto some = make(1000);
    EXPECT_FALSE(make(UINT64_MAX - 500)->hasMemory());
    firstDevice().maxAllocation = UINT64_MAX;
    EXPECT_FALSE(make(UINT64_MAX)->hasMemory());
    EXPECT_EQ(device->getUsedMemory(), 1000u);
}

TEST_F(Buffers, ADeviceOfLessThanTheReserveAdmitsEverything) {
    firstDevice().globalMemory = 100 * kMiB;
    remake();
    EXPECT_TRUE(make(200 * kMiB)->hasMemory());
}

TEST_F(Buffers, TheExactMaximumLiesOnPageAlignedHostMemory) {
    firstDevice().maxAllocation = 10000;
    remake();
    const auto exact = make(10000, zor::BUFFER_WRITE_ONLY);
    const auto numbers = driver().lastCall("clCreateBuffer").numbers;
    EXPECT_EQ(numbers[0], uint64_t{CL_MEM_READ_WRITE | CL_MEM_USE_HOST_PTR});
    EXPECT_EQ(numbers[1], 10000u);
    EXPECT_NE(numbers[2], 0u);
    EXPECT_EQ(numbers[2] % 4096, 0u);
    EXPECT_EQ(exact->hostMemory(), nullptr);
    EXPECT_FALSE(make(10001)->hasMemory());
    EXPECT_EQ(lines, "CL Memory Allocation Failure: 0.01MB, Total used memory: 0.01MB\n");
    void* const mapped = exact->map();
    std::memset(mapped, 1, 10000);
    exact->unmap(mapped);
}

TEST_F(Buffers, ARefusalOfTheDriverPrintsTheMaximumAndCountsNothing) {
    for (const uint64_t size : {uint64_t{3 * kMiB / 2}, 700 * kMiB}) {
        driver().fail("clCreateBuffer", CL_MEM_OBJECT_ALLOCATION_FAILURE);
        const auto buffer = make(size);
        EXPECT_FALSE(buffer->hasMemory());
        EXPECT_EQ(buffer->size(), 0u);
        EXPECT_EQ(lines, std::string("CL Memory Allocation Failure: ") + (size < 2 * kMiB ? "1.50" : "700.00") +
                             "MB, Total used memory: 0.00MB\nCL Max Memory Allocation Size: 700.00MB\n");
    }
    EXPECT_EQ(device->getUsedMemory(), 0u);
    EXPECT_EQ(device->getPeakUsedMemory(), 0u);
}

TEST_F(Buffers, MapForReadingAndWritingAndWaitForTheDevice) {
    const auto buffer = make(64);
    const size_t waits = driver().callCount("clFinish");
    void* const all = buffer->map();
    EXPECT_THAT(driver().lastCall("clEnqueueMapBuffer").numbers,
                ElementsAre(CL_FALSE, CL_MAP_READ | CL_MAP_WRITE, 0, 64));
    EXPECT_EQ(driver().callCount("clFinish"), waits + 1);
    buffer->unmap(all);
    EXPECT_EQ(driver().callCount("clFinish"), waits + 2);
    buffer->unmap(buffer->map(16));
    EXPECT_EQ(driver().lastCall("clEnqueueMapBuffer").numbers[3], 16u);
    EXPECT_THROW(buffer->map(65), zor::Error);
    EXPECT_THROW(buffer->map(0), zor::Error);
}

TEST_F(Buffers, AMapThatCannotBeWaitedForIsUndone) {
    const auto buffer = make(64);
    driver().fail("clEnqueueMapBuffer", CL_MAP_FAILURE);
    EXPECT_THROW(buffer->map(), zor::Error);
    driver().fail("clFinish", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(buffer->map(), zor::Error);
    EXPECT_TRUE(driver().maps.empty());
    void* const mapped = buffer->map();
    driver().fail("clEnqueueUnmapMemObject", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(buffer->unmap(mapped), zor::Error);
    buffer->unmap(mapped);
}

TEST_F(Buffers, CopyOnTheDevice) {
    const auto from = make(64);
    const auto to = make(32);
    std::memcpy(standin::bytesOf(from->memory()), "abcdef", 6);
    to->copyFrom(*from, 4);
    EXPECT_THAT(driver().lastCall("clEnqueueCopyBuffer").numbers, ElementsAre(0, 0, 4));
    EXPECT_EQ(std::string(reinterpret_cast<char*>(standin::bytesOf(to->memory())), 6), std::string("abcd\0\0", 6));
    to->copyFrom(*from, 0);
    to->copyFrom(*to, 32);
    EXPECT_EQ(driver().callCount("clEnqueueCopyBuffer"), 1u);
    EXPECT_THROW(to->copyFrom(*from, 33), zor::Error);
    EXPECT_THROW(to->copyFrom(*make(0), 1), zor::Error);
    const DeviceOwner other = makeDevice();
    EXPECT_THROW(Buffer<char>(*other, 64, zor::BUFFER_DEFAULT).copyFrom(*from, 1), zor::Error);
}

TEST_F(Buffers, WrapForeignMemoryWithoutCountingIt) {
    cl_mem foreign =
        zor::cl().clCreateBuffer(device->getContext(), cl_mem_flags{CL_MEM_READ_WRITE}, size_t{8}, nullptr, nullptr);
    {
        const auto borrowed = make(0, zor::BUFFER_NO_ALLOCATION);
        borrowed->adopt(foreign, 8, false);
        EXPECT_EQ(borrowed->memory(), foreign);
        EXPECT_EQ(borrowed->size(), 8u);
        EXPECT_THROW(borrowed->adopt(foreign, 8, false), zor::Error) << "it has memory already";
        EXPECT_THROW(make(0)->adopt(nullptr, 8, true), zor::Error);
        EXPECT_EQ(device->getUsedMemory(), 0u);
    }
    EXPECT_EQ(driver().liveObjects("memory"), 1u) << "still the caller's";
    make(0, zor::BUFFER_NO_ALLOCATION)->adopt(foreign, 8, true);
    EXPECT_EQ(driver().liveObjects("memory"), 0u);
}

TEST_F(Buffers, MoreReleasedThanCountedIsABrokenInvariantButNeverLeavesADestructor) {
    device->countAllocation(5);
    EXPECT_THROW(device->countRelease(6), zor::Error);
    EXPECT_EQ(device->getUsedMemory(), 5u);
    auto buffer = make(10);
    device->countRelease(12);
    buffer.reset();
    EXPECT_EQ(driver().liveObjects("memory"), 0u);
    device->countRelease(3);
}
