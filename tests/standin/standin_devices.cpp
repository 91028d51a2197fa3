// Platforms, devices, contexts, queues and events of the stand-in.
#include <array>

#include "standin_objects.h"

namespace standin {
namespace {

constexpr cl_device_info kBoardName = 0x4038;
constexpr cl_command_queue_info kQueueThread = 0x403E;
constexpr int32_t kNoPlatform = -1001;

// Handles that stay valid whatever the script says: their indices are looked up at each call.
constexpr size_t kMaxPlatforms = 64;
constexpr size_t kMaxDevices = 64;
std::array<_cl_platform_id, kMaxPlatforms> platformHandles;
std::array<std::array<_cl_device_id, kMaxDevices>, kMaxPlatforms> deviceHandles;

cl_device_id deviceHandle(size_t platform, size_t index) {
    deviceHandles[platform][index] = {platform, index};
    return &deviceHandles[platform][index];
}

const Device* scripted(cl_device_id device) {
    const auto& platforms = script().platforms;
    if (device == nullptr || device->platform >= platforms.size()) return nullptr;
    const auto& devices = platforms[device->platform].devices;
    return device->index < devices.size() ? &devices[device->index] : nullptr;
}

cl_device_id deviceByOrder(size_t order) {
    for (size_t p = 0; p < script().platforms.size(); ++p) {
        const size_t count = script().platforms[p].devices.size();
        if (order < count) return deviceHandle(p, order);
        order -= count;
    }
    return nullptr;
}

}  // namespace

State& script() {
    // Never destroyed: the library may be called until the process is gone.
    static State* const made = [] {
        auto* fresh = new State;
        fresh->reset();
        return fresh;
    }();
    return *made;
}

int32_t enter(const char* name, std::string text, std::vector<uint64_t> numbers) {
    State& state = script();
    state.calls.push_back({name, std::move(text), std::move(numbers)});
    const auto failure = state.failures.find(name);
    if (failure == state.failures.end()) return CL_SUCCESS;
    if (failure->second.at > 1) return --failure->second.at, CL_SUCCESS;
    if (failure->second.count == 0) return CL_SUCCESS;
    --failure->second.count;
    return failure->second.status;
}

void complain(const std::string& what) {
    script().misuse.push_back(what);
}

bool isLive(const void* object, const char* kind) {
    const auto found = script().live.find(object);
    return found != script().live.end() && found->second == kind;
}

int32_t answer(const void* data, size_t bytes, size_t capacity, void* out, size_t* outSize) {
    if (out != nullptr && capacity < bytes) return CL_INVALID_VALUE;
    if (out != nullptr && bytes > 0) std::memcpy(out, data, bytes);
    if (outSize != nullptr) *outSize = bytes;
    return CL_SUCCESS;
}

int32_t answer(const std::string& text, size_t capacity, void* out, size_t* outSize) {
    return answer(text.c_str(), text.size() + 1, capacity, out, outSize);
}

}  // namespace standin

using namespace standin;

STANDIN_API State* standin_state() {
    return &script();
}

STANDIN_API cl_int clGetPlatformIDs(cl_uint capacity, cl_platform_id* out, cl_uint* count) {
    if (const int32_t status = enter("clGetPlatformIDs")) return status;
    const size_t platforms = script().platforms.size();
    if (platforms == 0) return kNoPlatform;
    if (count != nullptr) *count = static_cast<cl_uint>(platforms);
    for (size_t i = 0; out != nullptr && i < std::min<size_t>(capacity, platforms); ++i) {
        platformHandles[i].index = i;
        out[i] = &platformHandles[i];
    }
    return CL_SUCCESS;
}

STANDIN_API cl_int clGetPlatformInfo(cl_platform_id platform, cl_platform_info key, size_t capacity, void* out,
                                     size_t* size) {
    if (const int32_t status = enter("clGetPlatformInfo", {}, {key})) return status;
    if (platform == nullptr || platform->index >= script().platforms.size()) return CL_INVALID_PLATFORM;
    if (key != CL_PLATFORM_VENDOR) return CL_INVALID_VALUE;
    return answer(script().platforms[platform->index].vendor, capacity, out, size);
}

STANDIN_API cl_int clGetDeviceIDs(cl_platform_id platform, cl_device_type type, cl_uint capacity, cl_device_id* out,
                                  cl_uint* count) {
    if (const int32_t status = enter("clGetDeviceIDs", {}, {type})) return status;
    if (platform == nullptr || platform->index >= script().platforms.size()) return CL_INVALID_PLATFORM;
    const auto& devices = script().platforms[platform->index].devices;
    cl_uint found = 0;
    for (size_t i = 0; i < devices.size(); ++i) {
        if ((devices[i].type & type) == 0) continue;
        if (out != nullptr && found < capacity) out[found] = deviceHandle(platform->index, i);
        ++found;
    }
    if (count != nullptr) *count = found;
    return found > 0 ? CL_SUCCESS : CL_DEVICE_NOT_FOUND;
}

// numbers: the key. The first call of a text asks for its size.
STANDIN_API cl_int clGetDeviceInfo(cl_device_id id, cl_device_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter("clGetDeviceInfo", {}, {key})) return status;
    const Device* const device = scripted(id);
    if (device == nullptr) return CL_INVALID_DEVICE;
    switch (key) {
        case CL_DEVICE_NAME:
            return answer(device->name, capacity, out, size);
        case CL_DEVICE_VENDOR:
            return answer(device->vendor, capacity, out, size);
        case CL_DEVICE_VERSION:
            return answer(device->version, capacity, out, size);
        case CL_DRIVER_VERSION:
            return answer(device->driverVersion, capacity, out, size);
        case kBoardName:
            return device->boardName ? answer(*device->boardName, capacity, out, size) : CL_INVALID_VALUE;
        case CL_DEVICE_TYPE:
            return answerValue(device->type, capacity, out, size);
        case CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS:
            return answerValue(static_cast<cl_uint>(device->workItemSizes.size()), capacity, out, size);
        case CL_DEVICE_MAX_WORK_ITEM_SIZES:
            return answer(device->workItemSizes.data(), device->workItemSizes.size() * sizeof(size_t), capacity, out,
                          size);
        case CL_DEVICE_MAX_WORK_GROUP_SIZE:
            return answerValue(device->workGroupSize, capacity, out, size);
        case CL_DEVICE_GLOBAL_MEM_SIZE:
            return answerValue(cl_ulong{device->globalMemory}, capacity, out, size);
        case CL_DEVICE_MAX_MEM_ALLOC_SIZE:
            return answerValue(cl_ulong{device->maxAllocation}, capacity, out, size);
        default:
            return CL_INVALID_VALUE;
    }
}

// numbers: the property list without its ending zero.
STANDIN_API cl_context clCreateContext(const cl_context_properties* properties, cl_uint, const cl_device_id* devices,
                                       void(CL_CALLBACK*)(const char*, const void*, size_t, void*), void*,
                                       cl_int* status) {
    std::vector<uint64_t> list;
    for (; properties != nullptr && *properties != 0; ++properties) list.push_back(static_cast<uint64_t>(*properties));
    if (const int32_t failure = enter("clCreateContext", {}, std::move(list))) return refuse(failure, status);
    if (scripted(*devices) == nullptr) return refuse(CL_INVALID_DEVICE, status);
    auto context = std::make_unique<_cl_context>();
    context->device = *devices;
    return give(add(std::move(context), "context"), status);
}

STANDIN_API cl_int clRetainContext(cl_context context) {
    return retain("clRetainContext", context, "context", CL_INVALID_CONTEXT);
}

STANDIN_API cl_int clReleaseContext(cl_context context) {
    return release("clReleaseContext", context, "context", CL_INVALID_CONTEXT);
}

// numbers: the properties.
STANDIN_API cl_command_queue clCreateCommandQueue(cl_context context, cl_device_id device,
                                                  cl_command_queue_properties properties, cl_int* status) {
    if (const int32_t failure = enter("clCreateCommandQueue", {}, {properties})) return refuse(failure, status);
    if (!isLive(context, "context")) return complain("clCreateCommandQueue"), refuse(CL_INVALID_CONTEXT, status);
    if (context->device != device) return refuse(CL_INVALID_DEVICE, status);
    return give(add(std::make_unique<_cl_command_queue>(), "queue"), status);
}

STANDIN_API cl_int clRetainCommandQueue(cl_command_queue queue) {
    return retain("clRetainCommandQueue", queue, "queue", CL_INVALID_COMMAND_QUEUE);
}

STANDIN_API cl_int clReleaseCommandQueue(cl_command_queue queue) {
    return release("clReleaseCommandQueue", queue, "queue", CL_INVALID_COMMAND_QUEUE);
}

STANDIN_API cl_int clGetCommandQueueInfo(cl_command_queue queue, cl_command_queue_info key, size_t capacity, void* out,
                                         size_t* size) {
    if (const int32_t status = enter("clGetCommandQueueInfo", {}, {key})) return status;
    if (!isLive(queue, "queue")) return complain("clGetCommandQueueInfo"), CL_INVALID_COMMAND_QUEUE;
    return key == kQueueThread ? answerValue(script().queueThread, capacity, out, size) : CL_INVALID_VALUE;
}

STANDIN_API cl_int clFinish(cl_command_queue queue) {
    if (const int32_t status = enter("clFinish")) return status;
    return isLive(queue, "queue") ? CL_SUCCESS : (complain("clFinish"), CL_INVALID_COMMAND_QUEUE);
}

STANDIN_API cl_int clFlush(cl_command_queue queue) {
    if (const int32_t status = enter("clFlush")) return status;
    return isLive(queue, "queue") ? CL_SUCCESS : (complain("clFlush"), CL_INVALID_COMMAND_QUEUE);
}

STANDIN_API cl_event clCreateUserEvent(cl_context, cl_int* status) {
    if (const int32_t failure = enter("clCreateUserEvent")) return refuse(failure, status);
    return give(add(std::make_unique<_cl_event>(), "event"), status);
}

STANDIN_API cl_int clSetUserEventStatus(cl_event event, cl_int execution) {
    event->status = execution;
    return CL_SUCCESS;
}

// Waiting completes the events.
STANDIN_API cl_int clWaitForEvents(cl_uint count, const cl_event* events) {
    if (const int32_t status = enter("clWaitForEvents")) return status;
    for (cl_uint i = 0; i < count; ++i) {
        if (!isLive(events[i], "event")) return complain("clWaitForEvents"), CL_INVALID_EVENT;
        events[i]->status = CL_COMPLETE;
    }
    return CL_SUCCESS;
}

STANDIN_API cl_int clGetEventInfo(cl_event event, cl_event_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter("clGetEventInfo")) return status;
    if (!isLive(event, "event")) return complain("clGetEventInfo"), CL_INVALID_EVENT;
    return key == CL_EVENT_COMMAND_EXECUTION_STATUS ? answerValue(event->status, capacity, out, size)
                                                    : CL_INVALID_VALUE;
}

STANDIN_API cl_int clReleaseEvent(cl_event event) {
    return release("clReleaseEvent", event, "event", CL_INVALID_EVENT);
}

// numbers: the property list without its ending zero.
static cl_int contextInfo(const cl_context_properties* properties, cl_gl_context_info key, size_t capacity, void* out,
                          size_t* size) {
    std::vector<uint64_t> list;
    for (; properties != nullptr && *properties != 0; ++properties) list.push_back(static_cast<uint64_t>(*properties));
    if (const int32_t status = enter("clGetGLContextInfoKHR", {}, std::move(list))) return status;
    if (key != CL_DEVICES_FOR_GL_CONTEXT_KHR) return CL_INVALID_VALUE;
    return answerValue(deviceByOrder(script().glDevice), capacity, out, size);
}

#ifndef STANDIN_BARE
// text: the name asked for.
STANDIN_API void* clGetExtensionFunctionAddress(const char* name) {
    if (enter("clGetExtensionFunctionAddress", name) != CL_SUCCESS) return nullptr;
    if (!script().hasGlContextInfo || std::strcmp(name, "clGetGLContextInfoKHR") != 0) return nullptr;
    return reinterpret_cast<void*>(&contextInfo);
}
#else
[[maybe_unused]] static const auto unusedContextInfo = &contextInfo;
#endif
