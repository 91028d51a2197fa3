// Hosts that end without tidying up: exit with everything alive, call the library from an exit handler, or unload it
// while the driver's threads run. Each must end with status 0.
//     exit_test exit|handler|unload LIBRARY CACHE
#include <dlfcn.h>
#include <tov/tov.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string_view>

namespace {

void* library = nullptr;
tov_context context = nullptr;
tov_command_queue queue = nullptr;

// A function by its name, since the library comes and goes.
#define CALL(name, ...) reinterpret_cast<decltype(&(name))>(dlsym(library, #name))(__VA_ARGS__)
#define SUCCEED(name, ...)                          \
    if (CALL(name, __VA_ARGS__) != TOV_SUCCESS) {   \
        std::fprintf(stderr, "%s failed\n", #name); \
        std::exit(2);                               \
    }

// Runs a filter and leaves everything alive, an image mapped.
void runFilter(const char* path, const char* cache) {
    library = dlopen(path, RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) std::exit(3);
    const tov_image_desc desc = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    tov_image image = nullptr;
    tov_image_filter filter = nullptr;
    void* pixels = nullptr;
    SUCCEED(tovCreateContext, TOV_API_VERSION, 0, TOV_DEVICE_TYPE_CPU, 0, cache, &context)
    SUCCEED(tovContextCreateImage, context, &desc, nullptr, &image)
    SUCCEED(tovContextCreateImageFilter, context, TOV_IMAGE_FILTER_LINEAR_TONEMAP, &filter)
    SUCCEED(tovContextCreateCommandQueue, context, &queue)
    SUCCEED(tovCommandQueueAttachImageFilter, queue, filter, image, image)
    SUCCEED(tovContextExecuteCommandQueue, context, queue, nullptr, nullptr)
    SUCCEED(tovImageMap, image, 0, &pixels)
}

// The library has had its own exit handlers by now; it may refuse, but not crash.
void useAtExit() {
    CALL(tovContextExecuteCommandQueue, context, queue, nullptr, nullptr);
    CALL(tovObjectDelete, queue);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 4) return 4;
    const std::string_view mode = argv[1];
    if (mode == "handler") std::atexit(useAtExit);
    runFilter(argv[2], argv[3]);
    if (mode != "unload") return 0;
    dlclose(library);
    usleep(100000);  // the driver's threads go on meanwhile
    runFilter(argv[2], argv[3]);
    dlclose(library);
    return 0;
}
