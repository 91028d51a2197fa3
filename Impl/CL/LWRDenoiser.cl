// Local weighted regression, after B. Moon et al., "Adaptive Rendering Based on Weighted Local Regression" (2014): a
// pixel becomes the value there of a linear fit of colour over position, depth, normal and transition colour in its
// window. The features are first reduced to the directions in which they vary, then five bandwidths are tried, and the
// one that balances the fit's bias against its variance is used.
//
// Pixels whose colour holds NaN or infinity are left out of every window, and so are those of which another feature is
// unusable than at the centre (finite depth beside the infinite depth of a sky). An unusable variance counts as 0.

#define BLOCK_SIZE 8
#define FEATURES 9
#define FIT_SIZE (FEATURES + 1)
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
    float3 color;
    float3 transition;
    float3 normal;
    float depth;
    float variance;  // Mean of the three channels' variances, of the mean.
    int usable;      // Bits: 1 normal, 2 depth, 4 transition.
    bool color_usable;
} Sample;

static inline float Mean3(float3 value) {
    return (value.x + value.y + value.z) * (1.0f / 3.0f);
}

static inline float3 UsableOrZero(float4 value) {
    return IsUsable(value) ? value.xyz : (float3)(0.0f);
}

static inline Sample ReadSample(IMAGE_PARAMETERS, const Window* window, int x, int y) {
    const float4 color = ReadPixel(srcBuffer, x, y);
    const float4 transition = ReadPixel(transBuff, x, y);
    const float4 normal = ReadPixel(normalsBuff, x, y);
    const float4 depth = (float4)(ReadPixel(depthBuff, x, y).y);
    Sample sample;
    sample.color = UsableOrZero(color) * window->per_sample;
    sample.transition = UsableOrZero(transition) * window->per_sample;
    sample.normal = UsableOrZero(normal) * window->per_sample;
    sample.depth = UsableOrZero(depth).x * window->per_sample;
    sample.variance = fmax(Mean3(UsableOrZero(ReadPixel(vColorBuff, x, y))), 0.0f) * window->per_sample *
                      window->per_variance;
    sample.usable = (IsUsable(normal) ? 1 : 0) + (IsUsable(depth) ? 2 : 0) + (IsUsable(transition) ? 4 : 0);
    sample.color_usable = IsUsable(color);
    return sample;
}

static inline bool TakesPart(const Window* window, const Sample* sample) {
    return sample->color_usable && sample->usable == window->usable;
}

// ---- Linear algebra ------------------------------------------------------------------------------------------------

// Factors the symmetric matrix A (upper triangle, row length `stride`) into L L^T; L takes the lower triangle.
static inline void Cholesky(float* a, int stride, int n) {
    for (int i = 0; i < n; ++i) {
        for (int j = 0; j <= i; ++j) {
            float s = 0.0f;
            for (int k = 0; k < j; ++k) {
                s += a[i * stride + k] * a[j * stride + k];
            }
            if (i == j) {
                // The ridge keeps this positive but for rounding over large windows.
                a[i * stride + i] = sqrt(fmax(a[i * stride + i] - s, 1e-6f));
            } else {
                a[i * stride + j] = (a[j * stride + i] - s) / a[j * stride + j];
            }
        }
    }
}

// Singular values of the symmetric 9 x 9 matrix u by one-sided Jacobi rotations of its columns, after J. C. Nash,
// "Compact Numerical Methods for Computers". Gives the right vectors v, the squared values s2 and the rank.
static inline int Decompose(float* u, float* v, float* s2) {
    const float eps = 1e-7f;
    const float e2 = 10.0f * FEATURES * eps * eps;
    const float tol = 0.1f * eps;
    int rank = FEATURES;
    int rotations = rank * (rank - 1) / 2;
    for (int i = 0; i < FEATURES; ++i) {
        s2[i] = 0.0f;
        for (int j = 0; j < FEATURES; ++j) {
            v[i * FEATURES + j] = i == j ? 1.0f : 0.0f;
        }
    }
    for (int sweep = 0; rotations != 0 && sweep <= 6; ++sweep) {
        rotations = rank * (rank - 1) / 2;
        for (int j = 0; j < rank - 1; ++j) {
            for (int k = j + 1; k < rank; ++k) {
                float p = 0.0f;
                float q = 0.0f;
                float r = 0.0f;
                for (int i = 0; i < FEATURES; ++i) {
                    const float x = u[i * FEATURES + j];
                    const float y = u[i * FEATURES + k];
                    p += x * y;
                    q += x * x;
                    r += y * y;
                }
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
                for (int i = 0; i < FEATURES; ++i) {
                    const float x = u[i * FEATURES + j];
                    const float y = u[i * FEATURES + k];
                    u[i * FEATURES + j] = x * c + y * s;
                    u[i * FEATURES + k] = y * c - x * s;
                    const float z = v[i * FEATURES + j];
                    const float w = v[i * FEATURES + k];
                    v[i * FEATURES + j] = z * c + w * s;
                    v[i * FEATURES + k] = w * c - z * s;
                }
            }
        }
        while (rank >= 3 && s2[rank - 1] <= s2[0] * tol + tol * tol) {
            --rank;
        }
    }
    return rank;
}

// ---- Reduced coordinates and weights -------------------------------------------------------------------------------

// z = projection * (feature differences to the centre pixel), `rank` coordinates.
static inline void ReducedCoordinates(const float* projection, int rank, const Window* window, const Sample* centre,
                                      const Sample* sample, int x, int y, float* z) {
    const float3 normal = sample->normal - centre->normal;
    const float3 transition = sample->transition - centre->transition;
    const float f[FEATURES] = {(float)(x - window->centre.x), (float)(y - window->centre.y),
                               sample->depth - centre->depth, normal.x,     normal.y,     normal.z,
                               transition.x,                  transition.y, transition.z};
    for (int c = 0; c < rank; ++c) {
        float sum = 0.0f;
        for (int r = 0; r < FEATURES; ++r) {
            sum += projection[r * FEATURES + c] * f[r];
        }
        z[c] = sum;
    }
}

// Epanechnikov kernel over the reduced coordinates with the bandwidths scale * bandwidths[i], lowered for noisy pixels.
static inline float KernelWeight(const float* z, const float* bandwidths, float scale, int rank, float variance) {
    float weight = 1.0f;
    for (int i = 0; i < rank; ++i) {
        const float t = z[i] / (scale * bandwidths[i]);
        weight *= fabs(t) < 1.0f ? 0.75f * (1.0f - t * t) : 0.0f;
    }
    return weight / fmax(1.0f, variance);
}

// Whether a pixel's mean is too far from the centre's for the noise of the two.
static inline bool IsOutlier(const Sample* centre, const Sample* sample) {
    const float limit = 3.0f * (sqrt(centre->variance) + sqrt(sample->variance)) + 0.005f;
    return centre->color_usable && fabs(Mean3(sample->color) - Mean3(centre->color)) > limit;
}

// ---- Steps ---------------------------------------------------------------------------------------------------------

// The directions in which the features of the window vary, as columns of `projection`. Returns their number, or 0 for a
// window without a usable pixel; mean_color is that of the window.
static inline int ReduceFeatures(IMAGE_PARAMETERS, const Window* window, float* projection, float3* mean_color) {
    float num = 0.0f;
    float3 mean_transition = (float3)(0.0f);
    float3 mean_normal = (float3)(0.0f);
    float mean_depth = 0.0f;
    *mean_color = (float3)(0.0f);
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (TakesPart(window, &sample)) {
                num += 1.0f;
                mean_transition += sample.transition;
                mean_normal += sample.normal;
                mean_depth += sample.depth;
                *mean_color += sample.color;
            }
        }
    }
    if (num == 0.0f) {
        return 0;
    }
    mean_transition /= num;
    mean_normal /= num;
    mean_depth /= num;
    *mean_color /= num;

    float depth_range = 0.0f;
    float normal_range = 0.0f;
    float transition_range = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (TakesPart(window, &sample)) {
                const float3 normal = sample.normal - mean_normal;
                const float3 transition = sample.transition - mean_transition;
                depth_range = fmax(depth_range, fabs(sample.depth - mean_depth));
                normal_range = fmax(normal_range, dot(normal, normal));
                transition_range = fmax(transition_range, dot(transition, transition));
            }
        }
    }
    const float depth_scale = 1.0f / fmax(depth_range, 0.01f);
    const float normal_scale = 1.0f / fmax(sqrt(normal_range), 0.01f);
    const float transition_scale = 1.0f / fmax(sqrt(transition_range), 0.01f);

    float matrix[FEATURES * FEATURES];
    for (int i = 0; i < FEATURES * FEATURES; ++i) {
        matrix[i] = 0.0f;
    }
    float norm = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample)) {
                continue;
            }
            const float3 normal = (sample.normal - mean_normal) * normal_scale;
            const float3 transition = (sample.transition - mean_transition) * transition_scale;
            const float delta[FEATURES] = {(float)(x - window->centre.x) / window->half_window,
                                           (float)(y - window->centre.y) / window->half_window,
                                           (sample.depth - mean_depth) * depth_scale,
                                           normal.x,
                                           normal.y,
                                           normal.z,
                                           transition.x,
                                           transition.y,
                                           transition.z};
            for (int r = 0; r < FEATURES; ++r) {
                for (int c = r; c < FEATURES; ++c) {
                    matrix[r * FEATURES + c] += delta[r] * delta[c];
                }
            }
            const float scale = window->per_variance;
            const float3 normal_noise = clamp(UsableOrZero(ReadPixel(vNormalsBuff, x, y)) * scale, 0.0f, 1.0f);
            const float3 transition_noise = clamp(UsableOrZero(ReadPixel(vTransBuff, x, y)) * scale, 0.0f, 1.0f);
            const float4 depth_variance = (float4)(ReadPixel(vDepthBuff, x, y).y);
            const float depth_noise = clamp(UsableOrZero(depth_variance).x * scale, 0.0f, 1.0f);
            norm += (depth_scale * depth_scale * depth_noise +
                     normal_scale * normal_scale * 3.0f * Mean3(normal_noise) +
                     transition_scale * transition_scale * 3.0f * Mean3(transition_noise)) *
                    window->per_sample;
        }
    }
    for (int r = 0; r < FEATURES; ++r) {
        for (int c = 0; c < r; ++c) {
            matrix[r * FEATURES + c] = matrix[c * FEATURES + r];
        }
    }

    float vectors[FEATURES * FEATURES];
    float s2[FEATURES];
    const int estimated = Decompose(matrix, vectors, s2);
    const float threshold = 0.01f + 2.0f * (sqrt(norm) / (sqrt((float)estimated) * 0.5f));
    int rank = 0;
    for (int c = 0; c < FEATURES; ++c) {
        // The two directions of the position always count.
        if (c >= 2 && sqrt(sqrt(fabs(s2[c]))) <= threshold) {
            continue;
        }
        for (int r = 0; r < FEATURES; ++r) {
            const float scale = r < 2   ? 1.0f / window->half_window
                                : r < 3 ? depth_scale
                                : r < 6 ? normal_scale
                                        : transition_scale;
            projection[r * FEATURES + rank] = vectors[r * FEATURES + c] * scale;
        }
        ++rank;
    }
    return rank;
}

// Bandwidth of each reduced direction, from the curvature of a fit with squares over the whole window.
static inline void EstimateBandwidths(IMAGE_PARAMETERS, const Window* window, const Sample* centre,
                                      const float* projection, int rank, float factor, float* bandwidths) {
    const int size = 2 * rank + 1;
    float a[ESTIMATE_SIZE * ESTIMATE_SIZE];
    float3 b[ESTIMATE_SIZE];
    float z[2 * FEATURES];
    float unit[FEATURES];
    for (int i = 0; i < ESTIMATE_SIZE * ESTIMATE_SIZE; ++i) {
        a[i] = 0.0f;
    }
    for (int i = 0; i < ESTIMATE_SIZE; ++i) {
        b[i] = (float3)(0.0f);
    }
    for (int i = 0; i < FEATURES; ++i) {
        unit[i] = 1.0f;
    }
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample)) {
                continue;
            }
            ReducedCoordinates(projection, rank, window, centre, &sample, x, y, z);
            const float weight = KernelWeight(z, unit, 1.0f, rank, sample.variance);
            if (weight == 0.0f) {
                continue;
            }
            for (int i = 0; i < rank; ++i) {
                z[rank + i] = z[i] * z[i];
            }
            a[0] += weight;
            b[0] += sample.color * weight;
            for (int c = 1; c < size; ++c) {
                a[c] += weight * z[c - 1];
                b[c] += sample.color * (weight * z[c - 1]);
                for (int r = 1; r <= c; ++r) {
                    a[r * ESTIMATE_SIZE + c] += weight * z[r - 1] * z[c - 1];
                }
            }
        }
    }
    for (int i = 0; i < size; ++i) {
        a[i * ESTIMATE_SIZE + i] += 0.001f;
    }
    Cholesky(a, ESTIMATE_SIZE, size);
    for (int i = 0; i < size; ++i) {
        for (int k = 0; k < i; ++k) {
            b[i] -= a[i * ESTIMATE_SIZE + k] * b[k];
        }
        b[i] /= a[i * ESTIMATE_SIZE + i];
    }
    for (int i = size - 1; i >= 0; --i) {
        for (int k = i + 1; k < size; ++k) {
            b[i] -= a[k * ESTIMATE_SIZE + i] * b[k];
        }
        b[i] /= a[i * ESTIMATE_SIZE + i];
    }
    for (int i = 0; i < FEATURES; ++i) {
        const float curvature = i < rank ? 2.0f * Mean3(fabs(b[i + rank + 1])) : 0.0f;
        bandwidths[i] = factor / sqrt(curvature + 0.16f);
    }
}

// The value at the centre of the linear fit with the bandwidths scale * bandwidths[i], and its variance. A fit that
// leaves the colours' range below is replaced by the mean over its positive weights.
static inline float3 FitColor(IMAGE_PARAMETERS, const Window* window, const Sample* centre, const float* projection,
                              int rank, const float* bandwidths, float scale, float* variance) {
    float a[FIT_SIZE * FIT_SIZE];
    float inverse[FIT_SIZE * FIT_SIZE];
    float z[FEATURES];
    for (int i = 0; i < FIT_SIZE * FIT_SIZE; ++i) {
        a[i] = 0.0f;
    }
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample) || IsOutlier(centre, &sample)) {
                continue;
            }
            ReducedCoordinates(projection, rank, window, centre, &sample, x, y, z);
            const float weight = KernelWeight(z, bandwidths, scale, rank, sample.variance);
            a[0] += weight;
            for (int c = 1; c <= rank; ++c) {
                a[c] += weight * z[c - 1];
                for (int r = 1; r <= c; ++r) {
                    a[r * FIT_SIZE + c] += weight * z[c - 1] * z[r - 1];
                }
            }
        }
    }
    for (int i = 0; i <= rank; ++i) {
        a[i * FIT_SIZE + i] += 0.0001f;
    }
    Cholesky(a, FIT_SIZE, rank + 1);

    // The first row of the inverse of A = L L^T, from the inverse of L.
    for (int j = rank; j >= 0; --j) {
        inverse[j * FIT_SIZE + j] = 1.0f / a[j * FIT_SIZE + j];
        for (int k = j + 1; k <= rank; ++k) {
            float sum = 0.0f;
            for (int i = j + 1; i <= k; ++i) {
                sum += inverse[k * FIT_SIZE + i] * a[i * FIT_SIZE + j];
            }
            inverse[k * FIT_SIZE + j] = -inverse[j * FIT_SIZE + j] * sum;
        }
    }
    float row[FIT_SIZE];
    for (int i = 0; i <= rank; ++i) {
        row[i] = 0.0f;
        for (int k = i; k <= rank; ++k) {
            row[i] += inverse[k * FIT_SIZE] * inverse[k * FIT_SIZE + i];
        }
    }

    float3 fit = (float3)(0.0f);
    float3 positive_fit = (float3)(0.0f);
    float positive_sum = 0.0f;
    float fit_variance = 0.0f;
    float positive_variance = 0.0f;
    for (int y = window->low.y; y <= window->high.y; ++y) {
        for (int x = window->low.x; x <= window->high.x; ++x) {
            const Sample sample = ReadSample(IMAGES, window, x, y);
            if (!TakesPart(window, &sample) || IsOutlier(centre, &sample)) {
                continue;
            }
            ReducedCoordinates(projection, rank, window, centre, &sample, x, y, z);
            const float weight = KernelWeight(z, bandwidths, scale, rank, sample.variance);
            float l = row[0];
            for (int i = 0; i < rank; ++i) {
                l += z[i] * row[i + 1];
            }
            l *= weight;
            fit += sample.color * l;
            fit_variance += l * l * sample.variance;
            if (l > 0.0f) {
                positive_fit += sample.color * l;
                positive_variance += l * l * sample.variance;
                positive_sum += l;
            }
        }
    }
    if (fit.x < 0.0f || fit.y < 0.0f || fit.z < 0.0f) {
        positive_sum = fmax(positive_sum, 0.001f);
        fit = positive_fit / positive_sum;
        fit_variance = positive_variance / (positive_sum * positive_sum);
    }
    *variance = fit_variance;
    return fit;
}

// The scale of the bandwidths, 0.2 to 1, at which bias^2 + variance is least, from models fitted to five candidates:
// the bias grows with the square of the scale, the variance falls with its power -rank.
static inline float OptimalScale(IMAGE_PARAMETERS, const Window* window, const Sample* centre, float3 reference,
                                 const float* projection, int rank, const float* bandwidths, float samples) {
    real bias_matrix[4] = {0, 0, 0, 0};
    real variance_matrix[4] = {0, 0, 0, 0};
    real bias_side[2] = {0, 0};
    real variance_side[2] = {0, 0};
    for (int g = 0; g < CANDIDATES; ++g) {
        const float scale = (float)(g + 1) / CANDIDATES;
        float fit_variance;
        const float3 fit = FitColor(IMAGES, window, centre, projection, rank, bandwidths, scale, &fit_variance);
        const real bias = (real)Mean3(fit - reference);
        const real spread = (real)fmax(samples * fit_variance, 0.0f);
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
    float3 mean_color = (float3)(0.0f);
    float projection[FEATURES * FEATURES];
    float bandwidths[FEATURES];
    int rank = 0;
    float scale = -1.0f;
    if (inside) {
        centre = ReadSample(IMAGES, &window, coord.x, coord.y);
        window.usable = centre.usable;
        rank = ReduceFeatures(IMAGES, &window, projection, &mean_color);
        scale = 1.0f;
    }
    if (rank > 0) {
        const float3 reference = centre.color_usable ? centre.color : mean_color;
        EstimateBandwidths(IMAGES, &window, &centre, projection, rank, bandwidthFactor, bandwidths);
        scale = OptimalScale(IMAGES, &window, &centre, reference, projection, rank, bandwidths, (float)samples);
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
        if (rank > 0) {
            float fit_variance;
            result = FitColor(IMAGES, &window, &centre, projection, rank, bandwidths, scale_sum / weight_sum,
                              &fit_variance) * (float)samples;
        }
        WritePixel(dstBuffer, coord.x, coord.y, (float4)(result, 1.0f));
    }
}
