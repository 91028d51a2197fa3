// Local weighted regression, after B. Moon et al., "Adaptive Rendering Based on Weighted Local Regression" (2014): a
// pixel becomes the value there of a linear fit of colour over position, depth, normal and transition colour in its
// window. The features are first reduced to the directions in which they vary, then five bandwidths are tried, and the
// one that balances the fit's bias against its variance is used.
//
// Pixels whose colour holds NaN or infinity are left out of every window, and so are those of which another feature is
// unusable than at the centre (finite depth beside the infinite depth of a sky). An unusable variance counts as 0.

//
// Sums over a window run on vectors of eight entries, (1, z0 ... z6) and, where there are more than seven directions,
// (z7, z8). A window is walked six times: the five bandwidths share one walk, and what a fit gives at its centre and the
// variance of that are linear and quadratic in sums of the same walk as its matrix.

#define BLOCK_SIZE 8
#define FEATURES 9
#define LANES 8
#define BLOCKS 2
#define ROWS (FEATURES + 1)
#define SQUARE_ROWS (2 * BLOCKS * LANES)
#define ESTIMATE_SIZE (2 * FEATURES + 1)
#define CANDIDATES 5

// The models of bias and variance over the bandwidth are solved in double precision where there is such a thing.
#ifdef cl_khr_fp64
typedef double real;
#else
typedef float real;
#endif

#define IMAGE_PARAMETERS                                                                                            \
    srcBufferType(srcBuffer), srcBufferType(vColorBuff), srcBufferType(transBuff), srcBufferType(vTransBuff),       \
        srcBufferType(normalsBuff), srcBufferType(vNormalsBuff), srcBufferType(depthBuff), srcBufferType(vDepthBuff)
#define IMAGES srcBuffer, vColorBuff, transBuff, vTransBuff, normalsBuff, vNormalsBuff, depthBuff, vDepthBuff

// What the windows of one work item share: pixels low to high, and the scales of the inputs, which are sums of samples.
typedef struct {
    int2 centre;
    int2 low;
    int2 high;
    float half_window;
    float per_sample;    // 1 / samples
    float per_variance;  // 1 / (samples - 1)
    int usable;          // Which features of the centre are usable, as in Sample.
} Window;

// One pixel, scaled to means; zeros in place of unusable features.
typedef struct {
    float8 features;  // Steps from the centre across and down, depth, normal, red and green of the transition colour.
    float last;       // Its blue.
    float3 color;
    float variance;  // Mean of the three channels' variances, of the mean.
    int usable;      // Bits: 1 normal, 2 depth, 4 transition.
    bool color_usable;
} Sample;

// The reduced directions: entries are (1, 0 ...) + projection * (feature differences to the centre pixel).
typedef struct {
    int rank;
    int blocks;         // Of entries in use.
    float full_weight;  // 0.75 ^ rank
    float8 projection[BLOCKS][FEATURES];
} Space;

// Weighted sums over a window of entry * entry and of colour * entry; row r of a block is entry r times the block.
typedef struct {
    float8 products[BLOCKS][ROWS];
    float8 red[BLOCKS];
    float8 green[BLOCKS];
    float8 blue[BLOCKS];
} FitSums;

static inline float SumOf(float8 value) {
    const float4 half_sum = value.lo + value.hi;
    const float2 quarter_sum = half_sum.lo + half_sum.hi;
    return quarter_sum.x + quarter_sum.y;
}

static inline float ProductOf(float8 value) {
    const float4 half_product = value.lo * value.hi;
    const float2 quarter_product = half_product.lo * half_product.hi;
    return quarter_product.x * quarter_product.y;
}

static inline float Mean3(float3 value) {
    return (value.x + value.y + value.z) * (1.0f / 3.0f);
}

static inline float3 UsableOrZero(float4 value) {
    return IsUsable(value) ? value.xyz : (float3)(0.0f);
}

static inline bool AllUsable(float4 a, float4 b, float4 c, float4 d) {
    const uint4 ab = max(as_uint4(a) & 0x7fffffffu, as_uint4(b) & 0x7fffffffu);
    const uint4 cd = max(as_uint4(c) & 0x7fffffffu, as_uint4(d) & 0x7fffffffu);
    return IsUsable(as_float4(max(ab, cd)));
}

// The features beside a colour.
static inline Sample ReadFeatures(IMAGE_PARAMETERS, const Window* window, int x, int y, float4 color) {
    float4 transition = IS_ABSENT(transBuff) ? (float4)(0.0f) : ReadPixel(transBuff, x, y);
    float4 normal = IS_ABSENT(normalsBuff) ? (float4)(0.0f) : ReadPixel(normalsBuff, x, y);
    float4 depth = IS_ABSENT(depthBuff) ? (float4)(0.0f) : (float4)(ReadPixel(depthBuff, x, y).y);
    Sample sample;
    sample.usable = 7;
    sample.color_usable = true;
    if (!AllUsable(transition, normal, depth, color)) {
        sample.usable = (IsUsable(normal) ? 1 : 0) + (IsUsable(depth) ? 2 : 0) + (IsUsable(transition) ? 4 : 0);
        sample.color_usable = IsUsable(color);
        transition.xyz = UsableOrZero(transition);
        normal.xyz = UsableOrZero(normal);
        depth.x = UsableOrZero(depth).x;
    }
    const float3 t = transition.xyz * window->per_sample;
    sample.features = (float8)((float)(x - window->centre.x), (float)(y - window->centre.y),
                               depth.x * window->per_sample, normal.xyz * window->per_sample, t.x, t.y);
    sample.last = t.z;
    return sample;
}

static inline Sample ReadSample(IMAGE_PARAMETERS, const Window* window, int x, int y) {
    const float4 color = ReadPixel(srcBuffer, x, y);
    const float4 variance = IS_ABSENT(vColorBuff) ? (float4)(0.0f) : ReadPixel(vColorBuff, x, y);
    Sample sample = ReadFeatures(IMAGES, window, x, y, color);
    sample.color = UsableOrZero(color) * window->per_sample;
    sample.variance = fmax(Mean3(UsableOrZero(variance)), 0.0f) * window->per_sample * window->per_variance;
    return sample;
}

static inline bool TakesPart(const Window* window, const Sample* sample) {
    return sample->color_usable && sample->usable == window->usable;
}

// Whether a pixel's mean is too far from the centre's for the noise of the two.
static inline bool IsOutlier(const Sample* centre, const Sample* sample) {
    const float limit = 3.0f * (sqrt(centre->variance) + sqrt(sample->variance)) + 0.005f;
    return centre->color_usable && fabs(Mean3(sample->color) - Mean3(centre->color)) > limit;
}

// ---- Linear algebra ------------------------------------------------------------------------------------------------

// Factors the symmetric matrix A (upper triangle, row length `stride`) into L L^T; L takes the lower triangle, with the
// inverses of its diagonal.
static inline void Cholesky(float* a, int stride, int n) {
    for (int i = 0; i < n; ++i) {
        for (int j = 0; j <= i; ++j) {
            float s = a[j * stride + i];
            for (int k = 0; k < j; ++k) {
                s -= a[i * stride + k] * a[j * stride + k];
            }
            // The ridge keeps the root positive but for rounding over large windows.
            a[i * stride + j] = i == j ? rsqrt(fmax(s, 1e-6f)) : s * a[j * stride + j];
        }
    }
}

// Solves L L^T x = b, in place.
static inline void Substitute(const float* a, int stride, int n, float3* b) {
    for (int i = 0; i < n; ++i) {
        for (int k = 0; k < i; ++k) {
            b[i] -= a[i * stride + k] * b[k];
        }
        b[i] *= a[i * stride + i];
    }
    for (int i = n - 1; i >= 0; --i) {
        for (int k = i + 1; k < n; ++k) {
            b[i] -= a[k * stride + i] * b[k];
        }
        b[i] *= a[i * stride + i];
    }
}

// A column of nine.
typedef struct {
    float8 head;
    float tail;
} Column;

static inline float DotColumns(Column a, Column b) {
    return SumOf(a.head * b.head) + a.tail * b.tail;
}

static inline void RotateColumns(Column* a, Column* b, float c, float s) {
    const Column x = *a;
    const Column y = *b;
    a->head = x.head * c + y.head * s;
    a->tail = x.tail * c + y.tail * s;
    b->head = y.head * c - x.head * s;
    b->tail = y.tail * c - x.tail * s;
}

// Singular values of the symmetric 9 x 9 matrix u by one-sided Jacobi rotations of its columns, after J. C. Nash,
// "Compact Numerical Methods for Computers". Gives the right vectors v, the squared values s2 and the rank.
static inline int Decompose(Column* u, Column* v, float* s2) {
    const float eps = 1e-7f;
    const float e2 = 10.0f * FEATURES * eps * eps;
    const float tol = 0.1f * eps;
    int rank = FEATURES;
    int rotations = rank * (rank - 1) / 2;
    for (int sweep = 0; rotations != 0 && sweep <= 6; ++sweep) {
        rotations = rank * (rank - 1) / 2;
        for (int j = 0; j < rank - 1; ++j) {
            for (int k = j + 1; k < rank; ++k) {
                float p = DotColumns(u[j], u[k]);
                float q = DotColumns(u[j], u[j]);
                float r = DotColumns(u[k], u[k]);
                s2[j] = q;
                s2[k] = r;
                float c = 1.0f;
                float s = 0.0f;
                if (q >= r) {
                    if (q <= e2 * s2[0] || fabs(p) <= tol * q) {
                        --rotations;
                        continue;
                    }
                    p /= q;
                    r = 1.0f - r / q;
                    const float vt = fmax(sqrt(4.0f * p * p + r * r), 1e-30f);
                    c = sqrt(0.5f * (1.0f + r / vt));
                    s = p / (vt * c);
                } else {
                    p /= r;
                    q = q / r - 1.0f;
                    const float vt = fmax(sqrt(4.0f * p * p + q * q), 1e-30f);
                    s = sqrt(fmax(0.5f * (1.0f - q / vt), 0.25f));
                    s = p < 0.0f ? -s : s;
                    c = p / (vt * s);
                }
                RotateColumns(&u[j], &u[k], c, s);
                RotateColumns(&v[j], &v[k], c, s);
            }
        }
        while (rank >= 3 && s2[rank - 1] <= s2[0] * tol + tol * tol) {
            --rank;
        }
    }
    return rank;
}

// ---- Reduction of the features -------------------------------------------------------------------------------------

// Means of the features over the window; 0 across and down. Returns the number of pixels that take part.
static inline float MeanFeatures(IMAGE_PARAMETERS, const Window* window, float8* mean, float* mean_last) {
    float num = 0.0f;
    float8 sum = (float8)(0.0f);
    float sum_last = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadFeatures(IMAGES, window, x, y, ReadPixel(srcBuffer, x, y));
            const float part = TakesPart(window, &sample) ? 1.0f : 0.0f;
            num += part;
            sum += sample.features * part;
            sum_last += sample.last * part;
        }
    }
    const float inverse = 1.0f / fmax(num, 1.0f);
    *mean = sum * inverse;
    (*mean).lo.lo = (float2)(0.0f);
    *mean_last = sum_last * inverse;
    return num;
}

// Scales that make the features' deviations from the means 1 at most; those of the position count half windows.
static inline float8 FeatureScales(IMAGE_PARAMETERS, const Window* window, float8 mean, float mean_last) {
    float depth_range = 0.0f;
    float normal_range = 0.0f;
    float transition_range = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadFeatures(IMAGES, window, x, y, ReadPixel(srcBuffer, x, y));
            const float part = TakesPart(window, &sample) ? 1.0f : 0.0f;
            const float8 delta = (sample.features - mean) * part;
            const float8 square = delta * delta;
            const float last = (sample.last - mean_last) * part;
            depth_range = fmax(depth_range, fabs(delta.s2));
            normal_range = fmax(normal_range, square.s3 + square.s4 + square.s5);
            transition_range = fmax(transition_range, square.s6 + square.s7 + last * last);
        }
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

// The directions in which the features of the window vary; none for a window without a usable pixel.
static inline void ReduceFeatures(IMAGE_PARAMETERS, const Window* window, Space* space) {
    float8 mean;
    float mean_last;
    space->rank = 0;
    space->blocks = 0;
    if (MeanFeatures(IMAGES, window, &mean, &mean_last) == 0.0f) {
        return;
    }
    const float8 scales = FeatureScales(IMAGES, window, mean, mean_last);
    Column matrix[FEATURES];
    Column vectors[FEATURES];
    for (int i = 0; i < FEATURES; ++i) {
        matrix[i].head = vectors[i].head = (float8)(0.0f);
        matrix[i].tail = vectors[i].tail = 0.0f;
    }
    float norm = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadFeatures(IMAGES, window, x, y, ReadPixel(srcBuffer, x, y));
            if (!TakesPart(window, &sample)) {
                continue;
            }
            const float8 delta = (sample.features - mean) * scales;
            const float last = (sample.last - mean_last) * scales.s7;
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
            norm += FeatureNoise(IMAGES, window, scales, x, y);
        }
    }
    const float* last_row = (const float*)&matrix[8].head;
    for (int i = 0; i < LANES; ++i) {
        matrix[i].tail = last_row[i];
        ((float*)&vectors[i].head)[i] = 1.0f;
    }
    vectors[LANES].tail = 1.0f;

    float s2[FEATURES] = {0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f};
    const int estimated = Decompose(matrix, vectors, s2);
    const float threshold = 0.01f + 2.0f * (sqrt(norm) / (sqrt((float)estimated) * 0.5f));
    for (int r = 0; r < FEATURES; ++r) {
        space->projection[0][r] = space->projection[1][r] = (float8)(0.0f);
    }
    int rank = 0;
    for (int c = 0; c < FEATURES; ++c) {
        // The two directions of the position always count.
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

// ---- Entries and weights -------------------------------------------------------------------------------------------

static inline void ComputeEntries(const Space* space, const Sample* centre, const Sample* sample, float8* entries) {
    const float8 d = sample->features - centre->features;
    const float last = sample->last - centre->last;
    entries[0] = (float8)(1.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f);
    entries[1] = (float8)(0.0f);
    for (int b = 0; b < space->blocks; ++b) {
        const float8* p = space->projection[b];
        entries[b] += d.s0 * p[0] + d.s1 * p[1] + d.s2 * p[2] + d.s3 * p[3] + d.s4 * p[4] + d.s5 * p[5] +
                      d.s6 * p[6] + d.s7 * p[7] + last * p[8];
    }
}

// Epanechnikov kernel, lowered for noisy pixels: 0.75 (1 - t^2) for each direction, whose t^2 is an entry of `squares`
// (other entries are 0) times `factor`. `full` is the weight of t = 0 and of this pixel.
static inline float KernelWeight(const Space* space, const float8* squares, float factor, float full) {
    float weight = full * ProductOf(max(1.0f - squares[0] * factor, 0.0f));
    if (space->blocks > 1) {
        weight *= ProductOf(max(1.0f - squares[1] * factor, 0.0f));
    }
    return weight;
}

static inline float FullWeight(const Space* space, const Sample* sample) {
    return space->full_weight / fmax(1.0f, sample->variance);
}

// Bandwidth of each reduced direction, from the curvature of a fit with squares over the whole window. Gives the
// inverses of the squared bandwidths, in the order of the entries.
static inline void EstimateBandwidths(IMAGE_PARAMETERS, const Window* window, const Sample* centre, const Space* space,
                                      float factor, float8* inverse_squares) {
    const int rank = space->rank;
    const int blocks = space->blocks;
    const int squares_at = blocks * LANES;  // Entries, then as many squares; the square of 1 is left 0.
    float8 products[2 * BLOCKS][SQUARE_ROWS];
    float8 colors[3][2 * BLOCKS];
    float8 entries[2 * BLOCKS];
    for (int b = 0; b < 2 * blocks; ++b) {
        for (int r = 0; r < 2 * squares_at; ++r) {
            products[b][r] = (float8)(0.0f);
        }
        colors[0][b] = colors[1][b] = colors[2][b] = (float8)(0.0f);
    }
    const float* entry = (const float*)entries;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample)) {
                continue;
            }
            float8 own[BLOCKS];
            ComputeEntries(space, centre, &sample, own);
            for (int b = 0; b < blocks; ++b) {
                entries[b] = own[b];
                own[b] *= own[b];
                own[0].s0 = 0.0f;
                entries[blocks + b] = own[b];
            }
            const float weight = KernelWeight(space, own, 1.0f, FullWeight(space, &sample));
            if (weight == 0.0f) {
                continue;
            }
            for (int b = 0; b < 2 * blocks; ++b) {
                const float8 block = entries[b] * weight;
                for (int r = 0; r <= rank; ++r) {
                    products[b][r] += block * entry[r];
                }
                colors[0][b] += block * sample.color.x;
                colors[1][b] += block * sample.color.y;
                colors[2][b] += block * sample.color.z;
            }
            for (int b = blocks; b < 2 * blocks; ++b) {
                const float8 block = entries[b] * weight;
                for (int r = squares_at + 1; r <= squares_at + rank; ++r) {
                    products[b][r] += block * entry[r];
                }
            }
        }
    }

    float a[ESTIMATE_SIZE * ESTIMATE_SIZE];
    float3 b[ESTIMATE_SIZE];
    const int size = 2 * rank + 1;
    for (int c = 0; c < size; ++c) {
        const int lane = c <= rank ? c : squares_at + c - rank;
        for (int r = 0; r <= c; ++r) {
            const int row = r <= rank ? r : squares_at + r - rank;
            a[r * ESTIMATE_SIZE + c] = ((const float*)&products[lane / LANES][row])[lane % LANES];
        }
        a[c * ESTIMATE_SIZE + c] += 0.001f;
        b[c] = (float3)(((const float*)colors[0])[lane], ((const float*)colors[1])[lane],
                        ((const float*)colors[2])[lane]);
    }
    Cholesky(a, ESTIMATE_SIZE, size);
    Substitute(a, ESTIMATE_SIZE, size, b);
    inverse_squares[0] = inverse_squares[1] = (float8)(0.0f);
    for (int i = 1; i <= rank; ++i) {
        const float curvature = 2.0f * Mean3(fabs(b[rank + i]));
        ((float*)inverse_squares)[i] = (curvature + 0.16f) / (factor * factor);
    }
}

// ---- Fits ----------------------------------------------------------------------------------------------------------

static inline void ClearProducts(const Space* space, float8 products[BLOCKS][ROWS]) {
    for (int b = 0; b < space->blocks; ++b) {
        for (int r = 0; r <= space->rank; ++r) {
            products[b][r] = (float8)(0.0f);
        }
    }
}

static inline void ClearSums(const Space* space, FitSums* sums) {
    ClearProducts(space, sums->products);
    for (int b = 0; b < space->blocks; ++b) {
        sums->red[b] = sums->green[b] = sums->blue[b] = (float8)(0.0f);
    }
}

static inline void AddColors(const Space* space, const float8* entries, float weight, float3 color, FitSums* sums) {
    for (int b = 0; b < space->blocks; ++b) {
        const float8 block = entries[b] * weight;
        sums->red[b] += block * color.x;
        sums->green[b] += block * color.y;
        sums->blue[b] += block * color.z;
    }
}

static inline void AddToFit(const Space* space, const float8* entries, float weight, float3 color, FitSums* sums) {
    const float* entry = (const float*)entries;
    for (int b = 0; b < space->blocks; ++b) {
        const float8 block = entries[b] * weight;
        for (int r = 0; r <= space->rank; ++r) {
            sums->products[b][r] += block * entry[r];
        }
    }
    AddColors(space, entries, weight, color, sums);
}

// Also the products of squared weights and the pixel's variance.
static inline void AddToCandidate(const Space* space, const float8* entries, float weight, const Sample* sample,
                                  FitSums* sums, float8 noise[BLOCKS][ROWS]) {
    const float* entry = (const float*)entries;
    const float noise_weight = weight * sample->variance;
    for (int b = 0; b < space->blocks; ++b) {
        const float8 block = entries[b] * weight;
        const float8 noise_block = block * noise_weight;
        for (int r = 0; r <= space->rank; ++r) {
            sums->products[b][r] += block * entry[r];
            noise[b][r] += noise_block * entry[r];
        }
    }
    AddColors(space, entries, weight, sample->color, sums);
}

// The first row of the inverse of the fit's matrix: a pixel of a weight counts with weight * (row . entries) in the
// fit's value at the centre.
static inline void FitRow(const Space* space, const FitSums* sums, float8* row) {
    float a[ROWS * ROWS];
    float3 unit[ROWS];
    for (int c = 0; c <= space->rank; ++c) {
        for (int r = 0; r <= c; ++r) {
            a[r * ROWS + c] = ((const float*)&sums->products[c / LANES][r])[c % LANES];
        }
        a[c * ROWS + c] += 0.0001f;
        unit[c] = (float3)(c == 0 ? 1.0f : 0.0f);
    }
    Cholesky(a, ROWS, space->rank + 1);
    Substitute(a, ROWS, space->rank + 1, unit);
    row[0] = row[1] = (float8)(0.0f);
    for (int i = 0; i <= space->rank; ++i) {
        ((float*)row)[i] = unit[i].x;
    }
}

static inline float3 FitValue(const Space* space, const FitSums* sums, const float8* row) {
    float3 value = (float3)(0.0f);
    for (int b = 0; b < space->blocks; ++b) {
        value += (float3)(SumOf(row[b] * sums->red[b]), SumOf(row[b] * sums->green[b]), SumOf(row[b] * sums->blue[b]));
    }
    return value;
}

// row^T products row.
static inline float FitVariance(const Space* space, float8 products[BLOCKS][ROWS], const float8* row) {
    float8 sum = (float8)(0.0f);
    for (int b = 0; b < space->blocks; ++b) {
        for (int r = 0; r <= space->rank; ++r) {
            sum += products[b][r] * row[b] * ((const float*)row)[r];
        }
    }
    return SumOf(sum);
}

static inline bool IsNegative(float3 color) {
    return color.x < 0.0f || color.y < 0.0f || color.z < 0.0f;
}

// Mean over the window's pixels that count positively, which replaces a fit that leaves the range of colours below.
static inline float3 PositiveFit(IMAGE_PARAMETERS, const Window* window, const Sample* centre, const Space* space,
                                 const float8* inverse_squares, float factor, const float8* row, float* variance) {
    float3 color_sum = (float3)(0.0f);
    float variance_sum = 0.0f;
    float sum = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample) || IsOutlier(centre, &sample)) {
                continue;
            }
            float8 entries[BLOCKS];
            ComputeEntries(space, centre, &sample, entries);
            const float8 squares[BLOCKS] = {entries[0] * entries[0] * inverse_squares[0],
                                            entries[1] * entries[1] * inverse_squares[1]};
            const float l = KernelWeight(space, squares, factor, FullWeight(space, &sample)) *
                            (SumOf(row[0] * entries[0]) + SumOf(row[1] * entries[1]));
            if (l > 0.0f) {
                color_sum += sample.color * l;
                variance_sum += l * l * sample.variance;
                sum += l;
            }
        }
    }
    sum = fmax(sum, 0.001f);
    *variance = variance_sum / (sum * sum);
    return color_sum / sum;
}

// Values and variances at the centre of the fits with the candidate bandwidths.
static inline void FitCandidates(IMAGE_PARAMETERS, const Window* window, const Sample* centre, const Space* space,
                                 const float8* inverse_squares, float3* values, float* variances) {
    FitSums sums[CANDIDATES];
    float8 noise[CANDIDATES][BLOCKS][ROWS];
    float factors[CANDIDATES];
    for (int g = 0; g < CANDIDATES; ++g) {
        ClearSums(space, &sums[g]);
        ClearProducts(space, noise[g]);
        const float scale = (float)(g + 1) / CANDIDATES;
        factors[g] = 1.0f / (scale * scale);
    }
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample) || IsOutlier(centre, &sample)) {
                continue;
            }
            float8 entries[BLOCKS];
            ComputeEntries(space, centre, &sample, entries);
            const float8 squares[BLOCKS] = {entries[0] * entries[0] * inverse_squares[0],
                                            entries[1] * entries[1] * inverse_squares[1]};
            const float full = FullWeight(space, &sample);
            // What is outside one bandwidth is outside all narrower ones.
            for (int g = CANDIDATES - 1; g >= 0; --g) {
                const float weight = KernelWeight(space, squares, factors[g], full);
                if (weight == 0.0f) {
                    break;
                }
                AddToCandidate(space, entries, weight, &sample, &sums[g], noise[g]);
            }
        }
    }
    for (int g = 0; g < CANDIDATES; ++g) {
        float8 row[BLOCKS];
        FitRow(space, &sums[g], row);
        values[g] = FitValue(space, &sums[g], row);
        variances[g] = FitVariance(space, noise[g], row);
        if (IsNegative(values[g])) {
            values[g] = PositiveFit(IMAGES, window, centre, space, inverse_squares, factors[g], row, &variances[g]);
        }
    }
}

// The value at the centre of the fit with the bandwidths times `scale`.
static inline float3 FitColor(IMAGE_PARAMETERS, const Window* window, const Sample* centre, const Space* space,
                              const float8* inverse_squares, float scale) {
    const float factor = 1.0f / (scale * scale);
    FitSums sums;
    ClearSums(space, &sums);
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample) || IsOutlier(centre, &sample)) {
                continue;
            }
            float8 entries[BLOCKS];
            ComputeEntries(space, centre, &sample, entries);
            const float8 squares[BLOCKS] = {entries[0] * entries[0] * inverse_squares[0],
                                            entries[1] * entries[1] * inverse_squares[1]};
            const float weight = KernelWeight(space, squares, factor, FullWeight(space, &sample));
            if (weight > 0.0f) {
                AddToFit(space, entries, weight, sample.color, &sums);
            }
        }
    }
    float8 row[BLOCKS];
    FitRow(space, &sums, row);
    const float3 value = FitValue(space, &sums, row);
    float variance;
    return IsNegative(value)
               ? PositiveFit(IMAGES, window, centre, space, inverse_squares, factor, row, &variance)
               : value;
}

// The scale of the bandwidths, 0.2 to 1, at which bias^2 + variance is least, from models fitted to the candidates: the
// bias grows with the square of the scale, the variance falls with its power -rank.
static inline float OptimalScale(const float3* values, const float* variances, float3 reference, int rank,
                                 float samples) {
    real bias_matrix[4] = {0, 0, 0, 0};
    real variance_matrix[4] = {0, 0, 0, 0};
    real bias_side[2] = {0, 0};
    real variance_side[2] = {0, 0};
    for (int g = 0; g < CANDIDATES; ++g) {
        const float scale = (float)(g + 1) / CANDIDATES;
        const real bias = (real)Mean3(values[g] - reference);
        const real spread = (real)fmax(samples * variances[g], 0.0f);
        const real h2 = (real)(scale * scale);
        real ihr = 1;
        for (int i = 0; i < rank; ++i) {
            ihr /= (real)scale;
        }
        bias_matrix[0] += 1;
        bias_matrix[1] += h2;
        bias_matrix[2] += h2;
        bias_matrix[3] += h2 * h2;
        bias_side[0] += bias;
        bias_side[1] += h2 * bias;
        variance_matrix[0] += 1;
        variance_matrix[1] += ihr;
        variance_matrix[2] += ihr;
        variance_matrix[3] += ihr * ihr;
        variance_side[0] += spread;
        variance_side[1] += spread * ihr;
    }
    const real bias_det = bias_matrix[0] * bias_matrix[3] - bias_matrix[1] * bias_matrix[2] + (real)0.0001f;
    const real variance_det =
        variance_matrix[0] * variance_matrix[3] - variance_matrix[1] * variance_matrix[2] + (real)0.0001f;
    const real bias_slope = (bias_matrix[0] * bias_side[1] - bias_matrix[2] * bias_side[0]) / bias_det;
    const real fall =
        (variance_matrix[0] * variance_side[1] - variance_matrix[2] * variance_side[0]) / variance_det;
    const real variance_slope = fall < 0 ? -fall : fall;

    // Without bias (flat or black areas) the widest scale is the best.
    const float denominator = (float)(4 * bias_slope * bias_slope * (real)samples);
    if (denominator < 1e-20f) {
        return 1.0f;
    }
    const float ratio = fmin((float)rank * (float)variance_slope / denominator, 1e30f);
    return clamp(pow(ratio, 1.0f / (float)(4 + rank)), 0.2f, 1.0f);
}

// Mean colour of the pixels that take part.
static inline float3 MeanColor(IMAGE_PARAMETERS, const Window* window) {
    float3 sum = (float3)(0.0f);
    float num = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (TakesPart(window, &sample)) {
                sum += sample.color;
                num += 1.0f;
            }
        }
    }
    return sum / fmax(num, 1.0f);
}

__kernel void LWRDenoiserFirstPass(srcBufferType(srcBuffer), srcBufferType(vColorBuff), srcBufferType(transBuff),
                                   srcBufferType(vTransBuff), srcBufferType(normalsBuff), srcBufferType(vNormalsBuff),
                                   srcBufferType(depthBuff), srcBufferType(vDepthBuff), int samples, int halfWindow,
                                   float bandwidthFactor, dstBufferType(dstBuffer)) {
    __local float tile[BLOCK_SIZE * BLOCK_SIZE];
    const int2 size = GET_BUFFER_SIZE(dstBuffer);
    const int2 coord = (int2)((int)get_global_id(0), (int)get_global_id(1));
    const int2 place = (int2)((int)get_local_id(0), (int)get_local_id(1));
    // Items outside the picture stay for the barrier; -1 keeps their tile entry out of the mean.
    const bool inside = coord.x < size.x && coord.y < size.y;

    Window window;
    window.centre = coord;
    window.low = max(coord - halfWindow, (int2)(0));
    window.high = min(coord + halfWindow, size - 1);
    window.half_window = (float)halfWindow;
    window.per_sample = 1.0f / (float)samples;
    window.per_variance = 1.0f / (float)(samples - 1);
    window.usable = 0;
    Sample centre;
    Space space;
    space.rank = 0;
    float8 inverse_squares[BLOCKS];
    float scale = -1.0f;
    if (inside) {
        centre = ReadSample(IMAGES, &window, coord.x, coord.y);
        window.usable = centre.usable;
        ReduceFeatures(IMAGES, &window, &space);
        scale = 1.0f;
    }
    if (space.rank > 0) {
        const float3 reference = centre.color_usable ? centre.color : MeanColor(IMAGES, &window);
        float3 values[CANDIDATES];
        float variances[CANDIDATES];
        EstimateBandwidths(IMAGES, &window, &centre, &space, bandwidthFactor, inverse_squares);
        FitCandidates(IMAGES, &window, &centre, &space, inverse_squares, values, variances);
        scale = OptimalScale(values, variances, reference, space.rank, (float)samples);
    }
    tile[place.x + BLOCK_SIZE * place.y] = scale;
    barrier(CLK_LOCAL_MEM_FENCE);

    if (inside) {
        float scale_sum = 0.0f;
        float weight_sum = 0.0f;
        for (int y = max(place.y - 3, 0); y <= min(place.y + 3, BLOCK_SIZE - 1); ++y) {
            for (int x = max(place.x - 3, 0); x <= min(place.x + 3, BLOCK_SIZE - 1); ++x) {
                const float neighbour = tile[x + BLOCK_SIZE * y];
                const float2 distance_to = convert_float2((int2)(x, y) - place);
                const float weight = neighbour > 0.0f ? exp(-0.5f * dot(distance_to, distance_to)) : 0.0f;
                scale_sum += neighbour * weight;
                weight_sum += weight;
            }
        }
        float3 result = (float3)(0.0f);
        if (space.rank > 0) {
            result = FitColor(IMAGES, &window, &centre, &space, inverse_squares, scale_sum / weight_sum) *
                     (float)samples;
        }
        WritePixel(dstBuffer, coord.x, coord.y, (float4)(result, 1.0f));
    }
}
