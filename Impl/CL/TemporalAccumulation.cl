// Accumulation of successive frames: reprojection and blending of the history, and its exchange for the next frame. Each
// kernel is built only with a definition of its own, as the one of MotionBuffer.cl is, which shares the program.
//
// The history is seven slices of four floats per pixel. Everything stored there is finite: NaN, infinite and huge input
// values are replaced before they are used, positions and normals by zero (which starts a pixel afresh), colours by the
// mean of their usable neighbours.

#define FRAME_BLEND_ALPHA 0.2f
#define HALF_WINDOW 3
#define DENOM_EPS 0.00001f
#define HISTORY_FRAMES 4.0f
#define MAX_VARIANCE 1000.0f
#define CONSISTENT_COSINE 0.70710678f

#define SLICE_POSITIONS 0
#define SLICE_NORMALS 1
#define SLICE_MESH_IDS 2
#define SLICE_MOMENTS_IN 3
#define SLICE_COLORS_IN 4
#define SLICE_MOMENTS_OUT 5
#define SLICE_COLORS_OUT 6

#if defined(TEMPORAL_ACCUMULATION) || defined(COPY)
static inline float4 UsableOrZero(float4 value) {
    return IsUsable(value) ? value : (float4)(0.0f);
}

static inline float4 UnitNormal(float4 value) {
    const float4 usable = UsableOrZero(value);
    return (float4)(Normalized(usable.xyz), usable.w);
}

static inline __global float4* Slice(__global float4* buff, int2 size, int slice) {
    return buff + (size_t)slice * (size_t)size.x * (size_t)size.y;
}
#endif

#ifdef TEMPORAL_ACCUMULATION
// A pixel's colour; one that is not usable is the mean of its usable neighbours, black without any.
static inline float4 UsableColor(srcBufferType(colors), int2 size, int2 coord) {
    const float4 color = ReadPixel(colors, coord.x, coord.y);
    if (IsUsable(color)) {
        return color;
    }
    float4 sum = (float4)(0.0f);
    float count = 0.0f;
    for (int y = max(coord.y - 1, 0); y <= min(coord.y + 1, size.y - 1); ++y) {
        for (int x = max(coord.x - 1, 0); x <= min(coord.x + 1, size.x - 1); ++x) {
            const float4 neighbour = ReadPixel(colors, x, y);
            const bool usable = IsUsable(neighbour);
            sum += usable ? neighbour : (float4)(0.0f);
            count += usable ? 1.0f : 0.0f;
        }
    }
    return count > 0.0f ? sum / count : (float4)(0.0f, 0.0f, 0.0f, 1.0f);
}

// Length of the change of position from pixel to pixel, across and along.
static inline float PositionGradient(srcBufferType(positions), int2 size, int2 coord) {
    const int l = max(coord.x - 1, 0);
    const int r = min(coord.x + 1, size.x - 1);
    const int t = max(coord.y - 1, 0);
    const int b = min(coord.y + 1, size.y - 1);
    const float4 lt = UsableOrZero(ReadPixel(positions, l, t));
    const float4 rt = UsableOrZero(ReadPixel(positions, r, t));
    const float4 lb = UsableOrZero(ReadPixel(positions, l, b));
    const float4 rb = UsableOrZero(ReadPixel(positions, r, b));
    const float4 lm = UsableOrZero(ReadPixel(positions, l, coord.y));
    const float4 rm = UsableOrZero(ReadPixel(positions, r, coord.y));
    const float4 mt = UsableOrZero(ReadPixel(positions, coord.x, t));
    const float4 mb = UsableOrZero(ReadPixel(positions, coord.x, b));
    const float4 dx = lt - rt + 2.0f * (lm - rm) + lb - rb;
    const float4 dy = lt - lb + 2.0f * (mt - mb) + rt - rb;
    return length(dx * 0.25f) + length(dy * 0.25f);
}

static inline float3 DivideByWeight(float4 value) {
    const float4 usable = UsableOrZero(value);
    return usable.xyz / fmax(usable.w, 1.0f);
}

// Likeness of two vectors at a standard deviation of 0.1.
static inline float Likeness(float3 a, float3 b) {
    const float3 difference = (a - b) * 10.0f;
    return exp(-0.5f * dot(difference, difference));
}

// Luminance of the colours' variance over a window, weighted by how alike position and normal are.
static inline float SpatialVariance(srcBufferType(colors), srcBufferType(positions), srcBufferType(normals), int2 size,
                                    int2 coord) {
    const int2 low = max(coord - HALF_WINDOW, (int2)(0));
    const int2 high = min(coord + HALF_WINDOW, size - 1);
    const float3 normal = DivideByWeight(ReadPixel(normals, coord.x, coord.y));
    const float3 position = DivideByWeight(ReadPixel(positions, coord.x, coord.y));
    float weights[(2 * HALF_WINDOW + 1) * (2 * HALF_WINDOW + 1)];
    float3 mean = (float3)(0.0f);
    float sum = 0.0f;
    int i = 0;
    for (int y = low.y; y <= high.y; ++y) {
        for (int x = low.x; x <= high.x; ++x) {
            const float4 color = ReadPixel(colors, x, y);
            const float likeness = Likeness(DivideByWeight(ReadPixel(positions, x, y)), position) *
                                   Likeness(DivideByWeight(ReadPixel(normals, x, y)), normal);
            weights[i] = IsUsable(color) ? likeness : 0.0f;
            mean += DivideByWeight(color) * weights[i];
            sum += weights[i];
            ++i;
        }
    }
    sum = fmax(sum, DENOM_EPS);
    mean /= sum;
    float3 variance = (float3)(0.0f);
    i = 0;
    for (int y = low.y; y <= high.y; ++y) {
        for (int x = low.x; x <= high.x; ++x) {
            const float3 difference = mean - DivideByWeight(ReadPixel(colors, x, y));
            variance += difference * difference * weights[i];
            ++i;
        }
    }
    return dot(variance / sum, WHITEPOINT.xyz);
}

// The history's colour at a position in pixels. Taps without weight take no part; when all others belong to the same
// surface the sample is bilinear, otherwise the mean of those that do, and the current colour when none does.
static inline float4 HistoryColor(__global float4* buff, int2 size, float2 place, float3 normal, bool normals_absent,
                                  int mesh_id, float4 current) {
    const float2 base = floor(place);
    const float2 f = place - base;
    const int2 corner = convert_int2(base);
    float4 sum = (float4)(0.0f);
    int accepted = 0;
    int weighted = 0;
    for (int tap = 0; tap < 4; ++tap) {
        const int2 side = (int2)(tap & 1, tap >> 1);
        const float weight = (side.x != 0 ? f.x : 1.0f - f.x) * (side.y != 0 ? f.y : 1.0f - f.y);
        if (weight <= 0.0f) {
            continue;
        }
        const int2 p = clamp(corner + side, (int2)(0), size - 1);
        const float3 tap_normal = ReadPixel_float_4(Slice(buff, size, SLICE_NORMALS), size, p.x, p.y).xyz;
        const int tap_id = convert_int_sat_rte(ReadPixel_float_4(Slice(buff, size, SLICE_MESH_IDS), size, p.x, p.y).x);
        ++weighted;
        if ((normals_absent || dot(normal, tap_normal) > CONSISTENT_COSINE) && tap_id == mesh_id) {
            sum += ReadPixel_float_4(Slice(buff, size, SLICE_COLORS_IN), size, p.x, p.y);
            ++accepted;
        }
    }
    if (accepted == 0) {
        return current;
    }
    if (accepted == weighted) {
        return BilinearAt_float_4(Slice(buff, size, SLICE_COLORS_IN), size, place);
    }
    return sum / (float)accepted;
}

__kernel void TemporalAccumulation(srcBufferType(colors), srcBufferType(positions), srcBufferType(normals),
                                   srcBufferType(meshIds), srcBufferType(motions), dstBufferType(outVariances),
                                   dstBufferType(outColors), __global float4* buff) {
    const int2 size = GET_BUFFER_SIZE(positions);
    int2 coord;
    GET_COORD(coord, size);
    const bool normals_absent = IS_ABSENT(normals) != 0;
    const int mesh_id = convert_int_sat_rte(UsableOrZero(ReadPixel(meshIds, coord.x, coord.y)).x);
    const float3 position = UsableOrZero(ReadPixel(positions, coord.x, coord.y)).xyz;
    const float3 normal = UnitNormal(ReadPixel(normals, coord.x, coord.y)).xyz;
    const float4 color = UsableColor(colors, size, coord);
    const float4 shift = ReadPixel(motions, coord.x, coord.y);
    const bool reprojected = IsUsable(shift);

    // The previous position in pixels, inside the picture. Rounding must not move a pixel at rest off its centre.
    const float2 extent = convert_float2(size);
    const float2 moved = convert_float2(coord) + (reprojected ? shift.xy : (float2)(0.0f)) * extent;
    const float2 inside = clamp(moved, (float2)(-0.5f), extent - 0.5f);
    const float2 whole = rint(inside);
    const float2 place = select(inside, whole, fabs(inside - whole) < (float2)(0.001f));

    const float previous_id = BilinearAt_float_4(Slice(buff, size, SLICE_MESH_IDS), size, place).x;
    const float3 previous_position = BilinearAt_float_4(Slice(buff, size, SLICE_POSITIONS), size, place).xyz;
    const float3 previous_normal = BilinearAt_float_4(Slice(buff, size, SLICE_NORMALS), size, place).xyz;
    float4 moments = BilinearAt_float_4(Slice(buff, size, SLICE_MOMENTS_IN), size, place);
    float4 accumulated = HistoryColor(buff, size, place, normal, normals_absent, mesh_id, color);

    const float reach = 4.0f * PositionGradient(positions, size, coord);
    const bool position_consistent = length(position - previous_position) < reach && dot(position, position) > 0.0f &&
                                     dot(previous_position, previous_position) > 0.0f;
    const bool mesh_consistent = convert_int_sat_rte(previous_id) == mesh_id;
    const bool normal_consistent = normals_absent || dot(previous_normal, normal) > CONSISTENT_COSINE;

    const float luminance = Luminance(color);
    if (reprojected && position_consistent && mesh_consistent && normal_consistent && IsUsable(accumulated) &&
        IsUsable(moments)) {
        const float delta = (luminance - moments.x) * (luminance - moments.x);
        moments.x = (1.0f - FRAME_BLEND_ALPHA) * moments.x + FRAME_BLEND_ALPHA * luminance;
        moments.y = (1.0f - FRAME_BLEND_ALPHA) * moments.y + FRAME_BLEND_ALPHA * delta;
        moments.w += 1.0f;
        accumulated = (1.0f - FRAME_BLEND_ALPHA) * accumulated + FRAME_BLEND_ALPHA * color;
    } else {
        moments = (float4)(luminance, 0.0f, 0.0f, 1.0f);
        accumulated = color;
    }
    const float estimate = moments.w > HISTORY_FRAMES ? moments.y
                                                      : SpatialVariance(colors, positions, normals, size, coord);
    const float4 variance = (float4)(clamp(estimate, 0.0f, MAX_VARIANCE));
    WritePixel_float_4(Slice(buff, size, SLICE_MOMENTS_OUT), size, coord.x, coord.y, moments);
    WritePixel_float_4(Slice(buff, size, SLICE_COLORS_OUT), size, coord.x, coord.y, accumulated);
    WritePixel(outVariances, coord.x, coord.y, variance);
    WritePixel(outColors, coord.x, coord.y, accumulated);
}
#endif

#ifdef COPY
// Makes this frame's results the history of the next.
__kernel void SwapOutToIn(srcBufferType(positions), srcBufferType(normals), srcBufferType(meshIds),
                          __global float4* buff) {
    const int2 size = GET_BUFFER_SIZE(positions);
    int2 coord;
    GET_COORD(coord, size);
    const float4 position = UsableOrZero(ReadPixel(positions, coord.x, coord.y));
    const float4 normal = UnitNormal(ReadPixel(normals, coord.x, coord.y));
    const float4 mesh_id = UsableOrZero(ReadPixel(meshIds, coord.x, coord.y));
    const float4 moments = ReadPixel_float_4(Slice(buff, size, SLICE_MOMENTS_OUT), size, coord.x, coord.y);
    const float4 color = ReadPixel_float_4(Slice(buff, size, SLICE_COLORS_OUT), size, coord.x, coord.y);
    WritePixel_float_4(Slice(buff, size, SLICE_POSITIONS), size, coord.x, coord.y, position);
    WritePixel_float_4(Slice(buff, size, SLICE_NORMALS), size, coord.x, coord.y, normal);
    WritePixel_float_4(Slice(buff, size, SLICE_MESH_IDS), size, coord.x, coord.y, mesh_id);
    WritePixel_float_4(Slice(buff, size, SLICE_MOMENTS_IN), size, coord.x, coord.y, moments);
    WritePixel_float_4(Slice(buff, size, SLICE_COLORS_IN), size, coord.x, coord.y, color);
}
#endif
