// Textures are described by a real OpenGL, Mesa's software renderer without a window. The CPU's OpenCL cannot share
// them, so a texture that was described well fails afterwards with another code.
#include <EGL/egl.h>
#include <GL/gl.h>
#include <gtest/gtest.h>
#include <tov/tov.h>

TEST(RealOpenGl, DescribesTexturesWhileItsContextIsCurrent) {
    EGLDisplay display = eglGetDisplay(EGL_DEFAULT_DISPLAY);
    ASSERT_TRUE(eglInitialize(display, nullptr, nullptr) && eglBindAPI(EGL_OPENGL_API)) << "no EGL";
    EGLContext gl = eglCreateContext(display, nullptr, EGL_NO_CONTEXT, nullptr);
    ASSERT_TRUE(eglMakeCurrent(display, EGL_NO_SURFACE, EGL_NO_SURFACE, gl));
    tov_context context = nullptr;
    ASSERT_EQ(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0, nullptr, &context), 0);
    GLuint name = 0;
    const auto wrap = [&](GLenum target, GLint level = 0) {
        tov_image image = nullptr;
        return tovContextCreateImageFromOpenGlTexture(context, target, level, name, &image);
    };
    for (const GLint format : {GL_RGBA8, GL_RGB, GL_RGBA16, 0x8814 /* 32-bit floats */, GL_RGBA}) {
        glGenTextures(1, &name);
        glBindTexture(GL_TEXTURE_2D, name);
        glTexImage2D(GL_TEXTURE_2D, 0, format, 8, 4, 0, GL_RGBA, GL_FLOAT, nullptr);
        EXPECT_EQ(wrap(GL_TEXTURE_2D), format == GL_RGBA8 ? TOV_ERROR_INVALID_PARAMETER : TOV_ERROR_INTERNAL_ERROR);
    }
    EXPECT_EQ(wrap(GL_TEXTURE_2D, 3), TOV_ERROR_INVALID_PARAMETER) << "an empty level";
    EXPECT_EQ(wrap(0x1234), TOV_ERROR_OPENGL) << "an unknown target";
    glEnable(0x1234);  // leaves an error behind
    EXPECT_EQ(wrap(GL_TEXTURE_2D), TOV_ERROR_INTERNAL_ERROR) << "described in spite of it";
    eglMakeCurrent(display, EGL_NO_SURFACE, EGL_NO_SURFACE, EGL_NO_CONTEXT);
    EXPECT_EQ(wrap(GL_TEXTURE_2D), TOV_ERROR_OPENGL) << "without a current context";
    EXPECT_EQ(tovObjectDelete(context), TOV_SUCCESS);
    eglTerminate(display);
}
