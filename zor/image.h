// OpenCL image objects that are not the caller's: copies that stand in for them.
#pragma once

#include "zor/device.h"
#include "zor/opencl.h"

namespace zor {

// A new two-dimensional image of another's format and size, readable and writable, with undefined content. Failures
// are broken invariants.
MemoryHandle createImageLike(Device& device, cl_mem image);

// Copies all pixels between two images of one format and size and waits for the device.
void copyImage(Device& device, cl_mem from, cl_mem to);

}  // namespace zor
