// Scaling by box average, bilinear or bicubic interpolation.
//
// Definitions: INTERPOLATION_OPERATOR (0 box, 1 bilinear, 2 bicubic; any other leaves the kernel out), CRATIO_X and
// CRATIO_Y, the whole source pixels per output pixel. The kernel keeps to the form in which it can be fused.

#if INTERPOLATION_OPERATOR >= 0 && INTERPOLATION_OPERATOR <= 2
__kernel void ResampleKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), int2 cSrcRes, int2 cDstRes,
                             float2 cRatio) {
    int2 coord;
    GET_COORD(coord, min(cDstRes, GET_BUFFER_SIZE(dstBuffer)));
    // A source that is computed instead of stored has the size 0 here, and no bounds but the given ones.
    const int2 stored = GET_BUFFER_SIZE(srcBuffer);
    const int2 extent = stored.x > 0 ? min(cSrcRes, stored) : cSrcRes;

#if INTERPOLATION_OPERATOR == 0
    const int2 first = (int2)(coord.x * CRATIO_X, coord.y * CRATIO_Y);
    const int2 behind = min(first + (int2)(CRATIO_X, CRATIO_Y), extent);
    float4 sum = (float4)(0.0f);
    for (int row = first.y; row < behind.y; ++row) {
        for (int column = first.x; column < behind.x; ++column) {
            sum += ReadPixel(srcBuffer, column, row);
        }
    }
    const int2 block = max(behind - first, (int2)(0));
    const float count = (float)block.x * (float)block.y;
    const float4 result = count > 0.0f ? sum / count : (float4)(0.0f, 0.0f, 0.0f, 1.0f);
#else
    const int2 last = max(extent - 1, (int2)(0));
    // The ratio of a side of one output pixel divides by zero: that pixel takes the first of the source.
    const float2 position = (float2)(cDstRes.x > 1 ? cRatio.x * (float)coord.x : 0.0f,
                                     cDstRes.y > 1 ? cRatio.y * (float)coord.y : 0.0f);
    const float2 whole = trunc(position);
    const float2 t = position - whole;
    const int2 q = clamp(convert_int2_sat(whole), (int2)(0), last);
    const int2 q1 = min(q + 1, last);
#if INTERPOLATION_OPERATOR == 1
    const float4 upper = mix(ReadPixel(srcBuffer, q.x, q.y), ReadPixel(srcBuffer, q1.x, q.y), t.x);
    const float4 lower = mix(ReadPixel(srcBuffer, q.x, q1.y), ReadPixel(srcBuffer, q1.x, q1.y), t.x);
    const float4 result = mix(upper, lower, t.y);
#else
    const int2 q0 = max(q - 1, (int2)(0));
    const int2 q2 = min(q + 2, last);
    const int rows[4] = {q0.y, q.y, q1.y, q2.y};
    float4 splines[4];
    for (int i = 0; i < 4; ++i) {
        const int row = rows[i];
        splines[i] = CubicInterp(ReadPixel(srcBuffer, q0.x, row), ReadPixel(srcBuffer, q.x, row),
                                 ReadPixel(srcBuffer, q1.x, row), ReadPixel(srcBuffer, q2.x, row), (float4)(t.x));
    }
    const float4 result = CubicInterp(splines[0], splines[1], splines[2], splines[3], (float4)(t.y));
#endif
#endif
    WritePixel(dstBuffer, coord.x, coord.y, result);
}
#endif
