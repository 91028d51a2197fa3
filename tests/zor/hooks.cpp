#include "hooks.h"

#include <dlfcn.h>

extern "C" {
extern void* __dso_handle;
int __cxa_atexit(void (*function)(void*), void* argument, void* library);
}

namespace hooks {

State& state() {
    static auto* const kept = new State;  // outlives the exit hooks
    return *kept;
}

}  // namespace hooks

extern "C" void* dlopen(const char* name, int flags) {
    using Open = void*(const char*, int);
    static auto* const real = reinterpret_cast<Open*>(dlsym(RTLD_NEXT, "dlopen"));
    if (name == nullptr) return real(name, flags);
    hooks::state().opened.emplace_back(name);
    hooks::state().flags.push_back(flags);
    const auto path = hooks::state().paths.find(name);
    if (path == hooks::state().paths.end()) return real(name, flags);
    return path->second.empty() ? nullptr : real(path->second.c_str(), flags);
}

extern "C" int dlclose(void* handle) {
    using Close = int(void*);
    static auto* const real = reinterpret_cast<Close*>(dlsym(RTLD_NEXT, "dlclose"));
    ++hooks::state().closed;
    return real(handle);
}

extern "C" int atexit(void (*function)()) {
    ++hooks::state().atexitCalls;
    if (hooks::state().refuseAtexit) return -1;
    return __cxa_atexit([](void* given) { reinterpret_cast<void (*)()>(given)(); }, reinterpret_cast<void*>(function),
                        &__dso_handle);
}

// Under the address sanitizer an allocation that cannot be had fails as everywhere else.
extern "C" __attribute__((visibility("default"))) const char* __asan_default_options() {
    return "allocator_may_return_null=1";
}
