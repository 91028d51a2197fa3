// The files of the binary cache. Beside each binary lies a side file, "<binary>.options": the option text, a line feed
// and one line with the hash and size of the binary's bytes and the hash of the program's identity. Only a binary whose
// side file says exactly that is used, so neither a truncated or altered file, nor one of another program whose name
// hashes alike, nor any mixture of two writers' files reaches the driver.
#pragma once

#include <optional>
#include <string>

#include "zor/cache_name.h"
#include "zor/opencl.h"

namespace zor {

// The bytes of a binary that agrees with its side file.
std::optional<std::string> loadBinary(const CacheEntry& entry);

// Writes both files under temporary names and renames them. False when that fails; then nothing is left behind.
bool storeBinary(const CacheEntry& entry, const std::string& binary);

// Stores a program's binary as the driver has it now, and prints a line; what cannot be stored is silently not cached.
void writeProgram(cl_program program, const CacheEntry& entry);

void removeBinary(const CacheEntry& entry);

// The whole of a regular file.
std::optional<std::string> readFile(const std::string& path);

}  // namespace zor
