/**
 * Tovkit: image filters for rendered pictures, on any OpenCL 1.2 device.
 *
 * A host makes a context on a device, creates or wraps images, creates filters, sets their parameters, attaches each
 * filter with an input and an output image to a command queue, executes the queue and maps the result:
 *
 *     tov_context context = NULL;
 *     tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0, NULL, &context);
 *     tov_image_desc desc = {width, height, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
 *     tov_image input = NULL, output = NULL;
 *     tovContextCreateImage(context, &desc, pixels, &input);
 *     tovContextCreateImage(context, &desc, NULL, &output);
 *     tov_image_filter gamma = NULL;
 *     tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_GAMMA_CORRECTION, &gamma);
 *     tovImageFilterSetParameter1f(gamma, "cGamma", 2.2f);
 *     tov_command_queue queue = NULL;
 *     tovContextCreateCommandQueue(context, &queue);
 *     tovCommandQueueAttachImageFilter(queue, gamma, input, output);
 *     tovContextExecuteCommandQueue(context, queue, NULL, NULL);
 *     void* result = NULL;
 *     tovImageMap(output, 0, &result);
 *
 * All 27 functions return TOV_SUCCESS (0) or a negative TOV_ERROR_ code. Arguments are checked in the order in which
 * their codes are listed. Output arguments are written only on success. No exception ever leaves the library.
 * Diagnostics, a failed compilation's log among them, are lines on standard output.
 *
 * Ownership: every handle lives until tovObjectDelete; deleting in any order is safe, and a device lives until its
 * last image, filter and queue are gone. Filters and queues never own what is bound to them: executing a queue that
 * refers to a deleted object returns that handle's code and runs nothing further. Float and image arrays belong to
 * the caller and must stay valid while the filter may run.
 *
 * Threads: the library starts none and takes no locks; call it from one thread at a time. Every call finishes its
 * work on the device before it returns.
 *
 * Compiled kernels (machine code for the device) are stored in the context's cache directory; only share that
 * directory with users whom you trust.
 */
#ifndef TOV_TOV_H
#define TOV_TOV_H

#include <stddef.h>
#include <stdint.h>

#include "types.h"

#if defined(_WIN32)
#if defined(TOV_BUILDING_LIBRARY)
#define TOV_API __declspec(dllexport)
#else
#define TOV_API __declspec(dllimport)
#endif
#elif defined(__GNUC__)
#define TOV_API __attribute__((visibility("default")))
#else
#define TOV_API
#endif

/* The OpenCL types of the functions below, so that a host without OpenCL headers can include this one. */
struct _cl_context;
struct _cl_device_id;
struct _cl_command_queue;
struct _cl_mem;

/** Handles. Null is never a valid handle. */
typedef void* tov_context;
typedef void* tov_image;
typedef void* tov_image_filter;
typedef void* tov_command_queue;
typedef void* tov_object; /**< Any of the four. */

/** Called by tovContextExecuteCommandQueue on the calling thread after the last filter has run. */
typedef void (*tov_callback)(void* userData);

#ifdef __cplusplus
extern "C" {
#endif

/* ---- Devices and contexts --------------------------------------------------------------------------------------- */

/**
 * Number of devices of a type, over all OpenCL platforms in platform order.
 *
 * @param backend    TOV_BACKEND_API_OPENCL; any other value counts 0.
 * @param deviceType TOV_DEVICE_TYPE_GPU or TOV_DEVICE_TYPE_CPU; any other value counts 0.
 * @param outCount   Receives the count. A machine without OpenCL has 0 devices, which is no error.
 * @return TOV_ERROR_INVALID_PARAMETER: outCount is null.
 */
TOV_API int32_t tovGetDeviceCount(uint32_t backend, uint32_t deviceType, uint32_t* outCount);

/**
 * Make a context on a device.
 *
 * @param apiVersion  TOV_API_VERSION.
 * @param backend     TOV_BACKEND_API_OPENCL.
 * @param deviceType  TOV_DEVICE_TYPE_GPU, or TOV_DEVICE_TYPE_CPU for any other value of those that have devices.
 * @param deviceIndex 0 ... tovGetDeviceCount - 1.
 * @param cachePath   Directory for compiled kernels, created (one level) when first needed; copied, cut to 127 bytes.
 *                    Null means "kernelsCache". A relative path is relative to the working directory.
 * @param outContext  Receives the context.
 * @return TOV_ERROR_INVALID_API_VERSION; TOV_ERROR_INVALID_PARAMETER: outContext is null;
 *         TOV_ERROR_INVALID_CONTEXT: no device of that index; TOV_ERROR_INTERNAL_ERROR: the driver refused.
 */
TOV_API int32_t tovCreateContext(uint32_t apiVersion, uint32_t backend, uint32_t deviceType, int32_t deviceIndex,
                                 const char* cachePath, tov_context* outContext);

/**
 * Make a context over the caller's OpenCL context, device and in-order command queue. Nothing is retained: the three
 * must outlive the context and everything made from it, and stay the caller's to release.
 *
 * @param cachePath As for tovCreateContext.
 * @return TOV_ERROR_INVALID_API_VERSION; TOV_ERROR_INVALID_PARAMETER: one of the three or outContext is null;
 *         TOV_ERROR_INTERNAL_ERROR: there is no OpenCL library, or the device cannot be queried.
 */
TOV_API int32_t tovCreateContextFromOpenClContext(uint32_t apiVersion, struct _cl_context* clContext,
                                                  struct _cl_device_id* clDevice, struct _cl_command_queue* clQueue,
                                                  const char* cachePath, tov_context* outContext);

/**
 * Type, name and vendor of a context's device.
 *
 * @param outDeviceType Receives the device type given at creation (TOV_DEVICE_TYPE_GPU for an adopted context).
 * @param outName       At least 128 bytes; receives the zero-terminated name without leading blanks, cut to fit.
 * @param reserved      Not read.
 * @param outVendor     At least 128 bytes; receives the zero-terminated vendor, cut to fit.
 * @return TOV_ERROR_INVALID_CONTEXT; TOV_ERROR_INVALID_PARAMETER: an output pointer is null.
 */
TOV_API int32_t tovContextGetDeviceInfo(tov_context context, uint32_t* outDeviceType, char* outName, uint32_t reserved,
                                        char* outVendor);

/* ---- Images ----------------------------------------------------------------------------------------------------- */

/**
 * Create an image in the device's memory.
 *
 * @param desc     Layout; copied. Unusual values give an image without storage, which nothing can map or run on.
 * @param data     Pixels to upload, as many bytes as desc describes; null leaves the content undefined.
 * @param outImage Receives the image.
 * @return TOV_ERROR_INVALID_CONTEXT; TOV_ERROR_INVALID_PARAMETER: outImage is null; TOV_ERROR_INVALID_IMAGE_DESC:
 *         desc is null; TOV_ERROR_INTERNAL_ERROR: data was given and the device has no room, or it is 4 GiB or more.
 *         Without data, storage that was refused is reported on standard output and by tovImageMap.
 */
TOV_API int32_t tovContextCreateImage(tov_context context, const tov_image_desc* desc, const void* data,
                                      tov_image* outImage);

/**
 * Wrap the caller's OpenCL buffer or 2D image as an image, without a copy. The memory object is not retained and must
 * outlive the image.
 *
 * @param desc     Layout of the memory; at most as many bytes as it holds.
 * @param memory   A buffer, or an image of the context given to tovCreateContextFromOpenClContext.
 * @param isImage  Non-zero when memory is an OpenCL image object; kernels then read it through a sampler.
 * @return TOV_ERROR_INVALID_CONTEXT; TOV_ERROR_INVALID_PARAMETER: a pointer is null or the memory does not fit desc;
 *         TOV_ERROR_INTERNAL_ERROR: the memory object cannot be queried.
 */
TOV_API int32_t tovContextCreateImageFromOpenClMemory(tov_context context, const tov_image_desc* desc,
                                                      struct _cl_mem* memory, uint8_t isImage, tov_image* outImage);

/**
 * The image's descriptor (TOV_IMAGE_DESC, 28 bytes) or data size (TOV_IMAGE_DATA_SIZE, 8 bytes).
 *
 * @param size    Bytes that out can hold.
 * @param outSize Receives the bytes written.
 * @return TOV_ERROR_INVALID_IMAGE; TOV_ERROR_INVALID_PARAMETER: a pointer is null or size is too small;
 *         TOV_ERROR_UNSUPPORTED: unknown key.
 */
TOV_API int32_t tovImageGetInfo(tov_image image, uint32_t key, uint64_t size, void* out, uint64_t* outSize);

/**
 * Map the whole image for reading and writing on the host, until tovImageUnmap.
 *
 * @param mapFlags   Not read.
 * @param outPointer Receives the address of the first pixel; rows follow each other at the row pitch.
 * @return TOV_ERROR_INVALID_IMAGE; TOV_ERROR_INVALID_PARAMETER: outPointer is null; TOV_ERROR_UNSUPPORTED: the image
 *         wraps an OpenCL image or an OpenGL texture; TOV_ERROR_INTERNAL_ERROR: it has no storage.
 */
TOV_API int32_t tovImageMap(tov_image image, uint32_t mapFlags, void** outPointer);

/**
 * End a mapping. What the host wrote is visible to filters afterwards.
 *
 * @return TOV_ERROR_INVALID_IMAGE; TOV_ERROR_INVALID_PARAMETER: pointer is null or did not come from tovImageMap.
 */
TOV_API int32_t tovImageUnmap(tov_image image, void* pointer);

/* ---- Filters ---------------------------------------------------------------------------------------------------- */

/**
 * Create a filter with its default parameters.
 *
 * @param filterType TOV_IMAGE_FILTER_MATH_TEST ... TOV_IMAGE_FILTER_SHADOW_CATCHER.
 * @return TOV_ERROR_INVALID_CONTEXT; TOV_ERROR_INVALID_PARAMETER: outFilter is null; TOV_ERROR_INVALID_OPERATION:
 *         no such type.
 */
TOV_API int32_t tovContextCreateImageFilter(tov_context context, uint32_t filterType, tov_image_filter* outFilter);

/**
 * Set a parameter by its exact, case-sensitive name. Values are used when the filter runs and are checked then.
 * tovImageFilterSetParameter2u also takes "srcRec" and "dstRec": width and height, in pixels, of the part of the
 * input and output that the filter works on, until the next binding. Filters of several passes work on whole outputs
 * only: a smaller "dstRec" is refused when they run.
 *
 * @return TOV_ERROR_INVALID_FILTER; TOV_ERROR_INVALID_PARAMETER_NAME: name is null; TOV_ERROR_INVALID_PARAMETER:
 *         matrix, or values or images with a non-zero count, is null, an image array has more than 64 elements, one
 *         of them is neither null nor a live image or filter, or is a filter that would feed itself;
 *         TOV_ERROR_INVALID_PARAMETER_NAME: the filter has no such parameter; TOV_ERROR_UNSUPPORTED: the parameter has
 *         another type.
 */
TOV_API int32_t tovImageFilterSetParameter1u(tov_image_filter filter, const char* name, uint32_t x);
TOV_API int32_t tovImageFilterSetParameter2u(tov_image_filter filter, const char* name, uint32_t x, uint32_t y);
TOV_API int32_t tovImageFilterSetParameter1f(tov_image_filter filter, const char* name, float x);
TOV_API int32_t tovImageFilterSetParameter3f(tov_image_filter filter, const char* name, float x, float y, float z);
TOV_API int32_t tovImageFilterSetParameter4f(tov_image_filter filter, const char* name, float x, float y, float z,
                                             float w);
/** @param matrix Sixteen floats, row after row; copied. */
TOV_API int32_t tovImageFilterSetParameter16f(tov_image_filter filter, const char* name, const float* matrix);

/**
 * Bind an image, or a filter whose result is computed on the fly, to an image parameter, "srcBuffer" or "dstBuffer".
 *
 * @param image An image or a filter; "dstBuffer" takes images only.
 * @return As above; TOV_ERROR_INVALID_IMAGE: image is null, deleted, or neither an image nor a filter;
 *         TOV_ERROR_INVALID_PARAMETER: a filter for "dstBuffer", or one that would feed itself.
 */
TOV_API int32_t tovImageFilterSetParameterImage(tov_image_filter filter, const char* name, tov_image image);

/** @param values count floats that the caller keeps valid and unchanged while the filter may run. */
TOV_API int32_t tovImageFilterSetParameterFloatArray(tov_image_filter filter, const char* name, const float* values,
                                                     uint32_t count);

/** @param images count handles, likewise; a null element is an absent image. */
TOV_API int32_t tovImageFilterSetParameterImageArray(tov_image_filter filter, const char* name, tov_image* images,
                                                     uint32_t count);

/**
 * The filter's type, parameter count or description (TOV_IMAGE_FILTER_TYPE ...).
 *
 * @param size    Bytes that out can hold.
 * @param outSize Receives the bytes written. Texts belong to the library and live as long as the filter.
 * @return TOV_ERROR_INVALID_FILTER; TOV_ERROR_INVALID_PARAMETER: a pointer is null or size is too small;
 *         TOV_ERROR_UNSUPPORTED: unknown key.
 */
TOV_API int32_t tovImageFilterGetInfo(tov_image_filter filter, uint32_t key, uint64_t size, void* out,
                                      uint64_t* outSize);

/**
 * Name, type, description or value address of a parameter (TOV_PARAMETER_NAME ...).
 *
 * @param parameterIndex 0 ... TOV_IMAGE_FILTER_PARAMETER_COUNT - 1.
 * @return As tovImageFilterGetInfo; TOV_ERROR_INVALID_PARAMETER also for an index out of range.
 */
TOV_API int32_t tovParameterGetInfo(tov_image_filter filter, uint32_t parameterIndex, uint32_t key, uint64_t size,
                                    void* out, uint64_t* outSize);

/* ---- Queues ----------------------------------------------------------------------------------------------------- */

/**
 * Create an empty command queue.
 *
 * @return TOV_ERROR_INVALID_CONTEXT; TOV_ERROR_INVALID_PARAMETER: outQueue is null.
 */
TOV_API int32_t tovContextCreateCommandQueue(tov_context context, tov_command_queue* outQueue);

/**
 * Bind a filter's input ("srcBuffer") and output ("dstBuffer") and append it to a queue. Input and output must have
 * the same width, height, depth and pitches, except for the resampling filter, whose output must not be its input.
 * The bindings stay when a later check fails.
 *
 * @param input  An image, or a filter to be fused into this one.
 * @param output An image.
 * @return TOV_ERROR_INVALID_QUEUE; TOV_ERROR_INVALID_FILTER; the codes of tovImageFilterSetParameterImage;
 *         TOV_ERROR_INVALID_OPERATION: the images do not go together; TOV_ERROR_INVALID_PARAMETER: the filter is
 *         attached to this queue already.
 */
TOV_API int32_t tovCommandQueueAttachImageFilter(tov_command_queue queue, tov_image_filter filter, tov_image input,
                                                 tov_image output);

/**
 * Remove a filter from a queue; its bindings stay.
 *
 * @return TOV_ERROR_INVALID_QUEUE; TOV_ERROR_INVALID_FILTER; TOV_ERROR_INVALID_PARAMETER: it is not attached.
 */
TOV_API int32_t tovCommandQueueDetachImageFilter(tov_command_queue queue, tov_image_filter filter);

/**
 * Run every filter of a queue in order of attachment, wait for the device, then call callback(userData) on this
 * thread. The first failure ends the run: later filters do not run and the callback is not called.
 *
 * @param callback May be null.
 * @return TOV_ERROR_INVALID_CONTEXT; TOV_ERROR_INVALID_QUEUE; otherwise the first failure: a deleted filter, image or
 *         context gives its own code; TOV_ERROR_INVALID_PARAMETER: a value that the filter cannot work with;
 *         TOV_ERROR_INVALID_OPERATION: an image that is missing, too small or of unknown layout;
 *         TOV_ERROR_UNSUPPORTED: filters that cannot be fused, or an OpenCL image where only a buffer will do;
 *         TOV_ERROR_INTERNAL_ERROR: no memory, a kernel that does not compile, a driver's refusal. A line on standard
 *         output says what was wrong.
 */
TOV_API int32_t tovContextExecuteCommandQueue(tov_context context, tov_command_queue queue, tov_callback callback,
                                              void* userData);

/* ---- All objects ------------------------------------------------------------------------------------------------ */

/**
 * Delete a context, image, filter or queue. A mapped image is unmapped first. The handle is invalid afterwards.
 *
 * @return TOV_ERROR_INVALID_PARAMETER: object is null or not registered.
 */
TOV_API int32_t tovObjectDelete(tov_object object);

#ifdef __cplusplus
}
#endif

/* This one function is exported under the symbol that C++ compilers form for it. The label lets C call it, too. */
#if defined(__GNUC__) && defined(__APPLE__)
#define TOV_GL_SYMBOL __asm__("__Z38tovContextCreateImageFromOpenGlTexturePvjijPS_")
#elif defined(__GNUC__) && !defined(_WIN32)
#define TOV_GL_SYMBOL __asm__("_Z38tovContextCreateImageFromOpenGlTexturePvjijPS_")
#else
#define TOV_GL_SYMBOL
#endif
#ifdef __cplusplus
extern "C++" {
#endif

/**
 * Wrap a level of an OpenGL texture as an image. The context must come from tovCreateContextFromOpenClContext over an
 * OpenCL context that shares with the current OpenGL context. The texture stays the caller's; do not use it in OpenGL
 * while a queue that reads or writes it executes.
 *
 * @param glTarget  For example GL_TEXTURE_2D; its binding is reset to 0.
 * @param mipLevel  Level of detail.
 * @param glTexture Texture name; internal format GL_RGB, GL_RGBA, GL_RGBA16 or GL_RGBA32F.
 * @return TOV_ERROR_INVALID_CONTEXT; TOV_ERROR_INVALID_PARAMETER: outImage is null, another format, or an empty level;
 *         TOV_ERROR_OPENGL: no OpenGL or no current context; TOV_ERROR_INTERNAL_ERROR: OpenCL cannot share it.
 */
TOV_API int tovContextCreateImageFromOpenGlTexture(tov_context context, unsigned int glTarget, int mipLevel,
                                                   unsigned int glTexture, tov_image* outImage) TOV_GL_SYMBOL;

#ifdef __cplusplus
}
#endif

#endif
