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

// The functions by name, since the library comes and goes.
template <class Function>
Function* find(void* library, const char* name) {
    auto* const function = reinterpret_cast<Function*>(dlsym(library, name));
    if (function == nullptr) std::exit(2);
    return function;
}
#define FIND(name) auto* const name##_ = find<decltype(name)>(library, #name)

struct Run {
    tov_context context = nullptr;
    tov_command_queue queue = nullptr;
};

void require(int32_t code, const char* what) {
    if (code == TOV_SUCCESS) return;
    std::fprintf(stderr, "%s: %d\n", what, static_cast<int>(code));
    std::exit(3);
}

// Runs a filter and leaves everything alive, an image mapped.
Run runFilter(void* library, const char* cache) {
    FIND(tovCreateContext);
    FIND(tovContextCreateImage);
    FIND(tovContextCreateImageFilter);
    FIND(tovContextCreateCommandQueue);
    FIND(tovCommandQueueAttachImageFilter);
    FIND(tovContextExecuteCommandQueue);
    FIND(tovImageMap);
    Run run;
    const tov_image_desc desc = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    tov_image image = nullptr;
    tov_image_filter filter = nullptr;
    void* pixels = nullptr;
    require(tovCreateContext_(TOV_API_VERSION, 0, TOV_DEVICE_TYPE_CPU, 0, cache, &run.context), "context");
    require(tovContextCreateImage_(run.context, &desc, nullptr, &image), "image");
    require(tovContextCreateImageFilter_(run.context, TOV_IMAGE_FILTER_LINEAR_TONEMAP, &filter), "filter");
    require(tovContextCreateCommandQueue_(run.context, &run.queue), "queue");
    require(tovCommandQueueAttachImageFilter_(run.queue, filter, image, image), "attach");
    require(tovContextExecuteCommandQueue_(run.context, run.queue, nullptr, nullptr), "execute");
    require(tovImageMap_(image, 0, &pixels), "map");
    return run;
}

void* open(const char* path) {
    void* library = dlopen(path, RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) std::exit(4);
    return library;
}

void* handlerLibrary = nullptr;
Run handlerRun;

// The library has had its own exit handlers by now; it may refuse, but not crash.
void useAtExit() {
    find<decltype(tovContextExecuteCommandQueue)>(handlerLibrary, "tovContextExecuteCommandQueue")(
        handlerRun.context, handlerRun.queue, nullptr, nullptr);
    find<decltype(tovObjectDelete)>(handlerLibrary, "tovObjectDelete")(handlerRun.queue);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 4) return 5;
    const std::string_view mode = argv[1];
    void* library = open(argv[2]);
    if (mode == "handler") {
        handlerLibrary = library;
        std::atexit(useAtExit);
    }
    handlerRun = runFilter(library, argv[3]);
    if (mode != "unload") return 0;
    dlclose(library);
    usleep(100000);  // the driver's threads go on meanwhile
    library = open(argv[2]);
    runFilter(library, argv[3]);
    dlclose(library);
    return 0;
}
