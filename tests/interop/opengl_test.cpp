// Textures are described by a real OpenGL, Mesa's software renderer without a window. The CPU's OpenCL cannot share
// them, so a texture that was described well fails afterwards with another code.
#include <EGL/egl.h>
#include <GL/gl.h>
#include <gtest/gtest.h>
#include <tov/tov.h>

namespace {

GLuint texture(GLint format) {
    GLuint name = 0;
    glGenTextures(1, &name);
    glBindTexture(GL_TEXTURE_2D, name);
    glTexImage2D(GL_TEXTURE_2D, 0, format, 8, 4, 0, GL_RGBA, GL_FLOAT, nullptr);
    return name;
}

TEST(RealOpenGl, DescribesTexturesWhileItsContextIsCurrent) {
    EGLDisplay display = eglGetDisplay(EGL_DEFAULT_DISPLAY);
    ASSERT_TRUE(eglInitialize(display, nullptr, nullptr) && eglBindAPI(EGL_OPENGL_API)) << "no EGL";
    EGLContext gl = eglCreateContext(display, nullptr, EGL_NO_CONTEXT, nullptr);
    ASSERT_TRUE(eglMakeCurrent(display, EGL_NO_SURFACE, EGL_NO_SURFACE, gl));
    tov_context context = nullptr;
    ASSERT_EQ(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0, nullptr, &context), 0);
    const auto wrap = [&](GLuint name, GLenum target = GL_TEXTURE_2D, GLint level = 0) {
        tov_image image = nullptr;
        return tovContextCreateImageFromOpenGlTexture(context, target, level, name, &image);
    };
    for (const GLint format : {GL_RGB, GL_RGBA, GL_RGBA16, 0x8814 /* 32-bit floats */})
        EXPECT_EQ(wrap(texture(format)), TOV_ERROR_INTERNAL_ERROR) << format;
    const GLuint name = texture(GL_RGBA);
    EXPECT_EQ(wrap(texture(GL_RGBA8)), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(wrap(name, GL_TEXTURE_2D, 3), TOV_ERROR_INVALID_PARAMETER) << "an empty level";
    EXPECT_EQ(wrap(name, 0x1234), TOV_ERROR_OPENGL) << "an unknown target";
    glEnable(0x1234);  // leaves an error behind
    EXPECT_EQ(wrap(name), TOV_ERROR_INTERNAL_ERROR) << "described in spite of it";
    eglMakeCurrent(display, EGL_NO_SURFACE, EGL_NO_SURFACE, EGL_NO_CONTEXT);
    EXPECT_EQ(wrap(name), TOV_ERROR_OPENGL) << "without a current context";
    EXPECT_EQ(tovObjectDelete(context), TOV_SUCCESS);
    eglTerminate(display);
}

}  // namespace
