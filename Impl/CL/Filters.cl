// Filters that compute a pixel from the input's pixel at the same place; Sobel also looks at its neighbours.
//
// All but the self-test can be fused, which rewrites them as plain text: a kernel declares its pixel, lets the
// coordinate macro fill it, calls nothing that is not in the shared text, and writes one plain variable at its end.

// Evaluates five functions on the first five floats, to measure the device's error. One item works: the others of the
// first column would overwrite its input when it runs in place.
__kernel void MathTestKernel(__global float* srcBuffer, __global float* dstBuffer) {
    if (get_global_id(0) != 0 || get_global_id(1) != 0) {
        return;
    }
    const float reciprocal = 1.0f / srcBuffer[0];
    const float square = srcBuffer[1] * srcBuffer[1];
    const float power = pow(srcBuffer[2], 2.5f);
    const float logarithm = log(srcBuffer[3]);
    const float exponential = exp(srcBuffer[4]);
    dstBuffer[0] = reciprocal;
    dstBuffer[1] = square;
    dstBuffer[2] = power;
    dstBuffer[3] = logarithm;
    dstBuffer[4] = exponential;
}

// Division by alpha; pixels that are all but transparent keep their colour.
__kernel void NormalizationKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const float divisor = fabs(color.w) > 0.0001f ? color.w : 1.0f;
    const float4 result =
        (float4)(Quotient(color.x, divisor), Quotient(color.y, divisor), Quotient(color.z, divisor), 1.0f);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// Linear conversion between RGB spaces by way of CIE XYZ.
__kernel void ColorSpaceKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), Mat4n3 cRgb2Xyz, Mat4n3 cXyz2Rgb) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    // The rows of the product of both matrices, which is the same for all pixels.
    const float4 red =
        cXyz2Rgb.row0.x * cRgb2Xyz.row0 + cXyz2Rgb.row0.y * cRgb2Xyz.row1 + cXyz2Rgb.row0.z * cRgb2Xyz.row2;
    const float4 green =
        cXyz2Rgb.row1.x * cRgb2Xyz.row0 + cXyz2Rgb.row1.y * cRgb2Xyz.row1 + cXyz2Rgb.row1.z * cRgb2Xyz.row2;
    const float4 blue =
        cXyz2Rgb.row2.x * cRgb2Xyz.row0 + cXyz2Rgb.row2.y * cRgb2Xyz.row1 + cXyz2Rgb.row2.z * cRgb2Xyz.row2;
    const float4 result = (float4)(dot3F4(red, color), dot3F4(green, color), dot3F4(blue, color), color.w);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

__kernel void LinearToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cKey) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const float4 result = ScaleColor(color, cKey);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

__kernel void GammaCorrectionKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cGamma) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const float4 result = applyGammaCorrection(cGamma, color);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

__kernel void SimpleToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cExposure,
                                      float cContrast, int cApplyToneMap) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const bool curved = cApplyToneMap != 0;
    const float4 result =
        (float4)(SimpleTone(color.x, cExposure, cContrast, curved), SimpleTone(color.y, cExposure, cContrast, curved),
                 SimpleTone(color.z, cExposure, cContrast, curved), 1.0f);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// E. Reinhard et al., "Photographic Tone Reproduction for Digital Images" (2002), the global operator.
__kernel void ReinhardToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cKey, float cWPoint,
                                        float cBurn) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const float4 result = ScaleColor(color, ReinhardScale(Luminance(color), cKey, cWPoint, cBurn));
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// F. Drago et al., "Adaptive Logarithmic Mapping for Displaying High Contrast Scenes" (2003).
__kernel void DragoToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cBias, float avLum,
                                     float maxLum) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const float4 result = ScaleColor(color, DragoScale(Luminance(color), cBias, avLum, maxLum));
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

__kernel void ExponentialToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cExposure,
                                           float cIntensity) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const float4 result =
        (float4)(ExposedFilm(color.x, cExposure) * cIntensity, ExposedFilm(color.y, cExposure) * cIntensity,
                 ExposedFilm(color.z, cExposure) * cIntensity, color.w);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// With the components (p, q, r, t): (r / t) * (1 - (p / r) / (q / r)), where r cancels; 0 where a divisor is 0 or so
// small that its inverse overflows.
__kernel void ShadowCatcherKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 layers = ReadPixel(srcBuffer, coord.x, coord.y);
    const float smallest = 1.17549435e-38f;
    const bool divisible = (fabs(layers.y) >= smallest) & (fabs(layers.z) >= smallest) & (fabs(layers.w) >= smallest);
    const float lit = 1.0f - Quotient(layers.x, divisible ? layers.y : 1.0f);
    const float matte = divisible ? Quotient(layers.z * lit, layers.w) : 0.0f;
    const float4 result = (float4)(matte, matte, matte, 1.0f);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// ---- Sobel operator: magnitude of the luminance gradient, with the edge pixels repeated -----------------------------
//
// The first form, one pixel per item, is the one that fusion takes from the text wherever it runs. In the second an
// item of a central processor takes a block and finds each luminance once.

#if !ON_CENTRAL_PROCESSOR

__kernel void SobelOperatorKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const int2 last = GET_BUFFER_SIZE(dstBuffer) - 1;
    const int top = min(coord.y + 1, last.y);
    const int bottom = max(coord.y - 1, 0);
    const int left = max(coord.x - 1, 0);
    const int right = min(coord.x + 1, last.x);

    const float4 leftTop = ReadPixel(srcBuffer, left, top);
    const float4 leftMiddle = ReadPixel(srcBuffer, left, coord.y);
    const float4 leftBottom = ReadPixel(srcBuffer, left, bottom);
    const float4 middleTop = ReadPixel(srcBuffer, coord.x, top);
    const float4 middleBottom = ReadPixel(srcBuffer, coord.x, bottom);
    const float4 rightTop = ReadPixel(srcBuffer, right, top);
    const float4 rightMiddle = ReadPixel(srcBuffer, right, coord.y);
    const float4 rightBottom = ReadPixel(srcBuffer, right, bottom);

    // Luminance is linear: the sums are taken over colours, and its weights applied once.
    const float4 across = (rightTop - leftTop) + 2.0f * (rightMiddle - leftMiddle) + (rightBottom - leftBottom);
    const float4 along = (leftBottom - leftTop) + 2.0f * (middleBottom - middleTop) + (rightBottom - rightTop);
    const float horizontal = Luminance(across);
    const float vertical = Luminance(along);
    const float magnitude = sqrt(horizontal * horizontal + vertical * vertical);
    const float4 result = (float4)(magnitude, magnitude, magnitude, 1.0f);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

#else

#define SOBEL_COLUMNS 64
#define SOBEL_ROWS 8

// Luminances of a part of a row, and of the pixels on both sides of each: vectors of them are read from the same place.
typedef struct {
    float left[SOBEL_COLUMNS + 2];
    float own[SOBEL_COLUMNS + 2];
    float right[SOBEL_COLUMNS + 2];
} SobelLine;

INLINED void FindLuminances(srcBufferType(srcBuffer), int row, int first, int count, int width, SobelLine* line) {
    line->left[1] = Luminance(ReadPixel(srcBuffer, max(first - 1, 0), row));
    line->right[count] = Luminance(ReadPixel(srcBuffer, min(first + count, width - 1), row));
    PIXELS_ARE_INDEPENDENT
    for (int i = 1; i <= count; ++i) {
        const float luminance = Luminance(ReadPixel(srcBuffer, first + i - 1, row));
        line->left[i + 1] = luminance;
        line->own[i] = luminance;
        line->right[i - 1] = luminance;
    }
}

__kernel void SobelOperatorKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)) {
    FIRST_OF_GROUP_ONLY
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    const int2 launched = LaunchedPixels(size);
    const int2 corner = (int2)((int)get_global_id(0), (int)get_global_id(1));
    if (corner.x % SOBEL_COLUMNS != 0 || corner.y % SOBEL_ROWS != 0 || any(corner >= launched)) {
        return;
    }
    const int columns = min(SOBEL_COLUMNS, launched.x - corner.x);
    const int behind = min(corner.y + SOBEL_ROWS, launched.y);
    SobelLine lines[3];
    FindLuminances(srcBuffer, max(corner.y - 1, 0), corner.x, columns, size.x, lines);
    FindLuminances(srcBuffer, corner.y, corner.x, columns, size.x, lines + 1);
    for (int y = corner.y; y < behind; ++y) {
        const int k = y - corner.y;
        const SobelLine* above = lines + k % 3;
        const SobelLine* own = lines + (k + 1) % 3;
        SobelLine* below = lines + (k + 2) % 3;
        FindLuminances(srcBuffer, min(y + 1, size.y - 1), corner.x, columns, size.x, below);
        PIXELS_ARE_INDEPENDENT
        for (int i = 1; i <= columns; ++i) {
            const float across = (above->right[i] - above->left[i]) + 2.0f * (own->right[i] - own->left[i]) +
                                 (below->right[i] - below->left[i]);
            const float along = (below->left[i] - above->left[i]) + 2.0f * (below->own[i] - above->own[i]) +
                                (below->right[i] - above->right[i]);
            const float magnitude = sqrt(across * across + along * along);
            PutPixel(dstBuffer, corner.x + i - 1, y, (float4)(magnitude, magnitude, magnitude, 1.0f));
        }
    }
}

#endif
