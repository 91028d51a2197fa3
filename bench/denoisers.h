// The denoisers against the device's arithmetic, which bounds them.
#pragma once

#include "opencl.h"
#include "tov/tov.h"

namespace bench {

// Registers "arithmetic/peak", "arithmetic/FILTER/1920x1080" and "first_frame/FILTER/1920x1080". Both must live until
// the benchmarks have run.
void registerDenoisers(const OpenCL& opencl, tov_context context);

}  // namespace bench
