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
    float4 result = ReadPixel(srcBuffer, coord.x, coord.y);
    const float alpha = result.w;
    if (fabs(alpha) > 0.0001f) {
        result /= alpha;
    }
    result.w = 1.0f;
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// Linear conversion between RGB spaces by way of CIE XYZ.
__kernel void ColorSpaceKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), Mat4n3 cRgb2Xyz, Mat4n3 cXyz2Rgb) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    // The columns of the product of both matrices; it is the same for all pixels.
    const float4 red = (float4)(cRgb2Xyz.row0.x, cRgb2Xyz.row1.x, cRgb2Xyz.row2.x, 0.0f);
    const float4 green = (float4)(cRgb2Xyz.row0.y, cRgb2Xyz.row1.y, cRgb2Xyz.row2.y, 0.0f);
    const float4 blue = (float4)(cRgb2Xyz.row0.z, cRgb2Xyz.row1.z, cRgb2Xyz.row2.z, 0.0f);
    const float4 from_red = (float4)(dot3F4(cXyz2Rgb.row0, red), dot3F4(cXyz2Rgb.row1, red),
                                     dot3F4(cXyz2Rgb.row2, red), 0.0f);
    const float4 from_green = (float4)(dot3F4(cXyz2Rgb.row0, green), dot3F4(cXyz2Rgb.row1, green),
                                       dot3F4(cXyz2Rgb.row2, green), 0.0f);
    const float4 from_blue = (float4)(dot3F4(cXyz2Rgb.row0, blue), dot3F4(cXyz2Rgb.row1, blue),
                                      dot3F4(cXyz2Rgb.row2, blue), 0.0f);
    float4 result = from_red * color.x + from_green * color.y + from_blue * color.z;
    result.w = color.w;
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

__kernel void LinearToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cKey) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    float4 result = color * cKey;
    result.w = color.w;
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// ---- Kernels that stand here twice ---------------------------------------------------------------------------------
//
// The first, one pixel per item, keeps to the form in which it can be fused, and fusion takes it from the text wherever
// it runs. The second is for central processors: an item in 64 takes the pixels of all, eight side by side.

#if !ON_CENTRAL_PROCESSOR

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
    float4 result = SimpleTone(LowerHalf(color), cExposure, cContrast, cApplyToneMap != 0).lo;
    result.w = 1.0f;
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// E. Reinhard et al., "Photographic Tone Reproduction for Digital Images" (2002), the global operator.
__kernel void ReinhardToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cKey,
                                        float cWPoint, float cBurn) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    float4 result = color * ReinhardScale(Luminance(color), cKey, cWPoint, cBurn);
    result.w = color.w;
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// F. Drago et al., "Adaptive Logarithmic Mapping for Displaying High Contrast Scenes" (2003).
__kernel void DragoToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cBias,
                                     float avLum, float maxLum) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    float4 result = color * DragoScaleOf8((float8)(Luminance(color)), cBias, avLum, maxLum).s0;
    result.w = color.w;
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

__kernel void ExponentialToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cExposure,
                                           float cIntensity) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    float4 result = ExposedFilm(LowerHalf(color), cExposure).lo * cIntensity;
    result.w = color.w;
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

// Magnitude of the luminance gradient, by the 3 x 3 Sobel operator with the edge pixels repeated.
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

// With the components (p, q, r, t): (r / t) * (1 - (p / r) / (q / r)), where r cancels; 0 where a divisor is 0 or so
// small that its inverse overflows.
__kernel void ShadowCatcherKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const float4 layers = ReadPixel(srcBuffer, coord.x, coord.y);
    const bool divisible = all(fabs(layers.yzw) >= (float3)(1.17549435e-38f)) != 0;
    const float2 quotients = divisible ? layers.xz / layers.yw : (float2)(0.0f);
    const float matte = quotients.y * (1.0f - quotients.x);
    const float4 result = (float4)(matte, matte, matte, 1.0f);
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

#else

INLINED float16 GammaOf4(float16 pixels, float gamma) {
    if (gamma == 1.0f) {
        return pixels;
    }
    const float exponent = 1.0f / gamma;
    return WithAlphaOf(pixels, (float16)(DisplayPower(pixels.lo, exponent), DisplayPower(pixels.hi, exponent)));
}

__kernel void GammaCorrectionKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cGamma) {
    SHADE_ROWS(left = GammaOf4(left, cGamma);
               right = GammaOf4(right, cGamma))
}

INLINED float16 SimpleToneOf4(float16 pixels, float exposure, float contrast, bool curved) {
    return Opaque((float16)(SimpleTone(pixels.lo, exposure, contrast, curved),
                            SimpleTone(pixels.hi, exposure, contrast, curved)));
}

__kernel void SimpleToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cExposure,
                                      float cContrast, int cApplyToneMap) {
    SHADE_ROWS(left = SimpleToneOf4(left, cExposure, cContrast, cApplyToneMap != 0);
               right = SimpleToneOf4(right, cExposure, cContrast, cApplyToneMap != 0))
}

__kernel void ReinhardToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cKey,
                                        float cWPoint, float cBurn) {
    SHADE_ROWS(const float8 factors = ReinhardScaleOf8(LuminancesOf8(left, right), cKey, cWPoint, cBurn);
               left = ScaleColors(left, factors.lo);
               right = ScaleColors(right, factors.hi))
}

__kernel void DragoToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cBias,
                                     float avLum, float maxLum) {
    SHADE_ROWS(const float8 factors = DragoScaleOf8(LuminancesOf8(left, right), cBias, avLum, maxLum);
               left = ScaleColors(left, factors.lo);
               right = ScaleColors(right, factors.hi))
}

INLINED float16 ExposedOf4(float16 pixels, float exposure, float intensity) {
    const float16 colors = (float16)(ExposedFilm(pixels.lo, exposure), ExposedFilm(pixels.hi, exposure));
    return WithAlphaOf(pixels, colors * intensity);
}

__kernel void ExponentialToneMappingKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), float cExposure,
                                           float cIntensity) {
    SHADE_ROWS(left = ExposedOf4(left, cExposure, cIntensity);
               right = ExposedOf4(right, cExposure, cIntensity))
}

// Of eight pixels of a row: the differences of the luminances on both sides, and the sums, weighted 1, 2, 1.
INLINED void CompareLuminances(srcBufferType(srcBuffer), int2 at, int width, float8* differences, float8* sums) {
    float16 left;
    float16 right;
    ReadEight(srcBuffer, at, min(8, width - at.x), &left, &right);
    const float8 own = LuminancesOf8(left, right);
    const float8 before = (float8)(Luminance(ReadPixel(srcBuffer, max(at.x - 1, 0), at.y)), own.s0123, own.s456);
    const float8 behind = (float8)(own.s1234, own.s567, Luminance(ReadPixel(srcBuffer, min(at.x + 8, width - 1), at.y)));
    *differences = behind - before;
    *sums = before + 2.0f * own + behind;
}

#define SOBEL_EIGHTS 8
#define SOBEL_ROWS 8

// An item takes a block of 64 columns and 8 rows, row after row, and keeps what it found in two rows for the next.
__kernel void SobelOperatorKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    const int2 launched = LaunchedPixels(size);
    const int2 corner = (int2)((int)get_global_id(0), (int)get_global_id(1));
    if (corner.x % (8 * SOBEL_EIGHTS) != 0 || corner.y % SOBEL_ROWS != 0 || any(corner >= launched)) {
        return;
    }
    float8 differences[2][SOBEL_EIGHTS];
    float8 sums[2][SOBEL_EIGHTS];
    const int eights = min(SOBEL_EIGHTS, (launched.x - 1 - corner.x) / 8 + 1);
    const int rows = min(SOBEL_ROWS, launched.y - corner.y);
    for (int j = -1; j <= rows; ++j) {
        const int row = clamp(corner.y + j, 0, size.y - 1);
        const int slot = j & 1;
        for (int k = 0; k < eights; ++k) {
            const int x = corner.x + 8 * k;
            float8 difference;
            float8 sum;
            CompareLuminances(srcBuffer, (int2)(x, row), size.x, &difference, &sum);
            if (j > 0) {
                const float8 horizontal = differences[slot][k] + 2.0f * differences[1 - slot][k] + difference;
                const float8 vertical = sums[slot][k] - sum;
                const float8 lengths = native_sqrt(horizontal * horizontal + vertical * vertical);
                WriteEight(dstBuffer, (int2)(x, corner.y + j - 1), min(8, launched.x - x),
                           Opaque(lengths.lo.s0000111122223333), Opaque(lengths.hi.s0000111122223333));
            }
            differences[slot][k] = difference;
            sums[slot][k] = sum;
        }
    }
}

INLINED float8 ShadowMatteOf8(float16 left, float16 right) {
    const float16 numerators = (float16)(left.even, right.even);
    const float16 divisors = (float16)(left.odd, right.odd);
    const float8 p = numerators.even;
    const float8 r = numerators.odd;
    const float8 q = divisors.even;
    const float8 t = divisors.odd;
    const float8 least = fmin(fmin(fabs(q), fabs(r)), fabs(t));
    return least >= 1.17549435e-38f ? (r / t) * (1.0f - p / q) : 0.0f;
}

__kernel void ShadowCatcherKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)) {
    SHADE_ROWS(const float8 mattes = ShadowMatteOf8(left, right);
               left = Opaque(mattes.lo.s0000111122223333);
               right = Opaque(mattes.hi.s0000111122223333))
}

#endif
