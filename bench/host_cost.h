// What the library adds to a launch: one execution of a filter on a small picture beside the bare launches of the same
// kernels.
#pragma once

#include <string>

#include "opencl.h"
#include "tov/tov.h"

namespace bench {

// Registers "host/FILTER". `cache` is the context's cache directory, from which the compiled kernels are taken.
void registerHostCost(const OpenCL& opencl, tov_context context, const std::string& cache);

}  // namespace bench
