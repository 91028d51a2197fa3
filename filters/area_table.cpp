#include "filters/area_table.h"

#include <algorithm>
#include <array>

namespace {

// What crosses an edge line at one of its ends, in quarters as the sampled edges give it.
enum Crossing : size_t { NONE = 0, OPPOSITE = 1, IMPOSSIBLE = 2, OWN = 3, BOTH = 4 };

bool isDecided(size_t crossing) {
    return crossing == OPPOSITE || crossing == OWN;
}

// An end where both sides are crossed takes the side that makes a Z with the other end; without a decided other end
// the line has no shape.
size_t resolve(size_t crossing, size_t other) {
    if (crossing != BOTH) return crossing;
    if (!isDecided(other)) return IMPOSSIBLE;
    return other == OPPOSITE ? OWN : OPPOSITE;
}

// Area, over one pixel, under the line that falls from 1/2 at this end to 0 half way to the other, as a byte.
uint8_t areaFromEnd(size_t toThisEnd, size_t toOtherEnd) {
    const size_t length = toThisEnd + toOtherEnd + 1;
    if (toThisEnd > toOtherEnd) return 0;
    if (toThisEnd == toOtherEnd) return static_cast<uint8_t>(255 / (8 * length));
    return static_cast<uint8_t>(255 * (toOtherEnd - toThisEnd) / (2 * length));
}

// (own side, opposite side)
std::array<uint8_t, 2> areas(size_t firstCrossing, size_t secondCrossing, size_t left, size_t right) {
    const size_t first = resolve(firstCrossing, secondCrossing);
    const size_t second = resolve(secondCrossing, firstCrossing);
    std::array<uint8_t, 2> sides{};
    if (first == IMPOSSIBLE || second == IMPOSSIBLE) return sides;
    const auto addEnd = [&](size_t crossing, size_t toThisEnd, size_t toOtherEnd) {
        if (!isDecided(crossing)) return;
        uint8_t& side = sides[crossing == OWN ? 0 : 1];
        side = static_cast<uint8_t>(side + areaFromEnd(toThisEnd, toOtherEnd));
    };
    addEnd(first, left, right);
    addEnd(second, right, left);
    return sides;
}

std::array<uint8_t, kAreaTableBytes> makeAreaTable() {
    std::array<uint8_t, kAreaTableBytes> table{};
    auto next = table.begin();
    for (size_t y = 0; y < kAreaTableSize; ++y) {
        for (size_t x = 0; x < kAreaTableSize; ++x) {
            const auto sides = areas(x / kAreaBlockSize, y / kAreaBlockSize, x % kAreaBlockSize, y % kAreaBlockSize);
            next = std::copy(sides.begin(), sides.end(), next);
        }
    }
    return table;
}

}  // namespace

std::span<const uint8_t> areaTable() {
    static const std::array<uint8_t, kAreaTableBytes> table = makeAreaTable();
    return table;
}
