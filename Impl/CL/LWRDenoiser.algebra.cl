// Local weighted regression: sums of vectors, linear systems and singular values, on small matrices in private memory.

#define FEATURES 9
#define LANES 8

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

// ---- Symmetric systems ---------------------------------------------------------------------------------------------

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

// ---- Singular values -----------------------------------------------------------------------------------------------

// A column of nine.
typedef struct {
    float8 head;
    float tail;
} Column;

// Rotates columns by the angle of these.
typedef struct {
    float cosine;
    float sine;
} Rotation;

static inline float DotColumns(Column a, Column b) {
    return SumOf(a.head * b.head) + a.tail * b.tail;
}

static inline void RotateColumns(Column* a, Column* b, Rotation rotation) {
    const float c = rotation.cosine;
    const float s = rotation.sine;
    const Column x = *a;
    const Column y = *b;
    a->head = x.head * c + y.head * s;
    a->tail = x.tail * c + y.tail * s;
    b->head = y.head * c - x.head * s;
    b->tail = y.tail * c - x.tail * s;
}

// The rotation that makes two columns orthogonal and the first the longer one, from their product p and their squares
// q and r. The bounds hold against rounding.
static inline Rotation Orthogonalizing(float p, float q, float r) {
    Rotation rotation;
    if (q >= r) {
        const float ratio = p / q;
        const float excess = 1.0f - r / q;
        const float root = fmax(sqrt(4.0f * ratio * ratio + excess * excess), 1e-30f);
        rotation.cosine = sqrt(0.5f * (1.0f + excess / root));
        rotation.sine = ratio / (root * rotation.cosine);
    } else {
        const float ratio = p / r;
        const float excess = q / r - 1.0f;
        const float root = fmax(sqrt(4.0f * ratio * ratio + excess * excess), 1e-30f);
        const float sine = sqrt(fmax(0.5f * (1.0f - excess / root), 0.25f));
        rotation.sine = ratio < 0.0f ? -sine : sine;
        rotation.cosine = ratio / (root * rotation.sine);
    }
    return rotation;
}

// Singular values of the symmetric 9 x 9 matrix u by one-sided Jacobi rotations of its columns, after J. C. Nash,
// "Compact Numerical Methods for Computers" (1990), algorithm 1. Gives the right vectors v, the squared values s2 in
// falling order and the rank.
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
                const float p = DotColumns(u[j], u[k]);
                const float q = DotColumns(u[j], u[j]);
                const float r = DotColumns(u[k], u[k]);
                s2[j] = q;
                s2[k] = r;
                // Columns without length stay: relaxed math may divide by way of an inverse, which overflows.
                if (fmax(q, r) < 1e-30f || (q >= r && (q <= e2 * s2[0] || fabs(p) <= tol * q))) {
                    --rotations;
                    continue;
                }
                const Rotation rotation = Orthogonalizing(p, q, r);
                RotateColumns(&u[j], &u[k], rotation);
                RotateColumns(&v[j], &v[k], rotation);
            }
        }
        while (rank >= 3 && s2[rank - 1] <= s2[0] * tol + tol * tol) {
            --rank;
        }
    }
    return rank;
}
