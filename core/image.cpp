#include "core/image.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include "core/exception.h"

namespace {

constexpr uint64_t kTooManyBytes = std::numeric_limits<uint64_t>::max();

uint64_t multiplySaturated(uint64_t a, uint64_t b) noexcept {
    return b != 0 && a > kTooManyBytes / b ? kTooManyBytes : a * b;
}

uint32_t effectiveRowPitch(const tov_image_desc& desc) noexcept {
    return desc.image_row_pitch != 0 ? desc.image_row_pitch : desc.image_width;
}

uint64_t effectiveSlicePitch(const tov_image_desc& desc) noexcept {
    return desc.image_slice_pitch != 0 ? desc.image_slice_pitch : uint64_t{effectiveRowPitch(desc)} * desc.image_height;
}

uint64_t sizeOf(const tov_image_desc& desc) noexcept {
    const uint64_t pixels = uint64_t{effectiveRowPitch(desc)} * desc.image_height;
    return multiplySaturated(pixels, uint64_t{desc.num_components} * componentBytes(desc.type));
}

}  // namespace

uint32_t componentBytes(uint32_t type) noexcept {
    switch (type) {
        case TOV_COMPONENT_TYPE_UINT8:
            return 1;
        case TOV_COMPONENT_TYPE_FLOAT16:
            return 2;
        case TOV_COMPONENT_TYPE_FLOAT32:
            return 4;
        default:
            return 0;
    }
}

bool sameGeometry(const tov_image_desc& a, const tov_image_desc& b) noexcept {
    return a.image_width == b.image_width && a.image_height == b.image_height && a.image_depth == b.image_depth &&
           effectiveRowPitch(a) == effectiveRowPitch(b) && effectiveSlicePitch(a) == effectiveSlicePitch(b);
}

TovImage::TovImage(DevicePointer device, const tov_image_desc& desc)
    : TovObject(kType), device_(std::move(device)), desc_(desc), byteSize_(sizeOf(desc)) {}

TovImage::~TovImage() {
    for (void* pointer : mappings_) {
        try {
            storage_->unmap(pointer);
        } catch (...) {
            // The driver's refusal has been printed; the memory object is released either way.
        }
    }
}

void TovImage::initialize(const void* data) {
    storage_.reset();
    storage_ = std::make_unique<zor::Buffer<char>>(*device_, byteSize_, zor::BUFFER_DEFAULT);
    placement_ = {storage_->memory(), 0, byteSize_};
    if (data != nullptr) upload(data);
}

void TovImage::upload(const void* data) {
    if (byteSize_ > std::numeric_limits<uint32_t>::max())
        refuse(TOV_ERROR_INTERNAL_ERROR, "An upload of 4 GiB or more: create the image without data and map it");
    void* pointer = storage_->map();
    std::memcpy(pointer, data, byteSize_);
    storage_->unmap(pointer);
}

bool TovImage::sharesMemoryWith(const TovImage& other) const noexcept {
    const Placement& a = placement_;
    const Placement& b = other.placement_;
    if (a.textureLevel[0] != 0 && a.textureLevel == b.textureLevel) return true;
    if (a.root == nullptr || a.root != b.root) return false;
    return a.offset < b.offset + b.size && b.offset < a.offset + a.size;
}

void* TovImage::map() {
    if (isOpenClImage()) refuse(TOV_ERROR_UNSUPPORTED, "An image over an OpenCL image or texture cannot be mapped");
    if (!hasStorage()) refuse(TOV_ERROR_INTERNAL_ERROR, "The image has no storage to map");
    mappings_.reserve(mappings_.size() + 1);  // nothing may fail once the mapping exists
    mappings_.push_back(storage_->map(byteSize_));
    return mappings_.back();
}

void TovImage::unmap(void* pointer) {
    const auto mapping = std::find(mappings_.begin(), mappings_.end(), pointer);
    if (mapping == mappings_.end()) throw TovException{TOV_ERROR_INVALID_PARAMETER};
    mappings_.erase(mapping);
    storage_->unmap(pointer);
}
