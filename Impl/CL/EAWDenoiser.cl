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
// The four weights of a tap are one exponential of a sum.

#ifdef ODD
#define READ_SLOT 1
#define WRITE_SLOT 0
#else
#define READ_SLOT 0
#define WRITE_SLOT 1
#endif

#define LOG2_E 1.44269504f
#define UNFILLED (-1.0f)

// Weights of the B3 spline from its middle on.
__constant float kSpline[3] = {0.375f, 0.25f, 0.0625f};

// Largest colour that the picture between two levels can hold.
#define LARGEST_uint 1.0f
#define LARGEST_half 65504.0f
#define LARGEST_float 1e15f
#define LARGEST__(type) LARGEST_##type
#define LARGEST_(type) LARGEST__(type)
#define LARGEST(name) LARGEST_(name##_COMP_TYPE)

#define IMAGE_PARAMETERS                                                                                      \
    srcBufferType(srcBuffer), srcBufferType(normalsBuff), srcBufferType(depthBuff), srcBufferType(transBuff), \
        srcBufferType(vColorBuff), __global float* slots
#define IMAGES srcBuffer, normalsBuff, depthBuff, transBuff, vColorBuff, slots

// What the taps are compared with.
typedef struct {
    Pixels color;
    Floats variance;
    Pixels normal;  // Of length 1.
    Pixels transition;
    Floats depth;
    Floats slope_x;  // Of the depth, between neighbouring taps.
    Floats slope_y;
    Ints color_usable;
    Ints normal_usable;
    Ints depth_usable;
    Ints transition_usable;
    Floats color_factor;  // Weights are 2^(factor * difference).
} Centre;

typedef struct {
    float color;
    float normal;
    float depth;
    float transition;
} Sigmas;

typedef struct {
    Floats x;
    Floats y;
    Floats z;
    Floats variance;
    Floats weight;
} Sums;

// A pixel's coordinate reflected about the borders; pictures too small for one reflection clamp the rest.
#define DEFINE_REFLECT(name, ints)                                                         \
    INLINED ints name(ints value, int size) {                                              \
        const ints positive = value ^ (value >> 31);                                       \
        return clamp(min(positive, 2 * size - 1 - positive), (ints)(0), (ints)(size - 1)); \
    }
DEFINE_REFLECT(ReflectColumns, Ints)
DEFINE_REFLECT(ReflectRow, int)

// Variances start behind the intermediate picture.
INLINED size_t VarianceIndex(int2 size, int x, int y) {
    return 2 * (2 * (size_t)size.x * (size_t)size.y + PixelIndex(size, x, y));
}

INLINED Floats ReadSlots(__global const float* slots, int2 size, Ints columns, int row) {
    __global const float* stored = slots + VarianceIndex(size, 0, row) + READ_SLOT;
#if ON_CENTRAL_PROCESSOR
    const int8 at = 2 * columns;
    return (float8)(stored[at.s0], stored[at.s1], stored[at.s2], stored[at.s3], stored[at.s4], stored[at.s5],
                    stored[at.s6], stored[at.s7]);
#else
    return stored[2 * columns];
#endif
}

INLINED Floats Distance(const Pixels* a, const Pixels* b) {
    return Length(a->x - b->x, a->y - b->y, a->z - b->z);
}

INLINED Ints ReadNormals(srcBufferType(normalsBuff), Ints columns, int row, Pixels* normals) {
    READ(normalsBuff, columns, row, normals);
    const Ints usable = KeepUsable(normals);
    normals->x += 0.01f;
    normals->y += 0.01f;
    normals->z += 0.01f;
    return usable;
}

INLINED Ints ReadDepths(srcBufferType(depthBuff), Ints columns, int row, Floats* depths) {
    Pixels read;
    READ(depthBuff, columns, row, &read);
    const Ints usable = Usable(Magnitude(read.x));
    *depths = ZeroUnless(usable, read.x);
    return usable;
}

INLINED Ints ReadTransitions(srcBufferType(transBuff), Ints columns, int row, Pixels* transitions) {
    READ(transBuff, columns, row, transitions);
    return DivideUsable(transitions);
}

// Depths beside the centre, its own where they are unusable.
INLINED Floats DepthBeside(srcBufferType(depthBuff), Ints columns, int row, Floats centre_depth) {
    Floats depths;
    const Ints usable = ReadDepths(depthBuff, columns, row, &depths);
    return depths + AS_FLOATS(AS_INTS(centre_depth) & ~usable);
}

// Gradient of the depth with the Sobel weights.
INLINED void FindSlope(srcBufferType(depthBuff), int2 size, Ints columns, int row, Centre* centre) {
    centre->slope_x = centre->slope_y = (Floats)(0.0f);
    if (IS_ABSENT(depthBuff)) {
        return;
    }
    const Ints left = ReflectColumns(columns - 1, size.x);
    const Ints right = ReflectColumns(columns + 1, size.x);
    for (int j = -1; j <= 1; ++j) {
        const int at = ReflectRow(row + j, size.y);
        const Floats a = DepthBeside(depthBuff, left, at, centre->depth);
        const Floats b = DepthBeside(depthBuff, columns, at, centre->depth);
        const Floats c = DepthBeside(depthBuff, right, at, centre->depth);
        centre->slope_x += (float)((2 - j * j) * offset) * (a - c);
        centre->slope_y -= (float)(j * offset) * (a + 2.0f * b + c);
    }
}

#ifdef FIRST_LEVEL
INLINED void ReadVariance(srcBufferType(vColorBuff), Ints columns, int row, Pixels* variance) {
    READ(vColorBuff, columns, row, variance);
    const Ints usable = KeepUsable(variance) & Usable(Magnitude(variance->w));
    variance->x = ZeroUnless(usable, variance->x);
    variance->y = ZeroUnless(usable, variance->y);
    variance->z = ZeroUnless(usable, variance->z);
    variance->w = ZeroUnless(usable, variance->w);
}

// The variance image, blurred with a small Gaussian; its length.
INLINED Floats BlurredVariance(srcBufferType(vColorBuff), int2 size, Ints columns, int row) {
    if (IS_ABSENT(vColorBuff)) {
        return (Floats)(0.0f);
    }
    Floats x = (Floats)(0.0f);
    Floats y = x;
    Floats z = x;
    for (int i = -1; i <= 1; ++i) {
        const Ints beside = ReflectColumns(columns + i, size.x);
        for (int j = -1; j <= 1; ++j) {
            Pixels variance;
            ReadVariance(vColorBuff, beside, ReflectRow(row + j, size.y), &variance);
            const int distance = i * i + j * j;
            const float gauss = distance == 0 ? 0.195346f : distance == 1 ? 0.123317f : 0.077847f;
            x += variance.x * gauss;
            y += variance.y * gauss;
            z += variance.z * gauss;
        }
    }
    return Length(x, y, z);
}
#endif

// Colours divided by alpha, zeros in place of unusable ones, and their variances; which colours were usable.
INLINED Ints ReadColors(IMAGE_PARAMETERS, int2 size, Ints columns, int row, Pixels* colors, Floats* variances) {
    READ(srcBuffer, columns, row, colors);
#ifdef FIRST_LEVEL
    *variances = (Floats)(0.0f);
    if (!IS_ABSENT(vColorBuff)) {
        Pixels v;
        ReadVariance(vColorBuff, columns, row, &v);
        const Floats square = v.x * v.x + v.y * v.y + v.z * v.z + v.w * v.w;
        *variances = square * InverseRoot(min(square, 1e36f));
    }
    return DivideUsable(colors);
#else
    // What the level before has written is finite and has alpha 1; where it found nothing the variance is negative.
    *variances = ReadSlots(slots, size, columns, row);
    return Exceeds(*variances, 0.5f * UNFILLED);
#endif
}

INLINED void ReadCentre(IMAGE_PARAMETERS, int2 size, Ints columns, int row, float color_sigma, Centre* centre) {
    centre->color_usable = ReadColors(IMAGES, size, columns, row, &centre->color, &centre->variance);
#ifdef FIRST_LEVEL
    const Floats blurred = BlurredVariance(vColorBuff, size, columns, row);
#else
    const Floats blurred = max(centre->variance, 0.0f);
#endif
    centre->color_factor = ZeroUnless(centre->color_usable, -LOG2_E / (color_sigma * sqrt(blurred) + 0.00001f));
    centre->normal_usable = ReadNormals(normalsBuff, columns, row, &centre->normal);
    const Pixels n = centre->normal;
    const Floats scale = 1.0f / sqrt(max(n.x * n.x + n.y * n.y + n.z * n.z, 1e-36f));
    centre->normal.x *= scale;
    centre->normal.y *= scale;
    centre->normal.z *= scale;
    centre->depth_usable = ReadDepths(depthBuff, columns, row, &centre->depth);
    FindSlope(depthBuff, size, columns, row, centre);
    centre->transition_usable = ReadTransitions(transBuff, columns, row, &centre->transition);
}

// Exponent of the features' weights, 0 and less, of the taps (i, j) steps away; which taps have usable features like
// the centre or unusable ones like it.
INLINED Floats FeatureExponent(IMAGE_PARAMETERS, const Centre* centre, const Sigmas* sigmas, int i, int j, Ints columns,
                               int row, Ints* comparable) {
    Floats exponent = (Floats)(0.0f);
    *comparable = (Ints)(-1);
    if (!IS_ABSENT(normalsBuff)) {
        Pixels n;
        const Ints usable = ReadNormals(normalsBuff, columns, row, &n);
        // The cosine's square, which is 1 for normals that are the same.
        const Floats product = max(n.x * centre->normal.x + n.y * centre->normal.y + n.z * centre->normal.z, 0.0f);
        const Floats square = product * product / max(n.x * n.x + n.y * n.y + n.z * n.z, 1e-36f);
        *comparable &= Same(usable, centre->normal_usable) & Exceeds(square, 1e-36f);
        exponent += LOG2(clamp(square, 1e-36f, 1.0f)) * (0.5f / fmax(sigmas->normal, 1e-15f));
    }
    if (!IS_ABSENT(depthBuff)) {
        Floats depth;
        *comparable &= Same(ReadDepths(depthBuff, columns, row, &depth), centre->depth_usable);
        const Floats slope = fabs(centre->slope_x * (float)i + centre->slope_y * (float)j);
        exponent -= fabs(depth - centre->depth) * (LOG2_E / (sigmas->depth * slope + 0.001f));
    }
    if (!IS_ABSENT(transBuff)) {
        Pixels transition;
        *comparable &= Same(ReadTransitions(transBuff, columns, row, &transition), centre->transition_usable);
        exponent -= Distance(&transition, &centre->transition) * (LOG2_E / fmax(sigmas->transition, 1e-15f));
    }
    return exponent;
}

// Adds the taps (i, j) steps away.
INLINED void AddTap(IMAGE_PARAMETERS, const Centre* centre, const Sigmas* sigmas, int2 size, int i, int j, Ints columns,
                    int row, Sums* sums) {
    Pixels color;
    Floats variance;
    Ints comparable;
    const Ints usable = ReadColors(IMAGES, size, columns, row, &color, &variance);
    Floats exponent = FeatureExponent(IMAGES, centre, sigmas, i, j, columns, row, &comparable);
    exponent += Distance(&color, &centre->color) * centre->color_factor;
    const float spline = kSpline[abs(i)] * kSpline[abs(j)];
    const Floats weight = ZeroUnless(usable & comparable, spline * EXP2(max(exponent, -126.0f)));
    sums->x += color.x * weight;
    sums->y += color.y * weight;
    sums->z += color.z * weight;
    sums->variance += variance * weight * weight;
    sums->weight += weight;
}

// The pixels from `at` on.
INLINED void FilterAt(IMAGE_PARAMETERS, const Sigmas* sigmas, dstBufferType(dstBuffer), int2 size, int2 at) {
    Centre centre;
    ReadCentre(IMAGES, size, min(at.x + LANE_NUMBERS, (Ints)(size.x - 1)), at.y, sigmas->color, &centre);
    // The centre itself, at full likeness.
    const Floats own_weight = ZeroUnless(centre.color_usable, (Floats)(kSpline[0] * kSpline[0]));
    Sums sums;
    sums.x = centre.color.x * own_weight;
    sums.y = centre.color.y * own_weight;
    sums.z = centre.color.z * own_weight;
    sums.variance = centre.variance * own_weight * own_weight;
    sums.weight = own_weight;
    for (int i = -2; i <= 2; ++i) {
        const Ints columns = ReflectColumns(at.x + LANE_NUMBERS + i * offset, size.x);
        for (int j = -2; j <= 2; ++j) {
            if (i != 0 || j != 0) {
                const int row = ReflectRow(at.y + j * offset, size.y);
                AddTap(IMAGES, &centre, sigmas, size, i, j, columns, row, &sums);
            }
        }
    }
    // Without the centre's weight nothing may be left: then a later level, with wider steps, fills the pixel.
    const Ints any = Exceeds(sums.weight, 1e-20f);
    const Floats inverse = ZeroUnless(any, 1.0f / max(sums.weight, 1e-20f));
    const float largest = LARGEST(dstBuffer);
    const Floats x = clamp(sums.x * inverse, -largest, largest);
    const Floats y = clamp(sums.y * inverse, -largest, largest);
    const Floats z = clamp(sums.z * inverse, -largest, largest);
    const Floats filtered = min(sums.variance * inverse * inverse, 1e30f);
    const Floats variance = AS_FLOATS((AS_INTS(filtered) & any) | (AS_INTS((Floats)(UNFILLED)) & ~any));
#define STORE(k)                                                                                   \
    if (at.x + k < size.x) {                                                                       \
        slots[VarianceIndex(size, at.x + k, at.y) + WRITE_SLOT] = LANE(variance, k);               \
        WritePixel(dstBuffer, at.x + k, at.y, (float4)(LANE(x, k), LANE(y, k), LANE(z, k), 1.0f)); \
    }
    FOR_EACH_LANE(STORE)
}

__kernel void EAWDenoiserKernel(srcBufferType(srcBuffer), srcBufferType(normalsBuff), srcBufferType(depthBuff),
                                srcBufferType(transBuff), srcBufferType(vColorBuff), float colSigma, float normSigma,
                                float dptSigma, float transSigma, dstBufferType(dstBuffer), __global float2* variance) {
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    int2 coord;
    GET_COORD(coord, size);
    if (coord.x % LANES != 0) {
        return;
    }
    // Neighbours read one float of a pair while its owner writes the other: single floats, never whole pairs.
    __global float* slots = (__global float*)variance;
    Sigmas sigmas;
    sigmas.color = colSigma;
    sigmas.normal = normSigma;
    sigmas.depth = dptSigma;
    sigmas.transition = transSigma;
    FilterAt(IMAGES, &sigmas, dstBuffer, size, coord);
}
