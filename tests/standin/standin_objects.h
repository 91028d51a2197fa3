// The objects behind the stand-in's handles, and what every entry point begins and ends with.
#pragma once

#include "standin.h"

#include <cstdlib>
#include <memory>
#include <typeinfo>

#define STANDIN_API extern "C" __attribute__((visibility("default")))
#define STANDIN_EVENTS cl_uint, const cl_event*, cl_event*

struct _cl_context {};
struct _cl_command_queue {};
struct _cl_event {};
struct _cl_mem {
    cl_context context;
    cl_mem_flags flags;
    size_t size;
    size_t width = 0, height = 0;  // 0: a buffer
    cl_image_format format{};
    // Zeros of calloc, so that a big buffer costs nothing until it is touched.
    std::unique_ptr<void, decltype(&std::free)> own{std::calloc(size, 1), std::free};
    unsigned char* bytes = static_cast<unsigned char*>(own.get());
};
struct _cl_program {
    std::string source, options;
};
struct _cl_kernel {
    standin::Launch launch;
};

namespace standin {

State& script();

// Logs the call; the status that it is scripted to have.
int32_t begin(Call call);
// Success for a live object of the kind; anything else is misuse.
int32_t checkLive(const std::string& call, const void* object, const std::string& kind);

// Begins an entry point: its scripted status, else that of the first dead handle, else success.
template <class... Objects>
int32_t enter(Call call, const Objects*... handles) {
    const std::string name = call.name;
    int32_t status = begin(std::move(call));
    ((status = status != CL_SUCCESS ? status : checkLive(name, handles, typeid(Objects).name())), ...);
    return status;
}

// Ends a creating call: the new object, or null and the status.
template <class Object>
Object* give(cl_int* out, int32_t status, Object object) {
    *out = status;
    if (status != CL_SUCCESS) return nullptr;
    auto* const made = new Object(std::move(object));
    script().live[made] = typeid(Object).name();
    return made;
}

// The bytes that answer a query.
template <class Value>
std::string bytesOfValue(const Value& value) {
    return {reinterpret_cast<const char*>(&value), sizeof value};
}
using Answers = std::map<cl_uint, std::string>;
int32_t answer(const Answers& answers, cl_uint key, size_t capacity, void* out, size_t* outSize);

}  // namespace standin

// Entry points that differ in name and handle alone: releases, and queries with their answers.
#define STANDIN_RELEASE(call, Handle)                                              \
    STANDIN_API cl_int call(Handle object) {                                       \
        if (const int32_t status = standin::enter({#call}, object)) return status; \
        standin::script().live.erase(object);                                      \
        delete object;                                                             \
        return CL_SUCCESS;                                                         \
    }
#define STANDIN_QUERY(call, Handle, ...)                                                               \
    STANDIN_API cl_int call(Handle object, cl_uint key, size_t capacity, void* out, size_t* outSize) { \
        if (const int32_t status = standin::enter({#call}, object)) return status;                     \
        return standin::answer(__VA_ARGS__, key, capacity, out, outSize);                              \
    }
