// Rows of eight pixels: on central processors one item in eight takes the pixels of all eight, side by side in vectors.
#if ON_CENTRAL_PROCESSOR

// ReadFour(buffer, x, y) and WriteFour(buffer, x, y, rgba): four neighbouring pixels, RGBA after RGBA.
#define DEFINE_READ_FOUR(layout, pointer)                                              \
    INLINED float16 ReadFour_##layout(pointer buffer, int2 bufferSize, int x, int y) { \
        return (float16)(ReadPixel_##layout(buffer, bufferSize, x, y),                 \
                         ReadPixel_##layout(buffer, bufferSize, x + 1, y),             \
                         ReadPixel_##layout(buffer, bufferSize, x + 2, y),             \
                         ReadPixel_##layout(buffer, bufferSize, x + 3, y));            \
    }
#define DEFINE_WRITE_FOUR(layout, pointer)                                                         \
    INLINED void WriteFour_##layout(pointer buffer, int2 bufferSize, int x, int y, float16 rgba) { \
        WritePixel_##layout(buffer, bufferSize, x, y, rgba.lo.lo);                                 \
        WritePixel_##layout(buffer, bufferSize, x + 1, y, rgba.lo.hi);                             \
        WritePixel_##layout(buffer, bufferSize, x + 2, y, rgba.hi.lo);                             \
        WritePixel_##layout(buffer, bufferSize, x + 3, y, rgba.hi.hi);                             \
    }
#define DEFINE_FOUR(layout, pointer)  \
    DEFINE_READ_FOUR(layout, pointer) \
    DEFINE_WRITE_FOUR(layout, pointer)
DEFINE_FOUR(uint_1, __global uchar*)
DEFINE_FOUR(uint_2, __global uchar2*)
DEFINE_FOUR(uint_3, __global uchar*)
DEFINE_FOUR(half_1, __global half*)
DEFINE_FOUR(half_2, __global half*)
DEFINE_FOUR(half_3, __global half*)
DEFINE_FOUR(half_4, __global half*)
DEFINE_FOUR(float_1, __global float*)
DEFINE_FOUR(float_2, __global float2*)
DEFINE_FOUR(float_3, __global float*)
#ifdef __IMAGE_SUPPORT__
DEFINE_READ_FOUR(sampler_, __read_only image2d_t)
DEFINE_WRITE_FOUR(sampler_, __write_only image2d_t)
#endif

INLINED float16 ReadFour_uint_4(__global uchar4* buffer, int2 bufferSize, int x, int y) {
    const uchar16 bytes = vload16(0, (__global uchar*)(buffer + PixelIndex(bufferSize, x, y)));
    return convert_float16(bytes) * (1.0f / 255.0f);
}

INLINED void WriteFour_uint_4(__global uchar4* buffer, int2 bufferSize, int x, int y, float16 rgba) {
    const uint16 digits = as_uint16(clamp(rgba, 0.0f, 1.0f) * 255.0f + 8388608.0f);
    vstore16(convert_uchar16(digits), 0, (__global uchar*)(buffer + PixelIndex(bufferSize, x, y)));
}

INLINED float16 ReadFour_float_4(__global float4* buffer, int2 bufferSize, int x, int y) {
    return vload16(0, (__global float*)(buffer + PixelIndex(bufferSize, x, y)));
}

INLINED void WriteFour_float_4(__global float4* buffer, int2 bufferSize, int x, int y, float16 rgba) {
    vstore16(rgba, 0, (__global float*)(buffer + PixelIndex(bufferSize, x, y)));
}

#define ReadFour__(type, count, buffer, bufferSize, x, y) ReadFour_##type##_##count(buffer, bufferSize, x, y)
#define ReadFour_(type, count, buffer, bufferSize, x, y) ReadFour__(type, count, buffer, bufferSize, x, y)
#define ReadFour(buffer, x, y) ReadFour_(buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, x, y)
#define WriteFour__(type, count, buffer, bufferSize, x, y, rgba) \
    WriteFour_##type##_##count(buffer, bufferSize, x, y, rgba)
#define WriteFour_(type, count, buffer, bufferSize, x, y, rgba) WriteFour__(type, count, buffer, bufferSize, x, y, rgba)
#define WriteFour(buffer, x, y, rgba) \
    WriteFour_(buffer##_COMP_TYPE, buffer##_COMP_NUM, buffer, buffer##_Res, x, y, rgba)

// The body of a kernel that computes each pixel of dstBuffer from the same of srcBuffer. The statements `shade` find
// eight pixels in left and right, RGBA after RGBA, and leave the results there. Where a row ends with fewer than eight,
// they are shaded one by one.
#define SHADE_ROW(shade)                                                     \
    const int2 size = GET_BUFFER_SIZE(dstBuffer);                            \
    const int2 first = (int2)((int)get_global_id(0), (int)get_global_id(1)); \
    if (first.x % 8 != 0 || first.x >= size.x || first.y >= size.y) {        \
        return;                                                              \
    }                                                                        \
    if (first.x + 8 <= size.x) {                                             \
        float16 left = ReadFour(srcBuffer, first.x, first.y);                \
        float16 right = ReadFour(srcBuffer, first.x + 4, first.y);           \
        shade;                                                               \
        WriteFour(dstBuffer, first.x, first.y, left);                        \
        WriteFour(dstBuffer, first.x + 4, first.y, right);                   \
        return;                                                              \
    }                                                                        \
    for (int x = first.x; x < size.x; ++x) {                                 \
        const float4 pixel = ReadPixel(srcBuffer, x, first.y);               \
        float16 left = (float16)(pixel, pixel, pixel, pixel);                \
        float16 right = left;                                                \
        shade;                                                               \
        WritePixel(dstBuffer, x, first.y, left.lo.lo);                       \
    }

INLINED float8 SumsOfPairs(float16 values) {
    return values.even + values.odd;
}

INLINED float8 LuminancesOf8(float16 left, float16 right) {
    const float16 weights = (float16)(WHITEPOINT, WHITEPOINT, WHITEPOINT, WHITEPOINT);
    return SumsOfPairs((float16)(SumsOfPairs(left * weights), SumsOfPairs(right * weights)));
}

INLINED float16 Opaque(float16 colors) {
    colors.s37bf = (float4)(1.0f);
    return colors;
}

INLINED float16 WithAlphaOf(float16 pixels, float16 colors) {
    const int4 alpha = (int4)(0, 0, 0, -1);
    return (int16)(alpha, alpha, alpha, alpha) ? pixels : colors;
}

// Each of four pixels' colour times its own factor.
INLINED float16 ScaleColors(float16 pixels, float4 factors) {
    return WithAlphaOf(pixels, pixels * factors.s0000111122223333);
}

#endif

