// The OpenCL context of a chosen device, shared with an OpenGL context where that runs on the same device.
#pragma once

#include "zor/discovery.h"

namespace zor {

struct CreatedContext {
    ContextHandle handle;
    bool glShared = false;
};

// Properties may be null; they are key/value pairs ended by a zero key, at most kMaxContextProperties entries with the
// platform and the end that are added. Where they do not lead to a context, one without properties is made.
inline constexpr size_t kMaxContextProperties = 32;
CreatedContext createContext(const FoundDevice& chosen, const cl_context_properties* properties);

}  // namespace zor
