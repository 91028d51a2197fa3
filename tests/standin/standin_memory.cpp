// Buffers, images and their mapping, and objects shared with OpenGL, of the stand-in.
#include <cstdlib>

#include "standin_objects.h"

namespace standin {
namespace {

bool readsHost(cl_mem_flags flags) {
    return (flags & (CL_MEM_USE_HOST_PTR | CL_MEM_COPY_HOST_PTR)) != 0;
}

bool holds(cl_mem memory, size_t offset, size_t bytes) {
    return bytes > 0 && offset <= memory->size && bytes <= memory->size - offset;
}

// Fresh bytes are calloc's zeros, so a big buffer costs nothing until it is touched.
std::unique_ptr<_cl_mem> makeMemory(cl_mem_flags flags, size_t size, void* host) {
    auto memory = std::make_unique<_cl_mem>();
    memory->flags = flags;
    memory->size = size;
    if ((flags & CL_MEM_USE_HOST_PTR) != 0) {
        memory->bytes = static_cast<unsigned char*>(host);
        return memory;
    }
    memory->own.reset(static_cast<unsigned char*>(std::calloc(size, 1)));
    memory->bytes = memory->own.get();
    if (host != nullptr && memory->bytes != nullptr) std::memcpy(memory->bytes, host, size);
    return memory;
}

size_t channelCount(cl_channel_order order) {
    return order == CL_R ? 1 : order == CL_RG ? 2 : order == CL_RGB ? 3 : 4;
}

size_t channelBytes(cl_channel_type type) {
    return type == CL_FLOAT ? 4 : type == CL_HALF_FLOAT ? 2 : 1;
}

std::unique_ptr<_cl_mem> makeImage(cl_mem_flags flags, cl_image_format format, size_t width, size_t height) {
    const size_t bytes = width * std::max<size_t>(height, 1) * channelCount(format.image_channel_order) *
                         channelBytes(format.image_channel_data_type);
    auto memory = makeMemory(flags & ~cl_mem_flags{CL_MEM_USE_HOST_PTR | CL_MEM_COPY_HOST_PTR}, bytes, nullptr);
    memory->type = CL_MEM_OBJECT_IMAGE2D;
    memory->format = format;
    memory->width = width;
    memory->height = height;
    return memory;
}

}  // namespace
}  // namespace standin

using namespace standin;

STANDIN_API unsigned char* standin_bytes(cl_mem memory, size_t* bytes) {
    if (!isLive(memory, "memory")) return nullptr;
    if (bytes != nullptr) *bytes = memory->size;
    return memory->bytes;
}

// numbers: flags, size, host pointer.
STANDIN_API cl_mem clCreateBuffer(cl_context context, cl_mem_flags flags, size_t size, void* host, cl_int* status) {
    const int32_t failure = enter("clCreateBuffer", {}, {flags, size, reinterpret_cast<uint64_t>(host)});
    if (failure != CL_SUCCESS) return refuse(failure, status);
    if (!isLive(context, "context")) return complain("clCreateBuffer"), refuse(CL_INVALID_CONTEXT, status);
    if (size == 0) return refuse(CL_INVALID_BUFFER_SIZE, status);
    if (readsHost(flags) != (host != nullptr)) return refuse(CL_INVALID_HOST_PTR, status);
    auto memory = makeMemory(flags, size, host);
    if (memory->bytes == nullptr) return refuse(CL_MEM_OBJECT_ALLOCATION_FAILURE, status);
    memory->context = context;
    return give(add(std::move(memory), "memory"), status);
}

STANDIN_API cl_mem clCreateImage(cl_context context, cl_mem_flags flags, const cl_image_format* format,
                                 const cl_image_desc* description, void*, cl_int* status) {
    if (const int32_t failure = enter("clCreateImage", {}, {flags})) return refuse(failure, status);
    if (!isLive(context, "context")) return complain("clCreateImage"), refuse(CL_INVALID_CONTEXT, status);
    auto memory = makeImage(flags, *format, description->image_width, description->image_height);
    memory->context = context;
    return give(add(std::move(memory), "memory"), status);
}

// numbers: flags, target, level, texture. The image is 8 x 8 pixels of four 8-bit components.
STANDIN_API cl_mem clCreateFromGLTexture(cl_context context, cl_mem_flags flags, cl_GLenum target, cl_GLint level,
                                         cl_GLuint texture, cl_int* status) {
    const int32_t failure = enter("clCreateFromGLTexture", {}, {flags, target, static_cast<uint64_t>(level), texture});
    if (failure != CL_SUCCESS) return refuse(failure, status);
    if (!isLive(context, "context")) return complain("clCreateFromGLTexture"), refuse(CL_INVALID_CONTEXT, status);
    auto memory = makeImage(flags, {CL_RGBA, CL_UNORM_INT8}, 8, 8);
    memory->texture = texture;
    memory->context = context;
    return give(add(std::move(memory), "memory"), status);
}

STANDIN_API cl_int clRetainMemObject(cl_mem memory) {
    return retain("clRetainMemObject", memory, "memory", CL_INVALID_MEM_OBJECT);
}

STANDIN_API cl_int clReleaseMemObject(cl_mem memory) {
    return release("clReleaseMemObject", memory, "memory", CL_INVALID_MEM_OBJECT);
}

STANDIN_API cl_int clGetMemObjectInfo(cl_mem memory, cl_mem_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter("clGetMemObjectInfo", {}, {key})) return status;
    if (!isLive(memory, "memory")) return complain("clGetMemObjectInfo"), CL_INVALID_MEM_OBJECT;
    switch (key) {
        case CL_MEM_TYPE:
            return answerValue(memory->type, capacity, out, size);
        case CL_MEM_SIZE:
            return answerValue(memory->size, capacity, out, size);
        case CL_MEM_CONTEXT:
            return answerValue(memory->context, capacity, out, size);
        case CL_MEM_FLAGS:
            return answerValue(memory->flags, capacity, out, size);
        case CL_MEM_HOST_PTR:
            return answerValue(memory->own == nullptr ? memory->bytes : nullptr, capacity, out, size);
        case CL_MEM_OFFSET:
            return answerValue(size_t{0}, capacity, out, size);
        case CL_MEM_ASSOCIATED_MEMOBJECT:
            return answerValue(cl_mem{nullptr}, capacity, out, size);
        default:
            return CL_INVALID_VALUE;
    }
}

STANDIN_API cl_int clGetImageInfo(cl_mem memory, cl_image_info key, size_t capacity, void* out, size_t* size) {
    if (const int32_t status = enter("clGetImageInfo", {}, {key})) return status;
    if (!isLive(memory, "memory") || memory->type == CL_MEM_OBJECT_BUFFER) return CL_INVALID_MEM_OBJECT;
    switch (key) {
        case CL_IMAGE_FORMAT:
            return answerValue(memory->format, capacity, out, size);
        case CL_IMAGE_WIDTH:
            return answerValue(memory->width, capacity, out, size);
        case CL_IMAGE_HEIGHT:
            return answerValue(memory->height, capacity, out, size);
        case CL_IMAGE_DEPTH:
            return answerValue(memory->depth, capacity, out, size);
        case CL_IMAGE_ROW_PITCH:
            return answerValue(memory->height > 0 ? memory->size / memory->height : 0, capacity, out, size);
        case CL_IMAGE_ELEMENT_SIZE:
            return answerValue(
                channelCount(memory->format.image_channel_order) * channelBytes(memory->format.image_channel_data_type),
                capacity, out, size);
        default:
            return CL_INVALID_VALUE;
    }
}

// numbers: blocking, flags, offset, size.
STANDIN_API void* clEnqueueMapBuffer(cl_command_queue queue, cl_mem memory, cl_bool blocking, cl_map_flags flags,
                                     size_t offset, size_t bytes, cl_uint, const cl_event*, cl_event*, cl_int* status) {
    const int32_t failure = enter("clEnqueueMapBuffer", {}, {blocking, flags, offset, bytes});
    if (failure != CL_SUCCESS) return refuse(failure, status);
    if (!isLive(queue, "queue")) return complain("clEnqueueMapBuffer"), refuse(CL_INVALID_COMMAND_QUEUE, status);
    if (!isLive(memory, "memory")) return complain("clEnqueueMapBuffer"), refuse(CL_INVALID_MEM_OBJECT, status);
    if (!holds(memory, offset, bytes)) return refuse(CL_INVALID_VALUE, status);
    unsigned char* const pointer = memory->bytes + offset;
    ++script().maps[{memory, pointer}];
    return give(static_cast<void*>(pointer), status);
}

STANDIN_API cl_int clEnqueueUnmapMemObject(cl_command_queue queue, cl_mem memory, void* pointer, cl_uint,
                                           const cl_event*, cl_event*) {
    if (const int32_t status = enter("clEnqueueUnmapMemObject")) return status;
    if (!isLive(queue, "queue")) return complain("clEnqueueUnmapMemObject"), CL_INVALID_COMMAND_QUEUE;
    if (!isLive(memory, "memory")) return complain("clEnqueueUnmapMemObject"), CL_INVALID_MEM_OBJECT;
    const auto map = script().maps.find({memory, pointer});
    if (map == script().maps.end())
        return complain("clEnqueueUnmapMemObject of a pointer not mapped"), CL_INVALID_VALUE;
    if (--map->second == 0) script().maps.erase(map);
    return CL_SUCCESS;
}

#ifndef STANDIN_BARE
// numbers: source offset, destination offset, size.
STANDIN_API cl_int clEnqueueCopyBuffer(cl_command_queue queue, cl_mem source, cl_mem destination, size_t sourceOffset,
                                       size_t destinationOffset, size_t bytes, cl_uint, const cl_event*, cl_event*) {
    const int32_t failure = enter("clEnqueueCopyBuffer", {}, {sourceOffset, destinationOffset, bytes});
    if (failure != CL_SUCCESS) return failure;
    if (!isLive(queue, "queue")) return complain("clEnqueueCopyBuffer"), CL_INVALID_COMMAND_QUEUE;
    if (!isLive(source, "memory") || !isLive(destination, "memory"))
        return complain("clEnqueueCopyBuffer"), CL_INVALID_MEM_OBJECT;
    if (!holds(source, sourceOffset, bytes) || !holds(destination, destinationOffset, bytes)) return CL_INVALID_VALUE;
    if (source == destination) return CL_MEM_COPY_OVERLAP;
    std::memcpy(destination->bytes + destinationOffset, source->bytes + sourceOffset, bytes);
    return CL_SUCCESS;
}
#endif

// numbers: origins and region. Whole images of one format only.
STANDIN_API cl_int clEnqueueCopyImage(cl_command_queue queue, cl_mem source, cl_mem destination,
                                      const size_t* sourceOrigin, const size_t* destinationOrigin, const size_t* region,
                                      cl_uint, const cl_event*, cl_event*) {
    const int32_t failure =
        enter("clEnqueueCopyImage", {},
              {sourceOrigin[0], sourceOrigin[1], destinationOrigin[0], destinationOrigin[1], region[0], region[1]});
    if (failure != CL_SUCCESS) return failure;
    if (!isLive(queue, "queue")) return complain("clEnqueueCopyImage"), CL_INVALID_COMMAND_QUEUE;
    if (!isLive(source, "memory") || !isLive(destination, "memory"))
        return complain("clEnqueueCopyImage"), CL_INVALID_MEM_OBJECT;
    std::memcpy(destination->bytes, source->bytes, std::min(source->size, destination->size));
    return CL_SUCCESS;
}

// numbers: the count of objects, then their textures.
static cl_int exchangeGlObjects(const char* name, cl_command_queue queue, cl_uint count, const cl_mem* objects) {
    std::vector<uint64_t> numbers{count};
    for (cl_uint i = 0; i < count; ++i) numbers.push_back(isLive(objects[i], "memory") ? objects[i]->texture : 0);
    if (const int32_t status = enter(name, {}, std::move(numbers))) return status;
    if (!isLive(queue, "queue")) return complain(name), CL_INVALID_COMMAND_QUEUE;
    for (cl_uint i = 0; i < count; ++i)
        if (!isLive(objects[i], "memory")) return complain(name), CL_INVALID_MEM_OBJECT;
    return CL_SUCCESS;
}

STANDIN_API cl_int clEnqueueAcquireGLObjects(cl_command_queue queue, cl_uint count, const cl_mem* objects, cl_uint,
                                             const cl_event*, cl_event*) {
    return exchangeGlObjects("clEnqueueAcquireGLObjects", queue, count, objects);
}

STANDIN_API cl_int clEnqueueReleaseGLObjects(cl_command_queue queue, cl_uint count, const cl_mem* objects, cl_uint,
                                             const cl_event*, cl_event*) {
    return exchangeGlObjects("clEnqueueReleaseGLObjects", queue, count, objects);
}
