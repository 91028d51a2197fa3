// Where compiled kernels are kept between runs.
#ifndef TOV_TOOLS_USER_DIRECTORIES_H
#define TOV_TOOLS_USER_DIRECTORIES_H

#include <cstddef>
#include <optional>
#include <string>

namespace tool {

// The library keeps 127 bytes of a cache path and cuts the rest.
inline constexpr size_t kMaxCachePathBytes = 127;

// The directory for the library's cache, made with its parents where it is missing (for the user alone). Without a
// given path: tov below the user's cache directory. A given path that cannot be made is a failure; the user's own one
// only a note, since the library works without. Throws a usage failure for a path that is empty or too long, or when
// there is no home directory; kFailed for a cache of another user, because the files in it are machine code.
std::string cacheDirectory(const std::optional<std::string>& given);

}  // namespace tool

#endif
