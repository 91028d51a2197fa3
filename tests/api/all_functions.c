/* A host in C99: calls all 27 functions, the one with a C++ symbol among them, and takes a picture through a filter. */
#include <math.h>
#include <stdio.h>
#include <stdlib.h>
#include <tov/tov.h>

#define WIDTH 5u
#define HEIGHT 3u

static int failures = 0;

static void expect(int32_t code, int32_t expected, const char* call) {
    if (code == expected) return;
    fprintf(stderr, "%s: %d instead of %d\n", call, (int)code, (int)expected);
    ++failures;
}
#define EXPECT(expected, call) expect((call), (expected), #call)
#define SUCCEED(call) EXPECT(TOV_SUCCESS, call)

static void countCall(void* calls) {
    ++*(int*)calls;
}

static void listFilter(tov_image_filter filter) {
    uint32_t count = 0;
    uint32_t type = 0;
    const char* name = NULL;
    uint64_t size = 0;
    SUCCEED(tovImageFilterGetInfo(filter, TOV_IMAGE_FILTER_PARAMETER_COUNT, sizeof count, &count, &size));
    SUCCEED(tovParameterGetInfo(filter, 0, TOV_PARAMETER_NAME, sizeof name, &name, &size));
    SUCCEED(tovParameterGetInfo(filter, 0, TOV_PARAMETER_TYPE, sizeof type, &type, &size));
    if (count == 0 || name == NULL || type == 0) ++failures;
}

static void setParameters(tov_context context, tov_image image) {
    static const float matrix[16] = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
    static const float weights[1] = {1};
    tov_image inputs[1];
    tov_image_filter sum = NULL;
    tov_image_filter motion = NULL;
    tov_image_filter antialiasing = NULL;
    inputs[0] = image;
    SUCCEED(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_WEIGHTED_SUM, &sum));
    SUCCEED(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_MOTION_BUFFER, &motion));
    SUCCEED(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_MLAA, &antialiasing));
    SUCCEED(tovImageFilterSetParameter1u(sum, "inputsNum", 1));
    SUCCEED(tovImageFilterSetParameterFloatArray(sum, "weights", weights, 1));
    SUCCEED(tovImageFilterSetParameterImageArray(sum, "inputs", inputs, 1));
    SUCCEED(tovImageFilterSetParameter16f(motion, "viewProjMatrix", matrix));
    SUCCEED(tovImageFilterSetParameterImage(antialiasing, "depthImg", image));
    SUCCEED(tovImageFilterSetParameter2u(sum, "srcRec", 1, 1));
    EXPECT(TOV_ERROR_UNSUPPORTED, tovImageFilterSetParameter3f(sum, "inputsNum", 1, 2, 3));
    EXPECT(TOV_ERROR_UNSUPPORTED, tovImageFilterSetParameter4f(sum, "inputsNum", 1, 2, 3, 4));
    SUCCEED(tovObjectDelete(sum));
    SUCCEED(tovObjectDelete(motion));
    SUCCEED(tovObjectDelete(antialiasing));
}

static void runGamma(tov_context context, tov_image input, tov_image output) {
    tov_image_filter gamma = NULL;
    tov_command_queue queue = NULL;
    int calls = 0;
    void* pixels = NULL;
    SUCCEED(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_GAMMA_CORRECTION, &gamma));
    listFilter(gamma);
    SUCCEED(tovImageFilterSetParameter1f(gamma, "cGamma", 2.0f));
    SUCCEED(tovContextCreateCommandQueue(context, &queue));
    SUCCEED(tovCommandQueueAttachImageFilter(queue, gamma, input, output));
    SUCCEED(tovContextExecuteCommandQueue(context, queue, countCall, &calls));
    SUCCEED(tovCommandQueueDetachImageFilter(queue, gamma));
    SUCCEED(tovImageMap(output, 0, &pixels));
    if (pixels != NULL) {
        const float* result = (const float*)pixels;
        if (fabsf(result[0] - 0.5f) > 1e-5f || result[7] != 0.75f || calls != 1) ++failures;
        SUCCEED(tovImageUnmap(output, pixels));
    }
    SUCCEED(tovObjectDelete(queue));
    SUCCEED(tovObjectDelete(gamma));
}

int main(int argc, char** argv) {
    const tov_image_desc desc = {WIDTH, HEIGHT, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    float pixels[WIDTH * HEIGHT * 4];
    char name[128];
    char vendor[128];
    uint32_t count = 0;
    uint64_t bytes = 0;
    uint64_t size = 0;
    tov_context context = NULL;
    tov_image input = NULL;
    tov_image output = NULL;
    tov_image none = NULL;
    unsigned i;
    for (i = 0; i < WIDTH * HEIGHT * 4; ++i) pixels[i] = 0.25f;
    pixels[7] = 0.75f;

    SUCCEED(tovGetDeviceCount(TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, &count));
    SUCCEED(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0, argc > 1 ? argv[1] : NULL,
                             &context));
    if (context == NULL) return EXIT_FAILURE;
    SUCCEED(tovContextGetDeviceInfo(context, &count, name, 0, vendor));
    EXPECT(TOV_ERROR_INVALID_PARAMETER,
           tovCreateContextFromOpenClContext(TOV_API_VERSION, NULL, NULL, NULL, NULL, &none));
    EXPECT(TOV_ERROR_INVALID_PARAMETER, tovContextCreateImageFromOpenClMemory(context, &desc, NULL, 0, &none));
    EXPECT(TOV_ERROR_INVALID_PARAMETER, tovContextCreateImageFromOpenGlTexture(context, 0, 0, 0, NULL));
    SUCCEED(tovContextCreateImage(context, &desc, pixels, &input));
    SUCCEED(tovContextCreateImage(context, &desc, NULL, &output));
    SUCCEED(tovImageGetInfo(input, TOV_IMAGE_DATA_SIZE, sizeof bytes, &bytes, &size));
    if (bytes != sizeof pixels) ++failures;
    setParameters(context, input);
    runGamma(context, input, output);
    SUCCEED(tovObjectDelete(input));
    SUCCEED(tovObjectDelete(output));
    SUCCEED(tovObjectDelete(context));
    return failures == 0 ? EXIT_SUCCESS : EXIT_FAILURE;
}
