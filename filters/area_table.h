// The area table of morphological antialiasing: how much of a pixel lies on either side of a smoothed edge line.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

// A square of 5 x 5 blocks of 33 x 33 texels of two bytes, row after row: 54,450 bytes. Block column and row are four
// times the crossing-edge value at the line's first and second end; inside a block, column and row are the distances
// to those ends in pixels. The two channels are the areas of the pixel's own and the opposite side, times 255.
// After A. Reshetov, "Morphological Antialiasing", High Performance Graphics 2009, in the form of J. Jimenez et al.,
// "Practical Morphological Anti-Aliasing", GPU Pro 2, 2011.
std::span<const uint8_t> areaTable();

inline constexpr size_t kAreaBlocks = 5;
inline constexpr size_t kAreaBlockSize = 33;
inline constexpr size_t kAreaTableSize = kAreaBlocks * kAreaBlockSize;
inline constexpr size_t kAreaTableBytes = 2 * kAreaTableSize * kAreaTableSize;
