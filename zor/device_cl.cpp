// The OpenCL device: initialisation in named steps, adoption, limits, information, events.
#include "zor/device_cl.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <limits>
#include <vector>

#include "zor/cache_name.h"
#include "zor/context_creation.h"
#include "zor/device_info.h"
#include "zor/discovery.h"
#include "zor/kernel.h"
#include "zor/kernel_builder.h"
#include "zor/queue_priority.h"

namespace zor {
namespace {

constexpr cl_device_info kBoardNameQuery = 0x4038;           // vendor-specific text
constexpr cl_command_queue_info kQueueThreadQuery = 0x403E;  // vendor-specific, 8 bytes

void requireLibrary() {
    require(loadOpenCL() == 0, "loadOpenCL", "no OpenCL library could be opened");
}

FoundDevice chooseDevice(const std::vector<FoundDevice>& devices, uint32_t deviceIndex) {
    const auto last = static_cast<int32_t>(devices.size()) - 1;
    const int32_t index = std::clamp(static_cast<int32_t>(deviceIndex), 0, last);
    return devices[static_cast<size_t>(index)];
}

QueueHandle createQueue(cl_context context, cl_device_id device) {
    int32_t status = CL_SUCCESS;
    QueueHandle queue(
        cl().clCreateCommandQueue(context, device, cl_command_queue_properties{CL_QUEUE_PROFILING_ENABLE}, &status));
    check(status, "clCreateCommandQueue");
    require(queue != nullptr, "clCreateCommandQueue", "no command queue");
    return queue;
}

std::string requiredText(cl_device_id device, cl_device_info key) {
    std::string text;
    check(readDeviceText(device, key, text), "clGetDeviceInfo");
    return text;
}

// A device may count more than three dimensions, and more items than 32 bits hold.
std::array<uint32_t, 3> readWorkItemSizes(cl_device_id device, uint32_t dimensions) {
    std::vector<size_t> sizes(std::max(dimensions, 3u), 1);
    check(readDeviceBytes(device, CL_DEVICE_MAX_WORK_ITEM_SIZES, sizes.data(), sizes.size() * sizeof(size_t)),
          "clGetDeviceInfo");
    std::array<uint32_t, 3> limits{};
    const auto inRange = [](size_t size) {
        return static_cast<uint32_t>(std::clamp<size_t>(size, 1, std::numeric_limits<uint32_t>::max()));
    };
    std::transform(sizes.begin(), sizes.begin() + 3, limits.begin(), inRange);
    return limits;
}

// Without separators, as a decimal of the context's low 32 bits.
std::string kernelMapName(cl_context context, const KernelRequest& request) {
    constexpr std::string_view kExtension = ".cl";
    const std::string_view options = request.options.value_or(std::string_view{});
    char number[12];
    const auto low = static_cast<int32_t>(reinterpret_cast<intptr_t>(context));
    char* const end = std::to_chars(number, number + sizeof number, low).ptr;
    std::string name;
    name.reserve(sizeof number + request.fileName.size() + kExtension.size() + request.kernelName.size() +
                 options.size());
    name.append(number, end).append(request.fileName).append(kExtension).append(request.kernelName).append(options);
    return name;
}

KernelHandle createKernel(cl_program program, const std::string& name) {
    int32_t status = CL_SUCCESS;
    KernelHandle kernel(cl().clCreateKernel(program, name.c_str(), &status));
    if (status == CL_SUCCESS && kernel != nullptr) return kernel;
    std::printf("clCreateKernel: %s (%d), kernel %s\n", openCLErrorString(status), status, name.c_str());
    return nullptr;
}

}  // namespace

DeviceCL::DeviceCL() : Device(DEVICE_KIND_CL) {}

DeviceCL::~DeviceCL() = default;

bool DeviceCL::isInitialized() const {
    return context_ != nullptr;
}

cl_context DeviceCL::getContext() const {
    return context_;
}

void DeviceCL::initialize(const DeviceConfig& config) {
    std::printf("> CL Initialization\n");
    requireLibrary();
    release();
    processorType_ = config.deviceType;
    const std::vector<FoundDevice> devices = listDevices(config);
    if (devices.empty()) return;
    const FoundDevice chosen = chooseDevice(devices, config.deviceIndex);
    CreatedContext created = createContext(chosen, config.contextProperties);
    std::printf("[%s]\n", requiredText(chosen.device, CL_DEVICE_NAME).c_str());
    ownQueue_ = createQueue(created.handle.get(), chosen.device);
    ownContext_ = std::move(created.handle);
    glShared_ = created.glShared;
    context_ = ownContext_.get();
    queue_ = ownQueue_.get();
    id_ = chosen.device;
    kernels_ = std::make_unique<KernelManager>();
    readLimits();
    printLimits();
    std::printf("< CL Initialization\n");
}

void DeviceCL::release() {
    ownQueue_.reset();
    ownContext_.reset();
    kernels_.reset();
    context_ = nullptr;
    queue_ = nullptr;
    id_ = nullptr;
    glShared_ = false;
}

void DeviceCL::adopt(cl_context context, cl_device_id device, cl_command_queue queue) {
    requireLibrary();
    ownContext_.reset();
    ownQueue_.reset();
    glShared_ = false;
    context_ = context;
    queue_ = queue;
    id_ = device;
    if (kernels_ == nullptr) kernels_ = std::make_unique<KernelManager>();
    readLimits();
}

void DeviceCL::readLimits() {
    deviceName_ = withoutLeadingBlanks(requiredText(id_, CL_DEVICE_NAME));
    readDeviceText(id_, CL_DRIVER_VERSION, driverVersion_);
    workItemDimensions_ = deviceValue<cl_uint>(id_, CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS);
    maxWorkItemSizes_ = readWorkItemSizes(id_, workItemDimensions_);
    maxWorkGroupSize_ = std::max<uint64_t>(deviceValue<size_t>(id_, CL_DEVICE_MAX_WORK_GROUP_SIZE), 1);
    vendor_ = classifyVendor(requiredText(id_, CL_DEVICE_VENDOR));
    maxAllocation_ = queryMaxAllocationSize();
    totalMemory_ = queryGlobalMemorySize();
}

void DeviceCL::printLimits() const {
    std::printf("CL_DEVICE_MAX_WORK_ITEM_SIZES  : %u, %u, %u\n", maxWorkItemSizes_[0], maxWorkItemSizes_[1],
                maxWorkItemSizes_[2]);
    std::printf("CL_DEVICE_MAX_WORK_GROUP_SIZE  : %s\n", std::to_string(maxWorkGroupSize_).c_str());
    std::printf("CL_DEVICE_MAX_WORK_ITEM_DIMENSIONS : %u\n", workItemDimensions_);
}

void DeviceCL::waitForEvent(EventHolder& holder) {
    if (holder.event == nullptr) return;
    auto* const event = holder.event.get();
    check(cl().clWaitForEvents(cl_uint{1}, &event), "clWaitForEvents");
    check(cl().clReleaseEvent(holder.event.release()), "clReleaseEvent");
}

void DeviceCL::finish() {
    requireDevice("clFinish");
    check(cl().clFinish(queue_), "clFinish");
}

bool DeviceCL::isComplete(EventHolder* holder) {
    if (holder == nullptr || holder->event == nullptr) return true;
    cl_int execution = CL_QUEUED;
    check(cl().clGetEventInfo(holder->event.get(), cl_event_info{CL_EVENT_COMMAND_EXECUTION_STATUS}, sizeof execution,
                              &execution, nullptr),
          "clGetEventInfo");
    if (execution != CL_COMPLETE) return false;
    check(cl().clReleaseEvent(holder->event.release()), "clReleaseEvent");
    return true;
}

void DeviceCL::flush() {
    requireDevice("clFlush");
    check(cl().clFlush(queue_), "clFlush");
}

void DeviceCL::getDeviceName(char* out) const {
    copyDeviceText(withoutLeadingBlanks(requiredText(id_, CL_DEVICE_NAME)), out);
}

void DeviceCL::getBoardName(char* out) const {
    std::string text;
    readDeviceText(id_, kBoardNameQuery, text);
    copyDeviceText(withoutLeadingBlanks(text), out);
}

void DeviceCL::getVendorName(char* out) const {
    copyDeviceText(requiredText(id_, CL_DEVICE_VENDOR), out);
}

void DeviceCL::getDeviceVersion(char* out) const {
    std::string text;
    readDeviceText(id_, CL_DEVICE_VERSION, text);
    copyDeviceText(withoutLeadingBlanks(text), out);
}

Kernel* DeviceCL::getKernel(const KernelRequest& request) {
    requireDevice("getKernel");
    std::string mapName = kernelMapName(context_, request);
    if (!request.keepInCache) kernels_->remove(mapName);
    const uint64_t identity = request.generatedSources ? programIdentity(*this, request.fileName, request.sources) : 0;
    Kernel* const known = kernels_->find(mapName);
    if (known != nullptr && known->sourceIdentity() == identity) return known;

    KernelBuilder builder(*this);
    if (request.sources.empty()) {
        if (!builder.buildFromFile(request, true)) return nullptr;
    } else {
        builder.buildFromSources(request);
    }
    if (builder.program() == nullptr) return nullptr;
    std::string name(request.kernelName);
    KernelHandle handle = createKernel(builder.program(), name);
    if (handle == nullptr) return nullptr;
    auto kernel = std::make_unique<Kernel>(std::move(handle), std::move(name), identity);
    kernel->setUnwritten(builder.takeUnwritten());
    return kernels_->insert(std::move(mapName), std::move(kernel));
}

uint64_t DeviceCL::queryGlobalMemorySize() const {
    return deviceValue<cl_ulong>(id_, CL_DEVICE_GLOBAL_MEM_SIZE);
}

uint64_t DeviceCL::queryMaxAllocationSize() const {
    return deviceValue<cl_ulong>(id_, CL_DEVICE_MAX_MEM_ALLOC_SIZE);
}

void DeviceCL::setQueuePriority(bool high) {
    if (vendor_ != VENDOR_QUARRION) return;
    requireDevice("setQueuePriority");
    uint64_t thread = 0;
    check(cl().clGetCommandQueueInfo(queue_, kQueueThreadQuery, sizeof thread, &thread, nullptr),
          "clGetCommandQueueInfo");
    std::printf(setThreadPriority(thread, high) ? "Set OCL queue priority high\n" : "Set OCL queue priority failed\n");
    bindThreadToFirstProcessor(thread);
}

cl_device_id DeviceCL::id() const noexcept {
    return id_;
}

cl_command_queue DeviceCL::queue() const noexcept {
    return queue_;
}

const std::string& DeviceCL::deviceName() const noexcept {
    return deviceName_;
}

const std::string& DeviceCL::driverVersion() const noexcept {
    return driverVersion_;
}

uint32_t DeviceCL::vendor() const noexcept {
    return vendor_;
}

uint32_t DeviceCL::maxWorkItemSize(uint32_t dimension) const {
    require(dimension < maxWorkItemSizes_.size(), "maxWorkItemSize", "no such dimension");
    return maxWorkItemSizes_[dimension];
}

uint64_t DeviceCL::maxWorkGroupSize() const noexcept {
    return maxWorkGroupSize_;
}

uint64_t DeviceCL::maxAllocation() const noexcept {
    return maxAllocation_;
}

void DeviceCL::requireDevice(const char* where) const {
    require(context_ != nullptr && queue_ != nullptr && id_ != nullptr, where, "no OpenCL device was found");
}

DeviceCL& requireOpenCL(Device& device, const char* where) {
    require(device.kind() == DEVICE_KIND_CL, where, "needs an OpenCL device");
    return static_cast<DeviceCL&>(device);
}

}  // namespace zor
