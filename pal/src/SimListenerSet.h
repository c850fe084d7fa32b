// The listeners of one simulated radio or sensor value (reachability, compass,
// proximity): each start hands out a handle, and each new value goes as one
// event to every listener's thread with that listener's user pointer.
#pragma once

#include <KD/kd.h>

#include <cstdint>
#include <map>
#include <mutex>

namespace pal::detail {

// Any thread may call it; events are posted outside its lock.
class SimListenerSet {
public:
    explicit SimListenerSet(KDint32 eventType) : eventType_(eventType) {}
    SimListenerSet(const SimListenerSet&) = delete;
    SimListenerSet& operator=(const SimListenerSet&) = delete;

    // Adds a listener on the calling thread; returns its nonzero handle.
    KDint add(void* userptr);
    // Removes the listener and discards its events still queued; unknown
    // handles are ignored.
    void remove(KDint handle);
    // Posts the value (data word 0) to every listener.
    void notify(std::intptr_t value);
    int count() const;
    // Forgets every listener without touching queues (their threads may be gone).
    void clear();

private:
    struct Listener {
        KDThread* thread;
        void* userptr;
    };

    void discardQueued(KDint handle, const Listener& listener);

    const KDint32 eventType_;
    mutable std::mutex mutex_;
    std::map<KDint, Listener> listeners_;
    // Never restarts, so a stale handle cannot stop a newer listener.
    KDint nextHandle_ = 1;
};

}  // namespace pal::detail
