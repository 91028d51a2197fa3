// Base of everything that has a handle.
#pragma once

#include <cstdint>

class TovObject {
 public:
    TovObject(const TovObject&) = delete;
    TovObject& operator=(const TovObject&) = delete;
    virtual ~TovObject() = default;

    // TOV_OBJECT_..., fixed at construction.
    uint32_t type() const noexcept { return type_; }
    // Different for every object of the process, so that a reused address does not pass for the old object.
    uint64_t serial() const noexcept { return serial_; }

 protected:
    explicit TovObject(uint32_t type) noexcept;

 private:
    uint32_t type_;
    uint64_t serial_;
};

// The object as the class that its tag names; null when it is none or another.
template <class Class>
Class* as(TovObject* object) noexcept {
    return object != nullptr && object->type() == Class::kType ? static_cast<Class*>(object) : nullptr;
}
