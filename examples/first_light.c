/* Tone-maps and gamma-corrects a rendered picture: first_light INPUT.pfm OUTPUT.ppm */
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <tov/tov.h>

static void check(int32_t code, const char* what) {
    if (code == TOV_SUCCESS) return;
    fprintf(stderr, "%s failed with code %d\n", what, (int)code);
    exit(1);
}

/* Reads a colour PFM, whose rows go from the bottom up, into rows from the top; three floats for each pixel. */
static float* readPfm(const char* path, uint32_t* width, uint32_t* height) {
    FILE* file = fopen(path, "rb");
    if (!file || fscanf(file, "PF %5u %5u -%*[0-9.]%*c", width, height) != 2 || !*width || !*height) return NULL;
    const size_t row = (size_t)*width * 3;
    float* pixels = malloc(row * *height * sizeof(float));
    for (uint32_t y = *height; pixels && y-- > 0;) {
        if (fread(pixels + y * row, sizeof(float), row, file) != row) return NULL;
    }
    fclose(file);
    return pixels;
}

int main(int argc, char** argv) {
    uint32_t width = 0, height = 0, gpus = 0;
    float* pixels = argc == 3 ? readPfm(argv[1], &width, &height) : NULL;
    if (!pixels) return fprintf(stderr, "usage: first_light INPUT.pfm OUTPUT.ppm\n"), 2;

    /* A context on the first GPU, or on the CPU; its compiled kernels are kept in the directory "kernelsCache". */
    tov_context context;
    check(tovGetDeviceCount(TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_GPU, &gpus), "counting GPUs");
    check(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, gpus ? TOV_DEVICE_TYPE_GPU : TOV_DEVICE_TYPE_CPU, 0,
                           "kernelsCache", &context),
          "opening a device");

    /* Three images: the render, the tone-mapped picture, and the result with 8 bits for each component. */
    tov_image_desc floats = {width, height, 1, 0, 0, 3, TOV_COMPONENT_TYPE_FLOAT32};
    tov_image_desc bytes = {width, height, 1, 0, 0, 3, TOV_COMPONENT_TYPE_UINT8};
    tov_image render, mapped, result;
    check(tovContextCreateImage(context, &floats, pixels, &render), "uploading the render");
    check(tovContextCreateImage(context, &floats, NULL, &mapped), "making an image");
    check(tovContextCreateImage(context, &bytes, NULL, &result), "making an image");

    /* Two filters and the queue that runs them one after the other. */
    tov_image_filter tonemap, gamma;
    tov_command_queue queue;
    check(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_REINHARD_TONEMAP, &tonemap), "making a filter");
    check(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_GAMMA_CORRECTION, &gamma), "making a filter");
    check(tovImageFilterSetParameter1f(gamma, "cGamma", 2.2f), "setting cGamma");
    check(tovContextCreateCommandQueue(context, &queue), "making a queue");
    check(tovCommandQueueAttachImageFilter(queue, tonemap, render, mapped), "attaching the tone mapper");
    check(tovCommandQueueAttachImageFilter(queue, gamma, mapped, result), "attaching the gamma correction");
    check(tovContextExecuteCommandQueue(context, queue, NULL, NULL), "running");

    void* data = NULL;
    check(tovImageMap(result, 0, &data), "reading the result");
    FILE* file = fopen(argv[2], "wb");
    const size_t size = (size_t)width * height * 3;
    int written = file && fprintf(file, "P6\n%u %u\n255\n", (unsigned)width, (unsigned)height) > 0 &&
                  fwrite(data, 1, size, file) == size;
    if (file && fclose(file) != 0) written = 0;

    tov_object objects[] = {queue, tonemap, gamma, render, mapped, result, context};
    for (size_t i = 0; i < sizeof objects / sizeof objects[0]; ++i) check(tovObjectDelete(objects[i]), "deleting");
    free(pixels);
    if (!written) fprintf(stderr, "cannot write %s\n", argv[2]);
    return written ? 0 : 1;
}
