// Device information, events, queue priority, adoption, destruction and the host device.
#include <sched.h>
#include <sys/resource.h>
#include <sys/syscall.h>

#include <atomic>
#include <thread>

#include "fixture.h"

using testing::HasSubstr;

class DeviceInformation : public OnStandin {};

TEST_F(DeviceInformation, TextsAreCutAtTheCallersBufferAndLoseLeadingBlanks) {
    firstDevice().name = "   " + std::string(600, 'n');
    firstDevice().vendor = " " + std::string(300, 'v');
    firstDevice().version = "  OpenCL 1.2";
    firstDevice().boardName = " Board";
    const DeviceOwner device = makeDevice();
    EXPECT_EQ(deviceText([&](char* out) { device->getDeviceName(out); }), std::string(127, 'n'));
    EXPECT_EQ(deviceText([&](char* out) { device->getVendorName(out); }), " " + std::string(126, 'v'));
    EXPECT_EQ(deviceText([&](char* out) { device->getDeviceVersion(out); }), "OpenCL 1.2");
    EXPECT_EQ(deviceText([&](char* out) { device->getBoardName(out); }), "Board");
    EXPECT_EQ(opencl(device).deviceName(), std::string(600, 'n'));
}

TEST_F(DeviceInformation, MissingTextsAreEmptyOrBrokenInvariants) {
    firstDevice().name = std::string(200, ' ');
    const DeviceOwner device = makeDevice();
    EXPECT_EQ(deviceText([&](char* out) { device->getDeviceName(out); }), "") << "only blanks";
    EXPECT_EQ(deviceText([&](char* out) { device->getBoardName(out); }), "") << "no such query";
    driver().fail("clGetDeviceInfo", CL_INVALID_VALUE);
    EXPECT_EQ(deviceText([&](char* out) { device->getDeviceVersion(out); }), "");
    char text[zor::kDeviceTextBytes];
    driver().fail("clGetDeviceInfo", CL_INVALID_VALUE, 1, 2);
    EXPECT_THROW(device->getDeviceName(text), zor::Error);
    EXPECT_THROW(device->getVendorName(text), zor::Error);
}

TEST_F(DeviceInformation, MemorySizesAreAskedAgainEachTime) {
    const DeviceOwner device = makeDevice();
    firstDevice().globalMemory = 123;
    firstDevice().maxAllocation = 45;
    EXPECT_EQ(device->queryGlobalMemorySize(), 123u);
    EXPECT_EQ(device->queryMaxAllocationSize(), 45u);
    EXPECT_EQ(device->getTotalMemory(), uint64_t{4} << 30) << "as recorded";
}

TEST_F(DeviceInformation, LimitsOfUnusualDevicesAreReadSafely) {
    firstDevice().workItemSizes = {0, uint64_t{1} << 40, 7, 8, 9};
    firstDevice().workGroupSize = 0;
    const DeviceOwner device = makeDevice();
    EXPECT_EQ(opencl(device).maxWorkItemSize(0), 1u);
    EXPECT_EQ(opencl(device).maxWorkItemSize(1), UINT32_MAX);
    EXPECT_EQ(opencl(device).maxWorkItemSize(2), 7u);
    EXPECT_EQ(opencl(device).maxWorkGroupSize(), 1u);
    EXPECT_THROW(opencl(device).maxWorkItemSize(3), zor::Error);
    EXPECT_THAT(lines, HasSubstr("CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS : 5\n"));
}

TEST_F(DeviceInformation, RecordsTheTypeItWasAskedFor) {
    EXPECT_EQ(makeDevice()->processorType(), 0u);
    EXPECT_EQ(makeDevice({.deviceType = 3})->processorType(), 3u);
    EXPECT_EQ(makeDevice()->kind(), zor::DEVICE_KIND_CL);
}

class Events : public OnStandin {
 protected:
    zor::EventHolder makeEvent() {
        return {
            zor::EventHandle(standin::function<decltype(clCreateUserEvent)>("clCreateUserEvent")(nullptr, nullptr))};
    }
};

TEST_F(Events, WaitingReleasesTheEventAndClearsTheHolder) {
    const DeviceOwner device = makeDevice();
    zor::EventHolder holder = makeEvent();
    device->waitForEvent(holder);
    EXPECT_EQ(holder.event, nullptr);
    EXPECT_EQ(driver().liveObjects("event"), 0u);
    device->waitForEvent(holder);
    EXPECT_EQ(driver().callCount("clWaitForEvents"), 1u);
}

TEST_F(Events, AreCompleteWithoutHolderWithoutEventAndWhenTheDeviceSaysSo) {
    const DeviceOwner device = makeDevice();
    zor::EventHolder holder;
    EXPECT_TRUE(device->isComplete(nullptr));
    EXPECT_TRUE(device->isComplete(&holder));
    holder = makeEvent();
    EXPECT_FALSE(device->isComplete(&holder));
    EXPECT_NE(holder.event, nullptr);
    standin::function<decltype(clSetUserEventStatus)>("clSetUserEventStatus")(holder.event.get(), CL_COMPLETE);
    EXPECT_TRUE(device->isComplete(&holder));
    EXPECT_EQ(holder.event, nullptr);
    EXPECT_EQ(driver().liveObjects("event"), 0u);
}

TEST_F(Events, FailedQueriesAreBrokenInvariantsAndLoseNothing) {
    const DeviceOwner device = makeDevice();
    zor::EventHolder holder = makeEvent();
    driver().fail("clWaitForEvents", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(device->waitForEvent(holder), zor::Error);
    driver().fail("clGetEventInfo", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(device->isComplete(&holder), zor::Error);
    EXPECT_NE(holder.event, nullptr);
    driver().fail("clFinish", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(device->finish(), zor::Error);
    device->flush();
    EXPECT_EQ(driver().callCount("clFlush"), 1u);
}

class QueuePriority : public OnStandin {
 protected:
    // A thread that stands for the driver's.
    void SetUp() override {
        OnStandin::SetUp();
        worker_ = std::thread([this] {
            id = static_cast<uint64_t>(syscall(SYS_gettid));
            while (!stop_) std::this_thread::yield();
        });
        while (id == 0) std::this_thread::yield();
        firstDevice().vendor = "Quarrion, Inc.";
        driver().queueThread = id;
    }
    void TearDown() override {
        stop_ = true;
        worker_.join();
        OnStandin::TearDown();
    }
    int nice() const { return getpriority(PRIO_PROCESS, static_cast<id_t>(id)); }

    std::atomic<uint64_t> id{0};

 private:
    std::atomic<bool> stop_{false};
    std::thread worker_;
};

TEST_F(QueuePriority, RaisesTheDriversThreadAndBindsItToTheFirstProcessor) {
    const DeviceOwner device = makeDevice();
    const int own = getpriority(PRIO_PROCESS, 0);
    const bool allowed = geteuid() == 0;
    const std::string line = printed([&] { device->setQueuePriority(true); });
    EXPECT_EQ(line, allowed ? "Set OCL queue priority high\n" : "Set OCL queue priority failed\n");
    if (allowed) {
        EXPECT_EQ(nice(), -20);
    }
    cpu_set_t processors;
    ASSERT_EQ(sched_getaffinity(static_cast<pid_t>(id), sizeof processors, &processors), 0);
    EXPECT_EQ(CPU_COUNT(&processors), 1);
    EXPECT_TRUE(CPU_ISSET(0, &processors));
    EXPECT_EQ(printed([&] { device->setQueuePriority(false); }), "Set OCL queue priority high\n");
    EXPECT_EQ(nice(), 0);
    EXPECT_EQ(getpriority(PRIO_PROCESS, 0), own) << "the caller's own thread is left alone";
}

TEST_F(QueuePriority, LeavesThreadsAloneThatAreNotOurs) {
    const DeviceOwner device = makeDevice();
    for (const uint64_t foreign : {uint64_t{0}, uint64_t{1}, uint64_t{1} << 40}) {
        driver().queueThread = foreign;
        EXPECT_EQ(printed([&] { device->setQueuePriority(true); }), "Set OCL queue priority failed\n") << foreign;
    }
    driver().fail("clGetCommandQueueInfo", CL_INVALID_VALUE);
    EXPECT_THROW(device->setQueuePriority(true), zor::Error);
}

TEST_F(QueuePriority, IsOneVendorsMatter) {
    firstDevice().vendor = "Apple";
    const DeviceOwner device = makeDevice();
    EXPECT_EQ(printed([&] { device->setQueuePriority(true); }), "");
    EXPECT_EQ(driver().callCount("clGetCommandQueueInfo"), 0u);
}

class Adoption : public OnStandin {
 protected:
    void SetUp() override {
        OnStandin::SetUp();
        driver().platforms = {{"A", {standin::gpu("own"), standin::cpu("caller's")}}};
        standin::Device& second = driver().platforms[0].devices[1];
        second.workItemSizes = {32, 16, 1};
        second.workGroupSize = 64;
        second.vendor = "Apple";
        second.globalMemory = uint64_t{2} << 30;
        second.maxAllocation = 4096;
        second.driverVersion = "7";
        cl_platform_id platform = nullptr;
        zor::cl().clGetPlatformIDs(1u, &platform, nullptr);
        zor::cl().clGetDeviceIDs(platform, cl_device_type{CL_DEVICE_TYPE_CPU}, 1u, &id, nullptr);
        context = zor::cl().clCreateContext(nullptr, 1u, &id, nullptr, nullptr, nullptr);
        queue = zor::cl().clCreateCommandQueue(context, id, cl_command_queue_properties{0}, nullptr);
    }
    void TearDown() override {
        EXPECT_EQ(driver().liveObjects("context"), 1u);
        EXPECT_EQ(driver().liveObjects("queue"), 1u);
        zor::cl().clReleaseCommandQueue(queue);
        zor::cl().clReleaseContext(context);
        OnStandin::TearDown();
    }

    cl_device_id id = nullptr;
    cl_context context = nullptr;
    cl_command_queue queue = nullptr;
};

TEST_F(Adoption, TakesTheCallersObjectsAndReadsTheirLimits) {
    const DeviceOwner owner = makeDevice();
    zor::DeviceCL& device = opencl(owner);
    device.adopt(context, id, queue);
    EXPECT_EQ(driver().liveObjects("context"), 1u) << "its own context is gone";
    EXPECT_TRUE(device.isExternal());
    EXPECT_EQ(device.getContext(), context);
    EXPECT_EQ(device.queue(), queue);
    EXPECT_EQ(device.deviceName(), "caller's");
    EXPECT_EQ(device.driverVersion(), "7");
    EXPECT_EQ(device.vendor(), zor::VENDOR_APPLE);
    EXPECT_EQ(device.maxWorkItemSize(1), 16u);
    EXPECT_EQ(device.maxWorkGroupSize(), 64u);
    EXPECT_EQ(device.getTotalMemory(), uint64_t{2} << 30);
    EXPECT_EQ(device.maxAllocation(), 4096u);
}

TEST_F(Adoption, WorksWhereInitialisationFoundNothingAndFreesOurKernelsOnly) {
    DeviceOwner owner = makeDevice({.vendorMask = 0});
    ASSERT_FALSE(owner->isInitialized());
    opencl(owner).adopt(context, id, queue);
    const std::string_view source = "kernel void k() {}";
    zor::Kernel* const kernel = owner->getKernel({.fileName = "f", .kernelName = "k", .sources = {&source, 1}});
    ASSERT_NE(kernel, nullptr);
    zor::Launcher(*owner, *kernel).launch2D(100, 100, 64, 64);
    EXPECT_EQ(driver().launches.back().local, (std::vector<size_t>{8, 8})) << "32 x 16, halved to 64 items";
    owner.reset();
    EXPECT_EQ(driver().liveObjects("kernel"), 0u);
}

TEST_F(Adoption, OfADeviceWhoseLimitsCannotBeReadLeavesTheCallersObjectsAlone) {
    const DeviceOwner owner = makeDevice();
    EXPECT_THROW(opencl(owner).adopt(context, nullptr, queue), zor::Error);
    EXPECT_TRUE(owner->isExternal());
}

class Destruction : public OnStandin {};

TEST_F(Destruction, RefusesADeviceWhoseMemoryIsInUse) {
    DeviceOwner device = makeDevice();
    {
        const zor::Buffer<char> buffer(*device, 16, zor::BUFFER_DEFAULT);
        EXPECT_THROW(zor::destroyDevice(device.get()), zor::Error);
    }
    zor::destroyDevice(nullptr);
}

TEST_F(Destruction, OfTheUnknownKindNothingIsMade) {
    EXPECT_EQ(zor::createDevice(1, {}), nullptr);
    EXPECT_EQ(zor::createDevice(4, {}), nullptr);
}

TEST(HostDevice, HasMemoryButNoKernels) {
    const DeviceOwner device(zor::createDevice(zor::DEVICE_KIND_HOST, {}));
    EXPECT_EQ(device->kind(), zor::DEVICE_KIND_HOST);
    EXPECT_FALSE(device->isInitialized());
    EXPECT_EQ(device->getContext(), nullptr);
    EXPECT_EQ(device->queryGlobalMemorySize(), 0u);
    EXPECT_EQ(device->queryMaxAllocationSize(), UINT64_MAX);
    EXPECT_EQ(deviceText([&](char* out) { device->getDeviceName(out); }), "");
    EXPECT_EQ(deviceText([&](char* out) { device->getBoardName(out); }), "");
    zor::EventHolder holder;
    device->waitForEvent(holder);
    EXPECT_TRUE(device->isComplete(&holder));
    device->finish();
    device->flush();
    device->setQueuePriority(true);
    EXPECT_THROW(device->getKernel({}), zor::Error);
}

TEST(HostDevice, BuffersAreHostMemoryAndAreNotCounted) {
    const DeviceOwner device(zor::createDevice(zor::DEVICE_KIND_HOST, {}));
    zor::Buffer<char> from(*device, 8, zor::BUFFER_DEFAULT);
    zor::Buffer<char> to(*device, 8, zor::BUFFER_WRITE_ONLY);
    EXPECT_EQ(device->getUsedMemory(), 0u);
    EXPECT_EQ(from.map(), from.hostMemory());
    std::memcpy(from.map(), "01234567", 8);
    std::memset(to.map(), '-', 8);
    to.copyFrom(from, 3);
    EXPECT_EQ(std::string(static_cast<char*>(to.map()), 8), "012-----");
    to.unmap(to.hostMemory());
    EXPECT_EQ(to.memory(), nullptr);
    EXPECT_THROW(to.copyFrom(from, 9), zor::Error);
    EXPECT_THROW(zor::Buffer<char>(*device, uint64_t{1} << 62, zor::BUFFER_DEFAULT), zor::Error);
    EXPECT_FALSE(zor::Buffer<char>(*device, 8, zor::BUFFER_NO_ALLOCATION).hasMemory());
}
