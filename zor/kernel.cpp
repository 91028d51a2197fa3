#include "zor/kernel.h"

#include <algorithm>
#include <utility>

#include "zor/cache_store.h"

namespace zor {
namespace {

uint64_t roundedUp(int32_t items, uint64_t group) noexcept {
    const uint64_t groups = (static_cast<uint64_t>(items) + group - 1) / group;
    return std::max<uint64_t>(groups, 1) * group;
}

// As unsigned values, so that limits of 2^31 and more count: a negative wish means the device's limit, 0 means 1.
uint64_t localSizeWithin(int32_t wished, uint32_t limit) noexcept {
    return std::clamp(static_cast<uint32_t>(wished), 1u, limit);
}

}  // namespace

void Kernel::hasRun() {
    if (!unwritten_) return;
    const UnwrittenProgram written = std::move(*std::exchange(unwritten_, std::nullopt));
    writeProgram(written.program.get(), written.entry);
}

Kernel* KernelManager::find(const std::string& mapName) const {
    const auto found = kernels_.find(mapName);
    return found == kernels_.end() ? nullptr : found->second.get();
}

Kernel* KernelManager::insert(std::string mapName, std::unique_ptr<Kernel> kernel) {
    return kernels_.insert_or_assign(std::move(mapName), std::move(kernel)).first->second.get();
}

void KernelManager::remove(const std::string& mapName) {
    kernels_.erase(mapName);
}

Launcher::Launcher(Device& device, Kernel& kernel) : device_(requireOpenCL(device, "Launcher")), kernel_(kernel) {}

void Launcher::arg(const BufferBase& buffer) {
    const cl_mem memory = buffer.memory();
    require(memory != nullptr, "arg", "the buffer has no memory");
    setNext(&memory, sizeof memory);
}

void Launcher::launch1D(int32_t globalSize, int32_t localSize) {
    launch2D(globalSize, 1, localSize, 1);
}

void Launcher::launch2D(int32_t globalX, int32_t globalY, int32_t localX, int32_t localY) {
    require(globalX >= 0 && globalY >= 0, "launch", "a negative number of work items");
    uint64_t groupX = localSizeWithin(localX, device_.maxWorkItemSize(0));
    uint64_t groupY = localSizeWithin(localY, device_.maxWorkItemSize(1));
    while (groupX * groupY > device_.maxWorkGroupSize()) (groupX >= groupY ? groupX : groupY) /= 2;
    const size_t local[] = {groupX, groupY, 1};
    const size_t global[] = {roundedUp(globalX, groupX), roundedUp(globalY, groupY), 1};
    check(cl().clEnqueueNDRangeKernel(device_.queue(), kernel_.handle(), cl_uint{2}, nullptr, &global[0], &local[0],
                                      cl_uint{0}, nullptr, nullptr),
          "clEnqueueNDRangeKernel");
    device_.finish();
    kernel_.hasRun();
}

void Launcher::setNext(const void* value, size_t size) {
    require(next_ < kMaxLaunchArguments, "arg", "more arguments than a launch takes");
    check(cl().clSetKernelArg(kernel_.handle(), next_, size, value), "clSetKernelArg");
    ++next_;
}

}  // namespace zor
