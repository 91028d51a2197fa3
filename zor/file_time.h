// Ages of files: when a cached binary is still current.
#pragma once

#include <cstdint>
#include <string>

#include "zor/kernel_builder.h"

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

}  // namespace zor
