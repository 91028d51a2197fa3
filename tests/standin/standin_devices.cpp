// Platforms, devices, contexts, queues and events of the stand-in.
#include "standin_objects.h"

namespace standin {
namespace {

constexpr cl_device_info kBoardName = 0x4038;
constexpr cl_command_queue_info kQueueThread = 0x403E;
constexpr int32_t kNoPlatform = -1001;

// Handles are numbers and stay valid whatever the script says: platform times 64, plus the device, plus 1.
template <class Handle>
Handle handleOf(size_t platform, size_t device = 0) {
    return reinterpret_cast<Handle>(platform * 64 + device + 1);
}

const Platform* platformOf(const void* id) {
    const size_t index = (reinterpret_cast<size_t>(id) - 1) / 64;
    return index < script().platforms.size() ? &script().platforms[index] : nullptr;
}

const Device* deviceOf(cl_device_id id) {
    const Platform* const platform = platformOf(id);
    const size_t index = (reinterpret_cast<size_t>(id) - 1) % 64;
    return platform != nullptr && index < platform->devices.size() ? &platform->devices[index] : nullptr;
}

std::string textOf(const std::string& text) {
    return {text.c_str(), text.size() + 1};
}

// A property list without its ending zero.
std::vector<uint64_t> numbersOf(const cl_context_properties* properties) {
    std::vector<uint64_t> list;
    for (; properties != nullptr && *properties != 0; ++properties) list.push_back(static_cast<uint64_t>(*properties));
    return list;
}

}  // namespace

State& script() {
    // Never destroyed: the library may be called until the process is gone.
    static State* const made = new State;
    return *made;
}

int32_t begin(Call call) {
    State& state = script();
    const auto failure = state.failures.find(call.name);
    state.calls.push_back(std::move(call));
    if (failure == state.failures.end()) return CL_SUCCESS;
    auto& [status, at, count] = failure->second;
    if (at > 1) return --at, CL_SUCCESS;
    if (count == 0) return CL_SUCCESS;
    --count;
    return status;
}

int32_t checkLive(const std::string& call, const void* object, Kind kind) {
    const auto found = script().live.find(object);
    if (found != script().live.end() && found->second == kind.name) return CL_SUCCESS;
    script().misuse.push_back(call);
    return kind.invalid;
}

int32_t answer(const Answers& answers, cl_uint key, size_t capacity, void* out, size_t* outSize) {
    const auto found = answers.find(key);
    if (found == answers.end() || (out != nullptr && capacity < found->second.size())) return CL_INVALID_VALUE;
    if (out != nullptr) found->second.copy(static_cast<char*>(out), found->second.size());
    if (outSize != nullptr) *outSize = found->second.size();
    return CL_SUCCESS;
}

}  // namespace standin

using namespace standin;

STANDIN_API State* standin_state() {
    return &script();
}

STANDIN_API cl_int clGetPlatformIDs(cl_uint capacity, cl_platform_id* out, cl_uint* count) {
    if (const int32_t status = enter({"clGetPlatformIDs"})) return status;
    const size_t platforms = script().platforms.size();
    if (platforms == 0) return kNoPlatform;
    if (count != nullptr) *count = static_cast<cl_uint>(platforms);
    for (size_t i = 0; i < std::min<size_t>(capacity, platforms); ++i) out[i] = handleOf<cl_platform_id>(i);
    return CL_SUCCESS;
}

STANDIN_API cl_int clGetPlatformInfo(cl_platform_id id, cl_platform_info key, size_t capacity, void* out,
                                     size_t* size) {
    if (const int32_t status = enter({"clGetPlatformInfo"})) return status;
    if (platformOf(id) == nullptr) return CL_INVALID_PLATFORM;
    return answer({{CL_PLATFORM_VENDOR, textOf(platformOf(id)->vendor)}}, key, capacity, out, size);
}

STANDIN_API cl_int clGetDeviceIDs(cl_platform_id id, cl_device_type type, cl_uint capacity, cl_device_id* out,
                                  cl_uint* count) {
    if (const int32_t status = enter({"clGetDeviceIDs"})) return status;
    std::vector<cl_device_id> found;
    for (auto handle = reinterpret_cast<size_t>(id);; ++handle) {
        auto* const device = reinterpret_cast<cl_device_id>(handle);
        if (deviceOf(device) == nullptr) break;
        if ((deviceOf(device)->type & type) != 0) found.push_back(device);
    }
    if (count != nullptr) *count = static_cast<cl_uint>(found.size());
    std::copy_n(found.begin(), std::min<size_t>(capacity, found.size()), out);
    return found.empty() ? CL_DEVICE_NOT_FOUND : CL_SUCCESS;
}

STANDIN_API cl_int clGetDeviceInfo(cl_device_id id, cl_device_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter({"clGetDeviceInfo"})) return status;
    const Device* const device = deviceOf(id);
    if (device == nullptr) return CL_INVALID_DEVICE;
    const std::vector<size_t>& sizes = device->workItemSizes;
    const Answers answers = {
        {kBoardName, textOf(device->boardName)},
        {CL_DEVICE_NAME, textOf(device->name)},
        {CL_DEVICE_VENDOR, textOf(device->vendor)},
        {CL_DEVICE_VERSION, textOf(device->version)},
        {CL_DRIVER_VERSION, textOf(device->driverVersion)},
        {CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS, bytesOfValue(static_cast<cl_uint>(sizes.size()))},
        {CL_DEVICE_MAX_WORK_ITEM_SIZES, {reinterpret_cast<const char*>(sizes.data()), sizes.size() * sizeof(size_t)}},
        {CL_DEVICE_MAX_WORK_GROUP_SIZE, bytesOfValue(device->workGroupSize)},
        {CL_DEVICE_GLOBAL_MEM_SIZE, bytesOfValue(cl_ulong{device->globalMemory})},
        {CL_DEVICE_MAX_MEM_ALLOC_SIZE, bytesOfValue(cl_ulong{device->maxAllocation})},
    };
    return answer(answers, key, capacity, out, size);
}

// numbers: the properties.
STANDIN_API cl_context clCreateContext(const cl_context_properties* properties, cl_uint, const cl_device_id* devices,
                                       void(CL_CALLBACK*)(const char*, const void*, size_t, void*), void*,
                                       cl_int* out) {
    int32_t status = enter({"clCreateContext", {}, numbersOf(properties)});
    if (status == CL_SUCCESS && deviceOf(*devices) == nullptr) status = CL_INVALID_DEVICE;
    return give(out, status, std::make_unique<_cl_context>(_cl_context{*devices}));
}

STANDIN_RELEASE(clReleaseContext, cl_context)

STANDIN_API cl_command_queue clCreateCommandQueue(cl_context context, cl_device_id device, cl_command_queue_properties,
                                                  cl_int* out) {
    int32_t status = enter({"clCreateCommandQueue"}, context);
    if (status == CL_SUCCESS && context->device != device) status = CL_INVALID_DEVICE;
    return give(out, status, std::make_unique<_cl_command_queue>());
}

STANDIN_RELEASE(clReleaseCommandQueue, cl_command_queue)

STANDIN_QUERY(clGetCommandQueueInfo, cl_command_queue, {{kQueueThread, bytesOfValue(script().queueThread)}})

STANDIN_API cl_int clFinish(cl_command_queue queue) {
    return enter({"clFinish"}, queue);
}

STANDIN_API cl_int clFlush(cl_command_queue queue) {
    return enter({"clFlush"}, queue);
}

STANDIN_API cl_event clCreateUserEvent(cl_context, cl_int* out) {
    return give(out, CL_SUCCESS, std::make_unique<_cl_event>());
}

STANDIN_API cl_int clWaitForEvents(cl_uint, const cl_event* events) {
    return enter({"clWaitForEvents"}, events[0]);
}

STANDIN_QUERY(clGetEventInfo, cl_event, {{CL_EVENT_COMMAND_EXECUTION_STATUS, bytesOfValue(script().eventStatus)}})

STANDIN_RELEASE(clReleaseEvent, cl_event)

// numbers: the properties.
static cl_int contextInfo(const cl_context_properties* properties, cl_gl_context_info key, size_t capacity, void* out,
                          size_t* size) {
    if (const int32_t status = enter({"clGetGLContextInfoKHR", {}, numbersOf(properties)})) return status;
    return answer({{CL_DEVICES_FOR_GL_CONTEXT_KHR, bytesOfValue(handleOf<cl_device_id>(0, script().glDevice))}}, key,
                  capacity, out, size);
}

STANDIN_API void* clGetExtensionFunctionAddress(const char* name) {
    return std::strcmp(name, "clGetGLContextInfoKHR") == 0 ? reinterpret_cast<void*>(&contextInfo) : nullptr;
}
