// Images over OpenGL textures. This program is the OpenGL: the library finds its three functions in the process.
#include "standin_fixture.h"

namespace {

struct FakeGl {
    int32_t width = 8;
    int32_t height = 8;
    int32_t format = 0x1908;
    std::vector<uint32_t> pendingErrors;  // last one first
    uint32_t errorOfQuery = 0;
    std::vector<std::pair<uint32_t, uint32_t>> bound;
    std::vector<int32_t> levels;
};
FakeGl gl;

}  // namespace

#define FAKE_GL extern "C" __attribute__((visibility("default")))
FAKE_GL void glBindTexture(uint32_t target, uint32_t texture) {
    gl.bound.emplace_back(target, texture);
}
FAKE_GL void glGetTexLevelParameteriv(uint32_t, int32_t level, uint32_t key, int32_t* value) {
    gl.levels.push_back(level);
    if (gl.errorOfQuery != 0) gl.pendingErrors.assign(1, gl.errorOfQuery);
    if (key == 0x1000) *value = gl.width;
    if (key == 0x1001) *value = gl.height;
    if (key == 0x1003) *value = gl.format;
}
FAKE_GL uint32_t glGetError() {
    if (gl.pendingErrors.empty()) return 0;
    const uint32_t error = gl.pendingErrors.back();
    gl.pendingErrors.pop_back();
    return error;
}

namespace apitest {
namespace {

constexpr uint32_t kTexture2D = 0x0de1;

class Textures : public StandinTest {
 protected:
    void SetUp() override {
        StandinTest::SetUp();
        gl = {};
        context_ = newContext();
    }
    void TearDown() override {
        for (void* object : objects_) EXPECT_EQ(tovObjectDelete(object), TOV_SUCCESS);
        EXPECT_EQ(tovObjectDelete(context_), TOV_SUCCESS);
        StandinTest::TearDown();
    }
    int32_t wrap(tov_image* out, int32_t level = 0, uint32_t texture = 5) {
        const int32_t code = tovContextCreateImageFromOpenGlTexture(context_, kTexture2D, level, texture, out);
        if (code == TOV_SUCCESS) objects_.push_back(*out);
        return code;
    }
    tov_image wrapped(uint32_t texture = 5) {
        tov_image image = nullptr;
        EXPECT_EQ(wrap(&image, 0, texture), TOV_SUCCESS);
        return image;
    }
    static tov_image_desc descOf(tov_image image) {
        tov_image_desc desc = {};
        uint64_t size = 0;
        EXPECT_EQ(tovImageGetInfo(image, TOV_IMAGE_DESC, sizeof desc, &desc, &size), TOV_SUCCESS);
        return desc;
    }
    // The code of one run of a new filter.
    int32_t run(uint32_t type, tov_image input, tov_image output, const char* name = nullptr,
                tov_image bound = nullptr) {
        tov_image_filter filter = nullptr;
        tov_command_queue queue = nullptr;
        EXPECT_EQ(tovContextCreateImageFilter(context_, type, &filter), TOV_SUCCESS);
        EXPECT_EQ(tovContextCreateCommandQueue(context_, &queue), TOV_SUCCESS);
        objects_.insert(objects_.end(), {filter, queue});
        if (name != nullptr) {
            EXPECT_EQ(tovImageFilterSetParameterImage(filter, name, bound), TOV_SUCCESS);
        }
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
        return tovContextExecuteCommandQueue(context_, queue, nullptr, nullptr);
    }
    size_t acquired() { return driver().callCount("clEnqueueAcquireGLObjects"); }
    size_t released() { return driver().callCount("clEnqueueReleaseGLObjects"); }

    tov_context context_ = nullptr;
    std::vector<void*> objects_;
};

TEST_F(Textures, FourInternalFormatsBecomeLayoutsAndOthersAreRefused) {
    struct Row {
        int32_t format;
        int32_t code;
        uint32_t components;
        uint32_t type;
    };
    const Row rows[] = {
        {0x1907, TOV_SUCCESS, 3, TOV_COMPONENT_TYPE_FLOAT32}, {0x1908, TOV_SUCCESS, 4, TOV_COMPONENT_TYPE_FLOAT32},
        {0x805B, TOV_SUCCESS, 4, TOV_COMPONENT_TYPE_FLOAT16}, {0x8814, TOV_SUCCESS, 4, TOV_COMPONENT_TYPE_FLOAT32},
        {0x8058, TOV_ERROR_INVALID_PARAMETER, 0, 0},          {-1, TOV_ERROR_INVALID_PARAMETER, 0, 0},
    };
    for (const Row& row : rows) {
        gl.format = row.format;
        tov_image image = nullptr;
        EXPECT_EQ(wrap(&image, 2), row.code) << row.format;
        if (row.code != TOV_SUCCESS) {
            EXPECT_EQ(image, nullptr);
            continue;
        }
        const tov_image_desc desc = descOf(image);
        const tov_image_desc expected = {8, 8, 1, 8, 64, row.components, row.type};
        EXPECT_EQ(std::memcmp(&desc, &expected, sizeof desc), 0) << row.format;
    }
    EXPECT_THAT(gl.levels, testing::Each(2));
    EXPECT_EQ(gl.bound.front(), (std::pair{kTexture2D, 5u}));
    EXPECT_EQ(gl.bound.back(), (std::pair{kTexture2D, 0u})) << "the binding is reset";
}

TEST_F(Textures, ErrorsOfOpenGlAreReportedAndOlderOnesIgnored) {
    tov_image image = nullptr;
    gl.errorOfQuery = 0x0501;
    EXPECT_EQ(wrap(&image), TOV_ERROR_OPENGL);
    gl = {};
    gl.pendingErrors = {0x0500, 0x0502};
    EXPECT_EQ(wrap(&image), TOV_SUCCESS) << "errors of the host's own earlier calls";
    image = nullptr;
    driver().fail("clCreateFromGLTexture", CL_INVALID_GL_OBJECT);
    EXPECT_EQ(wrap(&image), TOV_ERROR_INTERNAL_ERROR);
    driver().fail("clGetMemObjectInfo", CL_INVALID_MEM_OBJECT);
    EXPECT_EQ(wrap(&image), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(image, nullptr);
}

TEST_F(Textures, InputAndOutputAreAcquiredAroundARunAndOtherImagesAreNot) {
    const tov_image input = wrapped(5);
    const tov_image output = wrapped(6);
    ASSERT_EQ(run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, input, output), TOV_SUCCESS);
    EXPECT_EQ(acquired(), 2u);
    EXPECT_EQ(released(), 2u);
    const std::string options = driver().launches.back().options;
    EXPECT_THAT(options, testing::HasSubstr(" -D srcBuffer_COMP_NUM= -D srcBuffer_COMP_TYPE=sampler"));
    EXPECT_THAT(options, testing::HasSubstr(" -D dstBuffer_COMP_NUM= -D dstBuffer_COMP_TYPE=sampler"));

    const tov_image_desc desc = {8, 8, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    const tov_image plain = newImage(context_, desc, SOURCE);
    const tov_image other = newImage(context_, desc, DESTINATION);
    objects_.insert(objects_.end(), {plain, other});
    ASSERT_EQ(run(TOV_IMAGE_FILTER_LWR_DENOISE, plain, other, "normalsImg", input), TOV_SUCCESS);
    EXPECT_EQ(acquired(), 2u) << "only input and output are";
}

TEST_F(Textures, OneTextureAsInputAndOutputIsAcquiredAndReleasedTwiceAndReadFromACopy) {
    const tov_image image = wrapped(5);
    const tov_image again = wrapped(5);
    for (const tov_image output : {image, again}) {
        driver().calls.clear();
        EXPECT_EQ(run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, image, output), TOV_SUCCESS);
        EXPECT_EQ(acquired(), 2u);
        EXPECT_EQ(released(), 2u);
        EXPECT_EQ(driver().callCount("clEnqueueCopyImage"), 1u) << "no kernel may read and write one image";
    }
}

TEST_F(Textures, WhatFiltersInsideAFusedKernelReadIsAcquired) {
    tov_image inputs[] = {wrapped(6)};
    tov_image_filter inner = nullptr;
    ASSERT_EQ(tovContextCreateImageFilter(context_, TOV_IMAGE_FILTER_MULTIPLY, &inner), TOV_SUCCESS);
    objects_.push_back(inner);
    ASSERT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", wrapped(5)), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImageArray(inner, "inputs", &inputs[0], 1), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter1u(inner, "inputsNum", 1), TOV_SUCCESS);
    ASSERT_EQ(run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, inner, wrapped(7)), TOV_SUCCESS);
    EXPECT_EQ(acquired(), 3u);
    EXPECT_EQ(released(), 3u);
}

TEST_F(Textures, WhatWasAcquiredIsReleasedWhenTheRunFails) {
    const tov_image input = wrapped(5);
    const tov_image output = wrapped(6);
    driver().fail("clEnqueueNDRangeKernel", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, input, output), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(acquired(), 2u);
    EXPECT_EQ(released(), 2u);
    driver().fail("clEnqueueAcquireGLObjects", CL_OUT_OF_RESOURCES, 2);
    EXPECT_EQ(run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, input, output), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(acquired(), 4u);
    EXPECT_EQ(released(), 3u) << "the one that was acquired";
    driver().fail("clEnqueueReleaseGLObjects", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, input, output), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(released(), 5u) << "both are tried";
    EXPECT_EQ(run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, input, output), TOV_SUCCESS);
}

}  // namespace
}  // namespace apitest
