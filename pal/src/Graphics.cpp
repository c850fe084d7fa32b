// The graphics calls of the desktop layer: the simulated main context size,
// per-view redraw handlers, and coalesced redraws served from the requesting
// thread's event loop with the real GL context current.
#include <GLES/gl.h>
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <mutex>
#include <string>
#include <unordered_map>
#include <unordered_set>

#include "GraphicsEglContext.h"
#include "Runtime.h"
#include "SimInternal.h"

namespace {

// A private event type far from the OpenKODE and extension numbers.
const KDint32 kRedrawEvent = 0x7FFF0100;
const int kDefaultWidth = 480;
const int kDefaultHeight = 800;

struct GraphicsState {
    int width = kDefaultWidth;
    int height = kDefaultHeight;
    std::unordered_map<KDViewProxyZVR*, KDRedrawHandlerZVR*> handlers;
    // Views with a redraw event in flight; further requests join it.
    std::unordered_set<KDViewProxyZVR*> pending;
    int redrawCount = 0;
    bool failureLogged = false;
};

std::mutex gMutex;
GraphicsState gState;
// Created lazily by the first redraw; released by resetSimulation() so that
// every test starts with a fresh context at the default size. Never destroyed
// at process exit, where Mesa may already have torn itself down; the system
// reclaims it.
pal::detail::GraphicsEglContext& gContext = *new pal::detail::GraphicsEglContext();

// Makes the context current for a redraw. A failure is logged once (until the
// next reset), since redraws come sixty times a second.
bool prepareContextLocked() {
    if (gContext.makeCurrent(gState.width, gState.height)) {
        return true;
    }
    if (!gState.failureLogged) {
        gState.failureLogged = true;
        const std::string reason = gContext.failedReason().empty()
                                       ? "the context is current on another thread"
                                       : gContext.failedReason();
        const std::string line = "pal: graphics unavailable, redraw handlers are not called: " + reason;
        pal::detail::writeLogLine(line.c_str());
    }
    return false;
}

void onRedrawEvent(const KDEvent* event) {
    auto* view = static_cast<KDViewProxyZVR*>(event->userptr);
    KDRedrawHandlerZVR* handler = nullptr;
    {
        std::lock_guard<std::mutex> lock(gMutex);
        gState.pending.erase(view);
        auto it = gState.handlers.find(view);
        if (it == gState.handlers.end() || !prepareContextLocked()) {
            return;
        }
        handler = it->second;
    }
    // The handler runs unlocked: it may request the next redraw or query the size.
    handler(view);
    glFinish();
    std::lock_guard<std::mutex> lock(gMutex);
    ++gState.redrawCount;
}

}  // namespace

extern "C" {

KDint kdGFXQueryMainContextZVR(KDViewProxyZVR* /*view*/, KDint what, KDint* value) {
    if (value == nullptr) {
        return 0;
    }
    std::lock_guard<std::mutex> lock(gMutex);
    switch (what) {
        case KD_GFX_WIDTH_ZVR:
            *value = gState.width;
            return 1;
        case KD_GFX_HEIGHT_ZVR:
            *value = gState.height;
            return 1;
        default:
            return 0;
    }
}

void kdGFXSetRedrawHandler(KDViewProxyZVR* view, KDRedrawHandlerZVR* handler) {
    std::lock_guard<std::mutex> lock(gMutex);
    if (handler != nullptr) {
        gState.handlers[view] = handler;
    } else {
        gState.handlers.erase(view);
    }
}

void kdGFXRequestRedraw(KDViewProxyZVR* view) {
    {
        std::lock_guard<std::mutex> lock(gMutex);
        if (!gState.pending.insert(view).second) {
            return;
        }
    }
    // Installed at every request rather than once, because a thread's
    // bindings end with the thread (or with a platform restart).
    kdInstallCallback(onRedrawEvent, kRedrawEvent, nullptr);
    KDEvent* event = kdCreateEvent();
    event->type = kRedrawEvent;
    event->timestamp = kdGetTimeUST();
    event->userptr = view;
    kdPostEvent(event);
}

}  // extern "C"

namespace pal {

void setContextSize(int width, int height) {
    if (width < 1 || height < 1) {
        detail::writeLogLine("pal: setContextSize: width and height must be at least 1; size unchanged");
        return;
    }
    std::lock_guard<std::mutex> lock(gMutex);
    gState.width = width;
    gState.height = height;
}

int redrawCount() {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.redrawCount;
}

bool readFrame(std::vector<std::uint8_t>& rgba, int& width, int& height) {
    std::lock_guard<std::mutex> lock(gMutex);
    if (!gContext.makeCurrentAsIs()) {
        return false;
    }
    width = gContext.width();
    height = gContext.height();
    rgba.resize(static_cast<std::size_t>(width) * height * 4);
    // Errors the application's drawing left behind are not ours to report.
    for (int i = 0; i < 16 && glGetError() != GL_NO_ERROR; ++i) {
    }
    glPixelStorei(GL_PACK_ALIGNMENT, 1);
    glReadPixels(0, 0, width, height, GL_RGBA, GL_UNSIGNED_BYTE, rgba.data());
    return glGetError() == GL_NO_ERROR;
}

namespace detail {

void resetGraphics() {
    std::lock_guard<std::mutex> lock(gMutex);
    gContext.release();
    gState = GraphicsState();
}

}  // namespace detail
}  // namespace pal
