#include "core/opengl.h"

#include "core/exception.h"
#include "zor/dynamic_library.h"

namespace {

#if defined(_WIN32)
#define TOV_GL_CALL __stdcall
constexpr const char* kLibraryName = "opengl32.dll";
#elif defined(__APPLE__)
#define TOV_GL_CALL
constexpr const char* kLibraryName = "/System/Library/Frameworks/OpenGL.framework/OpenGL";
#else
#define TOV_GL_CALL
constexpr const char* kLibraryName = "libGL.so.1";
#endif

constexpr uint32_t kTextureWidth = 0x1000;
constexpr uint32_t kTextureHeight = 0x1001;
constexpr uint32_t kTextureInternalFormat = 0x1003;
// Without a current context some implementations report an error for ever.
constexpr int kMaxPendingErrors = 16;

struct OpenGl {
    void(TOV_GL_CALL* bindTexture)(uint32_t, uint32_t) = nullptr;
    void(TOV_GL_CALL* getTexLevelParameteriv)(uint32_t, int32_t, uint32_t, int32_t*) = nullptr;
    uint32_t(TOV_GL_CALL* getError)() = nullptr;

    bool isComplete() const {
        return bindTexture != nullptr && getTexLevelParameteriv != nullptr && getError != nullptr;
    }
};

// The host has OpenGL loaded, so the process itself is asked first, then the system's library.
void* findSymbol(const char* name) {
    if (void* symbol = zor::findLoadedSymbol(name)) return symbol;
    static void* const library = zor::openLibrary(kLibraryName);
    return library == nullptr ? nullptr : zor::findSymbol(library, name);
}

template <class Function>
void find(Function& function, const char* name) {
    function = reinterpret_cast<Function>(findSymbol(name));
}

OpenGl loadOpenGl() {
    OpenGl gl;
    find(gl.bindTexture, "glBindTexture");
    find(gl.getTexLevelParameteriv, "glGetTexLevelParameteriv");
    find(gl.getError, "glGetError");
    return gl;
}

struct TextureFormat {
    int32_t internalFormat;
    uint32_t components;
    uint32_t type;
};
constexpr TextureFormat kTextureFormats[] = {
    {0x1907, 3, TOV_COMPONENT_TYPE_FLOAT32},  // GL_RGB
    {0x1908, 4, TOV_COMPONENT_TYPE_FLOAT32},  // GL_RGBA
    {0x805B, 4, TOV_COMPONENT_TYPE_FLOAT16},  // GL_RGBA16
    {0x8814, 4, TOV_COMPONENT_TYPE_FLOAT32},  // GL_RGBA32F
};

const TextureFormat& requireFormat(int32_t internalFormat) {
    for (const TextureFormat& format : kTextureFormats)
        if (format.internalFormat == internalFormat) return format;
    refuse(TOV_ERROR_INVALID_PARAMETER, "The texture's internal format is none of RGB, RGBA, RGBA16 and RGBA32F");
}

void drainErrors(const OpenGl& gl) {
    for (int i = 0; i < kMaxPendingErrors && gl.getError() != 0; ++i) continue;
}

}  // namespace

tov_image_desc describeTexture(uint32_t target, int32_t level, uint32_t texture) {
    const OpenGl gl = loadOpenGl();
    if (!gl.isComplete()) refuse(TOV_ERROR_OPENGL, "OpenGL is not loaded and its library cannot be opened");
    drainErrors(gl);
    int32_t width = 0;
    int32_t height = 0;
    int32_t internalFormat = 0;
    gl.bindTexture(target, texture);
    gl.getTexLevelParameteriv(target, level, kTextureWidth, &width);
    gl.getTexLevelParameteriv(target, level, kTextureHeight, &height);
    gl.getTexLevelParameteriv(target, level, kTextureInternalFormat, &internalFormat);
    gl.bindTexture(target, 0);
    if (gl.getError() != 0) refuse(TOV_ERROR_OPENGL, "OpenGL cannot describe the texture: is its context current?");
    // Without a current context the calls may do nothing and report nothing.
    if (width == 0 && height == 0 && internalFormat == 0)
        refuse(TOV_ERROR_OPENGL, "OpenGL does not describe the texture: is its context current?");
    const TextureFormat& format = requireFormat(internalFormat);
    if (width <= 0 || height <= 0) refuse(TOV_ERROR_INVALID_PARAMETER, "The texture level has a width or height of 0");
    const auto w = static_cast<uint32_t>(width);
    const auto h = static_cast<uint32_t>(height);
    return {w, h, 1, w, w * h, format.components, format.type};
}
