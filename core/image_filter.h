// A filter: its parameters, its passes and its run.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "api/tov/types.h"
#include "core/context.h"
#include "core/image.h"
#include "core/private_copies.h"
#include "core/registry.h"
#include "filters/catalogue.h"
#include "filters/parameter.h"
#include "kernelgen/pass.h"

class FilterTree;

class TovImageFilter final : public TovObject {
 public:
    static constexpr uint32_t kType = TOV_OBJECT_IMAGE_FILTER;
    static constexpr int32_t kInvalidHandle = TOV_ERROR_INVALID_FILTER;

    // Throws invalid operation for a type that the catalogue lacks.
    TovImageFilter(TovContext& context, uint32_t filterType);

    uint32_t filterType() const noexcept { return filterType_; }
    const char* description() const noexcept { return spec_.description; }
    size_t parameterCount() const noexcept { return parameters_.size(); }
    const TovFilterParameter& parameter(size_t index) const noexcept { return *parameters_[index]; }

    // ---- Parameters by name. Throw: unknown name, or the parameter's own refusal of another type. ----

    void set1u(std::string_view name, uint32_t value) { byName(name).set1u(value); }
    // "srcRec" and "dstRec" override the sizes that a binding sets.
    void set2u(std::string_view name, const Size& value);
    void set1f(std::string_view name, float value) { byName(name).set1f(value); }
    void set3f(std::string_view name, const std::array<float, 3>& value) { byName(name).set3f(value); }
    void set4f(std::string_view name, const std::array<float, 4>& value) { byName(name).set4f(value); }
    void set16f(std::string_view name, const Matrix& value) { byName(name).set16f(value); }
    void setFloatArray(std::string_view name, const float* values, uint32_t count);
    // "srcBuffer" and "dstBuffer" also take over the image's size.
    void setImage(std::string_view name, TovImage& image);
    // Not for "dstBuffer", nor for a filter that this one feeds.
    void setFilterAsImage(std::string_view name, TovImageFilter& filter);
    void setImageArray(std::string_view name, void* const* images, uint32_t count);

    // Whether two images may be attached together as input and output.
    bool isCompatible(const TovImage& input, const TovImage& output) const noexcept;

    // ---- Running ----

    // Checks everything that is bound, then runs the passes; nothing is launched when a check fails.
    void apply();
    TovFilterPass& firstPass() noexcept { return *passes_.front(); }
    const std::string& kernelName() const noexcept { return passes_.front()->code().name; }
    // The output size that the host set by "dstRec" since the last binding of an output.
    const std::optional<Size>& explicitOutputSize() const noexcept { return explicitOutputSize_; }

    // Built-in or listed parameter; null for an unknown name. For the catalogue and the checks.
    TovFilterParameter* find(std::string_view name) noexcept;
    bool isInput(const TovFilterParameter& parameter) const noexcept { return &parameter == &srcBuffer_; }
    bool isMainOutput(const TovFilterParameter& parameter) const noexcept { return &parameter == &dstBuffer_; }
    // Every parameter that can bind images, input first, output second.
    const std::vector<TovFilterParameter*>& imageParameters() const noexcept { return imageParameters_; }
    const FilterSpec& spec() const noexcept { return spec_; }
    TovContext* context() const noexcept { return as<TovContext>(context_.get()); }
    const DevicePointer& device() const noexcept { return device_; }
    const StateSlot& stateBuffer() const noexcept { return stateBuffer_; }

    // ---- Filling by the catalogue ----

    TovFilterParameter& addParameter(const ParameterSpec& spec);
    TovFilterPass& addPass(const char* sourceName, const char* kernelName, bool grid2D);
    // A buffer of size bytes with the given content, or zeros for null.
    void createStateBuffer(const void* data, uint64_t size);

 private:
    TovFilterParameter& byName(std::string_view name);
    bool isFedBy(const TovImageFilter& filter) const;
    void requireNoCircle(const TovImageFilter& input) const;
    void reserveState();

    DevicePointer device_;
    ObjectRef context_;
    uint32_t filterType_;
    const FilterSpec& spec_;
    TovFilterParameter srcBuffer_{TOV_PARAMETER_TYPE_IMAGE, "srcBuffer", ""};
    TovFilterParameter srcBufferSize_{TOV_PARAMETER_TYPE_UINT2, "srcBufferSize", ""};
    TovFilterParameter dstBuffer_{TOV_PARAMETER_TYPE_IMAGE, "dstBuffer", ""};
    TovFilterParameter dstBufferSize_{TOV_PARAMETER_TYPE_UINT2, "dstBufferSize", ""};
    std::optional<Size> explicitOutputSize_;
    StateSlot stateBuffer_;
    uint32_t stateBufferSize_ = 0;
    std::vector<std::unique_ptr<TovFilterParameter>> parameters_;
    std::vector<TovFilterParameter*> imageParameters_;
    std::vector<std::unique_ptr<TovFilterPass>> passes_;
    PrivateCopies privateCopies_;
};
