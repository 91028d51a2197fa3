// Pixel access shared by every kernel, and a few small functions of general use.
//
// Three definitions describe each image argument N: N_COMP_TYPE (uint, half, float, sampler or none), N_COMP_NUM (1 to
// 4, empty with sampler, none with none) and N_Res, its (int2) size. The macros below paste them together where they
// are used, never while this text is read: a generated program may define them further down. An image that is computed
// instead of stored has no layout, and ReadPixel then pastes the names themselves, which such a program defines.

#define EXPAND(arg) arg

// 1 on central processors, where vectors within an item and the cache do what items side by side and local memory do
// elsewhere: a kernel may have a body for each.
#if defined(__x86_64__) || defined(__i386__) || defined(__aarch64__) || defined(__arm__)
#define ON_CENTRAL_PROCESSOR 1
#else
#define ON_CENTRAL_PROCESSOR 0
#endif

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
#define GROUP_COORD_1(limits)                           \
    ((int2)((int)((uint)get_global_id(0) % (uint)(limits).x), (int)((uint)get_global_id(0) / (uint)(limits).x)))
#define GROUP_COORD_GROUP_DIM_1D(limits) ((int2)((int)get_global_id(0), (int)get_global_id(1)))
#define GROUP_COORD_(flag, limits) GROUP_COORD_##flag(limits)
#define GROUP_COORD(flag, limits) GROUP_COORD_(flag, limits)

// Sets coord to the work item's pixel; items outside the limits leave the kernel.
#define GET_COORD(coord, limits)                                        \
    coord = GROUP_COORD(GROUP_DIM_1D, limits);                          \
    if (coord.x >= (limits).x || coord.y >= (limits).y) {               \
        return;                                                         \
    }

// ---- Reading -------------------------------------------------------------------------------------------------------

// Pixels are counted in the width of an address: a picture may hold more than 32 bits count.
static inline size_t PixelIndex(int2 bufferSize, int x, int y) {
    return (size_t)y * (size_t)bufferSize.x + (size_t)x;
}

static inline float4 ReadPixel_none_none(int buffer, int2 bufferSize, int x, int y) {
    return (float4)((float)buffer);
}

static inline float4 ReadPixel_uint_1(__global const uchar* buffer, int2 bufferSize, int x, int y) {
    const float gray = convert_float(buffer[PixelIndex(bufferSize, x, y)]) * (1.0f / 255.0f);
    return (float4)(gray, gray, gray, 1.0f);
}

static inline float4 ReadPixel_uint_2(__global const uchar2* buffer, int2 bufferSize, int x, int y) {
    const float2 value = convert_float2(buffer[PixelIndex(bufferSize, x, y)]) * (1.0f / 255.0f);
    return value.xxxy;
}

static inline float4 ReadPixel_uint_3(__global const uchar* buffer, int2 bufferSize, int x, int y) {
    const float3 value = convert_float3(vload3(PixelIndex(bufferSize, x, y), buffer)) * (1.0f / 255.0f);
    return (float4)(value, 1.0f);
}

static inline float4 ReadPixel_uint_4(__global const uchar4* buffer, int2 bufferSize, int x, int y) {
    return convert_float4(buffer[PixelIndex(bufferSize, x, y)]) * (1.0f / 255.0f);
}

static inline float4 ReadPixel_half_1(__global const half* buffer, int2 bufferSize, int x, int y) {
    const float gray = vload_half(PixelIndex(bufferSize, x, y), buffer);
    return (float4)(gray, gray, gray, 1.0f);
}

static inline float4 ReadPixel_half_2(__global const half* buffer, int2 bufferSize, int x, int y) {
    const float2 value = vload_half2(PixelIndex(bufferSize, x, y), buffer);
    return value.xxxy;
}

static inline float4 ReadPixel_half_3(__global const half* buffer, int2 bufferSize, int x, int y) {
    return (float4)(vload_half3(PixelIndex(bufferSize, x, y), buffer), 1.0f);
}

static inline float4 ReadPixel_half_4(__global const half* buffer, int2 bufferSize, int x, int y) {
    return vload_half4(PixelIndex(bufferSize, x, y), buffer);
}

static inline float4 ReadPixel_float_1(__global const float* buffer, int2 bufferSize, int x, int y) {
    const float gray = buffer[PixelIndex(bufferSize, x, y)];
    return (float4)(gray, gray, gray, 1.0f);
}

static inline float4 ReadPixel_float_2(__global const float2* buffer, int2 bufferSize, int x, int y) {
    const float2 value = buffer[PixelIndex(bufferSize, x, y)];
    return value.xxxy;
}

static inline float4 ReadPixel_float_3(__global const float* buffer, int2 bufferSize, int x, int y) {
    return (float4)(vload3(PixelIndex(bufferSize, x, y), buffer), 1.0f);
}

static inline float4 ReadPixel_float_4(__global const float4* buffer, int2 bufferSize, int x, int y) {
    return buffer[PixelIndex(bufferSize, x, y)];
}

// ReadPixel(buffer, x, y): the pixel as RGBA. 8-bit values become 0 ... 1, gray is repeated, a missing alpha is 1.
#define ReadPixel__(type, count, buffer, bufferSize, x, y) ReadPixel_##type##_##count(buffer, bufferSize, x, y)
#define ReadPixel_(type, count, buffer, bufferSize, x, y) ReadPixel__(type, count, buffer, bufferSize, x, y)
#define ReadPixel(buffer, x, y) ReadPixel_(buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, x, y)

// ---- Writing -------------------------------------------------------------------------------------------------------

static inline float Gray(float4 rgba) {
    return (rgba.x + rgba.y + rgba.z) * (1.0f / 3.0f);
}

// 0 ... 1 to 0 ... 255, rounded to nearest even: at 2^23 the digits of a float are whole numbers, and the last eight
// are the byte. Conversions that round and saturate are several times slower on central processors.
static inline uchar4 ToBytes(float4 value) {
    return convert_uchar4(as_uint4(clamp(value, 0.0f, 1.0f) * 255.0f + 8388608.0f));
}

static inline void WritePixel_none_none(int buffer, int2 bufferSize, int x, int y, float4 rgba) {
}

static inline void WritePixel_uint_1(__global uchar* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    buffer[PixelIndex(bufferSize, x, y)] = ToBytes((float4)(Gray(rgba))).x;
}

static inline void WritePixel_uint_2(__global uchar2* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    buffer[PixelIndex(bufferSize, x, y)] = ToBytes((float4)(Gray(rgba), rgba.w, 0.0f, 0.0f)).xy;
}

static inline void WritePixel_uint_3(__global uchar* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    vstore3(ToBytes(rgba).xyz, PixelIndex(bufferSize, x, y), buffer);
}

static inline void WritePixel_uint_4(__global uchar4* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    buffer[PixelIndex(bufferSize, x, y)] = ToBytes(rgba);
}

static inline void WritePixel_half_1(__global half* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    vstore_half(Gray(rgba), PixelIndex(bufferSize, x, y), buffer);
}

static inline void WritePixel_half_2(__global half* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    vstore_half2((float2)(Gray(rgba), rgba.w), PixelIndex(bufferSize, x, y), buffer);
}

static inline void WritePixel_half_3(__global half* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    vstore_half3(rgba.xyz, PixelIndex(bufferSize, x, y), buffer);
}

static inline void WritePixel_half_4(__global half* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    vstore_half4(rgba, PixelIndex(bufferSize, x, y), buffer);
}

static inline void WritePixel_float_1(__global float* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    buffer[PixelIndex(bufferSize, x, y)] = Gray(rgba);
}

static inline void WritePixel_float_2(__global float2* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    buffer[PixelIndex(bufferSize, x, y)] = (float2)(Gray(rgba), rgba.w);
}

static inline void WritePixel_float_3(__global float* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    vstore3(rgba.xyz, PixelIndex(bufferSize, x, y), buffer);
}

static inline void WritePixel_float_4(__global float4* buffer, int2 bufferSize, int x, int y, float4 rgba) {
    buffer[PixelIndex(bufferSize, x, y)] = rgba;
}

// WritePixel(buffer, x, y, rgba): gray is the mean of R, G and B; only 8-bit values are clamped; no image, no effect.
#define WritePixel__(type, count, buffer, bufferSize, x, y, rgba) \
    WritePixel_##type##_##count(buffer, bufferSize, x, y, rgba)
#define WritePixel_(type, count, buffer, bufferSize, x, y, rgba) \
    WritePixel__(type, count, buffer, bufferSize, x, y, rgba)
#define WritePixel(buffer, x, y, rgba) \
    WritePixel_(buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, x, y, rgba)

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

// Whether all components are below 1e15 in magnitude, so that sums of their squares stay finite, and none is NaN.
// It looks at the bits: programs are built with relaxed math, where a compiler may take NaN and infinity for absent.
static inline bool IsUsable(float4 value) {
    const uint4 magnitude = as_uint4(value) & (uint4)(0x7fffffffu);
    return all(magnitude < (uint4)(0x58635fa9u)) != 0;
}

// RGB divided by alpha, or as it is where alpha is 0. Finite for usable pixels.
static inline float3 DivideByAlpha(float4 rgba) {
    const float divisor = rgba.w != 0.0f ? rgba.w : 1.0f;
    return clamp(rgba.xyz / divisor, -1e15f, 1e15f);
}

// The vector scaled to length 1; a zero vector stays zero.
static inline float3 Normalized(float3 value) {
    return value * rsqrt(fmax(dot(value, value), 1e-36f));
}

// A coordinate outside 0 ... size - 1 reflected about the borders, the edge pixels repeated, until it is inside.
static inline int MirrorCoordinate(int value, int size) {
    if (value < 0 || value >= size) {
        const int period = 2 * size;
        value %= period;
        value = value < 0 ? value + period : value;
        value = value < size ? value : period - 1 - value;
    }
    return value;
}

// ---- Powers --------------------------------------------------------------------------------------------------------

// log2(1 + f) / f and (2^f - 1) / f as minimax polynomials, from -0.3 to 0.42 and from -0.5 to 0.5; their relative
// errors are 2e-7 and 1e-7.
static inline float4 Log2Quotient(float4 f) {
    // Pairs of terms are independent of each other, which shortens the chain of operations.
    const float4 f2 = f * f;
    const float4 low = (0.480931163f - 0.360263467f * f) * f2 + (1.4426949f - 0.721352458f * f);
    const float4 high = (0.235709637f - 0.149733275f * f) * f2 + (0.28686887f - 0.248322815f * f);
    return high * (f2 * f2) + low;
}

static inline float4 Exp2Quotient(float4 f) {
    const float4 high = (0.00134068541f * f + 0.00967160519f) * f + 0.0555031002f;
    return high * (f * f) + (0.240222409f * f + 0.693147242f);
}

// Splits positive, normal numbers into 2^exponent * (1 + f) with 1 + f between sqrt(1/2) and sqrt(2). Gives f.
static inline float4 SplitMantissa(float4 value, float4* exponent) {
    const int4 whole = (as_int4(value) - 0x3f3504f3) >> 23;
    *exponent = convert_float4(whole);
    return as_float4(as_int4(value) - (whole << 23)) - 1.0f;
}

// The nearest whole numbers, for magnitudes up to 2^22: at 1.5 * 2^23 the digits of a float are whole numbers. The
// library's rint takes some thirty instructions on central processors.
static inline int4 NearestInt(float4 value) {
    return as_int4(value + 12582912.0f) - 0x4b400000;
}

// 2^n for n from -126 to 127.
static inline float4 PowerOfTwo(int4 n) {
    return as_float4((n << 23) + 0x3f800000);
}

// Logarithms of positive, normal numbers and powers of two from -126 to 127. Graphics processors have instructions for
// both; on central processors the polynomials take a fraction of the library functions' time.
#if ON_CENTRAL_PROCESSOR
static inline float4 Log2(float4 value) {
    float4 exponent;
    const float4 f = SplitMantissa(value, &exponent);
    return Log2Quotient(f) * f + exponent;
}

static inline float4 Exp2(float4 value) {
    const int4 whole = NearestInt(value);
    const float4 f = value - convert_float4(whole);
    const float4 scale = PowerOfTwo(whole);
    return Exp2Quotient(f) * f * scale + scale;
}
#else
static inline float4 Log2(float4 value) {
    return native_log2(value);
}

static inline float4 Exp2(float4 value) {
    return native_exp2(value);
}
#endif

// 2^value - 1, exact to the last digits also near 0.
static inline float4 Exp2Minus1(float4 value) {
    const int4 whole = NearestInt(value);
    const float4 f = value - convert_float4(whole);
    const float4 scale = PowerOfTwo(whole);
    return Exp2Quotient(f) * f * scale + (scale - 1.0f);
}

// RGB clamped to 0 ... 10000 and raised to 1 / gamma; 0 stays 0. A gamma of 1 changes nothing.
static inline float4 applyGammaCorrection(float gamma, float4 rgba) {
    if (gamma == 1.0f) {
        return rgba;
    }
    const float4 base = clamp(rgba, 0.0f, 10000.0f);
    const float4 logarithm = Log2(fmax(base, 1.17549435e-38f));
    const float4 power = Exp2(clamp(logarithm * (1.0f / gamma), -126.0f, 127.0f));
    const float4 result = select((float4)(0.0f), power, base > (float4)(0.0f));
    return (float4)(result.xyz, rgba.w);
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
        const int2 nearest = convert_int2(clamp(base, -1.0f, convert_float2(bufferSize)));                             \
        const int2 p = clamp(nearest, (int2)(0), last);                                                                \
        const int2 q = clamp(nearest + 1, (int2)(0), last);                                                            \
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

