// Separable Gaussian blur: a horizontal pass from the input into four floats per pixel, and a vertical pass from there
// into the output. Borders mirror the picture, the edge pixels repeated.
//
// Definitions: cRadius, COEFFS (the 2 * cRadius + 1 weights in braces), TILED. Launches are one-dimensional in groups
// of 32. The tiled passes stage a group's pixels and their halo in local memory. In the order of the pass, row after row
// or column after column, every pixel that a group's sums need lies within cRadius places of the group: reflection
// never leads farther from a pixel than the offset that it reflects.

#define BLOCK_SIZE 32
#define TILEWIDTH (BLOCK_SIZE + 2 * cRadius)

// Beyond a radius of one group the halo costs more than it saves.
#if TILED != 0 && cRadius <= BLOCK_SIZE
#define USE_TILE 1
#else
#define USE_TILE 0
#endif

__constant float kCoefficients[] = COEFFS;

#if USE_TILE
static inline float4 SumOfTile(__local const float4* tile, int local_index, int position, int size) {
    float4 sum = (float4)(0.0f);
    for (int i = -cRadius; i <= cRadius; ++i) {
        const int step = MirrorCoordinate(position + i, size) - position;
        sum += tile[local_index + cRadius + step] * kCoefficients[i + cRadius];
    }
    return sum;
}
#endif

__kernel void GaussBlurHorKernel(srcBufferType(srcBuffer), dst_float_4 dstBuffer) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
#if USE_TILE
    __local float4 tile[TILEWIDTH];
    // A device that cannot run groups of 32 blurs without the tile; the choice is the same for all items.
    if (get_local_size(0) == BLOCK_SIZE) {
        const long count = (long)size.x * (long)size.y;
        const long id = (long)get_global_id(0);
        const int local_index = (int)get_local_id(0);
        for (int i = local_index; i < TILEWIDTH; i += BLOCK_SIZE) {
            const long place = clamp(id - local_index + i - cRadius, 0L, count - 1);
            tile[i] = ReadPixel(srcBuffer, (int)(place % size.x), (int)(place / size.x));
        }
        barrier(CLK_LOCAL_MEM_FENCE);
        if (id < count) {
            const int column = (int)(id % size.x);
            const float4 sum = SumOfTile(tile, local_index, column, size.x);
            WritePixel_float_4(dstBuffer, size, column, (int)(id / size.x), sum);
        }
        return;
    }
#endif
    int2 coord;
    GET_COORD(coord, size);
    float4 sum = (float4)(0.0f);
    for (int i = -cRadius; i <= cRadius; ++i) {
        const int column = MirrorCoordinate(coord.x - i, size.x);
        sum += ReadPixel(srcBuffer, column, coord.y) * kCoefficients[i + cRadius];
    }
    WritePixel_float_4(dstBuffer, size, coord.x, coord.y, sum);
}

__kernel void GaussBlurVertKernel(src_float_4 srcBuffer, dstBufferType(dstBuffer)) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
#if USE_TILE
    __local float4 tile[TILEWIDTH];
    if (get_local_size(0) == BLOCK_SIZE) {
        const long count = (long)size.x * (long)size.y;
        const long id = (long)get_global_id(0);
        const int local_index = (int)get_local_id(0);
        for (int i = local_index; i < TILEWIDTH; i += BLOCK_SIZE) {
            const long place = clamp(id - local_index + i - cRadius, 0L, count - 1);
            tile[i] = ReadPixel_float_4(srcBuffer, size, (int)(place / size.y), (int)(place % size.y));
        }
        barrier(CLK_LOCAL_MEM_FENCE);
        if (id < count) {
            const int row = (int)(id % size.y);
            const float4 sum = SumOfTile(tile, local_index, row, size.y);
            WritePixel(dstBuffer, (int)(id / size.y), row, sum);
        }
        return;
    }
#endif
    int2 coord;
    GET_COORD(coord, size);
    float4 sum = (float4)(0.0f);
    for (int i = -cRadius; i <= cRadius; ++i) {
        const int row = MirrorCoordinate(coord.y - i, size.y);
        sum += ReadPixel_float_4(srcBuffer, size, coord.x, row) * kCoefficients[i + cRadius];
    }
    WritePixel(dstBuffer, coord.x, coord.y, sum);
}
