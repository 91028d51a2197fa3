#include "core/registry.h"

#include <memory>
#include <vector>

namespace {

uint64_t nextSerial = 1;

// The list alone is freed when the library is unloaded. Objects still in it are left to the host's exit: destroying
// them then could call into a driver that is already gone.
struct LiveObjects {
    std::vector<TovObject*>* list = nullptr;

    ~LiveObjects() {
        delete list;
        list = nullptr;  // a host that calls from its own exit handlers finds nothing, instead of freed memory
    }
};
LiveObjects live;

}  // namespace

TovObject::TovObject(uint32_t type) noexcept : type_(type), serial_(nextSerial++) {}

namespace registry {

void add(TovObject* object) {
    if (live.list == nullptr) live.list = new std::vector<TovObject*>;
    live.list->push_back(object);
}

std::ptrdiff_t find(const void* handle) noexcept {
    for (size_t i = 0; i < size(); ++i)
        if ((*live.list)[i] == handle) return static_cast<std::ptrdiff_t>(i);
    return -1;
}

TovObject* lookUp(const void* handle) noexcept {
    const std::ptrdiff_t index = handle == nullptr ? -1 : find(handle);
    return index < 0 ? nullptr : (*live.list)[static_cast<size_t>(index)];
}

void remove(std::ptrdiff_t index) noexcept {
    const std::unique_ptr<TovObject> object((*live.list)[static_cast<size_t>(index)]);
    live.list->erase(live.list->begin() + index);
}

size_t size() noexcept {
    return live.list == nullptr ? 0 : live.list->size();
}

}  // namespace registry

ObjectRef::ObjectRef(TovObject* object) noexcept
    : object_(object),
      serial_(object == nullptr ? 0 : object->serial()),
      type_(object == nullptr ? 0 : object->type()) {}

TovObject* ObjectRef::get() const noexcept {
    TovObject* object = registry::lookUp(object_);
    return object != nullptr && object->serial() == serial_ ? object : nullptr;
}
