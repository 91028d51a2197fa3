// Average over a square neighbourhood, weighted by how alike up to six auxiliary images are there and at the centre.
// The colour itself does not steer the weights.
//
// Definitions: radius, INPUTS_NUM. Colours are divided by alpha; where alpha is 0 they are taken as they are.

#define MAX_INPUTS_NUM 6
#if INPUTS_NUM > MAX_INPUTS_NUM
#error Internal error: too lot of inputs!
#endif

// Lists of parameters whose length is INPUTS_NUM; each element brings the comma in front of it.
#define input(itr) , srcBufferType(input##itr)
#define SIGMA_DEF(n) , float sigma##n
#define IMAGE_ARRAY(name, num) REPEAT(num, name)

__kernel void BilateralFilterKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)
                                    IMAGE_ARRAY(input, INPUTS_NUM) REPEAT(INPUTS_NUM, SIGMA_DEF)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    const int2 last = GET_BUFFER_SIZE(dstBuffer) - 1;

#define READ_CENTRE(n) const float3 centre##n = DivideByAlpha(ReadPixel(input##n, coord.x, coord.y));
#define ADD_DISTANCE(n)                                                                             \
    {                                                                                               \
        const float3 difference = DivideByAlpha(ReadPixel(input##n, column, row)) - centre##n;      \
        distance_sum += dot(difference, difference) / sigma##n;                                     \
    }
    REPEAT(INPUTS_NUM, READ_CENTRE)

    float3 filtered = (float3)(0.0f);
    float weight_sum = 0.0f;
    for (int j = -radius; j <= radius; ++j) {
        const int row = clamp(coord.y + j, 0, last.y);
        for (int i = -radius; i <= radius; ++i) {
            const int column = clamp(coord.x + i, 0, last.x);
            float distance_sum = 0.0f;
            REPEAT(INPUTS_NUM, ADD_DISTANCE)
            const float weight = native_exp(-0.5f * distance_sum);
            filtered += DivideByAlpha(ReadPixel(srcBuffer, column, row)) * weight;
            weight_sum += weight;
        }
    }
#undef READ_CENTRE
#undef ADD_DISTANCE
    const float3 mean = weight_sum > 0.0f ? filtered / weight_sum : (float3)(0.0f);
    WritePixel(dstBuffer, coord.x, coord.y, (float4)(mean, 1.0f));
}
