// A scripted stand-in for the OpenCL library. Built as libOpenCL.so.1 into a folder of its own, it is found through the
// library path by whatever opens that name. It keeps platforms, devices, buffers, programs and kernels in memory;
// kernels compute nothing. A test scripts it and reads its log through state():
//
//     standin::State& driver = standin::state();
//     driver.reset();                                       // in every SetUp
//     driver.platforms = {{.vendor = "Apple", .devices = {{"Small"}}}};
//     driver.fail("clCreateBuffer", CL_OUT_OF_RESOURCES);   // the next call fails
//     ...
//     EXPECT_EQ(driver.launches.back().kernel, "GammaKernel");
//     EXPECT_EQ(driver.liveObjects(), 0u);                  // every object was released
//     EXPECT_THAT(driver.misuse, IsEmpty());                // no dead or foreign handle, no double unmap
//
// Library and tests are built by one compiler, so the state is shared as plain C++ objects.
#pragma once

#ifndef CL_TARGET_OPENCL_VERSION
#define CL_TARGET_OPENCL_VERSION 120
#endif
#ifndef CL_USE_DEPRECATED_OPENCL_1_1_APIS
#define CL_USE_DEPRECATED_OPENCL_1_1_APIS
#endif
#include <CL/cl.h>
#include <CL/cl_gl.h>
#include <dlfcn.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <map>
#include <set>
#include <string>
#include <vector>

namespace standin {

struct Device {
    std::string name = "Stand-in";
    cl_device_type type = CL_DEVICE_TYPE_GPU;
    std::string vendor = "Stand-in vendor";
    std::string version = "OpenCL 1.2 stand-in";
    std::string driverVersion = "1.0";
    std::string boardName{};  // answers the vendor-specific query 0x4038
    std::vector<size_t> workItemSizes{1024, 1024, 64};
    size_t workGroupSize = 1024;
    uint64_t globalMemory = uint64_t{4} << 30;   // bytes
    uint64_t maxAllocation = uint64_t{1} << 30;  // bytes
};

struct Platform {
    std::string vendor = "Stand-in vendor";
    std::vector<Device> devices{};
};

// One call as it reached the library. What text and numbers hold is said beside each function that fills them.
struct Call {
    std::string name;
    std::string text{};
    std::vector<uint64_t> numbers{};
};

struct Argument {
    size_t size = 0;
    std::vector<unsigned char> bytes;  // empty for a null value

    template <class Value>
    Value as() const {
        Value value{};
        if (bytes.size() == sizeof value) std::memcpy(&value, bytes.data(), sizeof value);
        return value;
    }
};

struct Launch {
    std::string kernel;
    std::string options;  // of the program
    std::vector<size_t> global{}, local{};
    std::map<uint32_t, Argument> arguments{};
};

struct State {
    // What the machine offers. Without platforms clGetPlatformIDs gives -1001.
    std::vector<Platform> platforms = {{.devices = {{"Stand-in GPU"}, {"Stand-in CPU", CL_DEVICE_TYPE_CPU}}}};
    std::string buildLog;                // of every build
    size_t glDevice = 0;                 // the device of the first platform that runs OpenGL
    int32_t eventStatus = CL_SUBMITTED;  // of all events
    uint64_t queueThread = 0;            // answers the vendor-specific queue query 0x403E

    // What happened.
    std::vector<Call> calls;
    std::vector<Launch> launches;
    std::vector<std::string> misuse;  // dead or null handles, bad unmaps

    // Makes a call fail with the status from its at-th time on from now, count times.
    void fail(const std::string& call, int32_t status, uint32_t at = 1, uint32_t count = 1) {
        statuses[call].assign(at - 1, CL_SUCCESS);
        statuses[call].insert(statuses[call].end(), count, status);
    }

    size_t callCount(const std::string& name) const {
        return static_cast<size_t>(std::ranges::count(calls, name, &Call::name));
    }
    // The latest call of the name; an empty one where there was none.
    Call lastCall(const std::string& name) const {
        const auto call = std::find_if(calls.rbegin(), calls.rend(), [&](const Call& c) { return c.name == name; });
        return call == calls.rend() ? Call{} : *call;
    }
    // Objects created and not released.
    size_t liveObjects() const { return live.size(); }

    // Forgets script, log and objects.
    void reset() { *this = State{}; }

    // The library's own.
    std::map<std::string, std::vector<int32_t>> statuses;     // of each call's next times
    std::map<const void*, std::string> live;                  // objects and their kinds
    std::multiset<std::pair<const void*, const void*>> maps;  // memory object and pointer, not yet unmapped
};

// A function of the library for the test's own use: function<decltype(clCreateImage)>("clCreateImage").
template <class Function>
Function* function(const char* name) {
    static void* const library = dlopen("libOpenCL.so.1", RTLD_NOW | RTLD_LOCAL);
    return reinterpret_cast<Function*>(library != nullptr ? dlsym(library, name) : nullptr);
}

// Null when another OpenCL library answers to the name.
inline State* findState() {
    auto* const get = function<State*()>("standin_state");
    return get != nullptr ? get() : nullptr;
}
inline State& state() {
    return *findState();
}

// The bytes of a buffer, whose size is given to bytes when that is not null.
inline unsigned char* bytesOf(cl_mem memory, size_t* bytes = nullptr) {
    return function<unsigned char*(cl_mem, size_t*)>("standin_bytes")(memory, bytes);
}

}  // namespace standin
