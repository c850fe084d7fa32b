// Simulated audio capture sessions: the platform's wrapper around OpenAL
// capture only needs to be opened, refused on demand, and closed.
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <memory>
#include <mutex>
#include <unordered_map>

#include "Runtime.h"
#include "SimInternal.h"

struct KDCaptureSessionZVR {
    bool alternative = false;
};

namespace {

struct AudioState {
    bool refused = false;
    bool lastAlternative = false;
    std::unordered_map<KDCaptureSessionZVR*, std::unique_ptr<KDCaptureSessionZVR>> sessions;
};

std::mutex gMutex;
AudioState gState;

}  // namespace

extern "C" {

KDCaptureSessionZVR* alCreateCaptureSessionZVR(KDboolean alternative) {
    std::lock_guard<std::mutex> lock(gMutex);
    if (gState.refused) {
        return nullptr;
    }
    auto session = std::make_unique<KDCaptureSessionZVR>();
    session->alternative = alternative != 0;
    gState.lastAlternative = session->alternative;
    KDCaptureSessionZVR* handle = session.get();
    gState.sessions.emplace(handle, std::move(session));
    return handle;
}

void alDestroyCaptureSessionZVR(KDCaptureSessionZVR* session) {
    std::lock_guard<std::mutex> lock(gMutex);
    // Looked up rather than trusted, so a stale or foreign pointer is ignored.
    if (gState.sessions.erase(session) == 0 && session != nullptr) {
        pal::detail::writeLogLine("pal: alDestroyCaptureSessionZVR: unknown capture session ignored");
    }
}

}  // extern "C"

namespace pal {

void setCaptureSessionsRefused(bool refused) {
    std::lock_guard<std::mutex> lock(gMutex);
    gState.refused = refused;
}

int openCaptureSessions() {
    std::lock_guard<std::mutex> lock(gMutex);
    return static_cast<int>(gState.sessions.size());
}

bool lastCaptureSessionAlternative() {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.lastAlternative;
}

namespace detail {

void resetAudio() {
    std::lock_guard<std::mutex> lock(gMutex);
    gState = AudioState();
}

}  // namespace detail
}  // namespace pal
