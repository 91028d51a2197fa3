// Local weighted regression: the features reduced to the directions in which they vary within a window more than their
// noise does, the right singular vectors of the matrix of their deviations.

// Of vectors of LANES entries: (1, z0 ... z6), and (z7, z8) where there are more than seven directions.
#define BLOCKS 2

// The reduced directions: entries are (1, 0 ...) + projection * (feature differences to the centre pixel).
typedef struct {
    int rank;
    int blocks;         // Of entries in use.
    float full_weight;  // 0.75 ^ rank
    float8 projection[BLOCKS][FEATURES];
} Space;

// A value of each feature, in the order of Sample.
typedef struct {
    float8 head;
    float last;
} FeatureValues;

// Means of the features over the window; 0 across and down. Returns the number of pixels that take part.
static inline float MeanFeatures(IMAGE_PARAMETERS, const Window* window, FeatureValues* mean) {
    float num = 0.0f;
    float8 sum = (float8)(0.0f);
    float sum_last = 0.0f;
    FOR_EACH_PIXEL(window, x, y) {
        const Sample sample = ReadFeatures(IMAGES, window, x, y, ReadPixel(srcBuffer, x, y));
        const float part = TakesPart(window, &sample) ? 1.0f : 0.0f;
        num += part;
        sum += sample.features * part;
        sum_last += sample.last * part;
    }
    const float inverse = 1.0f / fmax(num, 1.0f);
    mean->head = sum * inverse;
    mean->head.lo.lo = (float2)(0.0f);
    mean->last = sum_last * inverse;
    return num;
}

// Scales that make the features' deviations from the means 1 at most; those of the position count half windows.
static inline float8 FeatureScales(IMAGE_PARAMETERS, const Window* window, FeatureValues mean) {
    float depth_range = 0.0f;
    float normal_range = 0.0f;
    float transition_range = 0.0f;
    FOR_EACH_PIXEL(window, x, y) {
        const Sample sample = ReadFeatures(IMAGES, window, x, y, ReadPixel(srcBuffer, x, y));
        const float part = TakesPart(window, &sample) ? 1.0f : 0.0f;
        const float8 delta = (sample.features - mean.head) * part;
        const float8 square = delta * delta;
        const float last = (sample.last - mean.last) * part;
        depth_range = fmax(depth_range, fabs(delta.s2));
        normal_range = fmax(normal_range, square.s3 + square.s4 + square.s5);
        transition_range = fmax(transition_range, square.s6 + square.s7 + last * last);
    }
    const float position = 1.0f / window->half_window;
    const float depth = 1.0f / fmax(depth_range, 0.01f);
    const float normal = 1.0f / fmax(sqrt(normal_range), 0.01f);
    const float transition = 1.0f / fmax(sqrt(transition_range), 0.01f);
    return (float8)(position, position, depth, normal, normal, normal, transition, transition);
}

// Noise of a pixel's scaled features.
static inline float FeatureNoise(IMAGE_PARAMETERS, const Window* window, float8 scales, int x, int y) {
    const float scale = window->per_variance;
    float noise = 0.0f;
    if (!IS_ABSENT(vDepthBuff)) {
        const float4 depth = (float4)(ReadPixel(vDepthBuff, x, y).y);
        noise += scales.s2 * scales.s2 * clamp(UsableOrZero(depth).x * scale, 0.0f, 1.0f);
    }
    if (!IS_ABSENT(vNormalsBuff)) {
        const float3 normal = clamp(UsableOrZero(ReadPixel(vNormalsBuff, x, y)) * scale, 0.0f, 1.0f);
        noise += scales.s3 * scales.s3 * (normal.x + normal.y + normal.z);
    }
    if (!IS_ABSENT(vTransBuff)) {
        const float3 transition = clamp(UsableOrZero(ReadPixel(vTransBuff, x, y)) * scale, 0.0f, 1.0f);
        noise += scales.s7 * scales.s7 * (transition.x + transition.y + transition.z);
    }
    return noise * window->per_sample;
}

// Sums of the products of the scaled deviations, a symmetric matrix. Returns the sum of their noise.
static inline float SumDeviations(IMAGE_PARAMETERS, const Window* window, FeatureValues mean, float8 scales,
                                  Column* matrix) {
    for (int i = 0; i < FEATURES; ++i) {
        matrix[i].head = (float8)(0.0f);
    }
    matrix[LANES].tail = 0.0f;
    float noise = 0.0f;
    FOR_EACH_PIXEL(window, x, y) {
        const Sample sample = ReadFeatures(IMAGES, window, x, y, ReadPixel(srcBuffer, x, y));
        if (!TakesPart(window, &sample)) {
            continue;
        }
        const float8 delta = (sample.features - mean.head) * scales;
        const float last = (sample.last - mean.last) * scales.s7;
        matrix[0].head += delta * delta.s0;
        matrix[1].head += delta * delta.s1;
        matrix[2].head += delta * delta.s2;
        matrix[3].head += delta * delta.s3;
        matrix[4].head += delta * delta.s4;
        matrix[5].head += delta * delta.s5;
        matrix[6].head += delta * delta.s6;
        matrix[7].head += delta * delta.s7;
        matrix[8].head += delta * last;
        matrix[8].tail += last * last;
        noise += FeatureNoise(IMAGES, window, scales, x, y);
    }
    const float* last_row = (const float*)&matrix[LANES].head;
    for (int i = 0; i < LANES; ++i) {
        matrix[i].tail = last_row[i];
    }
    return noise;
}

static inline void SetIdentity(Column* columns) {
    for (int i = 0; i < FEATURES; ++i) {
        columns[i].head = (float8)(0.0f);
        columns[i].tail = 0.0f;
    }
    for (int i = 0; i < LANES; ++i) {
        ((float*)&columns[i].head)[i] = 1.0f;
    }
    columns[LANES].tail = 1.0f;
}

// Keeps the directions whose deviation, from its fourth power, is above the threshold; always the two of the position.
static inline void KeepDirections(const Column* vectors, const float* s2, float threshold, float8 scales,
                                  Space* space) {
    for (int r = 0; r < FEATURES; ++r) {
        space->projection[0][r] = space->projection[1][r] = (float8)(0.0f);
    }
    int rank = 0;
    for (int c = 0; c < FEATURES; ++c) {
        if (c >= 2 && sqrt(sqrt(fabs(s2[c]))) <= threshold) {
            continue;
        }
        ++rank;
        const float8 head = vectors[c].head * scales;
        for (int r = 0; r < LANES; ++r) {
            ((float*)&space->projection[rank / LANES][r])[rank % LANES] = ((const float*)&head)[r];
        }
        ((float*)&space->projection[rank / LANES][LANES])[rank % LANES] = vectors[c].tail * scales.s7;
    }
    space->rank = rank;
    space->blocks = rank / LANES + 1;
    space->full_weight = 1.0f;
    for (int i = 0; i < rank; ++i) {
        space->full_weight *= 0.75f;
    }
}

// The directions in which the features of the window vary; none for a window without a usable pixel.
static inline void ReduceFeatures(IMAGE_PARAMETERS, const Window* window, Space* space) {
    FeatureValues mean;
    space->rank = 0;
    space->blocks = 0;
    if (MeanFeatures(IMAGES, window, &mean) == 0.0f) {
        return;
    }
    const float8 scales = FeatureScales(IMAGES, window, mean);
    Column matrix[FEATURES];
    Column vectors[FEATURES];
    const float noise = SumDeviations(IMAGES, window, mean, scales, matrix);
    SetIdentity(vectors);
    float s2[FEATURES] = {0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f};
    const int estimated = Decompose(matrix, vectors, s2);
    const float threshold = 0.01f + 2.0f * (sqrt(noise) / (sqrt((float)estimated) * 0.5f));
    KeepDirections(vectors, s2, threshold, scales, space);
}
