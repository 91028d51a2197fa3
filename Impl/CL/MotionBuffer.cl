// Displacement of a point on the screen, 0 to 1 across it, from the current to the previous camera. A point in the
// plane of either camera is nowhere on the screen: its motion is NaN.
#ifdef MOTION_BUFFER
__kernel void GenerateMotionBuffer(srcBufferType(positions), dstBufferType(motion), float16 prev_view_projection,
                                   float16 view_projection) {
    int2 coord;
    GET_COORD(coord, GET_BUFFER_SIZE(motion));
    const float4 stored = ReadPixel(positions, coord.x, coord.y);
    const bool usable =
        IsUsableFloat(stored.x) & IsUsableFloat(stored.y) & IsUsableFloat(stored.z) & IsUsableFloat(stored.w);
    const float weight = stored.w > 1.0f ? stored.w : 1.0f;
    const float4 world =
        (float4)(usable ? Quotient(stored.x, weight) : 0.0f, usable ? Quotient(stored.y, weight) : 0.0f,
                 usable ? Quotient(stored.z, weight) : 0.0f, 1.0f);
    const float now_x = dot3F4(view_projection.s0123, world) + view_projection.s3;
    const float now_y = dot3F4(view_projection.s4567, world) + view_projection.s7;
    const float now_w = dot3F4(view_projection.scdef, world) + view_projection.sf;
    const float before_x = dot3F4(prev_view_projection.s0123, world) + prev_view_projection.s3;
    const float before_y = dot3F4(prev_view_projection.s4567, world) + prev_view_projection.s7;
    const float before_w = dot3F4(prev_view_projection.scdef, world) + prev_view_projection.sf;
    const bool projectable = (now_w != 0.0f) & (before_w != 0.0f);
    const float now_divisor = projectable ? now_w : 1.0f;
    const float before_divisor = projectable ? before_w : 1.0f;
    const float shift_x = (Quotient(before_x, before_divisor) - Quotient(now_x, now_divisor)) * 0.5f;
    const float shift_y = (Quotient(before_y, before_divisor) - Quotient(now_y, now_divisor)) * -0.5f;
    // Chosen among bits: among floats relaxed math may drop the NaN.
    const bool somewhere = (world.x != 0.0f) | (world.y != 0.0f) | (world.z != 0.0f);
    const uint bits_x = projectable ? as_uint(shift_x) : 0x7fc00000u;
    const uint bits_y = projectable ? as_uint(shift_y) : 0x7fc00000u;
    const float4 result =
        (float4)(somewhere ? as_float(bits_x) : 0.0f, somewhere ? as_float(bits_y) : 0.0f, 0.0f, 1.0f);
    WritePixel(motion, coord.x, coord.y, result);
}
#endif
