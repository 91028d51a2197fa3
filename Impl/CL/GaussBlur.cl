// Separable Gaussian blur: a horizontal pass from the input into four floats per pixel, and a vertical pass from there
// into the output. Borders mirror the picture, the edge pixels repeated.
//
// Definitions: cRadius, COEFFS (the 2 * cRadius + 1 weights in braces), TILED. Launches are one-dimensional over all
// pixels, in groups of 32. How a pass uses its items depends on the device:
// - Central processors have a cache instead of local memory, and vectors within one item. There every 32nd item blurs
//   32 pixels, tiled or not.
// - Other devices blur a pixel per item. Tiled, a group stages its pixels and their halo in local memory. In the order
//   of the pass, row after row or column after column, every pixel that a group's sums need lies within cRadius places
//   of the group: reflection never leads farther from a pixel than the offset that it reflects.

#define BLOCK_SIZE 32
#define TILEWIDTH (BLOCK_SIZE + 2 * cRadius)
#define TAPS (2 * cRadius + 1)

// Beyond a radius of one group the halo costs more than it saves.
#if TILED != 0 && cRadius <= BLOCK_SIZE
#define USE_TILE 1
#else
#define USE_TILE 0
#endif

__constant float kCoefficients[TAPS] = COEFFS;

// A coordinate outside 0 ... size - 1 reflected about the borders, the edge pixels repeated, until it is inside.
static inline int MirrorCoordinate(int value, int size) {
    if (value < 0 || value >= size) {
        const int period = 2 * size;
        value %= period;
        value = value < 0 ? value + period : value;
        value = value < size ? value : period - 1 - value;
    }
    return value;
}

// One pixel of the vertical pass, without a tile or a block.
static inline float4 SumColumn(__global const float4* srcBuffer, int2 size, int column, int row) {
    float4 sum = (float4)(0.0f);
    for (int i = 0; i < TAPS; ++i) {
        const int tap_row = MirrorCoordinate(row - cRadius + i, size.y);
        sum += ReadPixel_float_4(srcBuffer, size, column, tap_row) * kCoefficients[i];
    }
    return sum;
}

#if ON_CENTRAL_PROCESSOR

// ---- Blocks of 32 pixels per item ----------------------------------------------------------------------------------

// A block is 32 pixels of a row, or 8 columns of 4 rows. Sums are kept of 16 pixels at a time: as many as fit into the
// registers beside the weight.
#define PIXELS_AT_A_TIME 16
#define BLOCK_COLUMNS 8
#define BLOCK_ROWS 4

// Blocks side by side in a strip of the vertical pass: as many as keep the rows of a strip within 128 KiB of cache, for
// radii that leave room for two.
#define STRIP_BLOCKS (TAPS < 510 ? 1024 / (TAPS + 3) : 2)

// Pixels are staged for as many taps at a time, so that private memory has a bound for any radius.
#define STAGED_TAPS (TAPS < 512 ? TAPS : 512)

// Four neighbouring pixels in memory, aligned as one. Read through pointers: vectors of this size as the values of
// functions draw warnings on processors without registers as wide.
typedef float16 __attribute__((aligned(16))) FourPixels;

// Adds to the sums of 16 neighbouring pixels; `window` begins at the first pixel's first tap.
#define DEFINE_ADD_TAPS(name, space)                                                              \
    static inline void name(float16* sums, space const float4* window, int first_tap, int taps) { \
        float16 sum0 = sums[0];                                                                   \
        float16 sum1 = sums[1];                                                                   \
        float16 sum2 = sums[2];                                                                   \
        float16 sum3 = sums[3];                                                                   \
        for (int i = 0; i < taps; ++i) {                                                          \
            const float weight = kCoefficients[first_tap + i];                                    \
            space const FourPixels* pixels = (space const FourPixels*)(window + i);               \
            sum0 += pixels[0] * weight;                                                           \
            sum1 += pixels[1] * weight;                                                           \
            sum2 += pixels[2] * weight;                                                           \
            sum3 += pixels[3] * weight;                                                           \
        }                                                                                         \
        sums[0] = sum0;                                                                           \
        sums[1] = sum1;                                                                           \
        sums[2] = sum2;                                                                           \
        sums[3] = sum3;                                                                           \
    }
DEFINE_ADD_TAPS(AddTaps, __private)

// A stored picture of four floats is its own window wherever no border is near.
#define IS_LAYOUT_float_4 1
#define READS_IN_PLACE PASTE_LAYOUT(IS_LAYOUT, srcBuffer_COMP_TYPE, srcBuffer_COMP_NUM)
#if READS_IN_PLACE
DEFINE_ADD_TAPS(AddStoredTaps, __global)
#endif

// The sums of up to 32 pixels of a row, in parts of 16.
static inline void SumRun(float16* sums, srcBufferType(srcBuffer), int width, int column, int row, int parts) {
    float4 window[BLOCK_SIZE + STAGED_TAPS];
    for (int i = 0; i < BLOCK_SIZE / 4; ++i) {
        sums[i] = (float16)(0.0f);
    }
    for (int tap = 0; tap < TAPS; tap += STAGED_TAPS) {
        const int taps = min(STAGED_TAPS, TAPS - tap);
        const int first = column - cRadius + tap;
        const int staged = parts * PIXELS_AT_A_TIME + taps - 1;
        const bool is_inside = first >= 0 && first + staged <= width;
#if READS_IN_PLACE
        if (is_inside) {
            __global const float4* pixels = srcBuffer + PixelIndex(GET_BUFFER_SIZE(srcBuffer), first, row);
            for (int part = 0; part < parts; ++part) {
                AddStoredTaps(sums + 4 * part, pixels + PIXELS_AT_A_TIME * part, tap, taps);
            }
            continue;
        }
#endif
        if (is_inside) {
            for (int i = 0; i < staged; ++i) {
                window[i] = ReadPixel(srcBuffer, first + i, row);
            }
        } else {
            for (int i = 0; i < staged; ++i) {
                window[i] = ReadPixel(srcBuffer, MirrorCoordinate(first + i, width), row);
            }
        }
        for (int part = 0; part < parts; ++part) {
            AddTaps(sums + 4 * part, window + PIXELS_AT_A_TIME * part, tap, taps);
        }
    }
}

__kernel void GaussBlurHorKernel(srcBufferType(srcBuffer), dst_float_4 dstBuffer) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    const uint count = (uint)size.x * (uint)size.y;
    uint place = (uint)get_global_id(0);
    if (place % BLOCK_SIZE != 0 || place >= count) {
        return;
    }
    const uint behind = min(place + BLOCK_SIZE, count);
    // The block as runs of pixels in one row each.
    while (place < behind) {
        const int row = (int)(place / (uint)size.x);
        const int column = (int)(place % (uint)size.x);
        const int run = min((int)(behind - place), size.x - column);
        float16 sums[BLOCK_SIZE / 4];
        SumRun(sums, srcBuffer, size.x, column, row, (run + PIXELS_AT_A_TIME - 1) / PIXELS_AT_A_TIME);
        const float4* values = (const float4*)sums;
        for (int i = 0; i < run; ++i) {
            WritePixel_float_4(dstBuffer, size, column + i, row, values[i]);
        }
        place += (uint)run;
    }
}

// The sums of 4 columns by 4 rows, a row after the other. Each row that is read serves all four.
static inline void SumRows(float16* sums, __global const float4* srcBuffer, int2 size, int column, int row) {
    float16 sum0 = (float16)(0.0f);
    float16 sum1 = (float16)(0.0f);
    float16 sum2 = (float16)(0.0f);
    float16 sum3 = (float16)(0.0f);
    __global const float4* top = srcBuffer + column;
#define READ_ROW(tap) \
    *(__global const FourPixels*)(top + PixelIndex(size, 0, MirrorCoordinate(row - cRadius + (tap), size.y)))
#define ADD_ROW(n)                                 \
    if (tap - n >= 0 && tap - n < TAPS) {          \
        sum##n += pixels * kCoefficients[tap - n]; \
    }
    for (int tap = 0; tap < BLOCK_ROWS - 1; ++tap) {
        const float16 pixels = READ_ROW(tap);
        ADD_ROW(0)
        ADD_ROW(1)
        ADD_ROW(2)
    }
    for (int tap = BLOCK_ROWS - 1; tap < TAPS; ++tap) {
        const float16 pixels = READ_ROW(tap);
        sum0 += pixels * kCoefficients[tap];
        sum1 += pixels * kCoefficients[tap - 1];
        sum2 += pixels * kCoefficients[tap - 2];
        sum3 += pixels * kCoefficients[tap - 3];
    }
    for (int tap = max(TAPS, BLOCK_ROWS - 1); tap < TAPS + BLOCK_ROWS - 1; ++tap) {
        const float16 pixels = READ_ROW(tap);
        ADD_ROW(0)
        ADD_ROW(1)
        ADD_ROW(2)
        ADD_ROW(3)
    }
#undef READ_ROW
#undef ADD_ROW
    sums[0] = sum0;
    sums[1] = sum1;
    sums[2] = sum2;
    sums[3] = sum3;
}

// Full blocks first: strip after strip, across each strip and down, so that a block finds in the cache the rows that
// the blocks above it have read. Then, pixel by pixel, the columns and rows that fill no block.
__kernel void GaussBlurVertKernel(src_float_4 srcBuffer, dstBufferType(dstBuffer)) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    const uint count = (uint)size.x * (uint)size.y;
    const uint block = (uint)get_global_id(0) / BLOCK_SIZE;
    if ((uint)get_global_id(0) % BLOCK_SIZE != 0 || block * BLOCK_SIZE >= count) {
        return;
    }
    const uint across = (uint)size.x / BLOCK_COLUMNS;
    const uint down = (uint)size.y / BLOCK_ROWS;
    if (block < across * down) {
        const uint strip = block / (STRIP_BLOCKS * down);
        const uint width = min((uint)STRIP_BLOCKS, across - strip * STRIP_BLOCKS);
        const uint inside = block - strip * STRIP_BLOCKS * down;
        const int first_column = (int)(strip * STRIP_BLOCKS + inside % width) * BLOCK_COLUMNS;
        const int first_row = (int)(inside / width) * BLOCK_ROWS;
        for (int column = first_column; column < first_column + BLOCK_COLUMNS; column += 4) {
            float16 sums[BLOCK_ROWS];
            SumRows(sums, srcBuffer, size, column, first_row);
            const float4* values = (const float4*)sums;
            for (int i = 0; i < 4 * BLOCK_ROWS; ++i) {
                WritePixel(dstBuffer, column + i % 4, first_row + i / 4, values[i]);
            }
        }
        return;
    }
    const uint covered_columns = across * BLOCK_COLUMNS;
    const uint margin = (uint)size.x - covered_columns;
    const uint margin_pixels = margin * (uint)size.y;
    const uint rest = count - across * down * BLOCK_SIZE;
    const uint first = (block - across * down) * BLOCK_SIZE;
    for (uint place = first; place < min(first + BLOCK_SIZE, rest); ++place) {
        int2 coord;
        if (place < margin_pixels) {
            coord = (int2)((int)(covered_columns + place % margin), (int)(place / margin));
        } else {
            const uint below = place - margin_pixels;
            coord = (int2)((int)(below % covered_columns), (int)(down * BLOCK_ROWS + below / covered_columns));
        }
        WritePixel(dstBuffer, coord.x, coord.y, SumColumn(srcBuffer, size, coord.x, coord.y));
    }
}

#else

// ---- One pixel per item --------------------------------------------------------------------------------------------

#if USE_TILE
// Fills the group's tile; `place` is where a pixel lies in the order of the pass. A device that cannot run groups of 32
// blurs without the tile: that choice is the same for all items, but the barrier stands outside of it, since PoCL 3.1
// runs a barrier under a condition wrong.
#define STAGE_TILE(pixel)                                                            \
    __local float4 tile[TILEWIDTH];                                                  \
    const bool is_tiled = get_local_size(0) == BLOCK_SIZE;                           \
    const int count = size.x * size.y;                                               \
    for (int i = (int)get_local_id(0); is_tiled && i < TILEWIDTH; i += BLOCK_SIZE) { \
        const int place = TilePlace(i, count);                                       \
        tile[i] = pixel;                                                             \
    }                                                                                \
    barrier(CLK_LOCAL_MEM_FENCE);

// The place, in the order of the pass, of entry i of the group's tile. Launches stay below 2^31 items, their halo may
// not.
static inline int TilePlace(int i, int count) {
    return (int)clamp((long)get_global_id(0) - (long)get_local_id(0) + i - cRadius, 0L, (long)count - 1);
}

static inline float4 SumOfTile(__local const float4* tile, int position, int size) {
    const int local_index = (int)get_local_id(0);
    float4 sum = (float4)(0.0f);
    if (position >= cRadius && position + cRadius < size) {
        for (int i = 0; i < TAPS; ++i) {
            sum += tile[local_index + i] * kCoefficients[i];
        }
        return sum;
    }
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
    STAGE_TILE(ReadPixel(srcBuffer, place % size.x, place / size.x))
    if (is_tiled) {
        const int id = (int)get_global_id(0);
        if (id < count) {
            const float4 sum = SumOfTile(tile, id % size.x, size.x);
            WritePixel_float_4(dstBuffer, size, id % size.x, id / size.x, sum);
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
    STAGE_TILE(ReadPixel_float_4(srcBuffer, size, place / size.y, place % size.y))
    if (is_tiled) {
        const int id = (int)get_global_id(0);
        if (id < count) {
            const float4 sum = SumOfTile(tile, id % size.y, size.y);
            WritePixel(dstBuffer, id / size.y, id % size.y, sum);
        }
        return;
    }
#endif
    int2 coord;
    GET_COORD(coord, size);
    WritePixel(dstBuffer, coord.x, coord.y, SumColumn(srcBuffer, size, coord.x, coord.y));
}

#endif
