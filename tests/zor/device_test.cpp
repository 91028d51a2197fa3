// Limits and texts of devices, events, queue priority and adoption.
#include <sys/resource.h>
#include <sys/syscall.h>

#include <future>
#include <latch>
#include <thread>

#include "fixture.h"

class Devices : public OnStandin {};

TEST_F(Devices, HaveLimitsAndTextsWhateverTheirDriverSays) {
    firstDevice().workItemSizes = {0, uint64_t{1} << 40, 7, 8, 9};
    firstDevice().workGroupSize = 0;
    device = makeDevice();
    const uint32_t expected[] = {1, UINT32_MAX, 7};
    for (const uint32_t i : {0u, 1u, 2u}) EXPECT_EQ(opencl(device).maxWorkItemSize(i), expected[i]);
    EXPECT_EQ(opencl(device).maxWorkGroupSize(), 1u);
    char text[zor::kDeviceTextBytes] = "#";
    firstDevice().boardName = " " + std::string(300, 'b');
    device->getBoardName(text);
    EXPECT_EQ(text, std::string(127, 'b'));
}

TEST_F(Devices, WaitForEventsAndReleaseThem) {
    const auto make = standin::function<decltype(clCreateUserEvent)>("clCreateUserEvent");
    cl_int status = CL_SUCCESS;
    zor::EventHolder holder{zor::EventHandle(make(nullptr, &status))};
    driver().fail("clWaitForEvents", CL_OUT_OF_RESOURCES);
    EXPECT_THROW(device->waitForEvent(holder), zor::Error);
    device->waitForEvent(holder);
    EXPECT_EQ(holder.event, nullptr);
    holder.event.reset(make(nullptr, &status));
    EXPECT_FALSE(device->isComplete(&holder));
    driver().eventStatus = CL_COMPLETE;
    EXPECT_TRUE(device->isComplete(&holder));
    EXPECT_EQ(holder.event, nullptr);
}

TEST_F(Devices, RaiseTheirDriversThreadAndNoOneElses) {
    std::promise<uint64_t> started;
    std::latch done(1);
    std::jthread driversThread([&] {
        started.set_value(static_cast<uint64_t>(syscall(SYS_gettid)));
        done.wait();
    });
    const uint64_t id = started.get_future().get();
    firstDevice().vendor = "Quarrion, Inc.";
    device = makeDevice();
    const bool allowed = geteuid() == 0;
    for (const uint64_t thread : {uint64_t{0}, uint64_t{1}, uint64_t{1} << 40, id}) {
        driver().queueThread = thread;
        device->setQueuePriority(true);
        EXPECT_EQ(printed().ends_with("Set OCL queue priority high\n"), thread == id && allowed) << thread;
    }
    EXPECT_EQ(getpriority(PRIO_PROCESS, static_cast<id_t>(id)) == -20, allowed);
    EXPECT_NE(getpriority(PRIO_PROCESS, 0), -20) << "the caller's own thread is left alone";
    done.count_down();
}

TEST_F(Devices, AdoptTheCallersObjectsWithTheirLimitsAlsoWhereNoDeviceWasFound) {
    driver().platforms = {{"A", {{"caller's", CL_DEVICE_TYPE_CPU}}}};
    firstDevice().workItemSizes = {32, 16, 1};
    firstDevice().workGroupSize = 64;
    const DeviceOwner caller = makeDevice({.deviceType = 1});
    const cl_context context = caller->getContext();
    const cl_command_queue queue = opencl(caller).queue();
    device = makeDevice();
    ASSERT_FALSE(device->isInitialized());
    EXPECT_THROW(device->finish(), zor::Error);
    const size_t before = driver().liveObjects();
    opencl(device).adopt(context, opencl(caller).id(), queue);
    EXPECT_EQ(opencl(device).maxWorkItemSize(1) * opencl(device).maxWorkGroupSize(), 16u * 64);
    EXPECT_THROW(opencl(device).adopt(context, nullptr, queue), zor::Error) << "no limits can be read";
    device.reset();
    EXPECT_EQ(driver().liveObjects(), before) << "the caller's objects are as before";
}
