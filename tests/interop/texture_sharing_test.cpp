// Wrapping, acquiring and releasing OpenGL textures: a scripted OpenGL in this program, the stand-in's OpenCL.
#include "../api/standin_fixture.h"

namespace {

struct Gl {
    uint32_t internalFormat = 0x8814;
    uint32_t pendingErrors = 0;  // how many of them
} gl;

}  // namespace

#define FAKE_GL extern "C" __attribute__((visibility("default")))
FAKE_GL void glBindTexture(uint32_t, uint32_t) {}
FAKE_GL void glGetTexLevelParameteriv(uint32_t, int32_t, uint32_t key, uint32_t* value) {
    EXPECT_EQ(*value, 0u) << "queries start from zero";
    *value = key == 0x1003 ? gl.internalFormat : 8;
}
FAKE_GL uint32_t glGetError() {
    return gl.pendingErrors == 0 ? 0 : (--gl.pendingErrors, 0x0502);
}

namespace apitest {
namespace {

class TextureSharing : public StandinTest {
 protected:
    void SetUp() override {
        StandinTest::SetUp();
        gl = Gl{};
        open();
    }
    int32_t wrap(tov_image* image) { return tovContextCreateImageFromOpenGlTexture(context_, 0x0DE1, 2, 7, image); }
    tov_image wrapped() { return created(tovContextCreateImageFromOpenGlTexture, context_, 0x0DE1u, 2, 7u); }
    tov_image_filter attach(tov_object input, tov_image output, uint32_t type = TOV_IMAGE_FILTER_LINEAR_TONEMAP) {
        const tov_image_filter filter = newFilter(type);
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue_, filter, input, output), TOV_SUCCESS);
        return filter;
    }
    // Executes the queue: A for every acquired texture, R for every released one, K for every kernel.
    std::string callsOfRun(int32_t expected = TOV_SUCCESS) {
        driver().calls.clear();
        EXPECT_EQ(execute(), expected);
        std::string letters;
        for (const standin::Call& call : driver().calls) {
            if (call.name.ends_with("GLObjects")) letters += call.name[9];
            if (call.name == "clEnqueueNDRangeKernel") letters += 'K';
        }
        return letters;
    }
};

TEST_F(TextureSharing, DescribesALevelAndMakesAnOpenClObjectOfItOrSaysWhyNot) {
    for (const auto& [format, components, type] : {std::array{0x1907u, 3u, TOV_COMPONENT_TYPE_FLOAT32},
                                                   {0x1908u, 4u, TOV_COMPONENT_TYPE_FLOAT32},
                                                   {0x805Bu, 4u, TOV_COMPONENT_TYPE_FLOAT16}}) {
        gl.internalFormat = format;
        tov_image_desc desc = {};
        uint64_t size = 0;
        ASSERT_EQ(tovImageGetInfo(wrapped(), TOV_IMAGE_DESC, sizeof desc, &desc, &size), TOV_SUCCESS);
        const tov_image_desc expected = {8, 8, 1, 8, 64, components, type};
        EXPECT_EQ(std::memcmp(&desc, &expected, sizeof desc), 0) << format;
    }
    EXPECT_EQ(driver().lastCall("clCreateFromGLTexture").numbers,
              (std::vector<uint64_t>{CL_MEM_READ_WRITE, 0x0DE1, 2, 7}));
    void* pointer = nullptr;
    EXPECT_EQ(tovImageMap(wrapped(), 0, &pointer), TOV_ERROR_UNSUPPORTED);
    driver().fail("clGetMemObjectInfo", CL_INVALID_GL_OBJECT);
    EXPECT_EQ(wrap(&pointer), TOV_ERROR_INTERNAL_ERROR);
    gl.pendingErrors = 4000000000;
    EXPECT_EQ(wrap(&pointer), TOV_ERROR_OPENGL) << "draining them ends";
}

TEST_F(TextureSharing, AcquiresAroundEachRunWhatItsFiltersReadAndWrite) {
    tov_image both = wrapped();
    attach(both, both);
    const tov_image_filter inner = attach(wrapped(), wrapped(), TOV_IMAGE_FILTER_MULTIPLY);
    EXPECT_EQ(tovImageFilterSetParameterImageArray(inner, "inputs", &both, 1), TOV_SUCCESS);
    EXPECT_EQ(tovImageFilterSetParameter1u(inner, "inputsNum", 1), TOV_SUCCESS);
    attach(inner, wrapped());
    EXPECT_EQ(callsOfRun(), "AAKRRAAKRRAAAKRRR") << "all that an inner filter reads, too";
    EXPECT_THAT(driver().launches[0].options, testing::HasSubstr("srcBuffer_COMP_NUM= -D srcBuffer_COMP_TYPE=sampler"));
}

TEST_F(TextureSharing, ReleasesEverythingWhenTheRunFails) {
    attach(wrapped(), wrapped());
    const std::tuple<const char*, uint32_t, const char*> rows[] = {{"clBuildProgram", 1, "AARR"},
                                                                   {"clEnqueueAcquireGLObjects", 2, "AAR"},
                                                                   {"clEnqueueNDRangeKernel", 1, "AAKRR"},
                                                                   {"clEnqueueReleaseGLObjects", 1, "AAKRR"}};
    for (const auto& [call, at, sequence] : rows) {
        driver().fail(call, CL_OUT_OF_RESOURCES, at);
        EXPECT_EQ(callsOfRun(TOV_ERROR_INTERNAL_ERROR), sequence) << call;
    }
    EXPECT_EQ(callsOfRun(), "AAKRR") << "the queue is usable afterwards";
}

}  // namespace
}  // namespace apitest
