// Scratch memory holds two arrays of four floats per pixel: the edges, and behind them the blending weights.

#define MLAA_MAX_SEARCH_STEPS 15
#define MAX_DISTANCE 33

#ifdef EDGE_DETECTION
// Marks edges towards the left (x) and the upper (y) neighbour, where mesh, luminance, depth or normal changes.
__kernel void EdgeDetectionMLAA(srcBufferType(colorTex), srcBufferType(mesh_id), srcBufferType(normal),
                                srcBufferType(depthTex), dst_float_4 out_buffer, float colorTreshold,
                                float normalTreshold, float depthTreshold) {
    const int2 size = GET_BUFFER_SIZE(colorTex);
    int2 coord;
    GET_COORD(coord, size);
    const int left = max(coord.x - 1, 0);
    const int top = max(coord.y - 1, 0);

    const float mesh = ReadPixel(mesh_id, coord.x, coord.y).x;
    bool edge_left = mesh != ReadPixel(mesh_id, left, coord.y).x;
    bool edge_top = mesh != ReadPixel(mesh_id, coord.x, top).x;

    // The method compares luminance as vectors of four equal components: twice the difference.
    const float luminance = Luminance(ReadPixel(colorTex, coord.x, coord.y));
    edge_left |= 2.0f * fabs(luminance - Luminance(ReadPixel(colorTex, left, coord.y))) > colorTreshold;
    edge_top |= 2.0f * fabs(luminance - Luminance(ReadPixel(colorTex, coord.x, top))) > colorTreshold;

    const float depth = ReadPixel(depthTex, coord.x, coord.y).z;
    edge_left |= fabs(depth - ReadPixel(depthTex, left, coord.y).z) > depthTreshold;
    edge_top |= fabs(depth - ReadPixel(depthTex, coord.x, top).z) > depthTreshold;

    const float3 direction = Normalized(ReadPixel(normal, coord.x, coord.y).xyz);
    if (dot(direction, direction) > 0.0f) {
        edge_left |= dot(direction, Normalized(ReadPixel(normal, left, coord.y).xyz)) < normalTreshold;
        edge_top |= dot(direction, Normalized(ReadPixel(normal, coord.x, top).xyz)) < normalTreshold;
    }
    // The neighbour of the first column and row is the pixel itself.
    edge_left &= coord.x > 0;
    edge_top &= coord.y > 0;
    const float4 edges = (float4)(edge_left ? 1.0f : 0.0f, edge_top ? 1.0f : 0.0f, 0.0f, 0.0f);
    WritePixel_float_4(out_buffer, size, coord.x, coord.y, edges);
}
#endif

#ifdef WEIGH_CALC
// Distance in pixels to the end of the edge, at most 30, in the direction of stride (two pixels). A sample between two
// pixels is 1 while both have the edge; the last one tells whether the first of the two still has it.
static inline float SearchDistance(__global const float4* edgesTex, int2 size, float2 start, float2 stride,
                                   bool vertical) {
    float2 position = start + 0.75f * stride;
    float edge = 0.0f;
    int i = 0;
    for (; i < MLAA_MAX_SEARCH_STEPS; ++i) {
        const float4 sample = BilinearAt_float_4(edgesTex, size, position);
        edge = vertical ? sample.x : sample.y;
        if (edge < 0.9f) {
            break;
        }
        position += stride;
    }
    return fmin(2.0f * (float)i + 2.0f * edge, 2.0f * MLAA_MAX_SEARCH_STEPS);
}

// Coverage beside an edge line, by the distances to its ends and by what crosses it there (0, 1/4, 1/2, 3/4 or 1).
static inline float2 CoveredAreas(__global const uchar2* areaTex, float2 distances, float2 crossings) {
    const int2 block = convert_int2(rint(crossings * 4.0f));
    const int2 texel = clamp(MAX_DISTANCE * block + convert_int2(distances), (int2)(0), (int2)(5 * MAX_DISTANCE - 1));
    return convert_float2(areaTex[texel.x + 5 * MAX_DISTANCE * texel.y]) * (1.0f / 255.0f);
}

// Follows the edges of a pixel to both ends. Positions are counted in pixels, where all samples fall on exact quarters.
__kernel void BlendingWeightCalculationMLAA(src_float_4 edgesTex, src_uint_2 areaTex, int2 cSrcRes,
                                            dst_float_4 out_buffer) {
    int2 coord;
    GET_COORD(coord, cSrcRes);
    const float2 centre = convert_float2(coord);
    const float4 edges = ReadPixel_float_4(edgesTex, cSrcRes, coord.x, coord.y);
    float4 weights = (float4)(0.0f);

    if (edges.y > 0.0f) {
        const float left = SearchDistance(edgesTex, cSrcRes, centre, (float2)(-2.0f, 0.0f), false);
        const float right = SearchDistance(edgesTex, cSrcRes, centre, (float2)(2.0f, 0.0f), false);
        const float first = BilinearAt_float_4(edgesTex, cSrcRes, centre + (float2)(-left, -0.25f)).x;
        const float second = BilinearAt_float_4(edgesTex, cSrcRes, centre + (float2)(right + 1.0f, -0.25f)).x;
        weights.xy = CoveredAreas(areaTex, (float2)(left, right), (float2)(first, second));
    }
    if (edges.x > 0.0f) {
        const float up = SearchDistance(edgesTex, cSrcRes, centre, (float2)(0.0f, -2.0f), true);
        const float down = SearchDistance(edgesTex, cSrcRes, centre, (float2)(0.0f, 2.0f), true);
        const float first = BilinearAt_float_4(edgesTex, cSrcRes, centre + (float2)(-0.25f, -up)).y;
        const float second = BilinearAt_float_4(edgesTex, cSrcRes, centre + (float2)(-0.25f, down + 1.0f)).y;
        weights.zw = CoveredAreas(areaTex, (float2)(up, down), (float2)(first, second));
    }
    __global float4* weightTex = out_buffer + (size_t)cSrcRes.x * (size_t)cSrcRes.y;
    WritePixel_float_4(weightTex, cSrcRes, coord.x, coord.y, weights);
}
#endif

#ifdef BLENDING
// Weights of a pixel; outside the picture there are none.
static inline float4 WeightsAt(__global const float4* blendTex, int2 size, int column, int row) {
    if (column >= size.x || row >= size.y) {
        return (float4)(0.0f);
    }
    return ReadPixel_float_4(blendTex + (size_t)size.x * (size_t)size.y, size, column, row);
}

// Mixes a pixel with its four neighbours by the areas that the edges on its four sides give.
__kernel void NeighborhoodBlendingMLAA(srcBufferType(colorTex), dstBufferType(out_buffer), src_float_4 blendTex) {
    const int2 size = GET_BUFFER_SIZE(colorTex);
    int2 coord;
    GET_COORD(coord, min(size, GET_BUFFER_SIZE(out_buffer)));
    const float4 own = WeightsAt(blendTex, size, coord.x, coord.y);
    const float4 areas = (float4)(own.x, WeightsAt(blendTex, size, coord.x, coord.y + 1).y, own.z,
                                  WeightsAt(blendTex, size, coord.x + 1, coord.y).w);
    const float4 w = areas * areas * areas;
    const float sum = w.x + w.y + w.z + w.w;
    float4 result;
    if (sum < 0.00001f) {
        result = ReadPixel(colorTex, coord.x, coord.y);
    } else {
        const float2 centre = convert_float2(coord);
        result = (BilinearAt(colorTex, centre + (float2)(0.0f, -areas.x)) * w.x +
                  BilinearAt(colorTex, centre + (float2)(0.0f, areas.y)) * w.y +
                  BilinearAt(colorTex, centre + (float2)(-areas.z, 0.0f)) * w.z +
                  BilinearAt(colorTex, centre + (float2)(areas.w, 0.0f)) * w.w) /
                 sum;
    }
    WritePixel(out_buffer, coord.x, coord.y, result);
}
#endif
