// The objects behind the stand-in's handles, and what every entry point begins and ends with.
#pragma once

#include "standin.h"

#include <algorithm>
#include <cstdlib>
#include <memory>

#define STANDIN_API extern "C" __attribute__((visibility("default")))
#define STANDIN_EVENTS cl_uint, const cl_event*, cl_event*

namespace standin {

struct Kind {
    const char* name;
    int32_t invalid;  // status of a call with a dead handle
};

}  // namespace standin

struct _cl_context {
    static constexpr standin::Kind kKind{"context", CL_INVALID_CONTEXT};
    cl_device_id device = nullptr;
};
struct _cl_command_queue {
    static constexpr standin::Kind kKind{"queue", CL_INVALID_COMMAND_QUEUE};
};
struct _cl_mem {
    static constexpr standin::Kind kKind{"memory", CL_INVALID_MEM_OBJECT};
    cl_context context = nullptr;
    cl_mem_flags flags = 0;
    size_t size = 0;
    std::unique_ptr<unsigned char, decltype(&std::free)> own{nullptr, std::free};
    unsigned char* bytes = nullptr;
    cl_image_format format{};
    size_t width = 0, height = 0;  // 0: a buffer
};
struct _cl_program {
    static constexpr standin::Kind kKind{"program", CL_INVALID_PROGRAM};
    std::string source, options;
};
struct _cl_kernel {
    static constexpr standin::Kind kKind{"kernel", CL_INVALID_KERNEL};
    standin::Launch launch;
};
struct _cl_event {
    static constexpr standin::Kind kKind{"event", CL_INVALID_EVENT};
};

namespace standin {

State& script();

// Logs the call; the status it is scripted to fail with, else success.
int32_t begin(Call call);
// Success for a live object of the kind; the status of a dead one, which is misuse.
int32_t checkLive(const std::string& call, const void* object, Kind kind);

// Begins an entry point: its scripted status, else that of the first dead handle, else success.
template <class... Objects>
int32_t enter(Call call, const Objects*... handles) {
    const std::string name = call.name;
    int32_t status = begin(std::move(call));
    ((status = status != CL_SUCCESS ? status : checkLive(name, handles, Objects::kKind)), ...);
    return status;
}

// Ends a creating call: the new object, or null and the status.
template <class Object>
Object* give(cl_int* out, int32_t status, std::unique_ptr<Object> object) {
    if (out != nullptr) *out = status;
    if (status != CL_SUCCESS) return nullptr;
    script().live[object.get()] = Object::kKind.name;
    return object.release();
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
