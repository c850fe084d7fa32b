// Simulated radios: network reachability (value plus change events to each
// listener) and the satellite receiver (fixes and status for the thread that
// started it).
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <mutex>
#include <vector>

#include "Runtime.h"
#include "SimInternal.h"
#include "SimListenerSet.h"

namespace {

const KDint kDefaultReachability = KD_NETWORK_REACHABLE_VIA_WIFI_ZVR;

struct RadioState {
    KDint reachability = kDefaultReachability;
    bool locationStarted = false;
    KDThread* locationThread = nullptr;
};

std::mutex gMutex;
RadioState gState;
pal::detail::SimListenerSet gReachabilityListeners(KD_EVENT_NETWORK_REACHABILITY_ZVR);

bool isLocationEvent(const KDEvent& event) {
    return event.type == KD_EVENT_LOCATION_ZVR || event.type == KD_EVENT_LOCATION_STATUS_ZVR;
}

// Fixes and status queued before a stop are no longer wanted; their payloads
// are freed here because nobody will receive them.
void discardLocationEvents(KDThread* thread) {
    std::vector<void*> payloads;
    pal::detail::discardEvents(thread, [&payloads](const KDEvent& event) {
        if (!isLocationEvent(event)) {
            return false;
        }
        if (event.type == KD_EVENT_LOCATION_ZVR) {
            payloads.push_back(event.data.p[0]);
        }
        return true;
    });
    for (void* payload : payloads) {
        kdFree(payload);
    }
}

// The thread to post to while location runs, or null.
KDThread* locationTarget() {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.locationStarted ? gState.locationThread : nullptr;
}

void postLocationEvent(KDThread* thread, KDEvent* event) {
    pal::detail::post(thread, event);
    // A stop racing with this post may have swept the queue before the event
    // landed in it; sweep again so that nothing arrives after a stop.
    if (locationTarget() != thread) {
        discardLocationEvents(thread);
    }
}

}  // namespace

extern "C" {

KDint kdGetNetworkReachabilityStatusZVR(void) {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.reachability;
}

KDint kdStartListeningNetworkReachabilityStatusZVR(void* userptr) {
    return gReachabilityListeners.add(userptr);
}

void kdStopListeningNetworkReachabilityStatusZVR(KDint handle) {
    gReachabilityListeners.remove(handle);
}

KDint kdLocationStartZVR(void) {
    KDThread* thread = kdThreadSelf();
    if (thread == nullptr) {
        return -1;
    }
    std::lock_guard<std::mutex> lock(gMutex);
    gState.locationStarted = true;
    gState.locationThread = thread;
    return 0;
}

KDint kdLocationStopZVR(void) {
    KDThread* thread = nullptr;
    {
        std::lock_guard<std::mutex> lock(gMutex);
        if (!gState.locationStarted) {
            return 0;
        }
        thread = gState.locationThread;
        gState.locationStarted = false;
        gState.locationThread = nullptr;
    }
    discardLocationEvents(thread);
    return 0;
}

}  // extern "C"

namespace pal {

void setReachability(KDint status) {
    {
        std::lock_guard<std::mutex> lock(gMutex);
        if (status == gState.reachability) {
            return;
        }
        gState.reachability = status;
    }
    gReachabilityListeners.notify(status);
}

int reachabilityListeners() {
    return gReachabilityListeners.count();
}

bool isLocationStarted() {
    return locationTarget() != nullptr;
}

void injectLocationFix(const KDLocationFixZVR& fix, bool simulated) {
    KDThread* thread = locationTarget();
    if (thread == nullptr) {
        return;
    }
    auto* payload = static_cast<KDLocationFixZVR*>(kdMalloc(sizeof(KDLocationFixZVR)));
    *payload = fix;
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_LOCATION_ZVR;
    event->timestamp = simulated ? static_cast<KDust>(-1) : kdGetTimeUST();
    event->data.p[0] = payload;
    postLocationEvent(thread, event);
}

void injectLocationStatus(KDint status) {
    KDThread* thread = locationTarget();
    if (thread == nullptr) {
        return;
    }
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_LOCATION_STATUS_ZVR;
    event->timestamp = kdGetTimeUST();
    event->data.words[0] = status;
    postLocationEvent(thread, event);
}

namespace detail {

void resetRadios() {
    {
        std::lock_guard<std::mutex> lock(gMutex);
        gState = RadioState();
    }
    gReachabilityListeners.clear();
}

}  // namespace detail
}  // namespace pal
