// Local weighted regression: weights of a window's pixels, and the bandwidths that shape them.

// The models of bias and variance over the bandwidth are solved in double precision where there is such a thing.
#ifdef cl_khr_fp64
typedef double real;
#else
typedef float real;
#endif

#define CANDIDATES 5

// ---- Entries and weights -------------------------------------------------------------------------------------------

static inline void ComputeEntries(const Space* space, const Sample* centre, const Sample* sample, float8* entries) {
    const float8 d = sample->features - centre->features;
    const float last = sample->last - centre->last;
    entries[0] = (float8)(1.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f);
    entries[1] = (float8)(0.0f);
    for (int b = 0; b < space->blocks; ++b) {
        const float8* p = space->projection[b];
        entries[b] += d.s0 * p[0] + d.s1 * p[1] + d.s2 * p[2] + d.s3 * p[3] + d.s4 * p[4] + d.s5 * p[5] + d.s6 * p[6] +
                      d.s7 * p[7] + last * p[8];
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

// ---- Bandwidth of each direction -----------------------------------------------------------------------------------

#define SQUARE_ROWS (2 * BLOCKS * LANES)
#define ESTIMATE_SIZE (2 * FEATURES + 1)

// Weighted sums over a window of entry * entry and of colour * entry, where the entries are followed by as many squares
// of theirs (the square of 1 is left 0); row r of a block is entry r times the block.
typedef struct {
    float8 products[2 * BLOCKS][SQUARE_ROWS];
    float8 colors[3][2 * BLOCKS];
} QuadraticSums;

static inline void ClearQuadratic(int blocks, QuadraticSums* sums) {
    for (int b = 0; b < 2 * blocks; ++b) {
        for (int r = 0; r < 2 * blocks * LANES; ++r) {
            sums->products[b][r] = (float8)(0.0f);
        }
        sums->colors[0][b] = sums->colors[1][b] = sums->colors[2][b] = (float8)(0.0f);
    }
}

// Products of two squares are needed of the upper half of the matrix only, like those of two entries.
static inline void AddToQuadratic(const Space* space, const float8* entries, float weight, float3 color,
                                  QuadraticSums* sums) {
    const int blocks = space->blocks;
    const int first_square = blocks * LANES + 1;
    const float* entry = (const float*)entries;
    for (int b = 0; b < 2 * blocks; ++b) {
        const float8 block = entries[b] * weight;
        for (int r = 0; r <= space->rank; ++r) {
            sums->products[b][r] += block * entry[r];
        }
        sums->colors[0][b] += block * color.x;
        sums->colors[1][b] += block * color.y;
        sums->colors[2][b] += block * color.z;
    }
    for (int b = blocks; b < 2 * blocks; ++b) {
        const float8 block = entries[b] * weight;
        for (int r = first_square; r < first_square + space->rank; ++r) {
            sums->products[b][r] += block * entry[r];
        }
    }
}

// Over the whole window with bandwidths of 1, outliers included.
static inline void SumQuadratic(IMAGE_PARAMETERS, const Window* window, const Sample* centre, const Space* space,
                                QuadraticSums* sums) {
    const int blocks = space->blocks;
    ClearQuadratic(blocks, sums);
    float8 entries[2 * BLOCKS];
    FOR_EACH_PIXEL(window, x, y) {
        const Sample sample = ReadSample(IMAGES, window, x, y);
        if (!TakesPart(window, &sample)) {
            continue;
        }
        float8 own[BLOCKS];
        ComputeEntries(space, centre, &sample, own);
        for (int b = 0; b < blocks; ++b) {
            entries[b] = own[b];
            own[b] *= own[b];
        }
        own[0].s0 = 0.0f;
        for (int b = 0; b < blocks; ++b) {
            entries[blocks + b] = own[b];
        }
        const float weight = KernelWeight(space, own, 1.0f, FullWeight(space, &sample));
        if (weight > 0.0f) {
            AddToQuadratic(space, entries, weight, sample.color, sums);
        }
    }
}

// Coefficients of the fit: of 1, of the directions, of their squares.
static inline void SolveQuadratic(const Space* space, const QuadraticSums* sums, float3* coefficients) {
    const int rank = space->rank;
    const int to_squares = space->blocks * LANES - rank;
    const int size = 2 * rank + 1;
    float a[ESTIMATE_SIZE * ESTIMATE_SIZE];
    for (int c = 0; c < size; ++c) {
        const int lane = c <= rank ? c : c + to_squares;
        for (int r = 0; r <= c; ++r) {
            const int row = r <= rank ? r : r + to_squares;
            a[r * ESTIMATE_SIZE + c] = ((const float*)&sums->products[lane / LANES][row])[lane % LANES];
        }
        a[c * ESTIMATE_SIZE + c] += 0.001f;
        coefficients[c] = (float3)(((const float*)sums->colors[0])[lane], ((const float*)sums->colors[1])[lane],
                                   ((const float*)sums->colors[2])[lane]);
    }
    Cholesky(a, ESTIMATE_SIZE, size);
    Substitute(a, ESTIMATE_SIZE, size, coefficients);
}

// Bandwidth of each reduced direction, from the curvature of a fit with squares over the whole window. Gives the
// inverses of the squared bandwidths, in the order of the entries.
static inline void EstimateBandwidths(IMAGE_PARAMETERS, const Window* window, const Sample* centre, const Space* space,
                                      float factor, float8* inverse_squares) {
    const int rank = space->rank;
    QuadraticSums sums;
    float3 coefficients[ESTIMATE_SIZE];
    SumQuadratic(IMAGES, window, centre, space, &sums);
    SolveQuadratic(space, &sums, coefficients);
    inverse_squares[0] = inverse_squares[1] = (float8)(0.0f);
    for (int i = 1; i <= rank; ++i) {
        const float curvature = 2.0f * Mean3(fabs(coefficients[rank + i]));
        ((float*)inverse_squares)[i] = (curvature + 0.16f) / fmax(factor * factor, 1e-30f);
    }
}

// ---- Common scale of the bandwidths --------------------------------------------------------------------------------

static inline float CandidateScale(int candidate) {
    return (float)(candidate + 1) / CANDIDATES;
}

// Sums of a straight line's fit.
typedef struct {
    real num;
    real x;
    real y;
    real xx;
    real xy;
} LineSums;

static inline void AddToLine(real x, real y, LineSums* sums) {
    sums->num += 1;
    sums->x += x;
    sums->y += y;
    sums->xx += x * x;
    sums->xy += x * y;
}

static inline real SlopeOf(const LineSums* sums) {
    const real determinant = sums->num * sums->xx - sums->x * sums->x + (real)0.0001f;
    return (sums->num * sums->xy - sums->x * sums->y) / determinant;
}

// The scale of the bandwidths, 0.2 to 1, at which bias^2 + variance is least, from models fitted to the candidates: the
// bias grows with the square of the scale, the variance falls with its power -rank.
static inline float OptimalScale(const float3* values, const float* variances, float3 reference, int rank,
                                 float samples) {
    LineSums bias_line = {0, 0, 0, 0, 0};
    LineSums variance_line = {0, 0, 0, 0, 0};
    for (int g = 0; g < CANDIDATES; ++g) {
        const float scale = CandidateScale(g);
        real falling = 1;
        for (int i = 0; i < rank; ++i) {
            falling /= (real)scale;
        }
        AddToLine((real)(scale * scale), (real)Mean3(values[g] - reference), &bias_line);
        AddToLine(falling, (real)fmax(samples * variances[g], 0.0f), &variance_line);
    }
    const real bias_slope = SlopeOf(&bias_line);
    const real fall = SlopeOf(&variance_line);
    const real variance_slope = fall < 0 ? -fall : fall;

    // Without bias (flat or black areas) the widest scale is the best.
    const float denominator = (float)(4 * bias_slope * bias_slope * (real)samples);
    if (denominator < 1e-20f) {
        return 1.0f;
    }
    const float ratio = fmin((float)rank * (float)variance_slope / denominator, 1e30f);
    return clamp(pow(ratio, 1.0f / (float)(4 + rank)), 0.2f, 1.0f);
}
