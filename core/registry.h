// The process-wide list of live objects. Every handle that comes in is looked up here before it is used.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/exception.h"
#include "core/object.h"

namespace registry {

// Appends; takes ownership until remove.
void add(TovObject* object);

// Index of the handle's object in order of registration, or -1. Linear in the number of live objects.
std::ptrdiff_t find(const void* handle) noexcept;

// The handle's object, or null.
TovObject* lookUp(const void* handle) noexcept;

// Erases the entry and destroys its object; later entries move down by one.
void remove(std::ptrdiff_t index) noexcept;

}  // namespace registry

// A remembered handle that knows when its object has been deleted, also when the address is in use again.
class ObjectRef {
 public:
    ObjectRef() = default;
    explicit ObjectRef(TovObject* object) noexcept;

    TovObject* handle() const noexcept { return object_; }  // not to be followed: the object may be gone
    bool isNull() const noexcept { return object_ == nullptr; }
    uint32_t type() const noexcept { return type_; }  // the tag that the object had
    TovObject* get() const noexcept;                  // null when there is none or it was deleted

 private:
    TovObject* object_ = nullptr;
    uint64_t serial_ = 0;
    uint32_t type_ = 0;
};

// The live object of the class, or the class's own code for null, unknown and deleted handles and other classes.
template <class Class>
Class& require(const void* handle) {
    Class* object = as<Class>(registry::lookUp(handle));
    if (object == nullptr) throw TovException{Class::kInvalidHandle};
    return *object;
}

template <class Class>
Class& require(const ObjectRef& reference) {
    Class* object = as<Class>(reference.get());
    if (object == nullptr) throw TovException{Class::kInvalidHandle};
    return *object;
}
