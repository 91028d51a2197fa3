// Buffers, images and their mapping, and objects shared with OpenGL, of the stand-in.
#include "standin_objects.h"

using namespace standin;

static bool holds(cl_mem memory, size_t offset, size_t bytes) {
    return bytes > 0 && offset <= memory->size && bytes <= memory->size - offset;
}

// Its bytes are enough for any format.
static _cl_mem imageOf(cl_context context, cl_image_format format, size_t width, size_t height) {
    return {context, CL_MEM_READ_WRITE, width * height * 16, width, height, format};
}

STANDIN_API unsigned char* standin_bytes(cl_mem memory, size_t* bytes) {
    if (bytes != nullptr) *bytes = memory->size;
    return memory->bytes;
}

// numbers: flags, size, host pointer. The host's memory is not used.
STANDIN_API cl_mem clCreateBuffer(cl_context context, cl_mem_flags flags, size_t size, void* host, cl_int* out) {
    const int32_t status = enter({"clCreateBuffer", {}, {flags, size, reinterpret_cast<uint64_t>(host)}}, context);
    return give(out, status, _cl_mem{context, flags, size});
}

STANDIN_API cl_mem clCreateImage(cl_context context, cl_mem_flags, const cl_image_format* format,
                                 const cl_image_desc* size, void*, cl_int* out) {
    return give(out, enter({"clCreateImage"}, context),
                imageOf(context, *format, size->image_width, size->image_height));
}

// numbers: flags, target, level, texture. The image is 8 x 8 pixels of four 8-bit components.
STANDIN_API cl_mem clCreateFromGLTexture(cl_context context, cl_mem_flags flags, cl_GLenum target, cl_GLint level,
                                         cl_GLuint texture, cl_int* out) {
    const int32_t status =
        enter({"clCreateFromGLTexture", {}, {flags, target, static_cast<uint64_t>(level), texture}}, context);
    return give(out, status, imageOf(context, {CL_RGBA, CL_UNORM_INT8}, 8, 8));
}

STANDIN_RELEASE(clReleaseMemObject, cl_mem)

STANDIN_QUERY(clGetMemObjectInfo, cl_mem,
              {{CL_MEM_TYPE,
                bytesOfValue(cl_mem_object_type(object->width > 0 ? CL_MEM_OBJECT_IMAGE2D : CL_MEM_OBJECT_BUFFER))},
               {CL_MEM_SIZE, bytesOfValue(object->size)},
               {CL_MEM_CONTEXT, bytesOfValue(object->context)},
               {CL_MEM_FLAGS, bytesOfValue(object->flags)},
               {CL_MEM_OFFSET, bytesOfValue(size_t{0})},
               {CL_MEM_ASSOCIATED_MEMOBJECT, bytesOfValue(cl_mem{nullptr})}})

STANDIN_QUERY(clGetImageInfo, cl_mem,
              {{CL_IMAGE_FORMAT, bytesOfValue(object->format)},
               {CL_IMAGE_WIDTH, bytesOfValue(object->width)},
               {CL_IMAGE_HEIGHT, bytesOfValue(object->height)},
               {CL_IMAGE_DEPTH, bytesOfValue(size_t{0})}})

// numbers: blocking, flags, offset, size.
STANDIN_API void* clEnqueueMapBuffer(cl_command_queue queue, cl_mem memory, cl_bool blocking, cl_map_flags flags,
                                     size_t offset, size_t bytes, STANDIN_EVENTS, cl_int* out) {
    *out = enter({"clEnqueueMapBuffer", {}, {blocking, flags, offset, bytes}}, queue, memory);
    if (*out == CL_SUCCESS && !holds(memory, offset, bytes)) *out = CL_INVALID_VALUE;
    if (*out != CL_SUCCESS) return nullptr;
    script().maps.emplace(memory, memory->bytes + offset);
    return memory->bytes + offset;
}

STANDIN_API cl_int clEnqueueUnmapMemObject(cl_command_queue queue, cl_mem memory, void* pointer, STANDIN_EVENTS) {
    if (const int32_t status = enter({"clEnqueueUnmapMemObject"}, queue, memory)) return status;
    const auto map = script().maps.find({memory, pointer});
    if (map == script().maps.end()) {
        script().misuse.emplace_back("clEnqueueUnmapMemObject of a pointer not mapped");
        return CL_INVALID_VALUE;
    }
    script().maps.erase(map);
    return CL_SUCCESS;
}

STANDIN_API cl_int clEnqueueCopyBuffer(cl_command_queue queue, cl_mem source, cl_mem destination, size_t sourceOffset,
                                       size_t destinationOffset, size_t bytes, STANDIN_EVENTS) {
    if (const int32_t status = enter({"clEnqueueCopyBuffer"}, queue, source, destination)) return status;
    if (!holds(source, sourceOffset, bytes) || !holds(destination, destinationOffset, bytes)) return CL_INVALID_VALUE;
    std::memcpy(destination->bytes + destinationOffset, source->bytes + sourceOffset, bytes);
    return CL_SUCCESS;
}

// Whole images of one format only.
STANDIN_API cl_int clEnqueueCopyImage(cl_command_queue queue, cl_mem source, cl_mem destination, const size_t*,
                                      const size_t*, const size_t*, STANDIN_EVENTS) {
    if (const int32_t status = enter({"clEnqueueCopyImage"}, queue, source, destination)) return status;
    std::memcpy(destination->bytes, source->bytes, std::min(source->size, destination->size));
    return CL_SUCCESS;
}

// The library exchanges them one by one.
STANDIN_API cl_int clEnqueueAcquireGLObjects(cl_command_queue queue, cl_uint, const cl_mem* objects, STANDIN_EVENTS) {
    return enter({"clEnqueueAcquireGLObjects"}, queue, objects[0]);
}

STANDIN_API cl_int clEnqueueReleaseGLObjects(cl_command_queue queue, cl_uint, const cl_mem* objects, STANDIN_EVENTS) {
    return enter({"clEnqueueReleaseGLObjects"}, queue, objects[0]);
}
