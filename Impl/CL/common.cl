// Pixel access shared by every kernel, and a few small functions of general use.
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
#define GET_COORD(coord, limits)                          \
    coord = GROUP_COORD(GROUP_DIM_1D, limits);            \
    if (coord.x >= (limits).x || coord.y >= (limits).y) { \
        return;                                           \
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

// Whether all magnitudes are below 1e15, so that sums of their squares stay finite, and none is NaN. It looks at the
// bits: programs are built with relaxed math, where a compiler may take NaN and infinity for absent.
#define BITS_OF_1E15 0x58635fa9
static inline bool IsUsable(float4 value) {
    const uint4 magnitude = as_uint4(value) & (uint4)(0x7fffffffu);
    return all(magnitude < (uint4)(BITS_OF_1E15)) != 0;
}

// ---- Powers --------------------------------------------------------------------------------------------------------
// Eight at a time, as many as the vectors of central processors hold; others drop the lanes that nobody reads.

// log2(1 + f) / f and (2^f - 1) / f as minimax polynomials, from -0.3 to 0.42 and from -0.5 to 0.5; their relative
// errors are 2e-7 and 1e-7.
static inline float8 Log2Quotient(float8 f) {
    // Pairs of terms are independent of each other, which shortens the chain of operations.
    const float8 f2 = f * f;
    const float8 low = (0.480931163f - 0.360263467f * f) * f2 + (1.4426949f - 0.721352458f * f);
    const float8 high = (0.235709637f - 0.149733275f * f) * f2 + (0.28686887f - 0.248322815f * f);
    return high * (f2 * f2) + low;
}

static inline float8 Exp2Quotient(float8 f) {
    const float8 high = (0.00134068541f * f + 0.00967160519f) * f + 0.0555031002f;
    return high * (f * f) + (0.240222409f * f + 0.693147242f);
}

// Splits positive, normal numbers into 2^exponent * (1 + f) with 1 + f between sqrt(1/2) and sqrt(2). Gives f.
static inline float8 SplitMantissa(float8 value, float8* exponent) {
    const int8 whole = (as_int8(value) - 0x3f3504f3) >> 23;
    *exponent = convert_float8(whole);
    return as_float8(as_int8(value) - (whole << 23)) - 1.0f;
}

// The nearest whole numbers, for magnitudes up to 2^22: at 1.5 * 2^23 the digits of a float are whole numbers. The
// library's rint takes some thirty instructions on central processors.
static inline int8 NearestInt(float8 value) {
    return as_int8(value + 12582912.0f) - 0x4b400000;
}

// 2^n for n from -126 to 127.
static inline float8 PowerOfTwo(int8 n) {
    return as_float8((n << 23) + 0x3f800000);
}

// Logarithms of positive, normal numbers and powers of two from -126 to 127. Graphics processors have instructions for
// both; on central processors the polynomials take a fraction of the library functions' time.
#if ON_CENTRAL_PROCESSOR
static inline float8 Log2Of8(float8 value) {
    float8 exponent;
    const float8 f = SplitMantissa(value, &exponent);
    return Log2Quotient(f) * f + exponent;
}

static inline float8 Exp2Of8(float8 value) {
    const int8 whole = NearestInt(value);
    const float8 f = value - convert_float8(whole);
    const float8 scale = PowerOfTwo(whole);
    return Exp2Quotient(f) * f * scale + scale;
}
#else
static inline float8 Log2Of8(float8 value) {
    return native_log2(value);
}

static inline float8 Exp2Of8(float8 value) {
    return native_exp2(value);
}
#endif

// A vector of eight whose lower half counts.
static inline float8 LowerHalf(float4 value) {
    float8 both;
    both.lo = value;
    both.hi = value;
    return both;
}

static inline float4 Log2(float4 value) {
    return Log2Of8(LowerHalf(value)).lo;
}

static inline float4 Exp2(float4 value) {
    return Exp2Of8(LowerHalf(value)).lo;
}

// 2^value - 1, exact to the last digits also near 0.
static inline float8 Exp2Minus1(float8 value) {
    const int8 whole = NearestInt(value);
    const float8 f = value - convert_float8(whole);
    const float8 scale = PowerOfTwo(whole);
    return Exp2Quotient(f) * f * scale + (scale - 1.0f);
}

// Values clamped to 0 ... 10000 and raised to a power; 0 stays 0.
static inline float8 DisplayPower(float8 value, float exponent) {
    const float8 base = clamp(value, 0.0f, 10000.0f);
    const float8 logarithm = Log2Of8(fmax(base, 1.17549435e-38f));
    const float8 power = Exp2Of8(clamp(logarithm * exponent, -126.0f, 127.0f));
    return select((float8)(0.0f), power, base > (float8)(0.0f));
}

// RGB clamped to 0 ... 10000 and raised to 1 / gamma; 0 stays 0. A gamma of 1 changes nothing.
static inline float4 applyGammaCorrection(float gamma, float4 rgba) {
    if (gamma == 1.0f) {
        return rgba;
    }
    return (float4)(DisplayPower(LowerHalf(rgba), 1.0f / gamma).s012, rgba.w);
}

// 1 - exp(-exposure * value).
static inline float8 ExposedFilm(float8 value, float exposure) {
    return -Exp2Minus1(clamp(value * (exposure * -1.44269504f), -126.0f, 127.0f));
}

// ---- Tone curves ---------------------------------------------------------------------------------------------------
// Contrast about middle gray, exposure in stops, then on request the filmic curve of K. Narkowicz, "ACES Filmic Tone
// Mapping Curve" (2016). It is above 1 from 7.3 on; the upper bound only keeps its squares finite.
static inline float8 SimpleTone(float8 value, float exposure, float contrast, bool curved) {
    // Written so that a contrast of 1 adds an exact 0: dark pixels keep their last digits.
    const float8 stretched = value * contrast + 0.5f * (1.0f - contrast);
    const float8 exposed = stretched * exp2(clamp(exposure, -126.0f, 127.0f));
    if (!curved) {
        return exposed;
    }
    const float8 x = clamp(exposed, 0.0f, 10000.0f);
    return clamp(x * (2.51f * x + 0.03f) / ((2.43f * x + 0.59f) * x + 0.14f), 0.0f, 1.0f);
}

// What a pixel's luminance asks its colour to be scaled by, for one luminance and for those of eight pixels.
//
// With L = key * luminance the pixel is scaled by Ld / luminance, where Ld is L / (1 + L) mixed with L, or with a white
// point w, L (1 + L / w^2) / (1 + L). Ld holds L as a factor, so the luminance cancels and black stays black. Both
// curves are key * (constant + (1 - constant + slope * L) / (1 + L)). The bound on L keeps the products finite; the
// curve is flat long before.
#define DEFINE_REINHARD_SCALE(name, real)                                                        \
    static inline real name(real luminance, float key, float white_point, float burn) {          \
        const real lightness = clamp(key * luminance, -1e28f, 1e28f);                            \
        const real divisor = 1.0f + lightness;                                                   \
        const real compression = divisor != 0.0f ? 1.0f / divisor : 0.0f;                        \
        const bool has_white = white_point >= 0.00001f;                                          \
        const float constant_part = has_white ? 0.0f : burn;                                     \
        const float slope = has_white ? 1.0f / (white_point * white_point) : 0.0f;               \
        return key * (constant_part + (1.0f - constant_part + slope * lightness) * compression); \
    }
DEFINE_REINHARD_SCALE(ReinhardScale, float)
DEFINE_REINHARD_SCALE(ReinhardScaleOf8, float8)

// log2(1 + value) for values above -1. While the sum has the exponent 0, the value itself is the sum's mantissa less 1
// and has all its digits, which the sum has lost.
static inline float8 Log2Of1Plus(float8 value) {
    float8 exponent;
    const float8 mantissa = SplitMantissa(1.0f + value, &exponent);
    const float8 f = exponent == 0.0f ? value : mantissa;
    return Log2Quotient(f) * f + exponent;
}

// With Y the luminance over its average, ln(1 + Y) / Y over the other terms. That quotient is 1 at Y = 0, so black
// stays black. All logarithms have base 2, which cancels.
static inline float8 DragoScaleOf8(float8 luminance, float bias, float average, float maximum) {
    // No logarithm here has a value at -1 or below.
    const float8 adapted = clamp(luminance / average, -0.99999994f, 1e37f);
    const float8 compression = fabs(adapted) > 1e-30f ? Log2Of1Plus(adapted) / adapted : 1.44269504f;
    const float8 brightest = (float8)(clamp(maximum / average, -0.99999994f, 1e37f));

    // (luminance / maximum) ^ (ln bias / ln 0.5), for a negative base only where the exponent is whole.
    const float8 portion = clamp(luminance / maximum, -1e37f, 1e37f);
    const float exponent = -Log2((float4)(fmax(bias, 1e-37f))).x;
    const float8 magnitude = Exp2Of8(clamp(Log2Of8(fmax(fabs(portion), 1e-37f)) * exponent, -120.0f, 120.0f));
    const int whole = NearestInt((float8)(exponent)).s0;
    const float sign_of_negative = (float)whole != exponent ? 0.0f : ((whole & 1) != 0 ? -1.0f : 1.0f);
    const float8 power = portion < 0.0f ? sign_of_negative * magnitude : magnitude;

    const float8 interpolation = Log2Of8(fmax(2.0f + 8.0f * power, 1e-37f));
    const float8 divisor = interpolation * Log2Of1Plus(brightest) * (average * 0.30103f);
    return divisor != 0.0f ? compression / divisor : 0.0f;
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

