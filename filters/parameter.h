// One named, typed value of a filter.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "api/tov/types.h"
#include "core/registry.h"
#include "zor/buffer.h"

class TovImage;
class TovImageFilter;

using Matrix = std::array<float, 16>;  // row after row
using Size = std::array<uint32_t, 2>;  // width and height

// More elements than a launch has arguments are never of use; a count beyond it is taken for a mistake.
inline constexpr uint32_t kMaxArrayElements = 64;

inline constexpr uint32_t kReadBackElement = 1;

class TovFilterParameter {
 public:
    // type is one of TOV_PARAMETER_TYPE_...; the value starts as zero, no image or no array. The texts are not copied;
    // the description may be null.
    TovFilterParameter(uint32_t type, const char* name, const char* description) noexcept;
    TovFilterParameter(const TovFilterParameter&) = delete;
    TovFilterParameter& operator=(const TovFilterParameter&) = delete;

    uint32_t type() const noexcept { return type_; }
    const char* name() const noexcept { return name_; }
    const char* description() const noexcept { return description_; }
    uint32_t count() const noexcept { return count_; }      // elements of an array, 1 otherwise
    const void* value() const noexcept { return &value_; }  // what the host reads through

    // Throws the code when the parameter has another type.
    void requireType(uint32_t type, int32_t code = TOV_ERROR_UNSUPPORTED) const;

    // Each throws unsupported, changing nothing, when the parameter has another type.
    void set1u(uint32_t value);
    void set2u(const Size& value);
    void set1f(float value);
    void set3f(const std::array<float, 3>& value);
    void set4f(const std::array<float, 4>& value);
    void set16f(const Matrix& value);
    void setImage(TovObject* image);  // an image, a filter or null
    // The caller's pointers are kept and read when the filter runs. Elements of the image array have been checked.
    void setFloatArray(const float* values, uint32_t count);
    void setImageArray(void* const* images, uint32_t count);

    uint32_t asUint() const noexcept { return value_.uints[0]; }
    Size asSize() const noexcept { return runSize_.value_or(Size{value_.uints[0], value_.uints[1]}); }
    float asFloat() const noexcept { return value_.floats[0]; }
    const Matrix& asMatrix() const noexcept { return value_.floats; }
    const float* asFloatArray() const noexcept { return value_.floatArray; }

    bool isImageLike() const noexcept {
        return type_ == TOV_PARAMETER_TYPE_IMAGE || type_ == TOV_PARAMETER_TYPE_IMAGE_ARRAY;
    }
    // Elements that an image or image-array parameter binds; 0 for the other types.
    uint32_t imageCount() const noexcept { return isImageLike() ? count_ : 0; }
    // The live object bound to an element, null for an absent one. A deleted one throws its handle's code. Reads the
    // caller's array, so only while the filter runs.
    TovObject* boundObject(uint32_t element = 0) const;
    TovImage* boundImage(uint32_t element = 0) const;         // null also for a filter
    TovImageFilter* boundFilter(uint32_t element = 0) const;  // null also for an image
    // What an element was when it was set; null for an absent and for a deleted one. Does not read the caller's array.
    TovObject* objectWhenSet(uint32_t element) const noexcept;

    // Memory that stands in for a bound image while the filter runs; null for the image's own. kReadBackElement of an
    // output is what passes write for a later pass to read.
    void setStandIn(uint32_t element, const zor::BufferBase* memory);
    const zor::BufferBase* standIn(uint32_t element) const noexcept;
    void clearStandIns() noexcept { standIns_.clear(); }

    // What a fused run says of a filter inside it: of a size, another value than the one set; of an output, that it is
    // computed where it is read, in this size, and that its binding is of no account.
    void setRunSize(const Size& size) noexcept { runSize_ = size; }
    const std::optional<Size>& runSize() const noexcept { return runSize_; }
    void clearRunSize() noexcept { runSize_.reset(); }

 private:
    uint32_t type_;
    uint32_t count_ = 1;
    const char* name_;
    const char* description_;
    union {
        Matrix floats;
        std::array<uint32_t, 16> uints;
        void* handle;
        const float* floatArray;
        void* const* imageArray;
    } value_{};
    std::vector<ObjectRef> bound_;  // what the image or the array's elements were when they were set
    std::vector<const zor::BufferBase*> standIns_;
    std::optional<Size> runSize_;
};
