// A host that unloads the library while the driver's threads run, loads it afresh, exits with everything alive and
// calls it and begins anew in an exit handler. It must end with status 0.
//     exit_test LIBRARY CACHE
#include <dlfcn.h>
#include <tov/tov.h>
#include <unistd.h>

#include <cstdlib>

static const char *path, *cache;
static void *library, *context, *queue;

// A function by its name, since the library comes and goes.
#define CALL(name, ...) reinterpret_cast<decltype(&(name))>(dlsym(library, #name))(__VA_ARGS__)

// Runs a filter and leaves everything alive, an image mapped.
static bool runFilter() {
    library = dlopen(path, RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) return false;
    const tov_image_desc desc = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    void *image = nullptr, *filter = nullptr, *pixels = nullptr;
    return CALL(tovCreateContext, TOV_API_VERSION, 0, TOV_DEVICE_TYPE_CPU, 0, cache, &context) == TOV_SUCCESS &&
           CALL(tovContextCreateImage, context, &desc, nullptr, &image) == TOV_SUCCESS &&
           CALL(tovContextCreateImageFilter, context, TOV_IMAGE_FILTER_LINEAR_TONEMAP, &filter) == TOV_SUCCESS &&
           CALL(tovContextCreateCommandQueue, context, &queue) == TOV_SUCCESS &&
           CALL(tovCommandQueueAttachImageFilter, queue, filter, image, image) == TOV_SUCCESS &&
           CALL(tovContextExecuteCommandQueue, context, queue, nullptr, nullptr) == TOV_SUCCESS &&
           CALL(tovImageMap, image, 0, &pixels) == TOV_SUCCESS;
}

// The library has had its own exit handlers by now; it may refuse, but not crash.
static void useAtExit() {
    CALL(tovContextExecuteCommandQueue, context, queue, nullptr, nullptr);
    CALL(tovObjectDelete, queue);
    runFilter();
}

int main(int argc, char** argv) {
    std::atexit(useAtExit);
    if (argc != 3) std::_Exit(1);
    path = argv[1];
    cache = argv[2];
    if (!runFilter()) std::_Exit(2);
    dlclose(library);
    usleep(100000);  // the driver's threads go on meanwhile
    if (!runFilter()) std::_Exit(3);
    return 0;
}
