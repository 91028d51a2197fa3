// Textures are described by a real OpenGL, Mesa's software renderer without a window. The CPU's OpenCL cannot share
// them, so a texture that was described well fails afterwards with another code.
#include <EGL/egl.h>
#include <GL/gl.h>
#include <gtest/gtest.h>
#include <tov/tov.h>

#ifndef GL_RGBA32F
#define GL_RGBA32F 0x8814
#endif

namespace {

class RealOpenGl : public testing::Test {
 protected:
    void SetUp() override {
        display_ = eglGetDisplay(EGL_DEFAULT_DISPLAY);
        ASSERT_TRUE(eglInitialize(display_, nullptr, nullptr)) << "these tests need EGL without a window";
        ASSERT_TRUE(eglBindAPI(EGL_OPENGL_API));
        const EGLint wanted[] = {EGL_RENDERABLE_TYPE, EGL_OPENGL_BIT, EGL_SURFACE_TYPE, 0, EGL_NONE};
        EGLConfig config = nullptr;
        EGLint count = 0;
        ASSERT_TRUE(eglChooseConfig(display_, wanted, &config, 1, &count));
        gl_ = eglCreateContext(display_, count > 0 ? config : EGLConfig{nullptr}, EGL_NO_CONTEXT, nullptr);
        ASSERT_NE(gl_, EGL_NO_CONTEXT);
        makeCurrent();
        ASSERT_EQ(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0, nullptr, &context_),
                  TOV_SUCCESS);
    }
    void TearDown() override {
        if (context_ != nullptr) tovObjectDelete(context_);
        eglMakeCurrent(display_, EGL_NO_SURFACE, EGL_NO_SURFACE, EGL_NO_CONTEXT);
        if (gl_ != EGL_NO_CONTEXT) eglDestroyContext(display_, gl_);
        eglTerminate(display_);
    }

    void makeCurrent() { ASSERT_TRUE(eglMakeCurrent(display_, EGL_NO_SURFACE, EGL_NO_SURFACE, gl_)); }
    void makeNoneCurrent() { eglMakeCurrent(display_, EGL_NO_SURFACE, EGL_NO_SURFACE, EGL_NO_CONTEXT); }

    static GLuint texture(GLint format, GLsizei width, GLsizei height) {
        GLuint name = 0;
        glGenTextures(1, &name);
        glBindTexture(GL_TEXTURE_2D, name);
        glTexImage2D(GL_TEXTURE_2D, 0, format, width, height, 0, GL_RGBA, GL_FLOAT, nullptr);
        glBindTexture(GL_TEXTURE_2D, 0);
        EXPECT_EQ(glGetError(), GLenum{GL_NO_ERROR});
        return name;
    }
    int32_t wrap(GLuint name, GLenum target = GL_TEXTURE_2D, GLint level = 0) {
        tov_image image = nullptr;
        const int32_t code = tovContextCreateImageFromOpenGlTexture(context_, target, level, name, &image);
        EXPECT_EQ(image, nullptr) << "this OpenCL cannot share textures";
        return code;
    }

    EGLDisplay display_ = EGL_NO_DISPLAY;
    EGLContext gl_ = EGL_NO_CONTEXT;
    tov_context context_ = nullptr;
};

TEST_F(RealOpenGl, DescribesTexturesOfTheKnownFormats) {
    for (const GLint format : {GL_RGB, GL_RGBA, GL_RGBA16, GL_RGBA32F})
        EXPECT_EQ(wrap(texture(format, 8, 4)), TOV_ERROR_INTERNAL_ERROR) << format;
}

TEST_F(RealOpenGl, DescribesOtherFormatsAndEmptyLevelsAsRefused) {
    EXPECT_EQ(wrap(texture(GL_RGBA8, 8, 4)), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(wrap(texture(GL_RGBA32F, 8, 4), GL_TEXTURE_2D, 3), TOV_ERROR_INVALID_PARAMETER);
}

TEST_F(RealOpenGl, ReportsItsErrorsButNotThoseLeftFromBefore) {
    EXPECT_EQ(wrap(texture(GL_RGBA, 8, 4), 0x1234), TOV_ERROR_OPENGL);
    const GLuint name = texture(GL_RGBA, 8, 4);
    glEnable(0x1234);  // leaves an error behind
    EXPECT_EQ(wrap(name), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(glGetError(), GLenum{GL_NO_ERROR});
}

TEST_F(RealOpenGl, IsNothingWithoutACurrentContext) {
    const GLuint name = texture(GL_RGBA, 8, 4);
    makeNoneCurrent();
    EXPECT_EQ(wrap(name), TOV_ERROR_OPENGL);
}

}  // namespace
