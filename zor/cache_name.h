// Where a program's binary is cached: the directory in use and the names of its files.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "zor/kernel_builder.h"

namespace zor {

// 64-bit FNV-1a (Fowler, Noll, Vo) over the bytes of a text, continuing from hash.
inline constexpr uint64_t kFnvOffset = 14695981039346656037u;
uint64_t fnv1a(std::string_view text, uint64_t hash = kFnvOffset) noexcept;

// Identity of a program of these source texts on the device; file names and texts of every length stay apart.
uint64_t programIdentity(const DeviceCL& device, std::string_view fileName, std::span<const std::string_view> sources);

// False where the name cannot be a file of the cache directory itself: an empty directory text, or a device or driver
// text with a path separator.
bool isCacheable(const DeviceCL& device) noexcept;

// One level; that it exists already or cannot be made is no error.
void createCacheDirectory();

}  // namespace zor
