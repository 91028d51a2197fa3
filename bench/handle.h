// Library objects that are deleted with their scope, and failures as exceptions.
#pragma once

#include <memory>
#include <stdexcept>
#include <string>

#include "tov/tov.h"

namespace bench {

struct ObjectDeleter {
    void operator()(void* object) const noexcept { tovObjectDelete(object); }
};
using Handle = std::unique_ptr<void, ObjectDeleter>;

// Throws with the call's name and its code unless that is TOV_SUCCESS.
inline void check(int32_t code, const char* call) {
    if (code != TOV_SUCCESS) throw std::runtime_error(std::string(call) + " returned " + std::to_string(code));
}

}  // namespace bench
