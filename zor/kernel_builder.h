// Builds one OpenCL program: from the on-disk binary cache while that is current, otherwise with the compiler, writing
// the new binary to the cache. One builder lives for one kernel lookup.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "zor/device_cl.h"

namespace zor {

// The cache directory in use: one process-wide text of at most 127 bytes, "cache" at first. Longer texts are cut.
inline constexpr size_t kCacheDirectoryBytes = 128;
void setCacheDirectory(std::string_view directory) noexcept;
const char* cacheDirectory() noexcept;

// One-at-a-time hash (Bob Jenkins) over the bytes of a text, each taken as signed 8-bit, starting from seed.
uint32_t oneAtATimeHash(std::string_view text, uint32_t seed) noexcept;

// "directory/base-hash.v.version.device.driver_64.bin"; an absent option text gives "0x0" as hash.
std::string binaryFileName(const DeviceCL& device, std::string_view fileName, std::optional<std::string_view> options);

// The binary exists and is newer than the source, or there is no source. Prints a line for a file that cannot be
// opened.
bool isFileUpToDate(const std::string& binary, const std::string& source);

// A cache file and what its content must agree with.
struct CacheEntry {
    std::string path;       // of the binary; empty: not cached
    std::string options;    // as given to the compiler
    uint64_t identity = 0;  // hash of everything else that the binary depends on
};

// A compiled program whose binary is not in the cache yet.
struct UnwrittenProgram {
    ProgramHandle program;
    CacheEntry entry;
};

class KernelBuilder {
 public:
    explicit KernelBuilder(DeviceCL& device) noexcept : device_(device) {}

    // From the request's source texts. Without a file name nothing is cached.
    void buildFromSources(const KernelRequest& request);

    // From the file named by the request (plus ".cl" when addExtension is set), compared with its dependencies. False
    // when the file cannot be read.
    bool buildFromFile(const KernelRequest& request, bool addExtension);

    // Null after a failed compilation, whose log has been printed.
    cl_program program() const noexcept { return program_.get(); }

    // Gives the program away when it was compiled for a request that writes it after its first run.
    std::optional<UnwrittenProgram> takeUnwritten();

 private:
    bool load(const CacheEntry& entry);
    void compile(std::span<const std::string_view> sources, const std::string& options);
    void store(CacheEntry entry, bool afterRun);
    void reportBuildFailure(cl_program program, int32_t status) const;

    DeviceCL& device_;
    ProgramHandle program_;
    std::optional<CacheEntry> unwritten_;
};

}  // namespace zor
