// What all 27 functions share: the one place where anything thrown becomes a code, and the small checks.
#pragma once

#include <cstdint>
#include <cstring>
#include <memory>

#include "api/tov/types.h"
#include "core/context.h"
#include "core/exception.h"
#include "core/registry.h"

// 0 after the body, the code of a TovException, the internal error for everything else. Nothing passes.
template <class Body>
int32_t guarded(Body&& body) noexcept {
    try {
        body();
        return TOV_SUCCESS;
    } catch (const TovException& exception) {
        return exception.code();
    } catch (...) {
        return TOV_ERROR_INTERNAL_ERROR;
    }
}

inline void require(bool condition, int32_t code) {
    if (!condition) throw TovException{code};
}

// The handle's context, which must also have a device.
inline TovContext& requireContext(void* handle) {
    TovContext& context = require<TovContext>(handle);
    require(context.device() != nullptr, TOV_ERROR_INVALID_CONTEXT);
    return context;
}

// Registers a new object and hands it out; nothing is written when registering fails.
template <class Object>
void handOut(std::unique_ptr<Object> object, void** out) {
    registry::add(object.get());
    *out = object.release();
}

// Answers an information query: the caller's buffer must hold the whole value.
template <class Value>
void answer(const Value& value, uint64_t capacity, void* out, uint64_t* outSize) {
    require(capacity >= sizeof value, TOV_ERROR_INVALID_PARAMETER);
    std::memcpy(out, &value, sizeof value);
    *outSize = sizeof value;
}

inline void requireQuery(const void* out, uint64_t size, const uint64_t* outSize) {
    require(out != nullptr && size != 0 && outSize != nullptr, TOV_ERROR_INVALID_PARAMETER);
}
