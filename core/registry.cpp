#include "core/registry.h"

#include <memory>
#include <vector>

#include "zor/freed_at_unload.h"

namespace {

uint64_t nextSerial = 1;

std::vector<TovObject*>* live = nullptr;

// The list alone is freed. Objects still in it are left to the host's exit: destroying them then could call into a
// driver that is already gone. Exit handlers find no object from before, instead of freed memory.
const FreedAtUnload<std::vector<TovObject*>> listOwner{live};

size_t size() noexcept {
    return live == nullptr ? 0 : live->size();
}

}  // namespace

TovObject::TovObject(uint32_t type) noexcept : type_(type), serial_(nextSerial++) {}

namespace registry {

void add(TovObject* object) {
    if (live == nullptr) live = new std::vector<TovObject*>;
    live->push_back(object);
}

std::ptrdiff_t find(const void* handle) noexcept {
    for (size_t i = 0; i < size(); ++i)
        if ((*live)[i] == handle) return static_cast<std::ptrdiff_t>(i);
    return -1;
}

TovObject* lookUp(const void* handle) noexcept {
    const std::ptrdiff_t index = handle == nullptr ? -1 : find(handle);
    return index < 0 ? nullptr : (*live)[static_cast<size_t>(index)];
}

void remove(std::ptrdiff_t index) noexcept {
    const std::unique_ptr<TovObject> object((*live)[static_cast<size_t>(index)]);
    live->erase(live->begin() + index);
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
