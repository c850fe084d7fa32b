#include "SimListenerSet.h"

#include <vector>

#include "Runtime.h"

namespace pal::detail {

namespace {

// Data word 1 carries the listener's handle so that stopping one listener
// discards exactly its own events, even when two share a user pointer.
const int kHandleWord = 1;

}  // namespace

KDint SimListenerSet::add(void* userptr) {
    KDThread* thread = kdThreadSelf();
    if (thread == nullptr) {
        return 0;
    }
    std::lock_guard<std::mutex> lock(mutex_);
    const KDint handle = nextHandle_++;
    listeners_.emplace(handle, Listener{thread, userptr});
    return handle;
}

void SimListenerSet::remove(KDint handle) {
    Listener listener{};
    {
        std::lock_guard<std::mutex> lock(mutex_);
        auto it = listeners_.find(handle);
        if (it == listeners_.end()) {
            return;
        }
        listener = it->second;
        listeners_.erase(it);
    }
    discardQueued(handle, listener);
}

void SimListenerSet::discardQueued(KDint handle, const Listener& listener) {
    discardEvents(listener.thread, [this, &listener, handle](const KDEvent& event) {
        return event.type == eventType_ && event.userptr == listener.userptr &&
               event.data.words[kHandleWord] == handle;
    });
}

void SimListenerSet::notify(std::intptr_t value) {
    std::vector<std::pair<KDint, Listener>> snapshot;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        snapshot.assign(listeners_.begin(), listeners_.end());
    }
    const KDust now = kdGetTimeUST();
    for (const auto& [handle, listener] : snapshot) {
        KDEvent* event = kdCreateEvent();
        event->type = eventType_;
        event->timestamp = now;
        event->userptr = listener.userptr;
        event->data.words[0] = value;
        event->data.words[kHandleWord] = handle;
        post(listener.thread, event);
    }
    // A listener removed while we posted may have missed its own event in the
    // queue; discarding again here means no event outlives its listener.
    for (const auto& [handle, listener] : snapshot) {
        bool removed = false;
        {
            std::lock_guard<std::mutex> lock(mutex_);
            removed = listeners_.count(handle) == 0;
        }
        if (removed) {
            discardQueued(handle, listener);
        }
    }
}

int SimListenerSet::count() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return static_cast<int>(listeners_.size());
}

void SimListenerSet::clear() {
    std::lock_guard<std::mutex> lock(mutex_);
    listeners_.clear();
}

}  // namespace pal::detail
