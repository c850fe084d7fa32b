#include "network/impl/ReachabilityProvider.h"

#include <KD/kdext.h>

namespace Network {

ReachabilityProvider::ReachabilityProvider(OnChangedCallback onChanged)
    : palListener(0),
      onChanged(onChanged),
      enabled(false),
      paused(true),
      status(kdGetNetworkReachabilityStatusZVR()) {
    kdInstallCallback(&ReachabilityProvider::onReachabilityEvent, KD_EVENT_NETWORK_REACHABILITY_ZVR, this);
}

ReachabilityProvider::~ReachabilityProvider() {
    kdInstallCallback(nullptr, KD_EVENT_NETWORK_REACHABILITY_ZVR, this);
    KD_ASSERT(!enabled);
    disable();
}

void ReachabilityProvider::enable() {
    if (enabled) {
        return;
    }
    enabled = true;
    // Nobody listened before, so there is nobody to tell about a change. Read
    // also while paused: resume compares with this value, and a stale one
    // would hide a network that went and came back in the background.
    status = kdGetNetworkReachabilityStatusZVR();
    if (paused) {
        return;
    }
    KD_ASSERT(!palListener);
    startListening();
}

void ReachabilityProvider::disable() {
    if (!enabled) {
        return;
    }
    enabled = false;
    if (paused) {
        return;
    }
    KD_ASSERT(palListener);
    stopListening();
}

void ReachabilityProvider::onPaused() {
    KD_ASSERT(!paused);
    if (paused) {
        return;
    }
    paused = true;
    if (enabled) {
        stopListening();
    }
}

void ReachabilityProvider::onResumed() {
    KD_ASSERT(paused);
    if (!paused) {
        return;
    }
    paused = false;
    if (enabled) {
        startListening();
        update(kdGetNetworkReachabilityStatusZVR());
    }
}

int ReachabilityProvider::getNetworkReachabilityStatus() const {
    return isListening() ? status : kdGetNetworkReachabilityStatusZVR();
}

void ReachabilityProvider::onReachabilityEvent(const KDEvent* event) {
    ReachabilityProvider* self = static_cast<ReachabilityProvider*>(event->userptr);
    if (self->isListening()) {
        self->update(kdGetNetworkReachabilityStatusZVR());
    }
}

void ReachabilityProvider::startListening() {
    palListener = kdStartListeningNetworkReachabilityStatusZVR(this);
}

void ReachabilityProvider::stopListening() {
    if (palListener) {
        kdStopListeningNetworkReachabilityStatusZVR(palListener);
    }
    palListener = 0;
}

void ReachabilityProvider::update(int newStatus) {
    if (newStatus == status) {
        return;
    }
    status = newStatus;
    onChanged(status);
}

}  // namespace Network
