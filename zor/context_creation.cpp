#include "zor/context_creation.h"

namespace zor {
namespace {

std::vector<cl_context_properties> withPlatform(const cl_context_properties* pairs, cl_platform_id platform) {
    constexpr size_t kAdded = 3;  // the platform's key and value, and the end
    std::vector<cl_context_properties> list;
    for (; *pairs != 0; pairs += 2) {
        require(list.size() + 2 + kAdded <= kMaxContextProperties, "createContext", "too many context properties");
        list.insert(list.end(), pairs, pairs + 2);
    }
    list.push_back(CL_CONTEXT_PLATFORM);
    list.push_back(reinterpret_cast<cl_context_properties>(platform));
    list.push_back(0);
    return list;
}

// The device that drives the OpenGL context of the properties; the chosen one where the driver cannot tell.
cl_device_id glDevice(const std::vector<cl_context_properties>& properties, cl_device_id chosen) {
    const clGetGLContextInfoKHR_fn contextInfo = glContextInfo();
    if (contextInfo == nullptr) return chosen;
    cl_device_id device = nullptr;
    size_t size = 0;
    const int32_t status = contextInfo(properties.data(), CL_DEVICES_FOR_GL_CONTEXT_KHR, sizeof device, &device, &size);
    return status == CL_SUCCESS && size >= sizeof device ? device : nullptr;
}

ContextHandle createGlContext(const FoundDevice& chosen, const cl_context_properties* pairs) {
    const std::vector<cl_context_properties> properties = withPlatform(pairs, chosen.platform);
    if (glDevice(properties, chosen.device) != chosen.device) return nullptr;
    int32_t status = CL_SUCCESS;
    ContextHandle context(
        cl().clCreateContext(properties.data(), cl_uint{1}, &chosen.device, nullptr, nullptr, &status));
    return status == CL_SUCCESS ? std::move(context) : nullptr;
}

}  // namespace

CreatedContext createContext(const FoundDevice& chosen, const cl_context_properties* properties) {
    if (properties != nullptr) {
        ContextHandle shared = createGlContext(chosen, properties);
        if (shared != nullptr) return {std::move(shared), true};
    }
    int32_t status = CL_SUCCESS;
    ContextHandle plain(cl().clCreateContext(nullptr, cl_uint{1}, &chosen.device, nullptr, nullptr, &status));
    check(status, "clCreateContext");
    require(plain != nullptr, "clCreateContext", "no context");
    return {std::move(plain), false};
}

}  // namespace zor
