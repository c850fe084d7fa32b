#include "RealTimeBound.h"

namespace {

// No handler is installed for it, so kdWaitEvent hands it back undispatched.
const KDint32 kWakeEvent = KD_EVENT_USER + 0x7ACE;

}  // namespace

RealTimeBound::RealTimeBound(std::chrono::milliseconds bound)
    : waiter(kdThreadSelf()), done(false), hasExpired(false), watcher(&RealTimeBound::watch, this, bound) {}

RealTimeBound::~RealTimeBound() {
    {
        std::lock_guard<std::mutex> lock(mutex);
        done = true;
    }
    released.notify_one();
    watcher.join();
}

void RealTimeBound::watch(std::chrono::milliseconds bound) {
    std::unique_lock<std::mutex> lock(mutex);
    if (released.wait_for(lock, bound, [this] { return done; })) {
        return;
    }
    hasExpired = true;
    KDEvent* event = kdCreateEvent();
    event->type = kWakeEvent;
    kdPostThreadEvent(event, waiter);
}
