#include "filters/parameter.h"

#include <algorithm>

#include "core/exception.h"
#include "core/image.h"
#include "core/image_filter.h"  // upward: an image parameter may bind a filter

namespace {

[[noreturn]] void throwDeleted(const ObjectRef& reference) {
    throw TovException{reference.type() == TovImageFilter::kType ? TovImageFilter::kInvalidHandle
                                                                 : TovImage::kInvalidHandle};
}

}  // namespace

TovFilterParameter::TovFilterParameter(uint32_t type, const char* name, const char* description) noexcept
    : type_(type), name_(name), description_(description) {
    if (type == TOV_PARAMETER_TYPE_FLOAT_ARRAY || type == TOV_PARAMETER_TYPE_IMAGE_ARRAY) count_ = 0;
}

void TovFilterParameter::requireType(uint32_t type, int32_t code) const {
    if (type != type_) throw TovException{code};
}

void TovFilterParameter::set1u(uint32_t value) {
    requireType(TOV_PARAMETER_TYPE_UINT1);
    value_.uints[0] = value;
}

void TovFilterParameter::set2u(const Size& value) {
    requireType(TOV_PARAMETER_TYPE_UINT2);
    std::copy(value.begin(), value.end(), value_.uints.begin());
}

void TovFilterParameter::set1f(float value) {
    requireType(TOV_PARAMETER_TYPE_FLOAT1);
    value_.floats[0] = value;
}

void TovFilterParameter::set3f(const std::array<float, 3>& value) {
    requireType(TOV_PARAMETER_TYPE_FLOAT3);
    std::copy(value.begin(), value.end(), value_.floats.begin());
}

void TovFilterParameter::set4f(const std::array<float, 4>& value) {
    requireType(TOV_PARAMETER_TYPE_FLOAT4);
    std::copy(value.begin(), value.end(), value_.floats.begin());
}

void TovFilterParameter::set16f(const Matrix& value) {
    requireType(TOV_PARAMETER_TYPE_FLOAT16);
    value_.floats = value;
}

void TovFilterParameter::setImage(TovObject* image) {
    requireType(TOV_PARAMETER_TYPE_IMAGE);
    bound_.assign(1, ObjectRef(image));
    value_.handle = image;
}

void TovFilterParameter::setFloatArray(const float* values, uint32_t count) {
    requireType(TOV_PARAMETER_TYPE_FLOAT_ARRAY);
    value_.floatArray = values;
    count_ = count;
}

void TovFilterParameter::setImageArray(void* const* images, uint32_t count) {
    requireType(TOV_PARAMETER_TYPE_IMAGE_ARRAY);
    std::vector<ObjectRef> bound;
    bound.reserve(count);
    for (uint32_t i = 0; i < count; ++i) bound.emplace_back(registry::lookUp(images[i]));
    bound_ = std::move(bound);
    value_.imageArray = images;
    count_ = count;
}

TovObject* TovFilterParameter::boundObject(uint32_t element) const {
    if (element >= bound_.size()) return nullptr;
    const bool isArray = type_ == TOV_PARAMETER_TYPE_IMAGE_ARRAY;
    void* handle = isArray ? value_.imageArray[element] : value_.handle;
    if (handle == nullptr) return nullptr;
    // The caller owns the array and may have changed an element since: then the new handle counts.
    const ObjectRef& reference = bound_[element];
    TovObject* object = reference.handle() == handle ? reference.get() : registry::lookUp(handle);
    if (object == nullptr && reference.handle() == handle) throwDeleted(reference);
    if (as<TovImage>(object) == nullptr && as<TovImageFilter>(object) == nullptr)
        throw TovException{TovImage::kInvalidHandle};
    return object;
}

TovImage* TovFilterParameter::boundImage(uint32_t element) const {
    return as<TovImage>(boundObject(element));
}

TovImageFilter* TovFilterParameter::boundFilter(uint32_t element) const {
    return as<TovImageFilter>(boundObject(element));
}

TovObject* TovFilterParameter::objectWhenSet(uint32_t element) const noexcept {
    return element < bound_.size() ? bound_[element].get() : nullptr;
}

void TovFilterParameter::setStandIn(uint32_t element, const zor::BufferBase* memory) {
    if (standIns_.size() <= element) standIns_.resize(element + 1, nullptr);
    standIns_[element] = memory;
}

const zor::BufferBase* TovFilterParameter::standIn(uint32_t element) const noexcept {
    return element < standIns_.size() ? standIns_[element] : nullptr;
}
