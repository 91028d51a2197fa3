// The areas beside an edge line, from the rule of the method.
#pragma once

#include <algorithm>
#include <array>

// Integral, over the pixel that begins `own` pixels from this end, of a line that falls from 1/2 there to 0 half way to
// the other end and stays there; as a byte, truncated.
inline int areaByte(int own, int other) {
    const double half = (own + other + 1) / 2.0;
    const auto under = [&](double x) {
        return std::min(x, half) / 2 - std::min(x, half) * std::min(x, half) / (4 * half);
    };
    return static_cast<int>(255 * (under(own + 1) - under(own)) + 1e-9);
}

// Bytes of the own and of the opposite side. What crosses an end is 0 nothing, 1 an edge on the opposite side, 3 one on
// the own side, 4 both, which make a Z with the other end if that is decided; 2 cannot be.
inline std::array<int, 2> areaRule(int first, int second, int crossingFirst, int crossingSecond) {
    const auto resolved = [](int crossing, int other) {
        return crossing == 4 && (other == 1 || other == 3) ? 4 - other : crossing;
    };
    const int a = resolved(crossingFirst, crossingSecond);
    const int b = resolved(crossingSecond, crossingFirst);
    std::array<int, 2> sides{};
    if (a == 2 || a == 4 || b == 2 || b == 4) return sides;
    if (a != 0) sides[a == 3 ? 0 : 1] += areaByte(first, second);
    if (b != 0) sides[b == 3 ? 0 : 1] += areaByte(second, first);
    return sides;
}
