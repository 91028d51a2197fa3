// Ages of files: when a cached binary is still current.
#pragma once

#include <cstdint>
#include <string>

namespace zor {

// Nanoseconds since the system's epoch.
using FileTime = int64_t;

// Whether something is there under the name.
bool fileExists(const std::string& path);

// When the library file that carries this code was written or installed: the later of its modification and
// status-change times. 0 where it cannot be told.
FileTime libraryTime();

// The binary was written after the library file.
bool isNewerThanLibrary(const std::string& binary);

// The binary exists and is newer than the source, or there is no source. Prints a line for a file that cannot be
// opened.
bool isFileUpToDate(const std::string& binary, const std::string& source);

}  // namespace zor
