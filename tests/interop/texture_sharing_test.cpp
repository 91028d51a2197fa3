// Wrapping, acquiring and releasing OpenGL textures: a scripted OpenGL in this program, the stand-in's OpenCL.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <tov/tov.h>

#include "standin.h"

namespace {

// What the scripted OpenGL says of the bound texture.
struct Gl {
    int width = 8;
    int height = 8;
    int internalFormat = 0x8814;
    std::vector<unsigned> errors;  // from before, oldest first
    bool endlessError = false;
    unsigned queryError = 0;  // of the queries
    unsigned bound = 0;
    unsigned errorCalls = 0;
} gl;

}  // namespace

extern "C" {
__attribute__((visibility("default"))) void glBindTexture(unsigned, unsigned texture);
__attribute__((visibility("default"))) void glGetTexLevelParameteriv(unsigned, int, unsigned key, int* value);
__attribute__((visibility("default"))) unsigned glGetError();

void glBindTexture(unsigned, unsigned texture) {
    gl.bound = texture;
}
void glGetTexLevelParameteriv(unsigned, int, unsigned key, int* value) {
    EXPECT_EQ(*value, 0) << "queries start from zero";
    if (gl.queryError != 0) {
        gl.errors.push_back(gl.queryError);
        return;
    }
    if (key == 0x1000) *value = gl.width;
    if (key == 0x1001) *value = gl.height;
    if (key == 0x1003) *value = gl.internalFormat;
}
unsigned glGetError() {
    ++gl.errorCalls;
    if (gl.endlessError) return 0x0502;
    if (gl.errors.empty()) return 0;
    const unsigned error = gl.errors.front();
    gl.errors.erase(gl.errors.begin());
    return error;
}
}

namespace {

class TextureSharing : public testing::Test {
 protected:
    void SetUp() override {
        gl = Gl{};
        driver_.reset();
        ASSERT_EQ(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_GPU, 0, "", &context_), 0);
        ASSERT_EQ(tovContextCreateCommandQueue(context_, &queue_), 0);
    }
    void TearDown() override {
        for (tov_object object : objects_) tovObjectDelete(object);
        tovObjectDelete(queue_);
        tovObjectDelete(context_);
        EXPECT_EQ(driver_.liveObjects(), 0u) << "everything was released";
        EXPECT_THAT(driver_.misuse, testing::IsEmpty());
    }

    int32_t tryWrap(tov_image* image) { return tovContextCreateImageFromOpenGlTexture(context_, 0x0DE1, 0, 7, image); }
    tov_image wrapped() {
        tov_image image = nullptr;
        EXPECT_EQ(tryWrap(&image), TOV_SUCCESS);
        objects_.push_back(image);
        return image;
    }
    tov_image_filter attached(tov_image input, tov_image output, uint32_t type = TOV_IMAGE_FILTER_LINEAR_TONEMAP) {
        tov_image_filter filter = nullptr;
        EXPECT_EQ(tovContextCreateImageFilter(context_, type, &filter), TOV_SUCCESS);
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue_, filter, input, output), TOV_SUCCESS);
        objects_.push_back(filter);
        return filter;
    }
    int32_t execute() { return tovContextExecuteCommandQueue(context_, queue_, nullptr, nullptr); }
    // The calls that reached the driver, of those that share textures and launch.
    std::vector<std::string> sequence() {
        std::vector<std::string> names;
        for (const standin::Call& call : driver_.calls)
            for (const char* name :
                 {"clEnqueueAcquireGLObjects", "clEnqueueReleaseGLObjects", "clEnqueueNDRangeKernel"})
                if (call.name == name) names.push_back(std::string(name).substr(9, 7));
        return names;
    }

    standin::State& driver_ = standin::state();
    tov_context context_ = nullptr;
    tov_command_queue queue_ = nullptr;
    std::vector<tov_object> objects_;
};

TEST_F(TextureSharing, DescribesTheLevelAndMakesAnOpenClObjectOfIt) {
    const struct {
        int format;
        uint32_t components, type;
    } formats[] = {{0x1907, 3, TOV_COMPONENT_TYPE_FLOAT32},
                   {0x1908, 4, TOV_COMPONENT_TYPE_FLOAT32},
                   {0x805B, 4, TOV_COMPONENT_TYPE_FLOAT16},
                   {0x8814, 4, TOV_COMPONENT_TYPE_FLOAT32}};
    for (const auto& [format, components, type] : formats) {
        gl.internalFormat = format;
        tov_image_desc desc = {};
        uint64_t size = 0;
        ASSERT_EQ(tovImageGetInfo(wrapped(), TOV_IMAGE_DESC, sizeof desc, &desc, &size), TOV_SUCCESS);
        EXPECT_EQ(desc.image_width, 8u);
        EXPECT_EQ(desc.image_row_pitch, 8u);
        EXPECT_EQ(desc.image_slice_pitch, 64u);
        EXPECT_EQ(desc.num_components, components);
        EXPECT_EQ(desc.type, type);
        EXPECT_EQ(driver_.lastCall("clCreateFromGLTexture").numbers,
                  (std::vector<uint64_t>{CL_MEM_READ_WRITE, 0x0DE1, 0, 7}));
        EXPECT_EQ(gl.bound, 0u);
    }
}

TEST_F(TextureSharing, RefusesWhatCannotBeDescribedOrShared) {
    tov_image image = nullptr;
    gl.internalFormat = 0x8058;
    EXPECT_EQ(tryWrap(&image), TOV_ERROR_INVALID_PARAMETER);
    gl = Gl{};
    gl.height = 0;
    EXPECT_EQ(tryWrap(&image), TOV_ERROR_INVALID_PARAMETER);
    gl = Gl{};
    gl.queryError = 0x0500;
    EXPECT_EQ(tryWrap(&image), TOV_ERROR_OPENGL);
    gl = Gl{};
    gl.endlessError = true;
    EXPECT_EQ(tryWrap(&image), TOV_ERROR_OPENGL);
    EXPECT_LT(gl.errorCalls, 100u) << "draining ends";
    gl = Gl{};
    gl.errors = {0x0500, 0x0501};
    driver_.fail("clCreateFromGLTexture", CL_INVALID_GL_OBJECT);
    EXPECT_EQ(tryWrap(&image), TOV_ERROR_INTERNAL_ERROR) << "old errors are no reason, the driver's refusal is";
    driver_.fail("clGetMemObjectInfo", CL_OUT_OF_RESOURCES);
    EXPECT_EQ(tryWrap(&image), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(image, nullptr);
}

TEST_F(TextureSharing, AcquiresInputAndOutputAroundTheRunOnceForEachParameter) {
    attached(wrapped(), wrapped());
    const tov_image both = wrapped();
    attached(both, both);
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_THAT(sequence(), testing::ElementsAre("Acquire", "Acquire", "NDRange", "Release", "Release",  //
                                                 "Acquire", "Acquire", "NDRange", "Release", "Release"));
}

TEST_F(TextureSharing, AcquiresWhatInnerFiltersOfAFusedTreeRead) {
    tov_image_filter inner = nullptr;
    ASSERT_EQ(tovContextCreateImageFilter(context_, TOV_IMAGE_FILTER_GAMMA_CORRECTION, &inner), TOV_SUCCESS);
    objects_.push_back(inner);
    ASSERT_EQ(tovImageFilterSetParameterImage(inner, "srcBuffer", wrapped()), TOV_SUCCESS);
    attached(inner, wrapped());
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_THAT(sequence(), testing::ElementsAre("Acquire", "Acquire", "NDRange", "Release", "Release"));
}

TEST_F(TextureSharing, ReleasesEverythingWhenTheRunFails) {
    attached(wrapped(), wrapped());
    const struct {
        const char* call;
        uint32_t at;
        std::vector<std::string> sequence;
    } cases[] = {
        {"clEnqueueAcquireGLObjects", 2, {"Acquire", "Acquire", "Release"}},
        {"clEnqueueNDRangeKernel", 1, {"Acquire", "Acquire", "NDRange", "Release", "Release"}},
        {"clBuildProgram", 1, {"Acquire", "Acquire", "Release", "Release"}},
        {"clEnqueueReleaseGLObjects", 1, {"Acquire", "Acquire", "NDRange", "Release", "Release"}},
    };
    for (const auto& [call, at, expected] : cases) {
        driver_.calls.clear();
        driver_.failures.clear();
        driver_.fail(call, CL_OUT_OF_RESOURCES, at);
        // A kernel that is known is not built again: another size of parameters asks for another program.
        if (std::string(call) == "clBuildProgram") attached(wrapped(), wrapped(), TOV_IMAGE_FILTER_RESAMPLE);
        EXPECT_EQ(execute(), TOV_ERROR_INTERNAL_ERROR) << call;
        std::vector<std::string> seen = sequence();
        if (std::string(call) == "clBuildProgram") seen.erase(seen.begin(), seen.begin() + 5);
        EXPECT_EQ(seen, expected) << call;
        if (std::string(call) == "clBuildProgram") {
            ASSERT_EQ(tovCommandQueueDetachImageFilter(queue_, objects_.back()), TOV_SUCCESS);
        }
    }
    EXPECT_EQ(execute(), TOV_SUCCESS) << "the queue is usable afterwards";
}

TEST_F(TextureSharing, GivesTexturesToKernelsAsSamplersAndRefusesToMapThem) {
    const tov_image image = wrapped();
    attached(image, wrapped());
    ASSERT_EQ(execute(), TOV_SUCCESS);
    EXPECT_THAT(driver_.launches.back().options,
                testing::HasSubstr("srcBuffer_COMP_NUM= -D srcBuffer_COMP_TYPE=sampler"));
    void* pointer = nullptr;
    EXPECT_EQ(tovImageMap(image, 0, &pointer), TOV_ERROR_UNSUPPORTED);
}

}  // namespace
