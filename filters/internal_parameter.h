// One entry of a pass's kernel-argument list: a parameter's value, a shared buffer, or a value derived from parameters
// every time the pass runs.
#pragma once

#include <cstdint>
#include <memory>

#include "core/context.h"
#include "filters/parameter.h"
#include "zor/kernel.h"

using StateSlot = std::unique_ptr<zor::Buffer<char>>;

class TovInternalParameter {
 public:
    // With readBack, an output argument whose content a later pass of the filter reads.
    explicit TovInternalParameter(const TovFilterParameter& parameter, bool readBack = false) noexcept
        : parameter_(&parameter), readBack_(readBack) {}
    explicit TovInternalParameter(const ScratchHolder& scratch) noexcept : scratch_(&scratch) {}
    // The slot, not the buffer: a replaced buffer is seen.
    explicit TovInternalParameter(const StateSlot& state) noexcept : state_(&state) {}
    TovInternalParameter(const TovInternalParameter&) = delete;
    TovInternalParameter& operator=(const TovInternalParameter&) = delete;
    virtual ~TovInternalParameter() = default;

    // Appends the entry's kernel arguments. Throws invalid parameter for a value that has no such argument.
    virtual void SetKernelArgument(zor::Launcher& launcher);
    // The filter has run with the arguments last set.
    virtual void filterHasRun() {}

    // The parameter that it passes or derives from; null for buffers.
    const TovFilterParameter* parameter() const noexcept { return parameter_; }

 protected:
    const TovFilterParameter* parameter_ = nullptr;

 private:
    bool readBack_ = false;
    const ScratchHolder* scratch_ = nullptr;
    const StateSlot* state_ = nullptr;
};

// The matrix between linear RGB and CIE XYZ of the colour space that the parameter names, as three float4 rows.
class ColorSpaceConvertor final : public TovInternalParameter {
 public:
    enum Direction : uint32_t { FROM_XYZ = 0, TO_XYZ = 1 };
    ColorSpaceConvertor(const TovFilterParameter& colorSpace, Direction direction) noexcept;
    void SetKernelArgument(zor::Launcher& launcher) override;

 private:
    Direction direction_;
};

// Source size over destination size, both less one: the first and last pixels of either fall on each other. A
// destination of one pixel has ratio 0.
class RatioConverter final : public TovInternalParameter {
 public:
    RatioConverter(const TovFilterParameter& sourceSize, const TovFilterParameter& destinationSize) noexcept;
    void SetKernelArgument(zor::Launcher& launcher) override;

 private:
    const TovFilterParameter* destinationSize_;
};

// The previous run's and the current view-projection matrix; the same twice in the first run. A run that failed does
// not count.
class ViewProjectionSwapper final : public TovInternalParameter {
 public:
    explicit ViewProjectionSwapper(const TovFilterParameter& matrix) noexcept : TovInternalParameter(matrix) {}
    void SetKernelArgument(zor::Launcher& launcher) override;
    void filterHasRun() override;

 private:
    Matrix previous_{};
    bool initialised_ = false;
};
