// One level of the edge-avoiding a-trous wavelet filter of H. Dammertz et al., "Edge-Avoiding A-Trous Wavelet Transform
// for Fast Global Illumination Filtering" (2010), with a colour variance that is filtered along and narrows the colour
// weight where the picture is clean already.
//
// Definitions: offset (distance of the taps: 1, 2, 4, 8, 16), FIRST_LEVEL, and ODD on every second level. Variances
// lie behind the intermediate picture in the scratch memory, two per pixel: a level reads one and writes the other.
//
// Pixels that hold NaN or infinity take no part: such a colour is never averaged in, and as the centre of a window it
// is replaced by its neighbours, by those of the next level where the nearer ones are unusable, too; until then its
// variance is negative. A feature that is unusable matches one that is unusable likewise, and nothing else.
//
// The 24 taps around the centre are taken four at a time, component by component, so that central processors work on
// whole vectors. Opposite taps follow each other: the slope of the depth is the same for both. The four weights are one
// exponential of a sum.

#ifdef ODD
#define READ_SLOT 1
#define WRITE_SLOT 0
#else
#define READ_SLOT 0
#define WRITE_SLOT 1
#endif

#define LOG2_E 1.44269504f
#define UNFILLED (-1.0f)

// Largest colour that the picture between two levels can hold.
#define LARGEST_uint 1.0f
#define LARGEST_half 65504.0f
#define LARGEST_float 1e15f
#define LARGEST__(type) LARGEST_##type
#define LARGEST_(type) LARGEST__(type)
#define LARGEST(name) LARGEST_(name##_COMP_TYPE)

#define IMAGE_PARAMETERS                                                                            \
    srcBufferType(srcBuffer), srcBufferType(normalsBuff), srcBufferType(depthBuff), srcBufferType(transBuff), \
        srcBufferType(vColorBuff), __global const float *slots
#define IMAGES srcBuffer, normalsBuff, depthBuff, transBuff, vColorBuff, slots

// Vectors of four pixels.
typedef struct {
    float4 x;
    float4 y;
    float4 z;
} Vectors;

typedef struct {
    int4 x;
    int4 y;
} Places;

// What the taps are compared with.
typedef struct {
    float3 color;
    float3 normal;  // Of length 1.
    float3 transition;
    float depth;
    int normal_usable;  // -1 or 0, likewise the other two.
    int depth_usable;
    int transition_usable;
    float color_factor;   // Weights are 2^(factor * difference).
    float normal_factor;
    float transition_factor;
} Centre;

typedef struct {
    Vectors color;
    float4 variance;
    float4 weight;
} Sums;

// A pixel's coordinate reflected about the borders; pictures too small for one reflection clamp the rest.
static inline int4 ReflectOnce(int4 value, int size) {
    const int4 positive = value ^ (value >> 31);
    return clamp(min(positive, 2 * size - 1 - positive), (int4)(0), (int4)(size - 1));
}

static inline size_t VarianceIndex(int2 size, int x, int y) {
    return 2 * (2 * (size_t)size.x * (size_t)size.y + PixelIndex(size, x, y));
}

// -1 where a value is usable as IsUsable has it, else 0.
static inline int4 UsableEach(float4 value) {
    return (as_int4(value) & 0x7fffffff) < 0x58635fa9;
}

static inline float4 ZeroUnless(int4 mask, float4 value) {
    return as_float4(as_int4(value) & mask);
}

static inline float4 UsableOr(float4 value, float4 otherwise) {
    return IsUsable(value) ? value : otherwise;
}

static inline Vectors Transposed(float4 a, float4 b, float4 c, float4 d) {
    Vectors v;
    v.x = (float4)(a.x, b.x, c.x, d.x);
    v.y = (float4)(a.y, b.y, c.y, d.y);
    v.z = (float4)(a.z, b.z, c.z, d.z);
    return v;
}

// The vectors with zeros in place of unusable ones, and which were usable.
static inline int4 KeepUsable(Vectors* v) {
    const int4 usable = UsableEach(v->x) & UsableEach(v->y) & UsableEach(v->z);
    v->x = ZeroUnless(usable, v->x);
    v->y = ZeroUnless(usable, v->y);
    v->z = ZeroUnless(usable, v->z);
    return usable;
}

static inline void DivideEach(Vectors* v, float4 alpha) {
    // Alpha below 1e-15 counts as 0: quotients stay finite.
    const float4 inverse = 1.0f / select(alpha, (float4)(1.0f), fabs(alpha) < (float4)(1e-15f));
    v->x *= inverse;
    v->y *= inverse;
    v->z *= inverse;
}

// 1 / sqrt of numbers from 0 to 1e36 (a large number for 0), relative error 5e-6. The library's function goes through
// such a vector one by one on central processors: there, a guess from the bits and two of Newton's steps are faster.
static inline float4 InverseRoot(float4 value) {
#if defined(__x86_64__) || defined(__i386__) || defined(__aarch64__) || defined(__arm__)
    const float4 guess = as_float4(0x5f375a86 - (as_int4(value) >> 1));
    const float4 half_value = 0.5f * value;
    const float4 better = guess * (1.5f - half_value * guess * guess);
    return better * (1.5f - half_value * better * better);
#else
    return native_rsqrt(max(value, 1e-36f));
#endif
}

static inline float4 DistanceEach(Vectors v, float3 to) {
    const float4 x = v.x - to.x;
    const float4 y = v.y - to.y;
    const float4 z = v.z - to.z;
    const float4 square = min(x * x + y * y + z * z, 1e36f);
    return square * InverseRoot(square);
}

// The pixel's features, scaled for comparison.
static inline void ReadCentreFeatures(IMAGE_PARAMETERS, int2 at, Centre* centre) {
    const float4 normal = IS_ABSENT(normalsBuff) ? (float4)(0.0f) : ReadPixel(normalsBuff, at.x, at.y);
    const float4 depth = IS_ABSENT(depthBuff) ? (float4)(0.0f) : (float4)(ReadPixel(depthBuff, at.x, at.y).x);
    const float4 transition = IS_ABSENT(transBuff) ? (float4)(0.0f) : ReadPixel(transBuff, at.x, at.y);
    const bool normal_usable = IsUsable((float4)(normal.xyz, 0.0f));
    centre->normal_usable = normal_usable ? -1 : 0;
    centre->depth_usable = IsUsable(depth) ? -1 : 0;
    centre->transition_usable = IsUsable(transition) ? -1 : 0;
    centre->normal = Normalized((normal_usable ? normal.xyz : (float3)(0.0f)) + 0.01f);
    centre->depth = UsableOr(depth, (float4)(0.0f)).x;
    centre->transition = DivideByAlpha(UsableOr(transition, (float4)(0.0f)));
}

// Gradient of the depth with the Sobel weights.
static inline float2 DepthGradient(srcBufferType(depthBuff), int2 size, int2 at, float centre_depth) {
    float2 gradient = (float2)(0.0f);
    if (IS_ABSENT(depthBuff)) {
        return gradient;
    }
    const int4 columns = ReflectOnce((int4)(at.x - 1, at.x, at.x + 1, at.x), size.x);
    const int4 rows = ReflectOnce((int4)(at.y - 1, at.y, at.y + 1, at.y), size.y);
    const float4 above = (float4)(ReadPixel(depthBuff, columns.x, rows.x).x, ReadPixel(depthBuff, columns.y, rows.x).x,
                                  ReadPixel(depthBuff, columns.z, rows.x).x, 0.0f);
    const float4 beside = (float4)(ReadPixel(depthBuff, columns.x, rows.y).x, centre_depth,
                                   ReadPixel(depthBuff, columns.z, rows.y).x, 0.0f);
    const float4 below = (float4)(ReadPixel(depthBuff, columns.x, rows.z).x, ReadPixel(depthBuff, columns.y, rows.z).x,
                                  ReadPixel(depthBuff, columns.z, rows.z).x, 0.0f);
    const float4 a = select((float4)(centre_depth), above, UsableEach(above));
    const float4 b = select((float4)(centre_depth), beside, UsableEach(beside));
    const float4 c = select((float4)(centre_depth), below, UsableEach(below));
    gradient.x = a.x - a.z + 2.0f * (b.x - b.z) + c.x - c.z;
    gradient.y = a.x + 2.0f * a.y + a.z - c.x - 2.0f * c.y - c.z;
    return gradient;
}

#ifdef FIRST_LEVEL
// Length of a variance's components, 0 where one is unusable.
static inline float VarianceLength(float4 variance) {
    return fast_length(UsableOr(variance, (float4)(0.0f)));
}

// The variance image, blurred with a small Gaussian.
static inline float BlurredVariance(srcBufferType(vColorBuff), int2 size, int2 at) {
    float4 blurred = (float4)(0.0f);
    if (IS_ABSENT(vColorBuff)) {
        return 0.0f;
    }
    const int4 columns = ReflectOnce((int4)(at.x - 1, at.x, at.x + 1, at.x), size.x);
    const int4 rows = ReflectOnce((int4)(at.y - 1, at.y, at.y + 1, at.y), size.y);
    const int column[3] = {columns.x, columns.y, columns.z};
    const int row[3] = {rows.x, rows.y, rows.z};
    for (int i = 0; i < 3; ++i) {
        for (int j = 0; j < 3; ++j) {
            const float gauss = i == 1 && j == 1 ? 0.195346f : (i == 1 || j == 1 ? 0.123317f : 0.077847f);
            blurred += UsableOr(ReadPixel(vColorBuff, column[j], row[i]), (float4)(0.0f)) * gauss;
        }
    }
    return length(blurred.xyz);
}
#endif

// Colours of four pixels, divided by alpha; zeros in place of unusable ones. Also their variances.
static inline int4 ReadColors(IMAGE_PARAMETERS, int2 size, Places p, Vectors* color, float4* variance) {
    const float4 a = ReadPixel(srcBuffer, p.x.s0, p.y.s0);
    const float4 b = ReadPixel(srcBuffer, p.x.s1, p.y.s1);
    const float4 c = ReadPixel(srcBuffer, p.x.s2, p.y.s2);
    const float4 d = ReadPixel(srcBuffer, p.x.s3, p.y.s3);
    *color = Transposed(a, b, c, d);
#ifdef FIRST_LEVEL
    const float4 alpha = (float4)(a.w, b.w, c.w, d.w);
    const int4 usable = KeepUsable(color) & UsableEach(alpha);
    DivideEach(color, ZeroUnless(usable, alpha));
    if (IS_ABSENT(vColorBuff)) {
        *variance = (float4)(0.0f);
    } else {
        *variance = (float4)(VarianceLength(ReadPixel(vColorBuff, p.x.s0, p.y.s0)),
                             VarianceLength(ReadPixel(vColorBuff, p.x.s1, p.y.s1)),
                             VarianceLength(ReadPixel(vColorBuff, p.x.s2, p.y.s2)),
                             VarianceLength(ReadPixel(vColorBuff, p.x.s3, p.y.s3)));
    }
    return usable;
#else
    // What the level before has written is finite and has alpha 1.
    __global const float* stored = slots + 4 * (size_t)size.x * (size_t)size.y + READ_SLOT;
    *variance = (float4)(stored[2 * PixelIndex(size, p.x.s0, p.y.s0)], stored[2 * PixelIndex(size, p.x.s1, p.y.s1)],
                         stored[2 * PixelIndex(size, p.x.s2, p.y.s2)], stored[2 * PixelIndex(size, p.x.s3, p.y.s3)]);
    return *variance >= (float4)(0.0f);
#endif
}

// Exponent of the features' weights of four taps, 0 and less; which taps have usable features like the centre or
// unusable ones like it.
static inline float4 FeatureExponent(IMAGE_PARAMETERS, const Centre* centre, Places p, float4 depth_factor,
                                     int4* comparable) {
    *comparable = (int4)(-1);
    float4 exponent = (float4)(0.0f);
    if (!IS_ABSENT(normalsBuff)) {
        Vectors normal =
            Transposed(ReadPixel(normalsBuff, p.x.s0, p.y.s0), ReadPixel(normalsBuff, p.x.s1, p.y.s1),
                       ReadPixel(normalsBuff, p.x.s2, p.y.s2), ReadPixel(normalsBuff, p.x.s3, p.y.s3));
        const int4 usable = KeepUsable(&normal);
        const float4 x = normal.x + 0.01f;
        const float4 y = normal.y + 0.01f;
        const float4 z = normal.z + 0.01f;
        const float4 product = x * centre->normal.x + y * centre->normal.y + z * centre->normal.z;
        const float4 cosine = product * InverseRoot(min(x * x + y * y + z * z, 1e36f));
        *comparable &= (usable == (int4)(centre->normal_usable)) & (cosine > (float4)(0.0f));
        exponent += Log2(max(cosine, 1e-36f)) * centre->normal_factor;
    }
    if (!IS_ABSENT(depthBuff)) {
        float4 depth = (float4)(ReadPixel(depthBuff, p.x.s0, p.y.s0).x, ReadPixel(depthBuff, p.x.s1, p.y.s1).x,
                                ReadPixel(depthBuff, p.x.s2, p.y.s2).x, ReadPixel(depthBuff, p.x.s3, p.y.s3).x);
        const int4 usable = UsableEach(depth);
        *comparable &= usable == (int4)(centre->depth_usable);
        exponent += fabs(ZeroUnless(usable, depth) - centre->depth) * depth_factor;
    }
    if (!IS_ABSENT(transBuff)) {
        const float4 a = ReadPixel(transBuff, p.x.s0, p.y.s0);
        const float4 b = ReadPixel(transBuff, p.x.s1, p.y.s1);
        const float4 c = ReadPixel(transBuff, p.x.s2, p.y.s2);
        const float4 d = ReadPixel(transBuff, p.x.s3, p.y.s3);
        const float4 alpha = (float4)(a.w, b.w, c.w, d.w);
        Vectors transition = Transposed(a, b, c, d);
        const int4 usable = KeepUsable(&transition) & UsableEach(alpha);
        *comparable &= usable == (int4)(centre->transition_usable);
        DivideEach(&transition, ZeroUnless(usable, alpha));
        exponent += DistanceEach(transition, centre->transition) * centre->transition_factor;
    }
    return exponent;
}

// Adds the taps at steps (i, j) from the centre.
static inline void AddTaps(IMAGE_PARAMETERS, const Centre* centre, int2 size, int2 at, int4 i, int4 j, float4 spline,
                           float4 depth_factor, Sums* sums) {
    Places p;
    p.x = ReflectOnce(at.x + i * offset, size.x);
    p.y = ReflectOnce(at.y + j * offset, size.y);
    Vectors color;
    float4 variance;
    int4 comparable;
    const int4 usable = ReadColors(IMAGES, size, p, &color, &variance);
    float4 exponent = FeatureExponent(IMAGES, centre, p, depth_factor, &comparable);
    exponent += DistanceEach(color, centre->color) * centre->color_factor;
    const float4 weight = ZeroUnless(usable & comparable, spline * Exp2(max(exponent, -126.0f)));
    sums->color.x += color.x * weight;
    sums->color.y += color.y * weight;
    sums->color.z += color.z * weight;
    sums->variance += variance * weight * weight;
    sums->weight += weight;
}

static inline float SumOf(float4 value) {
    return (value.x + value.y) + (value.z + value.w);
}

__kernel void EAWDenoiserKernel(srcBufferType(srcBuffer), srcBufferType(normalsBuff), srcBufferType(depthBuff),
                                srcBufferType(transBuff), srcBufferType(vColorBuff), float colSigma, float normSigma,
                                float dptSigma, float transSigma, dstBufferType(dstBuffer),
                                __global float2* variance) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    int2 coord;
    GET_COORD(coord, size);
    // Neighbours read one float of a pair while its owner writes the other: single floats, never whole pairs.
    __global float* slots = (__global float*)variance;

    const float4 color = ReadPixel(srcBuffer, coord.x, coord.y);
#ifdef FIRST_LEVEL
    const bool color_usable = IsUsable(color);
    const float blurred = BlurredVariance(vColorBuff, size, coord);
    const float own_variance =
        IS_ABSENT(vColorBuff) ? 0.0f : VarianceLength(ReadPixel(vColorBuff, coord.x, coord.y));
#else
    const float own_variance = slots[VarianceIndex(size, coord.x, coord.y) + READ_SLOT];
    const bool color_usable = own_variance >= 0.0f;
    const float blurred = fmax(own_variance, 0.0f);
#endif
    Centre centre;
    centre.color = color_usable ? DivideByAlpha(color) : (float3)(0.0f);
    ReadCentreFeatures(IMAGES, coord, &centre);
    centre.color_factor = color_usable ? -LOG2_E / (colSigma * sqrt(blurred) + 0.00001f) : 0.0f;
    centre.normal_factor = 1.0f / fmax(normSigma, 1e-15f);
    centre.transition_factor = -LOG2_E / fmax(transSigma, 1e-15f);

    // Weights of the B3 spline: products of 1/16, 1/4, 3/8, 1/4, 1/16.
    const float2 gradient = DepthGradient(depthBuff, size, coord, centre.depth) * (float)offset;
    const int4 steps_x[3] = {(int4)(1, 0, 1, 1), (int4)(2, 0, 2, 1), (int4)(2, 1, 2, 2)};
    const int4 steps_y[3] = {(int4)(0, 1, 1, -1), (int4)(0, 2, 1, 2), (int4)(-1, -2, 2, -2)};
    const float4 spline[3] = {(float4)(24.0f, 24.0f, 16.0f, 16.0f) / 256.0f,
                              (float4)(6.0f, 6.0f, 4.0f, 4.0f) / 256.0f,
                              (float4)(4.0f, 4.0f, 1.0f, 1.0f) / 256.0f};
    Sums sums;
    sums.color.x = sums.color.y = sums.color.z = sums.variance = sums.weight = (float4)(0.0f);
    for (int k = 0; k < 3; ++k) {
        const float4 slope = fabs(gradient.x * convert_float4(steps_x[k]) + gradient.y * convert_float4(steps_y[k]));
        const float4 depth_factor = -LOG2_E / (dptSigma * slope + 0.001f);
        AddTaps(IMAGES, &centre, size, coord, steps_x[k], steps_y[k], spline[k], depth_factor, &sums);
        AddTaps(IMAGES, &centre, size, coord, -steps_x[k], -steps_y[k], spline[k], depth_factor, &sums);
    }

    const float own_weight = color_usable ? 9.0f / 64.0f : 0.0f;
    const float weight_sum = SumOf(sums.weight) + own_weight;
    const float variance_sum = SumOf(sums.variance) + own_variance * own_weight * own_weight;
    const float3 color_sum =
        (float3)(SumOf(sums.color.x), SumOf(sums.color.y), SumOf(sums.color.z)) + centre.color * own_weight;
    // Without the centre's weight nothing may be left: then a later level, with wider steps, fills the pixel.
    const bool any = weight_sum > 1e-20f;
    const float divisor = any ? weight_sum : 1.0f;
    const float largest = LARGEST(dstBuffer);
    const float3 filtered = any ? clamp(color_sum / divisor, -largest, largest) : (float3)(0.0f);
    const float filtered_variance = any ? fmin(variance_sum / divisor / divisor, 1e30f) : UNFILLED;
    slots[VarianceIndex(size, coord.x, coord.y) + WRITE_SLOT] = filtered_variance;
    WritePixel(dstBuffer, coord.x, coord.y, (float4)(filtered, 1.0f));
}
