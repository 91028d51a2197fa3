// Chains of filters fused into one kernel beside the same filters one after another.
#pragma once

#include "tov/tov.h"

namespace bench {

// Registers "fusion/CHAIN". The smallest picture shows what an execution costs the host: nothing else takes time there.
void registerFusedChains(tov_context context);

}  // namespace bench
