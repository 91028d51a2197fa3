// An ordered list of filters that run one after another.
#pragma once

#include <cstdint>
#include <vector>

#include "api/tov/types.h"
#include "core/context.h"
#include "core/registry.h"

class TovImageFilter;

class TovQueue final : public TovObject {
 public:
    static constexpr uint32_t kType = TOV_OBJECT_COMMAND_QUEUE;
    static constexpr int32_t kInvalidHandle = TOV_ERROR_INVALID_QUEUE;

    explicit TovQueue(DevicePointer device);

    // Each filter at most once: throws invalid parameter otherwise.
    void attach(TovImageFilter& filter);
    void detach(TovImageFilter& filter);
    // Runs every filter in order, then waits for the device. The first failure ends the run.
    void execute();

 private:
    std::vector<ObjectRef>::iterator position(const TovImageFilter& filter);

    DevicePointer device_;
    std::vector<ObjectRef> filters_;
};
