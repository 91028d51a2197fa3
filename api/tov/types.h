/* Public constants, error codes and the image descriptor. Plain C, included by tov.h; needs nothing else. */
#ifndef TOV_TYPES_H
#define TOV_TYPES_H

#include <stdint.h>

/* ---- Version ---------------------------------------------------------------------------------------------------- */

/** Version of the library that this header belongs to. The shared object's major version is TOV_VERSION_MAJOR. */
#define TOV_VERSION_MAJOR 1
#define TOV_VERSION_MINOR 0
#define TOV_VERSION_PATCH 0
#define TOV_VERSION_STRING "1.0.0"
/** One comparable number: 10000 * major + 100 * minor + patch. */
#define TOV_VERSION (TOV_VERSION_MAJOR * 10000 + TOV_VERSION_MINOR * 100 + TOV_VERSION_PATCH)

/** First argument of both context-creation functions; any other value is refused. */
#define TOV_API_VERSION 1u

/* ---- Back ends and devices -------------------------------------------------------------------------------------- */

/** The only back end with devices. Every other value counts 0 devices. */
#define TOV_BACKEND_API_OPENCL 0u

#define TOV_DEVICE_TYPE_GPU 0u /**< OpenCL devices of type GPU. */
#define TOV_DEVICE_TYPE_CPU 1u /**< OpenCL devices of type CPU. */

/* ---- Error codes ------------------------------------------------------------------------------------------------ */

/** The call did what it was asked. Every failure is negative and leaves the output arguments as they were. */
#define TOV_SUCCESS 0
/** An image handle is null, not registered (or deleted), or not an image. */
#define TOV_ERROR_INVALID_IMAGE (-6)
/** The image-descriptor pointer is null. */
#define TOV_ERROR_INVALID_IMAGE_DESC (-8)
/** OpenGL is not there or reported an error while a texture was inspected. */
#define TOV_ERROR_OPENGL (-10)
/** A pointer is null, a size or index is out of range, or a value is not acceptable. */
#define TOV_ERROR_INVALID_PARAMETER (-12)
/** A context handle is null, not registered (or deleted), or not a context; a device index is out of range. */
#define TOV_ERROR_INVALID_CONTEXT (-15)
/** A command-queue handle is null, not registered (or deleted), or not a command queue. */
#define TOV_ERROR_INVALID_QUEUE (-16)
/** A filter handle is null, not registered (or deleted), or not a filter. */
#define TOV_ERROR_INVALID_FILTER (-17)
/** A parameter name is null, or the filter has no parameter of that name. */
#define TOV_ERROR_INVALID_PARAMETER_NAME (-18)
/** The API-version argument is not TOV_API_VERSION. */
#define TOV_ERROR_INVALID_API_VERSION (-20)
/** Anything else: the driver refused a call, a kernel does not compile, memory is exhausted. */
#define TOV_ERROR_INTERNAL_ERROR (-21)
/** Unknown information key, a setter of another type than the parameter's, or something that cannot be done. */
#define TOV_ERROR_UNSUPPORTED (-23)
/** Unknown filter type, or images that the filter cannot use together. */
#define TOV_ERROR_INVALID_OPERATION (-24)

/* ---- Information keys ------------------------------------------------------------------------------------------- */

#define TOV_IMAGE_DESC 0x301u      /**< tovImageGetInfo: the 28-byte tov_image_desc given at creation. */
#define TOV_IMAGE_DATA_SIZE 0x302u /**< tovImageGetInfo: uint64_t, bytes of pixel data (low 32 bits of the size). */

#define TOV_IMAGE_FILTER_TYPE 0u            /**< tovImageFilterGetInfo: uint32_t, TOV_IMAGE_FILTER_... */
#define TOV_IMAGE_FILTER_PARAMETER_COUNT 1u /**< tovImageFilterGetInfo: uint32_t, number of parameters. */
#define TOV_IMAGE_FILTER_DESCRIPTION 2u     /**< tovImageFilterGetInfo: const char*, never null, may be "". */

#define TOV_PARAMETER_NAME 0x1202u        /**< tovParameterGetInfo: const char*. */
#define TOV_PARAMETER_TYPE 0x1203u        /**< tovParameterGetInfo: uint32_t, TOV_PARAMETER_TYPE_... */
#define TOV_PARAMETER_DESCRIPTION 0x1204u /**< tovParameterGetInfo: const char*, null where there is none. */
#define TOV_PARAMETER_VALUE 0x1205u       /**< tovParameterGetInfo: const void*, see TOV_PARAMETER_TYPE_... */

/* ---- Images ----------------------------------------------------------------------------------------------------- */

#define TOV_COMPONENT_TYPE_UINT8 1u   /**< 8-bit unsigned; kernels see 0 ... 255 as 0 ... 1. */
#define TOV_COMPONENT_TYPE_FLOAT16 2u /**< IEEE half. */
#define TOV_COMPONENT_TYPE_FLOAT32 3u /**< IEEE single. */

/**
 * Layout of an image: 28 bytes, pitches in pixels. Pixels lie in rows from the top, the components of a pixel side by
 * side, three-component pixels packed. Bytes of storage = row pitch (0: width) * height * components * bytes per
 * component. Kernels address rows of exactly image_width pixels: a larger row pitch only enlarges the storage.
 */
typedef struct tov_image_desc {
    uint32_t image_width;       /**< Pixels. */
    uint32_t image_height;      /**< Pixels. */
    uint32_t image_depth;       /**< Kept and compared only; 1 is usual. */
    uint32_t image_row_pitch;   /**< Pixels from row to row; 0 means image_width. */
    uint32_t image_slice_pitch; /**< Kept and compared only; 0 means row pitch * image_height. */
    uint32_t num_components;    /**< 1 gray, 2 gray and alpha, 3 RGB, 4 RGBA. */
    uint32_t type;              /**< TOV_COMPONENT_TYPE_... */
} tov_image_desc;

/* ---- Filters ---------------------------------------------------------------------------------------------------- */

/** Filter types. The parameters of each are listed by tovParameterGetInfo and in docs/filters.md. */
#define TOV_IMAGE_FILTER_MATH_TEST 0u              /**< Self-test of device arithmetic on five floats. */
#define TOV_IMAGE_FILTER_COLOR_SPACE 1u            /**< Linear conversion between RGB colour spaces. */
#define TOV_IMAGE_FILTER_NORMALIZATION 2u          /**< Divide by alpha. */
#define TOV_IMAGE_FILTER_GAMMA_CORRECTION 3u       /**< Raise RGB to 1 / cGamma. */
#define TOV_IMAGE_FILTER_RESAMPLE 4u               /**< Scale by box average, bilinear or bicubic interpolation. */
#define TOV_IMAGE_FILTER_GAUSSIAN_BLUR 5u          /**< Separable Gaussian blur. */
#define TOV_IMAGE_FILTER_SIMPLE_TONEMAP 6u         /**< Exposure, contrast and a filmic curve. */
#define TOV_IMAGE_FILTER_REINHARD_TONEMAP 7u       /**< Reinhard et al. 2002, global operator. */
#define TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP 8u    /**< 1 - exp(-exposure * x). */
#define TOV_IMAGE_FILTER_LINEAR_TONEMAP 9u         /**< Multiply RGB by cKey. */
#define TOV_IMAGE_FILTER_DRAGO_TONEMAP 10u         /**< Drago et al. 2003, adaptive logarithmic mapping. */
#define TOV_IMAGE_FILTER_BILATERAL_DENOISE 11u     /**< Average steered by up to six auxiliary images. */
#define TOV_IMAGE_FILTER_LWR_DENOISE 12u           /**< Local weighted regression. */
#define TOV_IMAGE_FILTER_EAW_DENOISE 13u           /**< Edge-avoiding a-trous wavelets. */
#define TOV_IMAGE_FILTER_SOBEL 14u                 /**< Gradient magnitude of luminance. */
#define TOV_IMAGE_FILTER_WEIGHTED_SUM 15u          /**< Weighted sum of up to six images. */
#define TOV_IMAGE_FILTER_MULTIPLY 16u              /**< Product of up to six images. */
#define TOV_IMAGE_FILTER_MLAA 17u                  /**< Morphological antialiasing. */
#define TOV_IMAGE_FILTER_MOTION_BUFFER 18u         /**< Screen-space motion from world positions. */
#define TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION 19u /**< Reprojected running average of successive frames. */
#define TOV_IMAGE_FILTER_SHADOW_CATCHER 20u        /**< Shadow matte from four packed components. */

/**
 * Parameter types. TOV_PARAMETER_VALUE points at the value inside the filter: the 32-bit components of numeric types;
 * the handle of an image or filter (null: none); the caller's array pointer of the two array types.
 */
#define TOV_PARAMETER_TYPE_FLOAT1 1u
#define TOV_PARAMETER_TYPE_FLOAT2 2u
#define TOV_PARAMETER_TYPE_FLOAT3 3u
#define TOV_PARAMETER_TYPE_FLOAT4 4u
#define TOV_PARAMETER_TYPE_IMAGE 5u
#define TOV_PARAMETER_TYPE_UINT1 8u
#define TOV_PARAMETER_TYPE_UINT2 9u
#define TOV_PARAMETER_TYPE_FLOAT_ARRAY 10u
#define TOV_PARAMETER_TYPE_IMAGE_ARRAY 12u
#define TOV_PARAMETER_TYPE_FLOAT16 13u /**< Sixteen floats, a 4 x 4 matrix row after row. */

/** Values of srcColorSpace and dstColorSpace. All four have the D65 white point. */
#define TOV_COLOR_SPACE_SRGB 1u
#define TOV_COLOR_SPACE_ADOBE_RGB 2u
#define TOV_COLOR_SPACE_REC2020 3u
#define TOV_COLOR_SPACE_DCIP3 4u

/** Values of interpOperator of the resampling filter. */
#define TOV_INTERPOLATION_DOWNSAMPLE 0u /**< Box average over whole blocks of pixels. */
#define TOV_INTERPOLATION_BILINEAR 1u
#define TOV_INTERPOLATION_BICUBIC 2u /**< Catmull-Rom. */

/* ---- Object tags ------------------------------------------------------------------------------------------------ */

#define TOV_OBJECT_CONTEXT 0u
#define TOV_OBJECT_COMMAND_QUEUE 1u
#define TOV_OBJECT_IMAGE 2u
#define TOV_OBJECT_IMAGE_FILTER 3u

#endif
