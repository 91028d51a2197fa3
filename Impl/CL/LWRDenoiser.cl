// Local weighted regression, after B. Moon, N. Carr and S.-E. Yoon, "Adaptive Rendering Based on Weighted Local
// Regression" (2014): a pixel becomes the value there of a linear fit of colour over position, depth, normal and
// transition colour in its window. The features are first reduced to the directions in which they vary, then five
// bandwidths are tried, and the one that balances the fit's bias against its variance is used.
//
// Pixels whose colour holds NaN or infinity are left out of every window, and so are those of which another feature is
// unusable than at the centre (finite depth beside the infinite depth of a sky). An unusable variance counts as 0.
//
// A window is walked six times: the five bandwidths share one walk, and what a fit gives at its centre and the variance
// of that are linear and quadratic in sums of the same walk as its matrix.

#define BLOCK_SIZE 8

// Mean of the group's scales around an item, with Gaussian weights.
static inline float SmoothedScale(__local const float* tile, int2 place) {
    float scale_sum = 0.0f;
    float weight_sum = 0.0f;
    for (int y = max(place.y - 3, 0); y <= min(place.y + 3, BLOCK_SIZE - 1); ++y) {
        for (int x = max(place.x - 3, 0); x <= min(place.x + 3, BLOCK_SIZE - 1); ++x) {
            const float neighbour = tile[x + BLOCK_SIZE * y];
            const float2 distance_to = convert_float2((int2)(x, y) - place);
            const float weight = neighbour > 0.0f ? exp(-0.5f * dot(distance_to, distance_to)) : 0.0f;
            scale_sum += neighbour * weight;
            weight_sum += weight;
        }
    }
    return scale_sum / weight_sum;
}

__kernel void LWRDenoiserFirstPass(srcBufferType(srcBuffer), srcBufferType(vColorBuff), srcBufferType(transBuff),
                                   srcBufferType(vTransBuff), srcBufferType(normalsBuff), srcBufferType(vNormalsBuff),
                                   srcBufferType(depthBuff), srcBufferType(vDepthBuff), uint samples, int halfWindow,
                                   float bandwidthFactor, dstBufferType(dstBuffer)) {
    __local float tile[BLOCK_SIZE * BLOCK_SIZE];
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    const int2 coord = (int2)((int)get_global_id(0), (int)get_global_id(1));
    const int2 place = (int2)((int)get_local_id(0), (int)get_local_id(1));
    // Items outside the picture stay for the barrier; -1 keeps their tile entry out of the mean.
    const bool inside = coord.x < size.x && coord.y < size.y;

    Window window = WindowAt(coord, size, halfWindow, samples);
    Sample centre;
    Space space;
    space.rank = 0;
    float8 inverse_squares[BLOCKS];
    float scale = -1.0f;
    if (inside) {
        centre = ReadSample(IMAGES, &window, coord.x, coord.y);
        window.usable = centre.usable;
        ReduceFeatures(IMAGES, &window, &space);
        scale = 1.0f;
    }
    if (space.rank > 0) {
        const float3 reference = centre.color_usable ? centre.color : MeanColor(IMAGES, &window);
        float3 values[CANDIDATES];
        float variances[CANDIDATES];
        EstimateBandwidths(IMAGES, &window, &centre, &space, bandwidthFactor, inverse_squares);
        FitCandidates(IMAGES, &window, &centre, &space, inverse_squares, values, variances);
        scale = OptimalScale(values, variances, reference, space.rank, (float)samples);
    }
    tile[place.x + BLOCK_SIZE * place.y] = scale;
    barrier(CLK_LOCAL_MEM_FENCE);

    if (inside) {
        float3 result = (float3)(0.0f);
        if (space.rank > 0) {
            const float smoothed = SmoothedScale(tile, place);
            result = FitColor(IMAGES, &window, &centre, &space, inverse_squares, smoothed) * (float)samples;
        }
        WritePixel(dstBuffer, coord.x, coord.y, (float4)(result, 1.0f));
    }
}
