// Which stages run as one fused kernel.
#ifndef TOV_TOOLS_STAGE_GROUPS_H
#define TOV_TOOLS_STAGE_GROUPS_H

#include <cstddef>
#include <vector>

#include "stage.h"

namespace tool {

// Whether the stage is given values that are measured on its very input.
bool measuresInput(const Stage& stage) noexcept;

// Sizes of the groups of neighbouring stages, in order. A stage joins the one before when both are filters that can be
// fused, it needs nothing but the pixels of that stage (a measurement or "@" wants a whole picture), and the fused
// kernel keeps few enough arguments. Without `fuse` every stage stays alone.
std::vector<size_t> groupStages(const std::vector<Stage>& stages, bool fuse);

}  // namespace tool

#endif
