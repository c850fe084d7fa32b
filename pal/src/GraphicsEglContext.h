// The main graphics context of the desktop layer: an OpenGL ES 1.1 context on
// a pbuffer, made with EGL on Mesa's surfaceless platform so that it needs no
// window system. Not thread-safe: Graphics.cpp calls it under its own mutex.
#pragma once

#include <EGL/egl.h>

#include <string>

namespace pal::detail {

class GraphicsEglContext {
public:
    GraphicsEglContext() = default;
    GraphicsEglContext(const GraphicsEglContext&) = delete;
    GraphicsEglContext& operator=(const GraphicsEglContext&) = delete;
    ~GraphicsEglContext() { release(); }

    // Creates the context on first use and the pbuffer at the given size
    // (again when the size changed), then makes both current on the calling
    // thread. False when EGL failed, and failedReason() says why; after a
    // failed initialisation no further attempt is made until release().
    // False with an empty reason when the context is current on another thread.
    bool makeCurrent(int width, int height);
    // Makes the existing context current without resizing; false without one.
    bool makeCurrentAsIs();
    bool hasSurface() const { return surface_ != EGL_NO_SURFACE; }
    int width() const { return width_; }
    int height() const { return height_; }
    const std::string& failedReason() const { return failedReason_; }
    // Destroys the context and the pbuffer, so the next makeCurrent starts
    // afresh. The display stays initialised for the life of the process:
    // terminating it makes Mesa unload its driver, which leaks each time.
    void release();

private:
    bool initialize();
    bool initializeDisplay();
    bool createSurface(int width, int height);
    bool bind();
    bool fail(const char* call);

    EGLDisplay display_ = EGL_NO_DISPLAY;
    EGLConfig config_ = nullptr;
    EGLContext context_ = EGL_NO_CONTEXT;
    EGLSurface surface_ = EGL_NO_SURFACE;
    EGLint maxWidth_ = 0;
    EGLint maxHeight_ = 0;
    int width_ = 0;
    int height_ = 0;
    std::string failedReason_;
    bool initializationFailed_ = false;
};

}  // namespace pal::detail
