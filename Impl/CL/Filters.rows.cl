// Rows of eight pixels: on central processors one item in 64 takes the pixels of all, eight side by side in vectors.
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

// The pixels that a launch covers, which may be a part of the picture.
INLINED int2 LaunchedPixels(int2 size) {
    return (int2)((int)min((size_t)size.x, get_global_size(0)), (int)min((size_t)size.y, get_global_size(1)));
}

// Where the eight pixels numbered k of the item at the corner of an 8 x 8 block begin. The items of eight rows take as
// many as their blocks have, but in the order of the rows: memory is read as it lies.
INLINED int2 EightOfBlock(int2 corner, int2 launched, int k) {
    const int across = (launched.x - 1) / 8 + 1;
    const int eight = corner.x + k;
    return (int2)(8 * (eight % across), corner.y + eight / across);
}

// Eight pixels of a row, RGBA after RGBA. Only the first `count` lie in the picture: the last of them is repeated.
INLINED void ReadEight(srcBufferType(srcBuffer), int2 at, int count, float16* left, float16* right) {
    if (count == 8) {
        *left = ReadFour(srcBuffer, at.x, at.y);
        *right = ReadFour(srcBuffer, at.x + 4, at.y);
        return;
    }
    float4 pixels[8];
    for (int i = 0; i < 8; ++i) {
        pixels[i] = ReadPixel(srcBuffer, at.x + min(i, count - 1), at.y);
    }
    *left = vload16(0, (float*)pixels);
    *right = vload16(1, (float*)pixels);
}

INLINED void WriteEight(dstBufferType(dstBuffer), int2 at, int count, float16 left, float16 right) {
    if (count == 8) {
        WriteFour(dstBuffer, at.x, at.y, left);
        WriteFour(dstBuffer, at.x + 4, at.y, right);
        return;
    }
    float4 pixels[8];
    vstore16(left, 0, (float*)pixels);
    vstore16(right, 1, (float*)pixels);
    for (int i = 0; i < count; ++i) {
        WritePixel(dstBuffer, at.x + i, at.y, pixels[i]);
    }
}

// The body of a kernel that computes each pixel of dstBuffer from the same of srcBuffer: the statements `shade` find
// eight pixels in left and right and leave the results there.
#define SHADE_ROWS(shade)                                                     \
    const int2 launched = LaunchedPixels(GET_BUFFER_SIZE(dstBuffer));         \
    const int2 corner = (int2)((int)get_global_id(0), (int)get_global_id(1)); \
    if (corner.x % 8 != 0 || corner.y % 8 != 0 || any(corner >= launched)) {  \
        return;                                                               \
    }                                                                         \
    for (int k = 0; k < 8; ++k) {                                             \
        const int2 at = EightOfBlock(corner, launched, k);                    \
        if (at.y >= launched.y) {                                             \
            return;                                                           \
        }                                                                     \
        const int count = min(8, launched.x - at.x);                          \
        float16 left;                                                         \
        float16 right;                                                        \
        ReadEight(srcBuffer, at, count, &left, &right);                       \
        shade;                                                                \
        WriteEight(dstBuffer, at, count, left, right);                        \
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
