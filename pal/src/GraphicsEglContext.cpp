#include "GraphicsEglContext.h"

#include <EGL/eglext.h>

#include <cstdio>

namespace pal::detail {

bool GraphicsEglContext::makeCurrent(int width, int height) {
    if (initializationFailed_) {
        return false;
    }
    failedReason_.clear();
    if (context_ == EGL_NO_CONTEXT && !initialize()) {
        initializationFailed_ = true;
        return false;
    }
    if ((surface_ == EGL_NO_SURFACE || width != width_ || height != height_) &&
        !createSurface(width, height)) {
        return false;
    }
    return bind();
}

bool GraphicsEglContext::makeCurrentAsIs() {
    return surface_ != EGL_NO_SURFACE && bind();
}

void GraphicsEglContext::release() {
    if (display_ != EGL_NO_DISPLAY) {
        // Only the calling thread's binding can be undone here; EGL defers the
        // destruction of objects still current on another thread.
        if (eglGetCurrentContext() == context_) {
            eglMakeCurrent(display_, EGL_NO_SURFACE, EGL_NO_SURFACE, EGL_NO_CONTEXT);
        }
        if (surface_ != EGL_NO_SURFACE) {
            eglDestroySurface(display_, surface_);
        }
        if (context_ != EGL_NO_CONTEXT) {
            eglDestroyContext(display_, context_);
        }
    }
    context_ = EGL_NO_CONTEXT;
    surface_ = EGL_NO_SURFACE;
    width_ = 0;
    height_ = 0;
    failedReason_.clear();
    initializationFailed_ = false;
}

bool GraphicsEglContext::initialize() {
    if (display_ == EGL_NO_DISPLAY && !initializeDisplay()) {
        return false;
    }
    if (!eglBindAPI(EGL_OPENGL_ES_API)) {
        return fail("eglBindAPI(EGL_OPENGL_ES_API)");
    }
    const EGLint contextAttributes[] = {EGL_CONTEXT_CLIENT_VERSION, 1, EGL_NONE};
    context_ = eglCreateContext(display_, config_, EGL_NO_CONTEXT, contextAttributes);
    if (context_ == EGL_NO_CONTEXT) {
        return fail("eglCreateContext (OpenGL ES 1)");
    }
    return true;
}

bool GraphicsEglContext::initializeDisplay() {
    // The surfaceless platform renders off-screen (llvmpipe on a machine
    // without a GPU), so no EGL_PLATFORM setting or display server is needed.
    EGLDisplay display = eglGetPlatformDisplay(EGL_PLATFORM_SURFACELESS_MESA, EGL_DEFAULT_DISPLAY, nullptr);
    if (display == EGL_NO_DISPLAY) {
        return fail("eglGetPlatformDisplay(EGL_PLATFORM_SURFACELESS_MESA)");
    }
    if (!eglInitialize(display, nullptr, nullptr)) {
        return fail("eglInitialize");
    }
    // clang-format off
    const EGLint configAttributes[] = {
        EGL_RENDERABLE_TYPE, EGL_OPENGL_ES_BIT,
        EGL_SURFACE_TYPE, EGL_PBUFFER_BIT,
        EGL_RED_SIZE, 8, EGL_GREEN_SIZE, 8, EGL_BLUE_SIZE, 8, EGL_ALPHA_SIZE, 8,
        EGL_DEPTH_SIZE, 16,
        EGL_NONE};
    // clang-format on
    EGLint count = 0;
    if (!eglChooseConfig(display, configAttributes, &config_, 1, &count) || count < 1) {
        return fail("eglChooseConfig (RGBA8, depth 16, pbuffer, OpenGL ES)");
    }
    eglGetConfigAttrib(display, config_, EGL_MAX_PBUFFER_WIDTH, &maxWidth_);
    eglGetConfigAttrib(display, config_, EGL_MAX_PBUFFER_HEIGHT, &maxHeight_);
    display_ = display;
    return true;
}

bool GraphicsEglContext::createSurface(int width, int height) {
    // Mesa creates larger pbuffers without complaint but then cannot render
    // into them, so the advertised limit is enforced here.
    if (width > maxWidth_ || height > maxHeight_) {
        char reason[160];
        std::snprintf(reason, sizeof(reason), "context size %dx%d exceeds the largest pbuffer (%dx%d)", width,
                      height, maxWidth_, maxHeight_);
        failedReason_ = reason;
        return false;
    }
    const EGLint attributes[] = {EGL_WIDTH, width, EGL_HEIGHT, height, EGL_NONE};
    EGLSurface surface = eglCreatePbufferSurface(display_, config_, attributes);
    if (surface == EGL_NO_SURFACE) {
        return fail("eglCreatePbufferSurface");
    }
    // EGL defers destroying a surface that is still current until it is
    // unbound, which the next bind() does.
    if (surface_ != EGL_NO_SURFACE) {
        eglDestroySurface(display_, surface_);
    }
    surface_ = surface;
    width_ = width;
    height_ = height;
    return true;
}

bool GraphicsEglContext::bind() {
    if (eglGetCurrentContext() == context_ && eglGetCurrentSurface(EGL_DRAW) == surface_) {
        return true;
    }
    if (!eglMakeCurrent(display_, surface_, surface_, context_)) {
        // Typically EGL_BAD_ACCESS: the context is current on another thread.
        // This is not fatal for later calls from the right thread.
        return false;
    }
    return true;
}

bool GraphicsEglContext::fail(const char* call) {
    char reason[160];
    std::snprintf(reason, sizeof(reason), "%s failed (EGL error 0x%04X)", call,
                  static_cast<unsigned>(eglGetError()));
    failedReason_ = reason;
    return false;
}

}  // namespace pal::detail
