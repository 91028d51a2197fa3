// Average over a square neighbourhood, weighted by how alike up to six auxiliary images are there and at the centre.
// The colour itself does not steer the weights.
//
// Definitions: radius, INPUTS_NUM. Colours are divided by alpha; where alpha is 0 they are taken as they are. The
// neighbours of border pixels are clamped to the picture.

#define SIGMA_DEF(n) , float sigma##n

// Sigmas are positive. exp(-0.5 * d / sigma) is 2^(d * EXPONENT(sigma)).
#define EXPONENT(sigma) (-0.5f * 1.44269504f / (sigma))

#if ON_CENTRAL_PROCESSOR

// ---- Blocks of 8 x 8 pixels per item -------------------------------------------------------------------------------

// The rows of the neighbourhood pass one by one: each is divided by alpha once, colour by colour, and then serves all
// rows of the block, eight pixels of it at a time.
#define BLOCK_SIDE 8
#define WINDOW (BLOCK_SIDE + 2 * radius)
#define CHANNELS (3 * INPUTS_NUM + 3)

typedef float8 __attribute__((aligned(4))) EightValues;

// Puts a colour into three channels of a row.
static inline void Stage(float (*channels)[WINDOW], int place, float4 rgba) {
    const float3 color = DivideByAlpha(rgba);
    channels[0][place] = color.x;
    channels[1][place] = color.y;
    channels[2][place] = color.z;
}

#define EIGHT(channel, place) (*(const EightValues*)(window[channel] + (place)))

__kernel void BilateralFilterKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)
                                    IMAGE_ARRAY(input, INPUTS_NUM) REPEAT(INPUTS_NUM, SIGMA_DEF)) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    const int2 corner = (int2)((int)get_global_id(0), (int)get_global_id(1));
    if (corner.x % BLOCK_SIDE != 0 || corner.y % BLOCK_SIDE != 0 || corner.x >= size.x || corner.y >= size.y) {
        return;
    }
    const int2 last = size - 1;
    const int rows = min(BLOCK_SIDE, size.y - corner.y);
    float8 centre[BLOCK_SIDE][CHANNELS];
    float8 sums[BLOCK_SIDE][4];

    // The auxiliary images come first, then the colour.
    float window[CHANNELS][WINDOW];
#define STAGE_INPUT(n) Stage(window + 3 * n, i, ReadPixel(input##n, column, row));
    for (int y = 0; y < rows; ++y) {
        const int row = corner.y + y;
        for (int i = 0; i < BLOCK_SIDE; ++i) {
            const int column = min(corner.x + i, last.x);
            REPEAT(INPUTS_NUM, STAGE_INPUT)
        }
        for (int channel = 0; channel < 3 * INPUTS_NUM; ++channel) {
            centre[y][channel] = EIGHT(channel, 0);
        }
        for (int channel = 0; channel < 4; ++channel) {
            sums[y][channel] = (float8)(0.0f);
        }
    }

#define ADD_DISTANCE(n)                                                              \
    {                                                                                \
        const float8 x = EIGHT(3 * n, i) - own[3 * n];                               \
        const float8 y = EIGHT(3 * n + 1, i) - own[3 * n + 1];                       \
        const float8 z = EIGHT(3 * n + 2, i) - own[3 * n + 2];                       \
        weight += (x * x + y * y + z * z) * EXPONENT(sigma##n);                      \
    }
    for (int offset = -radius; offset < BLOCK_SIDE + radius; ++offset) {
        const int row = clamp(corner.y + offset, 0, last.y);
        for (int i = 0; i < WINDOW; ++i) {
            const int column = clamp(corner.x - radius + i, 0, last.x);
            REPEAT(INPUTS_NUM, STAGE_INPUT)
            Stage(window + 3 * INPUTS_NUM, i, ReadPixel(srcBuffer, column, row));
        }
        for (int y = max(offset - radius, 0); y <= min(offset + radius, rows - 1); ++y) {
            const float8* own = centre[y];
            float8 red = sums[y][0];
            float8 green = sums[y][1];
            float8 blue = sums[y][2];
            float8 weights = sums[y][3];
            for (int i = 0; i <= 2 * radius; ++i) {
                float8 weight = (float8)(0.0f);
                REPEAT(INPUTS_NUM, ADD_DISTANCE)
                weight = Exp2_float8(fmax(weight, -126.0f));
                red += EIGHT(3 * INPUTS_NUM, i) * weight;
                green += EIGHT(3 * INPUTS_NUM + 1, i) * weight;
                blue += EIGHT(3 * INPUTS_NUM + 2, i) * weight;
                weights += weight;
            }
            sums[y][0] = red;
            sums[y][1] = green;
            sums[y][2] = blue;
            sums[y][3] = weights;
        }
    }
#undef STAGE_INPUT
#undef ADD_DISTANCE

    for (int y = 0; y < rows; ++y) {
        const float* red = (const float*)sums[y];
        const float* weights = red + 3 * BLOCK_SIDE;
        for (int i = 0; i < min(BLOCK_SIDE, size.x - corner.x); ++i) {
            const float3 sum = (float3)(red[i], red[BLOCK_SIDE + i], red[2 * BLOCK_SIDE + i]);
            const float3 mean = weights[i] > 0.0f ? sum / weights[i] : (float3)(0.0f);
            WritePixel(dstBuffer, corner.x + i, corner.y + y, (float4)(mean, 1.0f));
        }
    }
}

#else

// ---- One pixel per item --------------------------------------------------------------------------------------------

__kernel void BilateralFilterKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)
                                    IMAGE_ARRAY(input, INPUTS_NUM) REPEAT(INPUTS_NUM, SIGMA_DEF)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const int2 last = GET_BUFFER_SIZE(dstBuffer) - 1;

#define READ_CENTRE(n) const float3 centre##n = DivideByAlpha(ReadPixel(input##n, coord.x, coord.y));
#define ADD_DISTANCE(n)                                                                             \
    {                                                                                               \
        const float3 difference = DivideByAlpha(ReadPixel(input##n, column, row)) - centre##n;      \
        exponent += dot(difference, difference) * EXPONENT(sigma##n);                               \
    }
    REPEAT(INPUTS_NUM, READ_CENTRE)

    float3 filtered = (float3)(0.0f);
    float weight_sum = 0.0f;
    for (int j = -radius; j <= radius; ++j) {
        const int row = clamp(coord.y + j, 0, last.y);
        for (int i = -radius; i <= radius; ++i) {
            const int column = clamp(coord.x + i, 0, last.x);
            float exponent = 0.0f;
            REPEAT(INPUTS_NUM, ADD_DISTANCE)
            const float weight = native_exp2(exponent);
            filtered += DivideByAlpha(ReadPixel(srcBuffer, column, row)) * weight;
            weight_sum += weight;
        }
    }
#undef READ_CENTRE
#undef ADD_DISTANCE
    const float3 mean = weight_sum > 0.0f ? filtered / weight_sum : (float3)(0.0f);
    WritePixel(dstBuffer, coord.x, coord.y, (float4)(mean, 1.0f));
}

#endif
