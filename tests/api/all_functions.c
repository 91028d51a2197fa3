/* A host in C99: calls all 27 functions, the one with a C++ symbol among them, and takes a picture through a filter. */
#include <stdio.h>
#include <tov/tov.h>

static int failures = 0;

#define EXPECT(expected, call) failures += (call) == (expected) ? 0 : printf("%s\n", #call)
#define SUCCEED(call) EXPECT(TOV_SUCCESS, call)

static void countCall(void* calls) {
    ++*(int*)calls;
}

int main(int argc, char** argv) {
    static const tov_image_desc desc = {5, 3, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    static const float matrix[16] = {1};
    static const float weights[1] = {2.0f};
    static float pixels[5 * 3 * 4] = {0.25f, 0.75f};
    char texts[2][128];
    const char* text = NULL;
    float* result = NULL;
    uint32_t number = 0;
    uint64_t bytes = 0, size = 0;
    int calls = 0;
    tov_object context = NULL, image = NULL, sum = NULL, queue = NULL, none = NULL;

    SUCCEED(tovGetDeviceCount(TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, &number));
    if (argc != 2) return 2;
    SUCCEED(tovCreateContext(TOV_API_VERSION, 0, TOV_DEVICE_TYPE_CPU, 0, argv[1], &context));
    if (context == NULL) return 1;
    SUCCEED(tovContextGetDeviceInfo(context, &number, texts[0], 0, texts[1]));
    EXPECT(TOV_ERROR_INVALID_PARAMETER, tovCreateContextFromOpenClContext(1, NULL, NULL, NULL, NULL, &none));
    EXPECT(TOV_ERROR_INVALID_PARAMETER, tovContextCreateImageFromOpenClMemory(context, &desc, NULL, 0, &none));
    EXPECT(TOV_ERROR_INVALID_PARAMETER, tovContextCreateImageFromOpenGlTexture(context, 0, 0, 0, NULL));
    SUCCEED(tovContextCreateImage(context, &desc, pixels, &image));
    SUCCEED(tovImageGetInfo(image, TOV_IMAGE_DATA_SIZE, sizeof bytes, &bytes, &size));
    SUCCEED(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_WEIGHTED_SUM, &sum));
    SUCCEED(tovImageFilterGetInfo(sum, TOV_IMAGE_FILTER_PARAMETER_COUNT, sizeof number, &number, &size));
    SUCCEED(tovParameterGetInfo(sum, 0, TOV_PARAMETER_NAME, sizeof text, &text, &size));
    SUCCEED(tovImageFilterSetParameter1u(sum, "inputsNum", 1));
    SUCCEED(tovImageFilterSetParameterFloatArray(sum, "weights", weights, 1));
    SUCCEED(tovImageFilterSetParameterImageArray(sum, "inputs", &image, 1));
    SUCCEED(tovImageFilterSetParameterImage(sum, "srcBuffer", image));
    SUCCEED(tovImageFilterSetParameter2u(sum, "srcRec", 1, 1));
    EXPECT(TOV_ERROR_UNSUPPORTED, tovImageFilterSetParameter1f(sum, "inputsNum", 1));
    EXPECT(TOV_ERROR_UNSUPPORTED, tovImageFilterSetParameter3f(sum, "inputsNum", 1, 2, 3));
    EXPECT(TOV_ERROR_UNSUPPORTED, tovImageFilterSetParameter4f(sum, "inputsNum", 1, 2, 3, 4));
    EXPECT(TOV_ERROR_UNSUPPORTED, tovImageFilterSetParameter16f(sum, "inputsNum", matrix));
    SUCCEED(tovContextCreateCommandQueue(context, &queue));
    SUCCEED(tovCommandQueueAttachImageFilter(queue, sum, image, image));
    SUCCEED(tovContextExecuteCommandQueue(context, queue, countCall, &calls));
    SUCCEED(tovCommandQueueDetachImageFilter(queue, sum));
    SUCCEED(tovImageMap(image, 0, (void**)&result));
    if (result == NULL || result[0] != 0.5f || result[1] != 1.5f || result[4] != 0.0f) ++failures;
    SUCCEED(tovImageUnmap(image, result));
    tov_object objects[] = {context, image, sum, queue};
    if (bytes != sizeof pixels || number != 3 || text == NULL || calls != 1) ++failures;
    for (int i = 0; i < 4; ++i) SUCCEED(tovObjectDelete(objects[i]));
    return failures != 0;
}
