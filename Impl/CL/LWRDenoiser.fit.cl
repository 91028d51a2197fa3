// Local weighted regression: linear fits of the colour around a pixel, and the variance of their values there.

// What the fits of one work item share; the inverses of the squared bandwidths are in the order of the entries.
#define FIT_PARAMETERS \
    IMAGE_PARAMETERS, const Window *window, const Sample *centre, const Space *space, const float8 *inverse_squares
#define FIT IMAGES, window, centre, space, inverse_squares

// Weighted sums over a window of entry * entry and of colour * entry; row r of a block is entry r times the block.
typedef struct {
    float8 products[BLOCKS][FEATURES + 1];
    float8 red[BLOCKS];
    float8 green[BLOCKS];
    float8 blue[BLOCKS];
} FitSums;

// The sums with squared weights and the pixels' variances.
typedef struct {
    float8 products[BLOCKS][FEATURES + 1];
} NoiseSums;

// Declares a pixel's sample, its entries and their squares in units of the squared bandwidths; where the pixel is left
// out, the loop goes on with the next. As a function that fills all three through pointers and says whether to go on,
// this costs a fifth of the filter's time with colours alone.
#define READ_OR_CONTINUE(x, y, sample, entries, squares)                          \
    const Sample sample = ReadSample(IMAGES, window, x, y);                       \
    if (!TakesPart(window, &sample) || IsOutlier(centre, &sample)) {              \
        continue;                                                                 \
    }                                                                             \
    float8 entries[BLOCKS];                                                       \
    ComputeEntries(space, centre, &sample, entries);                              \
    const float8 squares[BLOCKS] = {entries[0] * entries[0] * inverse_squares[0], \
                                    entries[1] * entries[1] * inverse_squares[1]}

// ---- Sums ----------------------------------------------------------------------------------------------------------

static inline void ClearFit(const Space* space, FitSums* sums) {
    for (int b = 0; b < space->blocks; ++b) {
        for (int r = 0; r <= space->rank; ++r) {
            sums->products[b][r] = (float8)(0.0f);
        }
        sums->red[b] = sums->green[b] = sums->blue[b] = (float8)(0.0f);
    }
}

static inline void ClearNoise(const Space* space, NoiseSums* noise) {
    for (int b = 0; b < space->blocks; ++b) {
        for (int r = 0; r <= space->rank; ++r) {
            noise->products[b][r] = (float8)(0.0f);
        }
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

static inline void AddToFitAndNoise(const Space* space, const float8* entries, float weight, const Sample* sample,
                                    FitSums* sums, NoiseSums* noise) {
    const float* entry = (const float*)entries;
    const float noise_weight = weight * sample->variance;
    for (int b = 0; b < space->blocks; ++b) {
        const float8 block = entries[b] * weight;
        const float8 noise_block = block * noise_weight;
        for (int r = 0; r <= space->rank; ++r) {
            sums->products[b][r] += block * entry[r];
            noise->products[b][r] += noise_block * entry[r];
        }
    }
    AddColors(space, entries, weight, sample->color, sums);
}

// ---- Values of a fit -----------------------------------------------------------------------------------------------

// The first row of the inverse of the fit's matrix: a pixel of a weight counts with weight * (row . entries) in the
// fit's value at the centre.
static inline void FitRow(const Space* space, const FitSums* sums, float8* row) {
    const int size = space->rank + 1;
    float a[(FEATURES + 1) * (FEATURES + 1)];
    float3 unit[FEATURES + 1];
    for (int c = 0; c < size; ++c) {
        for (int r = 0; r <= c; ++r) {
            a[r * (FEATURES + 1) + c] = ((const float*)&sums->products[c / LANES][r])[c % LANES];
        }
        a[c * (FEATURES + 1) + c] += 0.0001f;
        unit[c] = (float3)(c == 0 ? 1.0f : 0.0f);
    }
    Cholesky(a, FEATURES + 1, size);
    Substitute(a, FEATURES + 1, size, unit);
    row[0] = row[1] = (float8)(0.0f);
    for (int i = 0; i < size; ++i) {
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
static inline float FitVariance(const Space* space, const NoiseSums* noise, const float8* row) {
    float8 sum = (float8)(0.0f);
    for (int b = 0; b < space->blocks; ++b) {
        for (int r = 0; r <= space->rank; ++r) {
            sum += noise->products[b][r] * row[b] * ((const float*)row)[r];
        }
    }
    return SumOf(sum);
}

static inline bool IsNegative(float3 color) {
    return color.x < 0.0f || color.y < 0.0f || color.z < 0.0f;
}

// Mean over the window's pixels that count positively, which replaces a fit that leaves the range of colours below.
static inline float3 PositiveFit(FIT_PARAMETERS, float factor, const float8* row, float* variance) {
    float3 color_sum = (float3)(0.0f);
    float variance_sum = 0.0f;
    float sum = 0.0f;
    FOR_EACH_PIXEL(window, x, y) {
        READ_OR_CONTINUE(x, y, sample, entries, squares);
        const float l = KernelWeight(space, squares, factor, FullWeight(space, &sample)) *
                        (SumOf(row[0] * entries[0]) + SumOf(row[1] * entries[1]));
        if (l > 0.0f) {
            color_sum += sample.color * l;
            variance_sum += l * l * sample.variance;
            sum += l;
        }
    }
    sum = fmax(sum, 0.001f);
    *variance = variance_sum / (sum * sum);
    return color_sum / sum;
}

// Value of a fit at the centre. Where the value is replaced, so is the variance.
static inline float3 PositiveValue(FIT_PARAMETERS, float factor, const FitSums* sums, const float8* row,
                                   float* variance) {
    const float3 value = FitValue(space, sums, row);
    return IsNegative(value) ? PositiveFit(FIT, factor, row, variance) : value;
}

// ---- Fits ----------------------------------------------------------------------------------------------------------

// Values and variances at the centre of the fits with the candidate bandwidths.
static inline void FitCandidates(FIT_PARAMETERS, float3* values, float* variances) {
    FitSums sums[CANDIDATES];
    NoiseSums noise[CANDIDATES];
    float factors[CANDIDATES];
    for (int g = 0; g < CANDIDATES; ++g) {
        ClearFit(space, &sums[g]);
        ClearNoise(space, &noise[g]);
        factors[g] = 1.0f / (CandidateScale(g) * CandidateScale(g));
    }
    FOR_EACH_PIXEL(window, x, y) {
        READ_OR_CONTINUE(x, y, sample, entries, squares);
        const float full = FullWeight(space, &sample);
        // What is outside one bandwidth is outside all narrower ones.
        for (int g = CANDIDATES - 1; g >= 0; --g) {
            const float weight = KernelWeight(space, squares, factors[g], full);
            if (weight == 0.0f) {
                break;
            }
            AddToFitAndNoise(space, entries, weight, &sample, &sums[g], &noise[g]);
        }
    }
    for (int g = 0; g < CANDIDATES; ++g) {
        float8 row[BLOCKS];
        FitRow(space, &sums[g], row);
        variances[g] = FitVariance(space, &noise[g], row);
        values[g] = PositiveValue(FIT, factors[g], &sums[g], row, &variances[g]);
    }
}

// The value at the centre of the fit with the bandwidths times `scale`.
static inline float3 FitColor(FIT_PARAMETERS, float scale) {
    const float factor = 1.0f / (scale * scale);
    FitSums sums;
    ClearFit(space, &sums);
    FOR_EACH_PIXEL(window, x, y) {
        READ_OR_CONTINUE(x, y, sample, entries, squares);
        const float weight = KernelWeight(space, squares, factor, FullWeight(space, &sample));
        if (weight > 0.0f) {
            AddToFit(space, entries, weight, sample.color, &sums);
        }
    }
    float8 row[BLOCKS];
    float variance;
    FitRow(space, &sums, row);
    return PositiveValue(FIT, factor, &sums, row, &variance);
}
