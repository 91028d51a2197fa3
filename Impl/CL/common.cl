// Pixel access shared by every kernel, and all that kernels call which can be fused: a fused program has no other text
// to include.
//
// Three definitions describe each image argument N: N_COMP_TYPE (uint, half, float, sampler or none), N_COMP_NUM (1 to
// 4, empty with sampler, none with none) and N_Res, its (int2) size. The macros below paste them together where they
// are used, never while this text is read: a generated program may define them further down. An image that is computed
// instead of stored has no layout, and ReadPixel then pastes the names themselves, which such a program defines.

#define EXPAND(arg) arg

// 1 where vectors within an item and the cache do what items side by side and local memory do elsewhere.
#if defined(__x86_64__) || defined(__i386__) || defined(__aarch64__) || defined(__arm__)
#define ON_CENTRAL_PROCESSOR 1
// Wide vectors are handed over between functions of one program only: how they would cross its border does not matter.
#ifdef __clang__
#pragma clang diagnostic ignored "-Wpsabi"
#pragma clang diagnostic ignored "-Wpass-failed"
#endif
#else
#define ON_CENTRAL_PROCESSOR 0
#endif
// Functions over wide vectors, which a call would send through memory.
#define INLINED static inline __attribute__((always_inline))

// REPEAT(N, X) is X(0) X(1) ... X(N - 1).
#define REPEAT_0(X)
#define REPEAT_1(X) X(0)
#define REPEAT_2(X) REPEAT_1(X) X(1)
#define REPEAT_3(X) REPEAT_2(X) X(2)
#define REPEAT_4(X) REPEAT_3(X) X(3)
#define REPEAT_5(X) REPEAT_4(X) X(4)
#define REPEAT_6(X) REPEAT_5(X) X(5)
#define REPEAT__(N, X) REPEAT_##N(X)
#define REPEAT_(N, X) REPEAT__(N, X)
#define REPEAT(N, X) REPEAT_(N, X)

#define make_float2(a, b) ((float2)((a), (b)))
#define make_float3(a, b, c) ((float3)((a), (b), (c)))
#define make_float4(a, b, c, d) ((float4)((a), (b), (c), (d)))
#define make_int2(a, b) ((int2)((a), (b)))

// Weights of R, G and B in the luminance of linear sRGB.
#define WHITEPOINT ((float4)(0.2126f, 0.7152f, 0.0722f, 0.0f))

// Three rows of a 3 x 3 matrix; the fourth components are 0.
typedef struct {
    float4 row0;
    float4 row1;
    float4 row2;
} Mat4n3;

// ---- Argument types ------------------------------------------------------------------------------------------------

#define src_none_none int
#define src_uint_1 __global uchar*
#define src_uint_2 __global uchar2*
#define src_uint_3 __global uchar*
#define src_uint_4 __global uchar4*
#define src_half_1 __global half*
#define src_half_2 __global half*
#define src_half_3 __global half*
#define src_half_4 __global half*
#define src_float_1 __global float*
#define src_float_2 __global float2*
#define src_float_3 __global float*
#define src_float_4 __global float4*
#define src_sampler_ __read_only image2d_t

#define dst_none_none int
#define dst_uint_1 __global uchar*
#define dst_uint_2 __global uchar2*
#define dst_uint_3 __global uchar*
#define dst_uint_4 __global uchar4*
#define dst_half_1 __global half*
#define dst_half_2 __global half*
#define dst_half_3 __global half*
#define dst_half_4 __global half*
#define dst_float_1 __global float*
#define dst_float_2 __global float2*
#define dst_float_3 __global float*
#define dst_float_4 __global float4*
#define dst_sampler_ __write_only image2d_t

#define PASTE_LAYOUT_(prefix, type, count) prefix##_##type##_##count
#define PASTE_LAYOUT(prefix, type, count) PASTE_LAYOUT_(prefix, type, count)

#define srcBufferType(name) PASTE_LAYOUT(src, name##_COMP_TYPE, name##_COMP_NUM) name
#define dstBufferType(name) PASTE_LAYOUT(dst, name##_COMP_TYPE, name##_COMP_NUM) name

#define GET_BUFFER_SIZE(name) name##_Res

// 1 when no image is bound to the argument, else 0.
#define ABSENT_none 1
#define ABSENT_uint 0
#define ABSENT_half 0
#define ABSENT_float 0
#define ABSENT_sampler 0
#define IS_ABSENT__(type) ABSENT_##type
#define IS_ABSENT_(type) IS_ABSENT__(type)
#define IS_ABSENT(name) IS_ABSENT_(name##_COMP_TYPE)

// ---- The work item's pixel -----------------------------------------------------------------------------------------

// One-dimensional launches are built with GROUP_DIM_1D defined as 1, which selects GROUP_COORD_1 by pasting. In every
// other program the name stands for itself.
#define GROUP_COORD_1(limits) \
    ((int2)((int)((uint)get_global_id(0) % (uint)(limits).x), (int)((uint)get_global_id(0) / (uint)(limits).x)))
#define GROUP_COORD_GROUP_DIM_1D(limits) ((int2)((int)get_global_id(0), (int)get_global_id(1)))
#define GROUP_COORD_(flag, limits) GROUP_COORD_##flag(limits)
#define GROUP_COORD(flag, limits) GROUP_COORD_(flag, limits)

// Sets coord to the work item's pixel; items outside the limits leave the kernel.
#define TAKE_OWN_PIXEL(coord, limits)                     \
    coord = GROUP_COORD(GROUP_DIM_1D, limits);            \
    if (coord.x >= (limits).x || coord.y >= (limits).y) { \
        return;                                           \
    }

// The pixels that a launch covers, which may be a part of the picture.
static inline int2 LaunchedPixels(int2 size) {
    return (int2)((int)min((size_t)size.x, get_global_size(0)), (int)min((size_t)size.y, get_global_size(1)));
}

// Before a loop over pixels: compilers may compute them side by side without a test for overlaps. A picture may be
// filtered in place, but no pixel reads another one's result. Compilers make vectors of plain numbers only, so what
// such a loop calls computes component by component, without branches.
#ifdef __clang__
#define PIXELS_ARE_INDEPENDENT _Pragma("clang loop vectorize(assume_safety) vectorize_width(8)")
#else
#define PIXELS_ARE_INDEPENDENT
#endif

// Leaves the kernel's work to the first item of a group.
#define FIRST_OF_GROUP_ONLY                             \
    if (get_local_id(0) != 0 || get_local_id(1) != 0) { \
        return;                                         \
    }

// That item takes the pixels of all. The groups of some rows have as many items as these rows have pixels, or more, and
// take them in the order of the rows, in which `place` counts: memory is read as it lies.
#define TAKE_PIXELS_OF_GROUP(coord, limits)                                                          \
    FIRST_OF_GROUP_ONLY                                                                              \
    const int2 launched = LaunchedPixels(limits);                                                    \
    const int2 corner = (int2)((int)get_global_id(0), (int)get_global_id(1));                        \
    const ulong width = (ulong)launched.x;                                                           \
    const ulong all_places = width * (ulong)clamp(launched.y - corner.y, 0, (int)get_local_size(1)); \
    ulong place = (ulong)corner.x * get_local_size(1);                                               \
    const ulong place_behind = min(place + get_local_size(0) * get_local_size(1), all_places);       \
    while (place < place_behind) {                                                                   \
        const ulong row = place / width;                                                             \
        const int first_column = (int)(place - row * width);                                         \
        place = min(place_behind, (row + 1) * width);                                                \
        const int column_behind = (int)(place - row * width);                                        \
        PIXELS_ARE_INDEPENDENT                                                                       \
        for (int column = first_column; column < column_behind; ++column) {                          \
            coord = (int2)(column, corner.y + (int)row);
#define PUT_PIXEL_OF_GROUP(buffer, x, y, rgba) \
    PutPixel(buffer, x, y, rgba);              \
    }                                          \
    }

// In fused programs, whose builds alone define HASH, a kernel is one loop on central processors: GET_COORD begins it
// and WritePixel ends it.
#if ON_CENTRAL_PROCESSOR && defined(HASH)
#define GET_COORD(coord, limits) TAKE_PIXELS_OF_GROUP(coord, limits)
#define WritePixel(buffer, x, y, rgba) PUT_PIXEL_OF_GROUP(buffer, x, y, rgba)
#else
#define GET_COORD(coord, limits) TAKE_OWN_PIXEL(coord, limits)
#define WritePixel(buffer, x, y, rgba) PutPixel(buffer, x, y, rgba)
#endif

// ---- Components in memory ------------------------------------------------------------------------------------------
// HOW_LOAD_N(type, buffer, i) and HOW_STORE_N(type, buffer, i, values): the N components of pixel i as floats, at once
// (VECTOR) or one by one (SINGLY), for loops of which compilers make vectors.

// 0 ... 1 to 0 ... 255, rounded to nearest even: at 2^23 the digits of a float are whole numbers, and the last eight
// are the byte. Conversions that round and saturate are several times slower on central processors.
#define AS_BYTE_DIGITS(clamped) ((clamped)*255.0f + 8388608.0f)

#define VECTOR_LOAD_1(type, buffer, i) LOAD_1_##type(buffer, i)
#define VECTOR_LOAD_2(type, buffer, i) LOAD_2_##type(buffer, i)
#define VECTOR_LOAD_3(type, buffer, i) LOAD_3_##type(buffer, i)
#define VECTOR_LOAD_4(type, buffer, i) LOAD_4_##type(buffer, i)
#define LOAD_1_uint(buffer, i) (convert_float(((__global const uchar*)(buffer))[i]) * (1.0f / 255.0f))
#define LOAD_2_uint(buffer, i) (convert_float2(((__global const uchar2*)(buffer))[i]) * (1.0f / 255.0f))
#define LOAD_3_uint(buffer, i) (convert_float3(vload3(i, (__global const uchar*)(buffer))) * (1.0f / 255.0f))
#define LOAD_4_uint(buffer, i) (convert_float4(((__global const uchar4*)(buffer))[i]) * (1.0f / 255.0f))
#define LOAD_1_half(buffer, i) vload_half(i, (__global const half*)(buffer))
#define LOAD_2_half(buffer, i) vload_half2(i, (__global const half*)(buffer))
#define LOAD_3_half(buffer, i) vload_half3(i, (__global const half*)(buffer))
#define LOAD_4_half(buffer, i) vload_half4(i, (__global const half*)(buffer))
#define LOAD_1_float(buffer, i) ((__global const float*)(buffer))[i]
#define LOAD_2_float(buffer, i) ((__global const float2*)(buffer))[i]
#define LOAD_3_float(buffer, i) vload3(i, (__global const float*)(buffer))
#define LOAD_4_float(buffer, i) ((__global const float4*)(buffer))[i]

static inline uchar4 ToBytes(float4 values) {
    return convert_uchar4(as_uint4(AS_BYTE_DIGITS(clamp(values, 0.0f, 1.0f))));
}
#define VECTOR_STORE_1(type, buffer, i, value) STORE_1_##type(buffer, i, value)
#define VECTOR_STORE_2(type, buffer, i, values) STORE_2_##type(buffer, i, values)
#define VECTOR_STORE_3(type, buffer, i, values) STORE_3_##type(buffer, i, values)
#define VECTOR_STORE_4(type, buffer, i, values) STORE_4_##type(buffer, i, values)
#define STORE_1_uint(buffer, i, value) ((__global uchar*)(buffer))[i] = ToBytes((float4)(value)).x
#define STORE_2_uint(buffer, i, values) ((__global uchar2*)(buffer))[i] = ToBytes((float4)(values, 0.0f, 0.0f)).xy
#define STORE_3_uint(buffer, i, values) vstore3(ToBytes((float4)(values, 0.0f)).xyz, i, (__global uchar*)(buffer))
#define STORE_4_uint(buffer, i, values) ((__global uchar4*)(buffer))[i] = ToBytes(values)
#define STORE_1_half(buffer, i, value) vstore_half(value, i, (__global half*)(buffer))
#define STORE_2_half(buffer, i, values) vstore_half2(values, i, (__global half*)(buffer))
#define STORE_3_half(buffer, i, values) vstore_half3(values, i, (__global half*)(buffer))
#define STORE_4_half(buffer, i, values) vstore_half4(values, i, (__global half*)(buffer))
#define STORE_1_float(buffer, i, value) ((__global float*)(buffer))[i] = value
#define STORE_2_float(buffer, i, values) ((__global float2*)(buffer))[i] = values
#define STORE_3_float(buffer, i, values) vstore3(values, i, (__global float*)(buffer))
#define STORE_4_float(buffer, i, values) ((__global float4*)(buffer))[i] = values

#if ON_CENTRAL_PROCESSOR
#define LOAD_uint(buffer, i) ((float)((__global const uchar*)(buffer))[i] * (1.0f / 255.0f))
#define LOAD_half(buffer, i) vload_half(i, (__global const half*)(buffer))
#define LOAD_float(buffer, i) ((__global const float*)(buffer))[i]
#define SINGLY_LOAD_1(type, buffer, i) LOAD_##type(buffer, i)
#define SINGLY_LOAD_2(type, buffer, i) ((float2)(LOAD_##type(buffer, 2 * (i)), LOAD_##type(buffer, 2 * (i) + 1)))
#define SINGLY_LOAD_3(type, buffer, i) \
    ((float3)(LOAD_##type(buffer, 3 * (i)), LOAD_##type(buffer, 3 * (i) + 1), LOAD_##type(buffer, 3 * (i) + 2)))

// Four components come in numbers of 32 and 64 bits and are taken apart there, which takes fewer shuffles.
typedef uint PackedWord __attribute__((may_alias));
typedef ulong PackedPair __attribute__((may_alias));

static inline float4 LoadFourBytes(__global const void* buffer, size_t i) {
    const uint word = ((__global const PackedWord*)buffer)[i];
    return (float4)((float)(int)(word & 0xffu) * (1.0f / 255.0f), (float)(int)(word >> 8 & 0xffu) * (1.0f / 255.0f),
                    (float)(int)(word >> 16 & 0xffu) * (1.0f / 255.0f), (float)(int)(word >> 24) * (1.0f / 255.0f));
}

// The bits of a half as a float: normal numbers, infinities and NaN by their exponent, smaller ones from 0.5 on.
static inline float FromHalf(uint bits) {
    const uint magnitude = bits & 0x7fffu;
    const float normal = as_float((magnitude << 13) + (magnitude < 0x7c00u ? 0x38000000u : 0x70000000u));
    const float small = as_float(magnitude | 0x3f000000u) - 0.5f;
    return as_float(as_uint(magnitude < 0x400u ? small : normal) | (bits & 0x8000u) << 16);
}

static inline float4 LoadFourHalves(__global const void* buffer, size_t i) {
    const uint low = ((__global const PackedWord*)buffer)[2 * i];
    const uint high = ((__global const PackedWord*)buffer)[2 * i + 1];
    return (float4)(FromHalf(low & 0xffffu), FromHalf(low >> 16), FromHalf(high & 0xffffu), FromHalf(high >> 16));
}

static inline float4 LoadFourFloats(__global const void* buffer, size_t i) {
    const ulong low = ((__global const PackedPair*)buffer)[2 * i];
    const ulong high = ((__global const PackedPair*)buffer)[2 * i + 1];
    return (float4)(as_float((uint)low), as_float((uint)(low >> 32)), as_float((uint)high),
                    as_float((uint)(high >> 32)));
}
#define SINGLY_LOAD_4(type, buffer, i) LOAD_SINGLY_4_##type(buffer, i)
#define LOAD_SINGLY_4_uint(buffer, i) LoadFourBytes(buffer, i)
#define LOAD_SINGLY_4_half(buffer, i) LoadFourHalves(buffer, i)
#define LOAD_SINGLY_4_float(buffer, i) LoadFourFloats(buffer, i)

static inline uint ToByte(float value) {
    const float positive = value > 0.0f ? value : 0.0f;
    return as_uint(AS_BYTE_DIGITS(positive < 1.0f ? positive : 1.0f)) & 0xffu;
}

// Rounded to nearest even, without the branches of the library's function. Halves too small for a whole mantissa have
// the steps of floats from 0.5 on; what is too large becomes infinite.
static inline uint ToHalf(float value) {
    const uint bits = as_uint(value);
    const uint magnitude = bits & 0x7fffffffu;
    const uint bounded = min(magnitude, 0x47800000u);
    const uint normal = (bounded - 0x37fff001u + (magnitude >> 13 & 1u)) >> 13;
    const uint small = as_uint(as_float(magnitude) + 0.5f) - 0x3f000000u;
    const uint nan = magnitude > 0x7f800000u ? 0x200u : 0u;
    return (bits >> 16 & 0x8000u) | (magnitude < 0x38800000u ? small : normal) | nan;
}

#define STORE_uint(buffer, i, value) ((__global uchar*)(buffer))[i] = (uchar)ToByte(value)
#define STORE_half(buffer, i, value) ((__global ushort*)(buffer))[i] = (ushort)ToHalf(value)
#define STORE_float(buffer, i, value) ((__global float*)(buffer))[i] = value
#define SINGLY_STORE_1(type, buffer, i, value) STORE_##type(buffer, i, value)
#define SINGLY_STORE_2(type, buffer, i, values) \
    STORE_##type(buffer, 2 * (i), (values).x);  \
    STORE_##type(buffer, 2 * (i) + 1, (values).y)
#define SINGLY_STORE_3(type, buffer, i, values)    \
    STORE_##type(buffer, 3 * (i), (values).x);     \
    STORE_##type(buffer, 3 * (i) + 1, (values).y); \
    STORE_##type(buffer, 3 * (i) + 2, (values).z)
#define SINGLY_STORE_4(type, buffer, i, values) STORE_SINGLY_4_##type(buffer, i, values)
#define STORE_SINGLY_4_uint(buffer, i, values) \
    ((__global PackedWord*)(buffer))[i] =      \
        ToByte((values).x) | ToByte((values).y) << 8 | ToByte((values).z) << 16 | ToByte((values).w) << 24
#define STORE_SINGLY_4_half(buffer, i, values)                                                 \
    ((__global PackedWord*)(buffer))[2 * (i)] = ToHalf((values).x) | ToHalf((values).y) << 16; \
    ((__global PackedWord*)(buffer))[2 * (i) + 1] = ToHalf((values).z) | ToHalf((values).w) << 16
#define STORE_SINGLY_4_float(buffer, i, values)          \
    SINGLY_STORE_2(float, buffer, 2 * (i), (values).xy); \
    SINGLY_STORE_2(float, buffer, 2 * (i) + 1, (values).zw)
#endif

// ---- Reading and writing pixels ------------------------------------------------------------------------------------

// Pixels are counted in the width of an address: a picture may hold more than 32 bits count.
static inline size_t PixelIndex(int2 bufferSize, int x, int y) {
    return (size_t)y * (size_t)bufferSize.x + (size_t)x;
}

static inline float Gray(float4 rgba) {
    return (rgba.x + rgba.y + rgba.z) * (1.0f / 3.0f);
}

#define DEFINE_PIXEL_ACCESS(how, read, write, type)                                                            \
    static inline float4 read##_##type##_1(__global const void* buffer, int2 bufferSize, int x, int y) {       \
        const float gray = how##_LOAD_1(type, buffer, PixelIndex(bufferSize, x, y));                           \
        return (float4)(gray, gray, gray, 1.0f);                                                               \
    }                                                                                                          \
    static inline float4 read##_##type##_2(__global const void* buffer, int2 bufferSize, int x, int y) {       \
        const float2 value = how##_LOAD_2(type, buffer, PixelIndex(bufferSize, x, y));                         \
        return value.xxxy;                                                                                     \
    }                                                                                                          \
    static inline float4 read##_##type##_3(__global const void* buffer, int2 bufferSize, int x, int y) {       \
        return (float4)(how##_LOAD_3(type, buffer, PixelIndex(bufferSize, x, y)), 1.0f);                       \
    }                                                                                                          \
    static inline float4 read##_##type##_4(__global const void* buffer, int2 bufferSize, int x, int y) {       \
        return how##_LOAD_4(type, buffer, PixelIndex(bufferSize, x, y));                                       \
    }                                                                                                          \
    static inline void write##_##type##_1(__global void* buffer, int2 bufferSize, int x, int y, float4 rgba) { \
        how##_STORE_1(type, buffer, PixelIndex(bufferSize, x, y), Gray(rgba));                                 \
    }                                                                                                          \
    static inline void write##_##type##_2(__global void* buffer, int2 bufferSize, int x, int y, float4 rgba) { \
        how##_STORE_2(type, buffer, PixelIndex(bufferSize, x, y), (float2)(Gray(rgba), rgba.w));               \
    }                                                                                                          \
    static inline void write##_##type##_3(__global void* buffer, int2 bufferSize, int x, int y, float4 rgba) { \
        how##_STORE_3(type, buffer, PixelIndex(bufferSize, x, y), rgba.xyz);                                   \
    }                                                                                                          \
    static inline void write##_##type##_4(__global void* buffer, int2 bufferSize, int x, int y, float4 rgba) { \
        how##_STORE_4(type, buffer, PixelIndex(bufferSize, x, y), rgba);                                       \
    }
#define DEFINE_ALL_PIXEL_ACCESS(how, read, write) \
    DEFINE_PIXEL_ACCESS(how, read, write, uint)   \
    DEFINE_PIXEL_ACCESS(how, read, write, half)   \
    DEFINE_PIXEL_ACCESS(how, read, write, float)
#if ON_CENTRAL_PROCESSOR && defined(HASH)
DEFINE_ALL_PIXEL_ACCESS(SINGLY, ReadPixel, WritePixel)
#else
DEFINE_ALL_PIXEL_ACCESS(VECTOR, ReadPixel, WritePixel)
#endif

static inline float4 ReadPixel_none_none(int buffer, int2 bufferSize, int x, int y) {
    return (float4)((float)buffer);
}

static inline void WritePixel_none_none(int buffer, int2 bufferSize, int x, int y, float4 rgba) {}

// ReadPixel(buffer, x, y): the pixel as RGBA. 8-bit values become 0 ... 1, gray is repeated, a missing alpha is 1.
#define ReadPixel__(type, count, buffer, bufferSize, x, y) ReadPixel_##type##_##count(buffer, bufferSize, x, y)
#define ReadPixel_(type, count, buffer, bufferSize, x, y) ReadPixel__(type, count, buffer, bufferSize, x, y)
#define ReadPixel(buffer, x, y) ReadPixel_(buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, x, y)

// WritePixel(buffer, x, y, rgba), by way of PutPixel: gray is the mean of R, G and B; only 8-bit values are clamped; no
// image, no effect.
#define PutPixel__(type, count, buffer, bufferSize, x, y, rgba) \
    WritePixel_##type##_##count(buffer, bufferSize, x, y, rgba)
#define PutPixel_(type, count, buffer, bufferSize, x, y, rgba) PutPixel__(type, count, buffer, bufferSize, x, y, rgba)
#define PutPixel(buffer, x, y, rgba) PutPixel_(buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, x, y, rgba)

// ---- OpenCL image objects ------------------------------------------------------------------------------------------

#ifdef __IMAGE_SUPPORT__
__constant sampler_t kNearestPixel = CLK_NORMALIZED_COORDS_FALSE | CLK_ADDRESS_CLAMP_TO_EDGE | CLK_FILTER_NEAREST;

static inline float4 ReadPixel_sampler_(__read_only image2d_t buffer, int2 bufferSize, int x, int y) {
    return read_imagef(buffer, kNearestPixel, (int2)(x, y));
}

static inline void WritePixel_sampler_(__write_only image2d_t buffer, int2 bufferSize, int x, int y, float4 rgba) {
    write_imagef(buffer, (int2)(x, y), rgba);
}
#endif

// ---- Vectors and guards --------------------------------------------------------------------------------------------
static inline float dot3F4(float4 a, float4 b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}

static inline float Luminance(float4 rgba) {
    return dot3F4(rgba, WHITEPOINT);
}

// Whether all magnitudes are below 1e15, so that sums of their squares stay finite, and none is NaN. It looks at the
// bits: programs are built with relaxed math, where a compiler may take NaN and infinity for absent.
#define BITS_OF_1E15 0x58635fa9
static inline bool IsUsableFloat(float value) {
    return (as_int(value) & 0x7fffffff) < BITS_OF_1E15;
}

static inline bool IsUsable(float4 value) {
    const uint4 magnitude = as_uint4(value) & (uint4)(0x7fffffffu);
    return all(magnitude < (uint4)(BITS_OF_1E15)) != 0;
}

// The value, or the bound that it is beyond; the lower one for NaN.
static inline float Within(float low, float value, float high) {
    const float above = value > low ? value : low;
    return above < high ? above : high;
}

// Central processors must divide exactly: with relaxed arithmetic their compilers estimate quotients in vectors, but
// not in the last pixels of a row, and the same colour would come out in two ways.
static inline float Quotient(float dividend, float divisor) {
#if ON_CENTRAL_PROCESSOR
    return native_divide(dividend, divisor);
#else
    return dividend / divisor;
#endif
}

// ---- Powers --------------------------------------------------------------------------------------------------------

// The nearest whole number, for magnitudes up to 2^22: at 1.5 * 2^23 the digits of a float are whole numbers. The
// library's rint takes some thirty instructions on central processors.
#define NEAREST_INT(whole, value) (as_##whole((value) + 12582912.0f) - 0x4b400000)

// 2^n for n from -126 to 127.
#define POWER_OF_TWO(real, n) as_##real(((n) << 23) + 0x3f800000)

// For single values and vectors:
// - log2(1 + f) / f and (2^f - 1) / f as minimax polynomials, from -0.3 to 0.42 and from -0.5 to 0.5; their relative
//   errors are 2e-7 and 1e-7. Pairs of terms are independent of each other, which shortens the chain of operations.
// - The split of positive, normal numbers into 2^exponent * (1 + f) with 1 + f between sqrt(1/2) and sqrt(2).
// - Logarithms of positive, normal numbers and powers of two from -126 to 127. Graphics processors have instructions
//   for both; on central processors the polynomials take a fraction of the library functions' time.
#define DEFINE_POLYNOMIALS(real, whole)                                                              \
    static inline real Log2Quotient_##real(real f) {                                                 \
        const real f2 = f * f;                                                                       \
        const real low = (0.480931163f - 0.360263467f * f) * f2 + (1.4426949f - 0.721352458f * f);   \
        const real high = (0.235709637f - 0.149733275f * f) * f2 + (0.28686887f - 0.248322815f * f); \
        return high * (f2 * f2) + low;                                                               \
    }                                                                                                \
    static inline real Exp2Quotient_##real(real f) {                                                 \
        const real high = (0.00134068541f * f + 0.00967160519f) * f + 0.0555031002f;                 \
        return high * (f * f) + (0.240222409f * f + 0.693147242f);                                   \
    }                                                                                                \
    static inline real SplitMantissa_##real(real value, real* exponent) {                            \
        const whole n = (as_##whole(value) - 0x3f3504f3) >> 23;                                      \
        *exponent = convert_##real(n);                                                               \
        return as_##real(as_##whole(value) - (n << 23)) - 1.0f;                                      \
    }
DEFINE_POLYNOMIALS(float, int)

#if ON_CENTRAL_PROCESSOR
#define DEFINE_POWERS(real, whole)                             \
    static inline real Log2_##real(real value) {               \
        real exponent;                                         \
        const real f = SplitMantissa_##real(value, &exponent); \
        return Log2Quotient_##real(f) * f + exponent;          \
    }                                                          \
    static inline real Exp2_##real(real value) {               \
        const whole n = NEAREST_INT(whole, value);             \
        const real f = value - convert_##real(n);              \
        const real scale = POWER_OF_TWO(real, n);              \
        return Exp2Quotient_##real(f) * f * scale + scale;     \
    }
DEFINE_POLYNOMIALS(float8, int8)
#else
#define DEFINE_POWERS(real, whole)               \
    static inline real Log2_##real(real value) { \
        return native_log2(value);               \
    }                                            \
    static inline real Exp2_##real(real value) { \
        return native_exp2(value);               \
    }
#endif
DEFINE_POWERS(float, int)
DEFINE_POWERS(float8, int8)

// 2^value - 1, exact to the last digits also near 0.
static inline float Exp2Minus1(float value) {
    const int n = NEAREST_INT(int, value);
    const float f = value - (float)n;
    const float scale = POWER_OF_TWO(float, n);
    return Exp2Quotient_float(f) * f * scale + (scale - 1.0f);
}

// log2(1 + value) for values above -1. While the sum has the exponent 0, the value itself is the sum's mantissa less 1
// and has all its digits, which the sum has lost.
static inline float Log2Of1Plus(float value) {
    float exponent;
    const float mantissa = SplitMantissa_float(1.0f + value, &exponent);
    const float f = exponent == 0.0f ? value : mantissa;
    return Log2Quotient_float(f) * f + exponent;
}

// A value clamped to 0 ... 10000 and raised to 1 / gamma; 0 stays 0. A gamma of 1 changes nothing.
static inline float DisplayPower(float value, float gamma) {
    const float logarithm = Log2_float(Within(1.17549435e-38f, value, 10000.0f));
    const float power = Exp2_float(Within(-126.0f, logarithm * (1.0f / gamma), 127.0f));
    const float corrected = value > 0.0f ? power : 0.0f;
    return gamma == 1.0f ? value : corrected;
}

static inline float4 applyGammaCorrection(float gamma, float4 rgba) {
    return (float4)(DisplayPower(rgba.x, gamma), DisplayPower(rgba.y, gamma), DisplayPower(rgba.z, gamma), rgba.w);
}

// 1 - exp(-exposure * value).
static inline float ExposedFilm(float value, float exposure) {
    return -Exp2Minus1(Within(-126.0f, value * (exposure * -1.44269504f), 127.0f));
}

// ---- Tone curves ---------------------------------------------------------------------------------------------------

// Contrast about middle gray, exposure in stops, then on request the filmic curve of K. Narkowicz, "ACES Filmic Tone
// Mapping Curve" (2016). It is above 1 from 7.3 on; the upper bound only keeps its squares finite.
static inline float SimpleTone(float value, float exposure, float contrast, bool curved) {
    // Written so that a contrast of 1 adds an exact 0: dark pixels keep their last digits.
    const float stretched = value * contrast + 0.5f * (1.0f - contrast);
    const float exposed = stretched * exp2(Within(-126.0f, exposure, 127.0f));
    const float x = Within(0.0f, exposed, 10000.0f);
    const float curve = Quotient(x * (2.51f * x + 0.03f), (2.43f * x + 0.59f) * x + 0.14f);
    return curved ? (curve < 1.0f ? curve : 1.0f) : exposed;
}

// What a pixel's luminance asks its colour to be scaled by.
//
// With L = key * luminance the pixel is scaled by Ld / luminance, where Ld is L / (1 + L) mixed with L, or with a white
// point w, L (1 + L / w^2) / (1 + L). Ld holds L as a factor, so the luminance cancels and black stays black. Both
// curves are key * (constant + (1 - constant + slope * L) / (1 + L)). The bound on L keeps the products finite; the
// curve is flat long before.
static inline float ReinhardScale(float luminance, float key, float white_point, float burn) {
    const float lightness = Within(-1e28f, key * luminance, 1e28f);
    const float divisor = 1.0f + lightness;
    const float compression = divisor != 0.0f ? Quotient(1.0f, divisor) : 0.0f;
    const bool has_white = white_point >= 0.00001f;
    const float constant_part = has_white ? 0.0f : burn;
    const float slope = has_white ? 1.0f / (white_point * white_point) : 0.0f;
    return key * (constant_part + (1.0f - constant_part + slope * lightness) * compression);
}

// With Y the luminance over its average, ln(1 + Y) / Y over the other terms. That quotient is 1 at Y = 0, so black
// stays black. All logarithms have base 2, which cancels.
static inline float DragoScale(float luminance, float bias, float average, float maximum) {
    // No logarithm here has a value at -1 or below.
    const float adapted = Within(-0.99999994f, luminance * (1.0f / Within(1e-37f, average, 1e37f)), 1e37f);
    const float compression = fabs(adapted) > 1e-30f ? Quotient(Log2Of1Plus(adapted), adapted) : 1.44269504f;
    const float brightest = Within(-0.99999994f, maximum / average, 1e37f);

    // (luminance / maximum) ^ (ln bias / ln 0.5), for a negative base only where the exponent is whole.
    const float portion = Within(-1e37f, luminance * (1.0f / Within(1e-37f, maximum, 1e37f)), 1e37f);
    const float exponent = -Log2_float(bias > 1e-37f ? bias : 1e-37f);
    const float base = fabs(portion) > 1e-37f ? fabs(portion) : 1e-37f;
    const float magnitude = Exp2_float(Within(-120.0f, Log2_float(base) * exponent, 120.0f));
    const int whole = NEAREST_INT(int, exponent);
    const float sign_of_negative = (float)whole != exponent ? 0.0f : ((whole & 1) != 0 ? -1.0f : 1.0f);
    const float power = portion < 0.0f ? sign_of_negative * magnitude : magnitude;

    const float ramp = 2.0f + 8.0f * power;
    const float interpolation = Log2_float(ramp > 1e-37f ? ramp : 1e-37f);
    const float divisor = interpolation * Log2Of1Plus(brightest) * (average * 0.30103f);
    return divisor != 0.0f ? Quotient(compression, divisor) : 0.0f;
}

// sum + rgba * weight and a * b, component by component.
static inline float4 AddWeighted(float4 sum, float4 rgba, float weight) {
    return (float4)(sum.x + rgba.x * weight, sum.y + rgba.y * weight, sum.z + rgba.z * weight, sum.w + rgba.w * weight);
}

static inline float4 Multiplied(float4 a, float4 b) {
    return (float4)(a.x * b.x, a.y * b.y, a.z * b.z, a.w * b.w);
}

// RGB times a factor.
static inline float4 ScaleColor(float4 rgba, float factor) {
    return (float4)(rgba.x * factor, rgba.y * factor, rgba.z * factor, rgba.w);
}

// ---- Interpolation -------------------------------------------------------------------------------------------------

// Catmull-Rom spline from p1 (t = 0) to p2 (t = 1).
static inline float4 CubicInterp(float4 p0, float4 p1, float4 p2, float4 p3, float4 t) {
    const float4 a = 1.5f * (p1 - p2) + 0.5f * (p3 - p0);
    const float4 b = p0 - 2.5f * p1 + 2.0f * p2 - 0.5f * p3;
    const float4 c = 0.5f * (p2 - p0);
    return fma(fma(fma(a, t, b), t, c), t, p1);
}

// Bilinear sample at a position in pixels; whole numbers are centres of pixels, taps are clamped to the picture.
#define DEFINE_BILINEAR(type, pointer)                                                                              \
    static inline float4 BilinearAt_##type##_4(__global const pointer* buffer, int2 bufferSize, float2 position) {  \
        const float2 base = floor(position);                                                                        \
        const float2 f = position - base;                                                                           \
        const int2 last = bufferSize - 1;                                                                           \
        const int2 nearest = convert_int2(clamp(base, -1.0f, convert_float2(bufferSize)));                          \
        const int2 p = clamp(nearest, (int2)(0), last);                                                             \
        const int2 q = clamp(nearest + 1, (int2)(0), last);                                                         \
        const float4 top = ReadPixel_##type##_4(buffer, bufferSize, p.x, p.y) * (1.0f - f.x) +                      \
                           ReadPixel_##type##_4(buffer, bufferSize, q.x, p.y) * f.x;                                \
        const float4 bottom = ReadPixel_##type##_4(buffer, bufferSize, p.x, q.y) * (1.0f - f.x) +                   \
                              ReadPixel_##type##_4(buffer, bufferSize, q.x, q.y) * f.x;                             \
        return top * (1.0f - f.y) + bottom * f.y;                                                                   \
    }                                                                                                               \
    static inline float4 Sampler2DBilinear_##type##_4(__global const pointer* buffer, int2 bufferSize, float2 uv) { \
        return BilinearAt_##type##_4(buffer, bufferSize, uv * convert_float2(bufferSize) - 0.5f);                   \
    }
DEFINE_BILINEAR(half, half)
DEFINE_BILINEAR(float, float4)

// Sampler2DBilinear(buffer, uv) takes coordinates from 0 to 1, BilinearAt(buffer, position) pixels. Both exist for
// four-component half and float buffers only.
#define PASTE_SAMPLER_(name, type, count, buffer, bufferSize, position) \
    name##_##type##_##count(buffer, bufferSize, position)
#define PASTE_SAMPLER(name, type, count, buffer, bufferSize, position) \
    PASTE_SAMPLER_(name, type, count, buffer, bufferSize, position)
#define Sampler2DBilinear(buffer, uv) \
    PASTE_SAMPLER(Sampler2DBilinear, buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, uv)
#define BilinearAt(buffer, position) \
    PASTE_SAMPLER(BilinearAt, buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, position)
