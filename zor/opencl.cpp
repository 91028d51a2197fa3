// Opens the system's OpenCL library and looks its entry points up.
#include "zor/opencl.h"

#include <array>
#include <cstdlib>
#include <optional>

#include "zor/dynamic_library.h"

namespace zor {
namespace {

#if defined(_WIN32)
constexpr std::array kLibraryNames = {"OpenCL.dll"};
#elif defined(__APPLE__)
constexpr std::array kLibraryNames = {"/System/Library/Frameworks/OpenCL.framework/OpenCL"};
#else
constexpr std::array kLibraryNames = {"libOpenCL.so.1", "libOpenCL.so"};
#endif

struct Library {
    void* handle = nullptr;
    uint32_t references = 0;
    EntryPoints entryPoints;
    std::optional<clGetGLContextInfoKHR_fn> glContextInfo;
};
constinit Library library;

void* openFirstLibrary() noexcept {
    for (const char* name : kLibraryNames)
        if (void* handle = openLibrary(name)) return handle;
    return nullptr;
}

}  // namespace

const EntryPoints& cl() noexcept {
    return library.entryPoints;
}

int32_t loadOpenCL() {
    if (library.handle != nullptr) return 0;
    void* handle = openFirstLibrary();
    if (handle == nullptr) return -1;
    if (std::atexit([] { unloadOpenCL(); }) != 0) {
        closeLibrary(handle);
        return -2;
    }
    library.handle = handle;
#define ZOR_CL(name) library.entryPoints.name.set(findSymbol(handle, #name));
#include "zor/entry_points.def"
#undef ZOR_CL
    return 0;
}

void unloadOpenCL() noexcept {
    library = Library{};
}

uint32_t openCLReferences() noexcept {
    return library.references;
}

void addOpenCLReference() noexcept {
    ++library.references;
}

clGetGLContextInfoKHR_fn glContextInfo() {
    if (!library.glContextInfo) {
        void* address = nullptr;
        if (cl().clGetExtensionFunctionAddress) address = cl().clGetExtensionFunctionAddress("clGetGLContextInfoKHR");
        library.glContextInfo = reinterpret_cast<clGetGLContextInfoKHR_fn>(address);
    }
    return *library.glContextInfo;
}

}  // namespace zor
