#include "zor/dynamic_library.h"

#ifdef _WIN32
#include <windows.h>
#else
#include <dlfcn.h>
#endif

namespace zor {

#ifdef _WIN32
void* openLibrary(const char* name) noexcept {
    return LoadLibraryExA(name, nullptr, LOAD_LIBRARY_SEARCH_SYSTEM32);
}

void closeLibrary(void* library) noexcept {
    FreeLibrary(static_cast<HMODULE>(library));
}

void* findSymbol(void* library, const char* name) noexcept {
    return reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(library), name));
}

void* findLoadedSymbol(const char*) noexcept {
    return nullptr;
}
#else
void* openLibrary(const char* name) noexcept {
    return dlopen(name, RTLD_NOW | RTLD_LOCAL);
}

void closeLibrary(void* library) noexcept {
    dlclose(library);
}

void* findSymbol(void* library, const char* name) noexcept {
    return dlsym(library, name);
}

void* findLoadedSymbol(const char* name) noexcept {
    return dlsym(RTLD_DEFAULT, name);
}
#endif

}  // namespace zor
