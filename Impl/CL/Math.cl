// Sum and product of up to six images.

#define WEIGHT_DEF(n) , float weight##n

__kernel void WeightedSumKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)
                                IMAGE_ARRAY(input, INPUTS_NUM) REPEAT(INPUTS_NUM, WEIGHT_DEF)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    float4 result = (float4)(0.0f);
#define ADD_WEIGHTED(itr) result = AddWeighted(result, ReadPixel(input##itr, coord.x, coord.y), weight##itr);
    REPEAT(INPUTS_NUM, ADD_WEIGHTED)
#undef ADD_WEIGHTED
    WritePixel(dstBuffer, coord.x, coord.y, result);
}

__kernel void MultiplicationKernel(srcBufferType(srcBuffer), dstBufferType(dstBuffer)
                                   IMAGE_ARRAY(input, INPUTS_NUM)) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(dstBuffer));
    float4 result = (float4)(1.0f);
#define MULTIPLY_BY(itr) result = Multiplied(result, ReadPixel(input##itr, coord.x, coord.y));
    REPEAT(INPUTS_NUM, MULTIPLY_BY)
#undef MULTIPLY_BY
    WritePixel(dstBuffer, coord.x, coord.y, result);
}
