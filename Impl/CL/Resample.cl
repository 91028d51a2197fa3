// Scaling by box average, bilinear or bicubic interpolation.
//
// Definitions: INTERPOLATION_OPERATOR (0 box, 1 bilinear, 2 bicubic; any other leaves the kernel out), CRATIO_X and
// CRATIO_Y, the whole source pixels per output pixel.
//
// The kernel stands here twice. The first, one pixel per item, keeps to the form in which it can be fused, and fusion
// takes it from the text wherever it runs. The second takes 64 pixels per item on central processors.

#if INTERPOLATION_OPERATOR >= 0 && INTERPOLATION_OPERATOR <= 2
#if !ON_CENTRAL_PROCESSOR

__kernel void ResampleKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), int2 cSrcRes, int2 cDstRes,
                             float2 cRatio) {
    int2 coord;
    GET_COORD(coord, min(cDstRes, GET_BUFFER_SIZE(dstBuffer)));
    // A source that is computed instead of stored has the size 0 here, and no bounds but the given ones.
    const int2 stored = GET_BUFFER_SIZE(srcBuffer);
    const int2 extent = max(stored.x > 0 ? min(cSrcRes, stored) : cSrcRes, (int2)(0));

#if INTERPOLATION_OPERATOR == 0
    // Sizes that a host overrides may be of any magnitude, and so their ratios.
    const int2 first =
        (int2)((int)min((long)coord.x * CRATIO_X, (long)extent.x), (int)min((long)coord.y * CRATIO_Y, (long)extent.y));
    const int2 behind =
        (int2)((int)min((long)first.x + CRATIO_X, (long)extent.x), (int)min((long)first.y + CRATIO_Y, (long)extent.y));
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
    const float2 position =
        (float2)(cDstRes.x > 1 ? cRatio.x * (float)coord.x : 0.0f, cDstRes.y > 1 ? cRatio.y * (float)coord.y : 0.0f);
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

#else

#define BLOCK_SIDE 8
// The beginning of a kernel: the item at the corner of a block goes on, with the part of the output to write and the
// part of the source to read.
#define BEGIN_BLOCK                                                                               \
    FIRST_OF_GROUP_ONLY                                                                           \
    const int2 limits = min(cDstRes, GET_BUFFER_SIZE(dstBuffer));                                 \
    const int2 corner = (int2)((int)get_global_id(0), (int)get_global_id(1));                     \
    if (corner.x % BLOCK_SIDE != 0 || corner.y % BLOCK_SIDE != 0 || any(corner >= limits) != 0) { \
        return;                                                                                   \
    }                                                                                             \
    const int2 extent = max(min(cSrcRes, GET_BUFFER_SIZE(srcBuffer)), (int2)(0));

#if INTERPOLATION_OPERATOR == 0
// Where the source pixels of an output column or row begin; sizes that a host overrides may be of any magnitude.
static inline int SquareStart(int position, long ratio, int extent) {
    return (int)min((long)position * ratio, (long)extent);
}

INLINED float4 AverageOf(srcBufferType(srcBuffer), int left, int right, int top, int below) {
    const float count = (float)(right - left) * (float)(below - top);
    float4 sum = (float4)(0.0f);
    for (int row = top; row < below; ++row) {
        for (int column = left; column < right; ++column) {
            sum += ReadPixel(srcBuffer, column, row);
        }
    }
    return count > 0.0f ? sum / count : (float4)(0.0f, 0.0f, 0.0f, 1.0f);
}

// An item takes as many pixels as a block has, but in the order of the rows: they share nothing, and the source is read
// as it lies.
__kernel void ResampleKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), int2 cSrcRes, int2 cDstRes,
                             float2 cRatio) {
    BEGIN_BLOCK
    const int across = (limits.x - 1) / BLOCK_SIDE + 1;
    const long block = (long)(corner.y / BLOCK_SIDE) * across + corner.x / BLOCK_SIDE;
    long place = block * BLOCK_SIDE * BLOCK_SIDE;
    const long behind = min(place + BLOCK_SIDE * BLOCK_SIDE, (long)limits.x * limits.y);
    while (place < behind) {
        const int y = (int)(place / limits.x);
        const int first = (int)(place % limits.x);
        const int after = (int)min(first + (behind - place), (long)limits.x);
        const int top = SquareStart(y, CRATIO_Y, extent.y);
        const int below = SquareStart(y + 1, CRATIO_Y, extent.y);
#if CRATIO_X > 0 && CRATIO_X <= 64 && CRATIO_Y > 0 && CRATIO_Y <= 64
        const bool is_whole = (long)after * CRATIO_X <= extent.x && below - top == CRATIO_Y;
#else
        const bool is_whole = false;
#endif
        for (int x = first; x < after; ++x) {
            if (is_whole) {
                // Of known size: the compiler unrolls it.
                const int left = x * CRATIO_X;
                WritePixel(dstBuffer, x, y, AverageOf(srcBuffer, left, left + CRATIO_X, top, top + CRATIO_Y));
            } else {
                const int left = SquareStart(x, CRATIO_X, extent.x);
                const int right = SquareStart(x + 1, CRATIO_X, extent.x);
                WritePixel(dstBuffer, x, y, AverageOf(srcBuffer, left, right, top, below));
            }
        }
        place += after - first;
    }
}

#else

#define TAPS (2 * INTERPOLATION_OPERATOR)

// Where the samples of one column or row lie in the source, and their weights.
typedef struct {
    int place[TAPS];
    float weight[TAPS];
} Samples;

static inline void FindSamples(Samples* samples, int position, int size, float ratio, int extent) {
    // The ratio of a side of one output pixel divides by zero: that pixel takes the first of the source.
    const float exact = size > 1 ? ratio * (float)position : 0.0f;
    const int last = max(extent - 1, 0);
    const float whole = trunc(exact);
    const float t = exact - whole;
    const int q = clamp(convert_int_sat(whole), 0, last);
#if INTERPOLATION_OPERATOR == 1
    samples->place[0] = q;
    samples->place[1] = min(q + 1, last);
    samples->weight[0] = 1.0f - t;
    samples->weight[1] = t;
#else
    // The factors of the four points in CubicInterp.
    samples->place[0] = max(q - 1, 0);
    samples->place[1] = q;
    samples->place[2] = min(q + 1, last);
    samples->place[3] = min(q + 2, last);
    samples->weight[0] = ((-0.5f * t + 1.0f) * t - 0.5f) * t;
    samples->weight[1] = (1.5f * t - 2.5f) * t * t + 1.0f;
    samples->weight[2] = ((-1.5f * t + 2.0f) * t + 0.5f) * t;
    samples->weight[3] = (0.5f * t - 0.5f) * t * t;
#endif
}

// One source row at the columns of a block.
INLINED void InterpolateRow(srcBufferType(srcBuffer), const Samples* across, int row, float4* line) {
    for (int i = 0; i < BLOCK_SIDE; ++i) {
        float4 sum = ReadPixel(srcBuffer, across[i].place[0], row) * across[i].weight[0];
        for (int k = 1; k < TAPS; ++k) {
            sum += ReadPixel(srcBuffer, across[i].place[k], row) * across[i].weight[k];
        }
        line[i] = sum;
    }
}

__kernel void ResampleKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer), int2 cSrcRes, int2 cDstRes,
                             float2 cRatio) {
    BEGIN_BLOCK
    // All eight columns are computed: loops of known length. Those behind the picture repeat its last one.
    Samples across[BLOCK_SIDE];
    for (int i = 0; i < BLOCK_SIDE; ++i) {
        FindSamples(across + i, min(corner.x + i, limits.x - 1), cDstRes.x, cRatio.x, extent.x);
    }
    // Source rows, interpolated at the columns of the block. Rows of one output row are neighbours: each has a place of
    // its own until another one needs it.
    float16 lines[TAPS][BLOCK_SIDE / 4];
    int line_rows[TAPS];
    for (int i = 0; i < TAPS; ++i) {
        line_rows[i] = -1;
    }
    for (int y = corner.y; y < min(corner.y + BLOCK_SIDE, limits.y); ++y) {
        Samples down;
        FindSamples(&down, y, cDstRes.y, cRatio.y, extent.y);
        float16 sums[BLOCK_SIDE / 4];
        for (int i = 0; i < BLOCK_SIDE / 4; ++i) {
            sums[i] = (float16)(0.0f);
        }
        for (int j = 0; j < TAPS; ++j) {
            const int row = down.place[j];
            float16* line = lines[row % TAPS];
            if (line_rows[row % TAPS] != row) {
                line_rows[row % TAPS] = row;
                InterpolateRow(srcBuffer, across, row, (float4*)line);
            }
            for (int i = 0; i < BLOCK_SIDE / 4; ++i) {
                sums[i] += line[i] * down.weight[j];
            }
        }
        const float4* pixels = (const float4*)sums;
        for (int i = 0; i < min(BLOCK_SIDE, limits.x - corner.x); ++i) {
            WritePixel(dstBuffer, corner.x + i, y, pixels[i]);
        }
    }
}

#endif
#endif
#endif
