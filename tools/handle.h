// A library object that is deleted with its scope.
#ifndef TOV_TOOLS_HANDLE_H
#define TOV_TOOLS_HANDLE_H

#include <memory>

#include "tov/tov.h"

namespace tool {

struct ObjectDeleter {
    void operator()(void* object) const noexcept { tovObjectDelete(object); }
};
using Handle = std::unique_ptr<void, ObjectDeleter>;

}  // namespace tool

#endif
