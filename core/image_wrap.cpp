// Images over memory that the caller owns: OpenCL buffers, OpenCL images and OpenGL textures.
#include <array>

#include "core/exception.h"
#include "core/image.h"

namespace {

template <class Value>
Value memoryInfo(cl_mem memory, cl_mem_info key) {
    Value value{};
    if (zor::cl().clGetMemObjectInfo(memory, key, sizeof value, &value, nullptr) != CL_SUCCESS)
        refuse(TOV_ERROR_INTERNAL_ERROR, "The OpenCL memory object cannot be queried");
    return value;
}

template <class Value>
Value imageInfo(cl_mem memory, cl_image_info key) {
    Value value{};
    if (zor::cl().clGetImageInfo(memory, key, sizeof value, &value, nullptr) != CL_SUCCESS)
        refuse(TOV_ERROR_INTERNAL_ERROR, "The OpenCL image cannot be queried");
    return value;
}

// Integer channels cannot be read as floats.
bool isIntegerChannel(cl_channel_type type) noexcept {
    static constexpr std::array kIntegerTypes = {CL_SIGNED_INT8,   CL_SIGNED_INT16,   CL_SIGNED_INT32,
                                                 CL_UNSIGNED_INT8, CL_UNSIGNED_INT16, CL_UNSIGNED_INT32};
    for (const auto integer : kIntegerTypes)
        if (type == static_cast<cl_channel_type>(integer)) return true;
    return false;
}

[[noreturn]] void refuseMemory(const char* why) {
    refuse(TOV_ERROR_INVALID_PARAMETER, why);
}

// An image may be bound as input and as output, so kernels need both kinds of access.
void requireAccess(cl_mem memory) {
    if ((memoryInfo<cl_mem_flags>(memory, CL_MEM_FLAGS) & (CL_MEM_READ_ONLY | CL_MEM_WRITE_ONLY)) != 0)
        refuseMemory("The memory object was created read-only or write-only: kernels need to read and write it");
}

}  // namespace

void TovImage::requireUsableBuffer(cl_mem memory) const {
    if (memoryInfo<cl_mem_object_type>(memory, CL_MEM_TYPE) != CL_MEM_OBJECT_BUFFER)
        refuseMemory("The memory object is an OpenCL image, not a buffer: set the image flag");
}

void TovImage::requireUsableImage(cl_mem memory) const {
    if (memoryInfo<cl_mem_object_type>(memory, CL_MEM_TYPE) != CL_MEM_OBJECT_IMAGE2D)
        refuseMemory("The memory object is not a two-dimensional OpenCL image");
    if (imageInfo<size_t>(memory, CL_IMAGE_WIDTH) != width() || imageInfo<size_t>(memory, CL_IMAGE_HEIGHT) != height())
        refuseMemory("The OpenCL image has another width or height than the descriptor");
    if (isIntegerChannel(imageInfo<cl_image_format>(memory, CL_IMAGE_FORMAT).image_channel_data_type))
        refuseMemory("The OpenCL image has integer channels, which kernels cannot read as floats");
}

void TovImage::placeBuffer(cl_mem memory, uint64_t size) {
    placement_ = {memory, 0, size};
    if (const auto parent = memoryInfo<cl_mem>(memory, CL_MEM_ASSOCIATED_MEMOBJECT); parent != nullptr)
        placement_ = {parent, memoryInfo<size_t>(memory, CL_MEM_OFFSET), size};
}

void TovImage::wrapOpenClMemory(cl_mem memory, bool isImage) {
    storage_.reset();
    external_ = true;
    const uint64_t size = memoryInfo<size_t>(memory, CL_MEM_SIZE);
    if (memoryInfo<cl_context>(memory, CL_MEM_CONTEXT) != device_->getContext())
        refuseMemory("The memory object belongs to another OpenCL context");
    requireAccess(memory);
    if (isImage) {
        requireUsableImage(memory);
    } else {
        requireUsableBuffer(memory);
    }
    if (size < byteSize_) refuseMemory("The memory object is smaller than the descriptor says");
    placeBuffer(memory, size);
    storage_ = std::make_unique<zor::Buffer<char>>(*device_, size, zor::BUFFER_NO_ALLOCATION);
    storage_->adopt(memory, size, false);
    externalKind_ = isImage ? EXTERNAL_KIND_IMAGE : EXTERNAL_KIND_BUFFER;
}

void TovImage::wrapOpenGlTexture(uint32_t target, int32_t level, uint32_t texture) {
    storage_.reset();
    cl_int status = CL_SUCCESS;
    zor::MemoryHandle memory(
        zor::cl().clCreateFromGLTexture(device_->getContext(), CL_MEM_READ_WRITE, target, level, texture, &status));
    zor::check(status, "clCreateFromGLTexture");
    const uint64_t size = memoryInfo<size_t>(memory.get(), CL_MEM_SIZE);
    storage_ = std::make_unique<zor::Buffer<char>>(*device_, size, zor::BUFFER_NO_ALLOCATION);
    placement_ = {memory.get(), 0, size};
    storage_->adopt(memory.release(), size, true);
    external_ = true;
    externalKind_ = EXTERNAL_KIND_TEXTURE;
}
