// Images over memory that the caller owns: OpenCL buffers, OpenCL images and OpenGL textures.
#include <optional>

#include "core/exception.h"
#include "core/image.h"

namespace {

// What a driver does not tell about a memory object cannot be checked.
template <class Value>
std::optional<Value> memoryInfo(cl_mem memory, cl_mem_info key) {
    Value value{};
    if (zor::cl().clGetMemObjectInfo(memory, key, sizeof value, &value, nullptr) != CL_SUCCESS) return std::nullopt;
    return value;
}

template <class Value>
std::optional<Value> imageInfo(cl_mem memory, cl_image_info key) {
    Value value{};
    if (!zor::cl().clGetImageInfo) return std::nullopt;
    if (zor::cl().clGetImageInfo(memory, key, sizeof value, &value, nullptr) != CL_SUCCESS) return std::nullopt;
    return value;
}

// Integer channels cannot be read as floats.
bool isIntegerChannel(cl_channel_type type) noexcept {
    return type >= CL_SIGNED_INT8 && type <= CL_UNSIGNED_INT32;
}

[[noreturn]] void refuseMemory(const char* why) {
    refuse(TOV_ERROR_INVALID_PARAMETER, why);
}

uint64_t requireSize(cl_mem memory) {
    const auto size = memoryInfo<size_t>(memory, CL_MEM_SIZE);
    if (!size) refuse(TOV_ERROR_INTERNAL_ERROR, "The OpenCL memory object cannot be queried");
    return *size;
}

void requireType(cl_mem memory, cl_mem_object_type wanted, const char* why) {
    if (memoryInfo<cl_mem_object_type>(memory, CL_MEM_TYPE).value_or(wanted) != wanted) refuseMemory(why);
}

// An image may be bound as input and as output, so kernels need both kinds of access.
void requireAccess(cl_mem memory) {
    const cl_mem_flags flags = memoryInfo<cl_mem_flags>(memory, CL_MEM_FLAGS).value_or(0);
    if ((flags & (CL_MEM_READ_ONLY | CL_MEM_WRITE_ONLY)) != 0)
        refuseMemory("The memory object was created read-only or write-only: kernels need to read and write it");
}

void requireImage(cl_mem memory, size_t width, size_t height) {
    requireType(memory, CL_MEM_OBJECT_IMAGE2D, "The memory object is not a two-dimensional OpenCL image");
    if (imageInfo<size_t>(memory, CL_IMAGE_WIDTH).value_or(width) != width ||
        imageInfo<size_t>(memory, CL_IMAGE_HEIGHT).value_or(height) != height)
        refuseMemory("The OpenCL image has another width or height than the descriptor");
    const auto format = imageInfo<cl_image_format>(memory, CL_IMAGE_FORMAT);
    if (format && isIntegerChannel(format->image_channel_data_type))
        refuseMemory("The OpenCL image has integer channels, which kernels cannot read as floats");
}

}  // namespace

void TovImage::placeBuffer(cl_mem memory, uint64_t size) {
    placement_ = {memory, 0, size};
    auto* const parent = memoryInfo<cl_mem>(memory, CL_MEM_ASSOCIATED_MEMOBJECT).value_or(nullptr);
    if (parent != nullptr) placement_ = {parent, memoryInfo<size_t>(memory, CL_MEM_OFFSET).value_or(0), size};
}

void TovImage::wrapOpenClMemory(cl_mem memory, bool isImage) {
    storage_.reset();
    const uint64_t size = requireSize(memory);
    auto* const context = device_->getContext();
    if (memoryInfo<cl_context>(memory, CL_MEM_CONTEXT).value_or(context) != context)
        refuseMemory("The memory object belongs to another OpenCL context");
    if (isImage) {
        requireImage(memory, width(), height());
    } else {
        requireType(memory, CL_MEM_OBJECT_BUFFER, "The memory object is an OpenCL image: set the image flag");
    }
    requireAccess(memory);
    if (size < byteSize_) refuseMemory("The memory object is smaller than the descriptor says");
    placeBuffer(memory, size);
    storage_ = std::make_unique<zor::Buffer<char>>(*device_, size, zor::BUFFER_NO_ALLOCATION);
    storage_->adopt(memory, size, false);
    externalKind_ = isImage ? EXTERNAL_KIND_IMAGE : EXTERNAL_KIND_BUFFER;
}

void TovImage::wrapOpenGlTexture(uint32_t target, int32_t level, uint32_t texture) {
    storage_.reset();
    if (!device_->isInitialized()) refuse(TOV_ERROR_INTERNAL_ERROR, "The context has no OpenCL device");
    cl_int status = CL_SUCCESS;
    zor::MemoryHandle memory(
        zor::cl().clCreateFromGLTexture(device_->getContext(), CL_MEM_READ_WRITE, target, level, texture, &status));
    zor::check(status, "clCreateFromGLTexture");
    const uint64_t size = requireSize(memory.get());
    storage_ = std::make_unique<zor::Buffer<char>>(*device_, size, zor::BUFFER_NO_ALLOCATION);
    placement_ = {memory.get(), 0, size, {texture, target, static_cast<uint32_t>(level)}};
    storage_->adopt(memory.release(), size, true);
    externalKind_ = EXTERNAL_KIND_TEXTURE;
}
