// The three OpenGL calls that describe a texture before it is wrapped.
#pragma once

#include <cstdint>

#include "api/tov/types.h"

// Layout of a level of a texture of the current OpenGL context. Throws the OpenGL error when there is no OpenGL, no
// current context, or OpenGL reports an error; invalid parameter for a format that kernels do not know and for an
// empty level.
tov_image_desc describeTexture(uint32_t target, int32_t level, uint32_t texture);
