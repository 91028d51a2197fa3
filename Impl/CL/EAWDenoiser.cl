// One level of the edge-avoiding a-trous wavelet filter of H. Dammertz et al., "Edge-Avoiding A-Trous Wavelet Transform
// for Fast Global Illumination Filtering" (2010), with a colour variance that is filtered along and narrows the colour
// weight where the picture is clean already.
//
// Definitions: offset (distance of the taps: 1, 2, 4, 8, 16), FIRST_LEVEL, and ODD on every second level. Variances
// lie behind the intermediate picture in the scratch memory, two per pixel: a level reads one and writes the other.
//
// Pixels that hold NaN or infinity take no part: such a colour is never averaged in, and as the centre of a window it
// is replaced by its neighbours. A feature that is unusable matches one that is unusable likewise, and nothing else.

#ifdef ODD
#define READ_SLOT 1
#define WRITE_SLOT 0
#else
#define READ_SLOT 0
#define WRITE_SLOT 1
#endif

#define LOG2_E 1.44269504f

// A pixel's coordinate reflected about the borders; pictures too small for one reflection clamp the rest.
static inline int ReflectOnce(int value, int size) {
    value = value < 0 ? -value - 1 : value;
    value = value >= size ? 2 * size - value - 1 : value;
    return clamp(value, 0, size - 1);
}

static inline size_t VarianceIndex(int2 size, int x, int y) {
    return 2 * (2 * (size_t)size.x * (size_t)size.y + PixelIndex(size, x, y));
}

// The features of a pixel, with zeros in place of what is not usable.
typedef struct {
    float3 normal;
    float3 transition;
    float depth;
    int usable;
} Features;

static inline Features MakeFeatures(float4 normal, float4 depth, float4 transition) {
    const bool normal_usable = IsUsable(normal);
    const bool depth_usable = IsUsable((float4)(depth.x));
    const bool transition_usable = IsUsable(transition);
    Features features;
    features.normal = Normalized((normal_usable ? normal.xyz : (float3)(0.0f)) + 0.01f);
    features.transition = transition_usable ? DivideByAlpha(transition) : (float3)(0.0f);
    features.depth = depth_usable ? depth.x : 0.0f;
    features.usable = (normal_usable ? 1 : 0) + (depth_usable ? 2 : 0) + (transition_usable ? 4 : 0);
    return features;
}

static inline float4 UsableOr(float4 value, float4 otherwise) {
    return IsUsable(value) ? value : otherwise;
}

__kernel void EAWDenoiserKernel(srcBufferType(srcBuffer), srcBufferType(normalsBuff), srcBufferType(depthBuff),
                                srcBufferType(transBuff), srcBufferType(vColorBuff), float colSigma, float normSigma,
                                float dptSigma, float transSigma, dstBufferType(dstBuffer),
                                __global float2* variance) {
    const float spline[5] = {1.0f / 16.0f, 1.0f / 4.0f, 3.0f / 8.0f, 1.0f / 4.0f, 1.0f / 16.0f};
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    int2 coord;
    GET_COORD(coord, size);
    // Neighbours read one float of a pair while its owner writes the other: single floats, never whole pairs.
    __global float* slots = (__global float*)variance;

    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
    const bool color_usable = IsUsable(color);
    const float3 centre_color = color_usable ? DivideByAlpha(color) : (float3)(0.0f);
    const Features centre = MakeFeatures(ReadPixel(normalsBuff, coord.x, coord.y),
                                         ReadPixel(depthBuff, coord.x, coord.y),
                                         ReadPixel(transBuff, coord.x, coord.y));

    // Depth gradient with the Sobel weights, and on the first level the blurred variance.
    float2 gradient = (float2)(0.0f);
#ifdef FIRST_LEVEL
    float4 blurred = (float4)(0.0f);
#endif
    for (int i = -1; i <= 1; ++i) {
        const int row = ReflectOnce(coord.y + i, size.y);
        for (int j = -1; j <= 1; ++j) {
            const int column = ReflectOnce(coord.x + j, size.x);
            const float depth = UsableOr((float4)(ReadPixel(depthBuff, column, row).x), (float4)(centre.depth)).x;
            gradient.x -= (float)(j * (2 - abs(i))) * depth;
            gradient.y -= (float)(i * (2 - abs(j))) * depth;
#ifdef FIRST_LEVEL
            const float gauss = i == 0 && j == 0 ? 0.195346f : (i == 0 || j == 0 ? 0.123317f : 0.077847f);
            blurred += UsableOr(ReadPixel(vColorBuff, column, row), (float4)(0.0f)) * gauss;
#endif
        }
    }
#ifdef FIRST_LEVEL
    const float centre_variance = length(blurred.xyz);
#else
    const float centre_variance = slots[VarianceIndex(size, coord.x, coord.y) + READ_SLOT];
#endif

    const float color_scale = color_usable ? 1.0f / (colSigma * sqrt(centre_variance) + 0.00001f) : 0.0f;
    float3 color_sum = (float3)(0.0f);
    float variance_sum = 0.0f;
    float weight_sum = 0.0f;
    for (int i = -2; i <= 2; ++i) {
        const int column = ReflectOnce(coord.x + i * offset, size.x);
        for (int j = -2; j <= 2; ++j) {
            const int row = ReflectOnce(coord.y + j * offset, size.y);
            const float4 sample = ReadPixel(srcBuffer, column, row);
            const Features features = MakeFeatures(ReadPixel(normalsBuff, column, row),
                                                   ReadPixel(depthBuff, column, row),
                                                   ReadPixel(transBuff, column, row));
            if (!IsUsable(sample) || features.usable != centre.usable) {
                continue;
            }
            const float3 sample_color = DivideByAlpha(sample);
            const float slope = fabs(gradient.x * (float)(i * offset) + gradient.y * (float)(j * offset));
            const float distance_sum = fast_length(sample_color - centre_color) * color_scale +
                                       fabs(features.depth - centre.depth) / (dptSigma * slope + 0.001f) +
                                       fast_length(features.transition - centre.transition) / transSigma;
            const float cosine = dot(features.normal, centre.normal);
            const float likeness = native_exp2(native_log2(fmax(cosine, 1e-30f)) / normSigma - distance_sum * LOG2_E);
            const float weight = cosine > 0.0f ? spline[i + 2] * spline[j + 2] * likeness : 0.0f;
#ifdef FIRST_LEVEL
            const float sample_variance = length(UsableOr(ReadPixel(vColorBuff, column, row), (float4)(0.0f)));
#else
            const float sample_variance = slots[VarianceIndex(size, column, row) + READ_SLOT];
#endif
            color_sum += sample_color * weight;
            variance_sum += sample_variance * weight * weight;
            weight_sum += weight;
        }
    }

    // The centre alone gives 9/64. Less than this remains only where the centre is unusable and nothing is like it.
    const bool any = weight_sum > 1e-12f;
    const float3 filtered = any ? color_sum / weight_sum : (float3)(0.0f);
    const float filtered_variance = any ? variance_sum / (weight_sum * weight_sum) : 0.0f;
    slots[VarianceIndex(size, coord.x, coord.y) + WRITE_SLOT] = fmin(filtered_variance, 1e30f);
    WritePixel(dstBuffer, coord.x, coord.y, (float4)(filtered, 1.0f));
}
