// Builds one OpenCL program: from the on-disk binary cache while that is current, otherwise with the compiler, writing
// the new binary to the cache. One builder lives for one kernel lookup.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "zor/cache_name.h"
#include "zor/device_cl.h"

namespace zor {

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
