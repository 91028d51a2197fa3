// Pixels held component by component: on central processors those of eight neighbours in a row, which one item in eight
// computes, elsewhere the item's own.

#if ON_CENTRAL_PROCESSOR
#define LANES 8
#define LANE_NUMBERS ((int8)(0, 1, 2, 3, 4, 5, 6, 7))
#define FOR_EACH_LANE(X) X(0) X(1) X(2) X(3) X(4) X(5) X(6) X(7)
#define LANE(value, k) value.s##k
#define AS_FLOATS as_float8
#define AS_INTS as_int8
#define LOG2 Log2_float8
#define EXP2 Exp2_float8
typedef float8 Floats;
typedef int8 Ints;
#else
#define LANES 1
#define LANE_NUMBERS 0
#define FOR_EACH_LANE(X) X(0)
#define LANE(value, k) value
#define AS_FLOATS as_float
#define AS_INTS as_int
#define LOG2 native_log2
#define EXP2 native_exp2
typedef float Floats;
typedef int Ints;
#endif

typedef struct {
    Floats x;
    Floats y;
    Floats z;
    Floats w;
} Pixels;

// READ(image, columns, row, pixels) gets pixels of one row.
#if ON_CENTRAL_PROCESSOR
INLINED void Transpose(float8 ae, float8 bf, float8 cg, float8 dh, Pixels* p) {
    const float8 ab_xy = (float8)(ae.s0, bf.s0, ae.s1, bf.s1, ae.s4, bf.s4, ae.s5, bf.s5);
    const float8 cd_xy = (float8)(cg.s0, dh.s0, cg.s1, dh.s1, cg.s4, dh.s4, cg.s5, dh.s5);
    const float8 ab_zw = (float8)(ae.s2, bf.s2, ae.s3, bf.s3, ae.s6, bf.s6, ae.s7, bf.s7);
    const float8 cd_zw = (float8)(cg.s2, dh.s2, cg.s3, dh.s3, cg.s6, dh.s6, cg.s7, dh.s7);
    p->x = (float8)(ab_xy.s01, cd_xy.s01, ab_xy.s45, cd_xy.s45);
    p->y = (float8)(ab_xy.s23, cd_xy.s23, ab_xy.s67, cd_xy.s67);
    p->z = (float8)(ab_zw.s01, cd_zw.s01, ab_zw.s45, cd_zw.s45);
    p->w = (float8)(ab_zw.s23, cd_zw.s23, ab_zw.s67, cd_zw.s67);
}
#define READ(image, columns, row, pixels)                                                     \
    Transpose((float8)(ReadPixel(image, columns.s0, row), ReadPixel(image, columns.s4, row)), \
              (float8)(ReadPixel(image, columns.s1, row), ReadPixel(image, columns.s5, row)), \
              (float8)(ReadPixel(image, columns.s2, row), ReadPixel(image, columns.s6, row)), \
              (float8)(ReadPixel(image, columns.s3, row), ReadPixel(image, columns.s7, row)), pixels)
#else
INLINED void Split(float4 rgba, Pixels* p) {
    p->x = rgba.x;
    p->y = rgba.y;
    p->z = rgba.z;
    p->w = rgba.w;
}
#define READ(image, columns, row, pixels) Split(ReadPixel(image, columns, row), pixels)
#endif

// Masks are -1 or 0. They come from signs: from comparisons compilers make narrower vectors and convert to and fro.
INLINED Ints Same(Ints mask, Ints other) {
    return ~(mask ^ other);
}

// Where value exceeds the limit; neither is NaN.
INLINED Ints Exceeds(Floats value, float limit) {
    return AS_INTS(limit - value) >> 31;
}

// The bits of a magnitude. They grow with it, those of infinity and NaN beyond all others.
INLINED Ints Magnitude(Floats value) {
    return AS_INTS(value) & 0x7fffffff;
}

// Where a magnitude is usable as IsUsable has it.
INLINED Ints Usable(Ints magnitude) {
    return (magnitude - BITS_OF_1E15) >> 31;
}

INLINED Floats ZeroUnless(Ints mask, Floats value) {
    return AS_FLOATS(AS_INTS(value) & mask);
}

// The first three components with zeros in place of unusable ones, and which were usable.
INLINED Ints KeepUsable(Pixels* p) {
    const Ints usable = Usable(max(max(Magnitude(p->x), Magnitude(p->y)), Magnitude(p->z)));
    p->x = ZeroUnless(usable, p->x);
    p->y = ZeroUnless(usable, p->y);
    p->z = ZeroUnless(usable, p->z);
    return usable;
}

// The same with the alpha, by which the others are divided.
INLINED Ints DivideUsable(Pixels* p) {
    const Ints usable = KeepUsable(p) & Usable(Magnitude(p->w));
    const Floats alpha = ZeroUnless(usable, p->w);
    // Alpha below 1e-15 counts as 0: quotients stay finite.
    const Floats inverse = 1.0f / (fabs(alpha) < (Floats)(1e-15f) ? (Floats)(1.0f) : alpha);
    p->x = ZeroUnless(usable, p->x * inverse);
    p->y = ZeroUnless(usable, p->y * inverse);
    p->z = ZeroUnless(usable, p->z * inverse);
    return usable;
}

// 1 / sqrt of numbers from 0 to 1e36 (a large number for 0), relative error 5e-6. The library's function goes through
// a vector one by one on central processors: there, a guess from the bits and two of Newton's steps are faster.
INLINED Floats InverseRoot(Floats value) {
#if ON_CENTRAL_PROCESSOR
    const Floats guess = AS_FLOATS(0x5f375a86 - (AS_INTS(value) >> 1));
    const Floats half_value = 0.5f * value;
    const Floats better = guess * (1.5f - half_value * guess * guess);
    return better * (1.5f - half_value * better * better);
#else
    return native_rsqrt(max(value, 1e-36f));
#endif
}

INLINED Floats Length(Floats x, Floats y, Floats z) {
    const Floats square = min(x * x + y * y + z * z, 1e36f);
    return square * InverseRoot(square);
}
