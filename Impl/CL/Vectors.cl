// Vectors and colours that are divided by a length or an alpha.

// RGB divided by alpha, or as it is where alpha is 0. Finite for usable pixels.
static inline float3 DivideByAlpha(float4 rgba) {
    const float divisor = rgba.w != 0.0f ? rgba.w : 1.0f;
    return clamp(rgba.xyz / divisor, -1e15f, 1e15f);
}

// The vector scaled to length 1; a zero vector stays zero.
static inline float3 Normalized(float3 value) {
    return value * rsqrt(fmax(dot(value, value), 1e-36f));
}

