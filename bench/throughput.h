// Every filter over whole pictures beside a copy kernel of the same launch shape and layout.
#pragma once

#include "opencl.h"
#include "tov/tov.h"

namespace bench {

// Registers "throughput/FILTER/WIDTHxHEIGHT/LAYOUT". Both must live until the benchmarks have run.
void registerThroughput(const OpenCL& opencl, tov_context context);

// Releases what the latest of them kept. Called before the context goes.
void releaseThroughput() noexcept;

}  // namespace bench
