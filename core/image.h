// An image: a descriptor and a linear device buffer, or memory that the caller owns.
#pragma once

#include <array>
#include <cstdint>
#include <memory>
#include <vector>

#include "api/tov/types.h"
#include "core/context.h"
#include "core/object.h"
#include "zor/buffer.h"

// 1, 2, 4 for the three component types, 0 for any other.
uint32_t componentBytes(uint32_t type) noexcept;

// Equal width, height, depth and effective pitches (row pitch 0: width; slice pitch 0: row pitch * height). Component
// count and type are not compared.
bool sameGeometry(const tov_image_desc& a, const tov_image_desc& b) noexcept;

// How kernels reach an image.
enum ExternalKind : uint32_t {
    EXTERNAL_KIND_BUFFER = 0,   // a plain buffer, own or the caller's
    EXTERNAL_KIND_IMAGE = 1,    // the caller's OpenCL image object
    EXTERNAL_KIND_TEXTURE = 2,  // an OpenGL texture, acquired around every run
};

class TovImage final : public TovObject {
 public:
    static constexpr uint32_t kType = TOV_OBJECT_IMAGE;
    static constexpr int32_t kInvalidHandle = TOV_ERROR_INVALID_IMAGE;

    // No storage yet: initialize or one of the two wraps provides it.
    TovImage(DevicePointer device, const tov_image_desc& desc);
    ~TovImage() override;

    // Creates the storage and uploads byteSize() bytes; null data uploads nothing. Storage that the device refuses
    // stays empty, which throws the internal error only when there was data, as do 4 GiB of data or more.
    void initialize(const void* data);

    // Puts the caller's memory object in the place of storage; counts nothing against the device's budget. Throws
    // invalid parameter for memory that the descriptor or the kernels do not fit.
    void wrapOpenClMemory(cl_mem memory, bool isImage);
    // Likewise for an OpenGL texture level; the OpenCL object made from it is released with the image.
    void wrapOpenGlTexture(uint32_t target, int32_t level, uint32_t texture);

    const tov_image_desc& desc() const noexcept { return desc_; }
    uint32_t width() const noexcept { return desc_.image_width; }
    uint32_t height() const noexcept { return desc_.image_height; }
    // Row pitch (0: width) * height * components * bytes per component; the largest 64-bit number where that overflows,
    // 0 for an unknown component type. Depth and slice pitch take no part.
    uint64_t byteSize() const noexcept { return byteSize_; }
    // The low 32 bits of byteSize().
    uint32_t getByteSize() const noexcept { return static_cast<uint32_t>(byteSize_); }
    // Width * height, 64 bits.
    uint64_t pixelCount() const noexcept { return uint64_t{width()} * height(); }

    const DevicePointer& device() const noexcept { return device_; }
    const zor::Buffer<char>* storage() const noexcept { return storage_.get(); }
    bool hasStorage() const noexcept { return storage_ != nullptr && storage_->hasMemory(); }
    uint32_t externalKind() const noexcept { return externalKind_; }
    bool isOpenClImage() const noexcept { return externalKind_ != EXTERNAL_KIND_BUFFER; }

    // True when writing one image may change pixels of the other.
    bool sharesMemoryWith(const TovImage& other) const noexcept;

    // Host address of the whole storage, readable and writable until unmap. Waits for the device.
    void* map();
    // Throws invalid parameter for a pointer that map did not give.
    void unmap(void* pointer);

 private:
    // Where the memory lies: sub-buffers of one buffer share its memory, and all wraps of one texture level theirs.
    struct Placement {
        cl_mem root = nullptr;
        uint64_t offset = 0;                        // bytes
        uint64_t size = 0;                          // bytes
        std::array<uint32_t, 3> textureLevel = {};  // name, target, level; name 0: no texture
    };

    void placeBuffer(cl_mem memory, uint64_t size);
    void upload(const void* data);

    DevicePointer device_;
    tov_image_desc desc_;
    uint64_t byteSize_;
    uint32_t externalKind_ = EXTERNAL_KIND_BUFFER;
    Placement placement_;
    std::unique_ptr<zor::Buffer<char>> storage_;
    std::vector<void*> mappings_;
};
