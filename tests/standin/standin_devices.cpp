// Platforms, devices, contexts, queues and events of the stand-in.
#include "standin_objects.h"

namespace standin {
namespace {

constexpr cl_device_info kBoardName = 0x4038;
constexpr cl_command_queue_info kQueueThread = 0x403E;
constexpr int32_t kNoPlatform = -1001;

// Handles are numbers and stay valid whatever the script says: platform times 64, plus the device, plus 1.
const Platform& platformOf(const void* id) {
    return script().platforms.at((reinterpret_cast<size_t>(id) - 1) / 64);
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
    std::vector<int32_t>& next = script().statuses[call.name];
    script().calls.push_back(std::move(call));
    if (next.empty()) return CL_SUCCESS;
    const int32_t status = next.front();
    next.erase(next.begin());
    return status;
}

int32_t checkLive(const std::string& call, const void* object, const std::string& kind) {
    const auto found = script().live.find(object);
    if (found != script().live.end() && found->second == kind) return CL_SUCCESS;
    script().misuse.push_back(call);
    return CL_INVALID_VALUE;
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
    for (size_t i = 0; i < std::min<size_t>(capacity, platforms); ++i)
        out[i] = reinterpret_cast<cl_platform_id>(i * 64 + 1);
    return CL_SUCCESS;
}

STANDIN_API cl_int clGetPlatformInfo(cl_platform_id id, cl_platform_info key, size_t capacity, void* out,
                                     size_t* size) {
    if (const int32_t status = enter({"clGetPlatformInfo"})) return status;
    return answer({{CL_PLATFORM_VENDOR, platformOf(id).vendor + '\0'}}, key, capacity, out, size);
}

STANDIN_API cl_int clGetDeviceIDs(cl_platform_id id, cl_device_type type, cl_uint capacity, cl_device_id* out,
                                  cl_uint* count) {
    if (const int32_t status = enter({"clGetDeviceIDs"})) return status;
    std::vector<cl_device_id> found;
    auto handle = reinterpret_cast<size_t>(id);
    for (const Device& device : platformOf(id).devices) {
        if ((device.type & type) != 0) found.push_back(reinterpret_cast<cl_device_id>(handle));
        ++handle;
    }
    if (count != nullptr) *count = static_cast<cl_uint>(found.size());
    std::copy_n(found.begin(), std::min<size_t>(capacity, found.size()), out);
    return found.empty() ? CL_DEVICE_NOT_FOUND : CL_SUCCESS;
}

STANDIN_API cl_int clGetDeviceInfo(cl_device_id id, cl_device_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter({"clGetDeviceInfo"})) return status;
    const Device& device = platformOf(id).devices.at((reinterpret_cast<size_t>(id) - 1) % 64);
    const std::vector<size_t>& sizes = device.workItemSizes;
    const Answers answers = {
        {kBoardName, device.boardName + '\0'},
        {CL_DEVICE_NAME, device.name + '\0'},
        {CL_DEVICE_VENDOR, device.vendor + '\0'},
        {CL_DEVICE_VERSION, device.version + '\0'},
        {CL_DRIVER_VERSION, device.driverVersion + '\0'},
        {CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS, bytesOfValue(static_cast<cl_uint>(sizes.size()))},
        {CL_DEVICE_MAX_WORK_ITEM_SIZES, {reinterpret_cast<const char*>(sizes.data()), sizes.size() * sizeof(size_t)}},
        {CL_DEVICE_MAX_WORK_GROUP_SIZE, bytesOfValue(device.workGroupSize)},
        {CL_DEVICE_GLOBAL_MEM_SIZE, bytesOfValue(cl_ulong{device.globalMemory})},
        {CL_DEVICE_MAX_MEM_ALLOC_SIZE, bytesOfValue(cl_ulong{device.maxAllocation})},
    };
    return answer(answers, key, capacity, out, size);
}

// numbers: the properties.
STANDIN_API cl_context clCreateContext(const cl_context_properties* properties, cl_uint, const cl_device_id*,
                                       void(CL_CALLBACK*)(const char*, const void*, size_t, void*), void*,
                                       cl_int* out) {
    return give(out, enter({"clCreateContext", {}, numbersOf(properties)}), _cl_context{});
}

STANDIN_RELEASE(clReleaseContext, cl_context)

STANDIN_API cl_command_queue clCreateCommandQueue(cl_context context, cl_device_id, cl_command_queue_properties,
                                                  cl_int* out) {
    return give(out, enter({"clCreateCommandQueue"}, context), _cl_command_queue{});
}

STANDIN_RELEASE(clReleaseCommandQueue, cl_command_queue)

STANDIN_QUERY(clGetCommandQueueInfo, cl_command_queue, {{kQueueThread, bytesOfValue(script().queueThread)}})

STANDIN_API cl_int clFinish(cl_command_queue queue) {
    return enter({"clFinish"}, queue);
}

STANDIN_API cl_event clCreateUserEvent(cl_context, cl_int* out) {
    return give(out, CL_SUCCESS, _cl_event{});
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
    return answer(
        {{CL_DEVICES_FOR_GL_CONTEXT_KHR, bytesOfValue(reinterpret_cast<cl_device_id>(script().glDevice + 1))}}, key,
        capacity, out, size);
}

STANDIN_API void* clGetExtensionFunctionAddress(const char* name) {
    return std::strcmp(name, "clGetGLContextInfoKHR") == 0 ? reinterpret_cast<void*>(&contextInfo) : nullptr;
}
