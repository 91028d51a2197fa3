// Device information, limits, events, queue priority, adoption and the host device.
#include <sched.h>
#include <sys/resource.h>
#include <sys/syscall.h>

#include <atomic>
#include <thread>

#include "fixture.h"

class Devices : public OnStandin {};

TEST_F(Devices, HaveLimitsAndTextsWhateverTheirDriverSays) {
    firstDevice().workItemSizes = {0, uint64_t{1} << 40, 7, 8, 9};
    firstDevice().workGroupSize = 0;
    firstDevice().version = "  ";
    device = makeDevice();
    EXPECT_EQ(opencl(device).maxWorkItemSize(0), 1u);
    EXPECT_EQ(opencl(device).maxWorkItemSize(1), UINT32_MAX);
    EXPECT_EQ(opencl(device).maxWorkItemSize(2), 7u);
    EXPECT_EQ(opencl(device).maxWorkGroupSize(), 1u);
    char text[zor::kDeviceTextBytes] = "#";
    device->getDeviceVersion(text);
    EXPECT_STREQ(text, "") << "only blanks";
    driver().fail("clGetDeviceInfo", CL_INVALID_VALUE);
    device->getBoardName(text);
    EXPECT_STREQ(text, "") << "no such query";
    firstDevice().boardName = " " + std::string(300, 'b');
    device->getBoardName(text);
    EXPECT_EQ(text, std::string(127, 'b'));
}

TEST_F(Devices, WaitForEventsAndReleaseThem) {
    const auto make = standin::function<decltype(clCreateUserEvent)>("clCreateUserEvent");
    zor::EventHolder holder{zor::EventHandle(make(nullptr, nullptr))};
    driver().fail("clWaitForEvents", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(device->waitForEvent(holder), zor::Error);
    EXPECT_FALSE(device->isComplete(&holder));
    driver().eventStatus = CL_COMPLETE;
    EXPECT_TRUE(device->isComplete(&holder));
    EXPECT_EQ(holder.event, nullptr);
    holder.event.reset(make(nullptr, nullptr));
    device->waitForEvent(holder);
    EXPECT_EQ(driver().liveObjects("event"), 0u);
}

TEST_F(Devices, RaiseTheirDriversThreadAndNoOneElses) {
    std::atomic<uint64_t> id{0};
    std::jthread worker([&](const std::stop_token& stop) {  // stands for the driver's
        id = static_cast<uint64_t>(syscall(SYS_gettid));
        while (!stop.stop_requested()) std::this_thread::yield();
    });
    while (id == 0) std::this_thread::yield();
    firstDevice().vendor = "Quarrion, Inc.";
    device = makeDevice();
    const int own = getpriority(PRIO_PROCESS, 0);
    const bool allowed = geteuid() == 0;
    for (const uint64_t thread : {uint64_t{0}, uint64_t{1}, uint64_t{1} << 40, id.load()}) {
        driver().queueThread = thread;
        EXPECT_EQ(printed([&] { device->setQueuePriority(true); }),
                  thread == id && allowed ? "Set OCL queue priority high\n" : "Set OCL queue priority failed\n")
            << thread;
    }
    EXPECT_EQ(getpriority(PRIO_PROCESS, static_cast<id_t>(id)), allowed ? -20 : own);
    EXPECT_EQ(getpriority(PRIO_PROCESS, 0), own) << "the caller's own thread is left alone";
    cpu_set_t processors;
    ASSERT_EQ(sched_getaffinity(static_cast<pid_t>(id), sizeof processors, &processors), 0);
    EXPECT_TRUE(CPU_COUNT(&processors) == 1 && CPU_ISSET(0, &processors));
}

TEST_F(Devices, AdoptTheCallersObjectsWithTheirLimitsAlsoWhereNoDeviceWasFound) {
    driver().platforms = {{"A", {standin::cpu("caller's")}}};
    firstDevice().workItemSizes = {32, 16, 1};
    firstDevice().workGroupSize = 64;
    firstDevice().globalMemory = uint64_t{2} << 30;
    const DeviceOwner caller = makeDevice({.deviceType = 1});
    const cl_context context = caller->getContext();
    const cl_command_queue queue = opencl(caller).queue();
    device = makeDevice();
    ASSERT_FALSE(device->isInitialized());
    EXPECT_THROW(device->finish(), zor::Error);
    opencl(device).adopt(context, opencl(caller).id(), queue);
    EXPECT_TRUE(device->isExternal());
    EXPECT_EQ(device->getTotalMemory(), uint64_t{2} << 30);
    const std::string_view source = "kernel void k() {}";
    zor::Kernel* const kernel = device->getKernel({.kernelName = "k", .sources = {&source, 1}});
    ASSERT_NE(kernel, nullptr);
    zor::Launcher(*device, *kernel).launch2D(100, 100, 64, 64);
    EXPECT_EQ(driver().launches.back().local, (std::vector<size_t>{8, 8})) << "32 x 16, halved to 64 items";
    EXPECT_THROW(opencl(device).adopt(context, nullptr, queue), zor::Error) << "no limits can be read";
    device.reset();
    EXPECT_EQ(driver().liveObjects("kernel"), 0u);
    caller->finish();  // the caller's objects are as before: another release would be misuse
}

TEST(HostDevice, HasUncountedMemoryButNoKernels) {
    const DeviceOwner host(zor::createDevice(zor::DEVICE_KIND_HOST, {}));
    zor::Buffer<char> from(*host, 8, zor::BUFFER_DEFAULT);
    zor::Buffer<char> to(*host, 8, zor::BUFFER_WRITE_ONLY);
    std::memcpy(from.map(), "01234567", 8);
    std::memset(to.map(), '-', 8);
    to.copyFrom(from, 3);
    EXPECT_EQ(std::string(static_cast<char*>(to.map()), 8), "012-----");
    EXPECT_EQ(host->getUsedMemory(), 0u);
    EXPECT_THROW(host->getKernel({}), zor::Error);
}
