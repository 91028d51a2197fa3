// Where a program's binary is cached: the directory in use and the names of its files.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

namespace zor {

class DeviceCL;

// The cache directory in use: one process-wide text of at most 127 bytes, "cache" at first. Longer texts are cut.
inline constexpr size_t kCacheDirectoryBytes = 128;
void setCacheDirectory(std::string_view directory) noexcept;
const char* cacheDirectory() noexcept;

// One-at-a-time hash (Bob Jenkins) over the bytes of a text, each taken as signed 8-bit, starting from seed.
uint32_t oneAtATimeHash(std::string_view text, uint32_t seed) noexcept;

// "directory/base-hash.v.version.device.driver_64.bin"; an absent option text gives "0x0" as hash.
std::string binaryFileName(const DeviceCL& device, std::string_view fileName, std::optional<std::string_view> options);

// A cache file and what its content must agree with.
struct CacheEntry {
    std::string path;       // of the binary; empty: not cached
    std::string options;    // as given to the compiler
    uint64_t identity = 0;  // hash of everything else that the binary depends on
};

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
