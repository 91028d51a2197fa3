// The objects behind the stand-in's handles, and what every entry point begins with.
#pragma once

#include "standin.h"

#include <algorithm>
#include <cstdlib>
#include <memory>

#define STANDIN_API extern "C" __attribute__((visibility("default")))

struct _cl_platform_id {
    size_t index;
};
struct _cl_device_id {
    size_t platform;
    size_t index;
};
struct Counted {
    uint32_t references = 1;
};
struct _cl_context : Counted {
    cl_device_id device = nullptr;
};
struct _cl_command_queue : Counted {};
struct FreeBytes {
    void operator()(void* bytes) const noexcept { std::free(bytes); }
};
struct _cl_mem : Counted {
    cl_context context = nullptr;
    cl_mem_object_type type = CL_MEM_OBJECT_BUFFER;
    cl_mem_flags flags = 0;
    size_t size = 0;
    std::unique_ptr<unsigned char, FreeBytes> own;
    unsigned char* bytes = nullptr;
    cl_image_format format{};
    size_t width = 0, height = 0, depth = 0;
    uint32_t texture = 0;
};
struct _cl_program : Counted {
    std::string source, options, log;
    bool fromBinary = false, built = false;
};
struct _cl_kernel : Counted {
    standin::Launch launch;
};
struct _cl_event : Counted {
    cl_int status = CL_SUBMITTED;
};

namespace standin {

State& script();

// Logs the call; the status it is scripted to fail with, else success.
int32_t enter(const char* name, std::string text = {}, std::vector<uint64_t> numbers = {});

void complain(const std::string& what);
bool isLive(const void* object, const char* kind);

template <class Object>
Object* add(std::unique_ptr<Object> object, const char* kind) {
    script().live[object.get()] = kind;
    return object.release();
}

template <class Object>
int32_t retain(const char* name, Object* object, const char* kind, int32_t invalid) {
    if (const int32_t status = enter(name)) return status;
    if (!isLive(object, kind)) return complain(name), invalid;
    ++object->references;
    return CL_SUCCESS;
}

template <class Object>
int32_t release(const char* name, Object* object, const char* kind, int32_t invalid) {
    if (const int32_t status = enter(name)) return status;
    if (!isLive(object, kind)) return complain(name), invalid;
    if (--object->references > 0) return CL_SUCCESS;
    script().live.erase(object);
    delete object;
    return CL_SUCCESS;
}

// What a creating call gives for a failure.
template <class Object = void>
std::nullptr_t refuse(int32_t status, cl_int* out) {
    if (out != nullptr) *out = status;
    return nullptr;
}
template <class Object>
Object* give(Object* object, cl_int* out) {
    if (out != nullptr) *out = CL_SUCCESS;
    return object;
}

int32_t answer(const void* data, size_t bytes, size_t capacity, void* out, size_t* outSize);
int32_t answer(const std::string& text, size_t capacity, void* out, size_t* outSize);
template <class Value>
int32_t answerValue(const Value& value, size_t capacity, void* out, size_t* outSize) {
    return answer(&value, sizeof value, capacity, out, outSize);
}

}  // namespace standin
