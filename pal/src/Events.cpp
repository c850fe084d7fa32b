// Per-thread event queues and callback dispatch.
//
// Each thread owns a queue that any thread may post to, and a table of
// callbacks that only the thread itself touches. Events are popped one at a
// time under the queue lock and dispatched with the lock released, so a
// callback may post, pump again (nested) or install callbacks freely.

#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <chrono>
#include <vector>

#include "Runtime.h"
#include "SimInternal.h"
#include "ThreadRecord.h"

namespace pal::detail {

namespace {

KDCallbackFunc* findCallback(KDThread* self, const KDEvent& event) {
    auto exact = self->callbacks.find({event.type, event.userptr});
    if (exact != self->callbacks.end()) {
        return exact->second;
    }
    auto fallback = self->callbacks.find({event.type, nullptr});
    return fallback != self->callbacks.end() ? fallback->second : nullptr;
}

QueuedEvent* popEvent(KDThread* self) {
    {
        std::lock_guard<std::mutex> lock(self->inFlightMutex);
        if (!self->inFlight.empty()) {
            QueuedEvent* queued = self->inFlight.front();
            self->inFlight.pop_front();
            return queued;
        }
    }
    std::lock_guard<std::mutex> queueLock(self->queueMutex);
    if (self->queue.empty()) {
        return nullptr;
    }
    std::lock_guard<std::mutex> lock(self->inFlightMutex);
    self->inFlight.swap(self->queue);
    QueuedEvent* queued = self->inFlight.front();
    self->inFlight.pop_front();
    return queued;
}

// Runs what the event asks for. Returns false, keeping the event, when no
// callback takes it; the event is freed otherwise.
bool dispatch(KDThread* self, QueuedEvent* queued) {
    if (queued->action) {
        queued->action();
        delete queued;
        return true;
    }
    KDCallbackFunc* callback = findCallback(self, queued->event);
    if (callback == nullptr) {
        return false;
    }
    callback(&queued->event);
    delete queued;
    return true;
}

// An event that will never reach a callback still owns its payload (a record
// to release, a fix to free); hand it back before the event goes.
void freeUndelivered(QueuedEvent* queued) {
    if (!queued->action && queued->timer == nullptr) {
        releaseUndeliveredPayload(queued->event);
    }
    delete queued;
}

void takeMatchingFrom(std::deque<QueuedEvent*>& queue, const std::function<bool(const KDEvent&)>& match,
                      std::vector<QueuedEvent*>& taken) {
    for (auto it = queue.begin(); it != queue.end();) {
        if (match((*it)->event)) {
            taken.push_back(*it);
            it = queue.erase(it);
        } else {
            ++it;
        }
    }
}

std::vector<QueuedEvent*> takeMatching(KDThread* thread, const std::function<bool(const KDEvent&)>& match) {
    std::vector<QueuedEvent*> taken;
    std::lock_guard<std::mutex> queueLock(thread->queueMutex);
    std::lock_guard<std::mutex> lock(thread->inFlightMutex);
    takeMatchingFrom(thread->inFlight, match, taken);
    takeMatchingFrom(thread->queue, match, taken);
    return taken;
}

// A record named by a listener or a request may belong to a thread that has
// ended (its owner is destroyed late, during the process's exit): its queue
// went with it, so there is nothing to take.
std::vector<QueuedEvent*> takeMatchingIfLive(KDThread* thread,
                                             const std::function<bool(const KDEvent&)>& match) {
    std::vector<QueuedEvent*> taken;
    pal::detail::withLiveThread(thread, [&] { taken = takeMatching(thread, match); });
    return taken;
}

void discardUndelivered(KDThread* thread, const std::function<bool(const KDEvent&)>& match) {
    for (QueuedEvent* queued : takeMatchingIfLive(thread, match)) {
        freeUndelivered(queued);
    }
}

std::size_t queueLength(KDThread* self) {
    std::lock_guard<std::mutex> queueLock(self->queueMutex);
    std::lock_guard<std::mutex> lock(self->inFlightMutex);
    return self->queue.size() + self->inFlight.size();
}

}  // namespace

void post(KDThread* thread, KDEvent* event) {
    QueuedEvent* queued = queuedEventOf(event);
    {
        std::lock_guard<std::mutex> lock(thread->queueMutex);
        thread->queue.push_back(queued);
        if (!thread->ownerWaiting) {
            return;
        }
        // Once the owner has taken this event it may end and be joined while
        // we still signal it; ~KDThread waits for signals in progress.
        ++thread->signalsInProgress;
    }
    thread->queueChanged.notify_one();
    --thread->signalsInProgress;
}

void discardEvents(KDThread* thread, const std::function<bool(const KDEvent&)>& match) {
    for (QueuedEvent* queued : takeMatchingIfLive(thread, match)) {
        delete queued;
    }
}

// Called by the owner, or by the record's destructor after it has left the
// registry of live records.
void discardAllEvents(KDThread* thread) {
    for (QueuedEvent* queued : takeMatching(thread, [](const KDEvent&) { return true; })) {
        freeUndelivered(queued);
    }
}

void pumpThread(KDThread* self) {
    // Only what is queued now: a callback that keeps re-posting must not keep
    // one pump going forever.
    std::size_t budget = queueLength(self);
    for (; budget > 0; --budget) {
        QueuedEvent* queued = popEvent(self);
        if (queued == nullptr) {
            break;
        }
        if (!dispatch(self, queued)) {
            freeUndelivered(queued);  // nobody listens: dropped, as OpenKODE does for kdPumpEvents
        }
    }
}

}  // namespace pal::detail

using pal::detail::QueuedEvent;

extern "C" {

KDEvent* kdCreateEvent(void) {
    return &(new QueuedEvent())->event;
}

void kdFreeEvent(KDEvent* event) {
    if (event != nullptr) {
        delete pal::detail::queuedEventOf(event);
    }
}

KDint kdPostEvent(KDEvent* event) {
    return kdPostThreadEvent(event, kdThreadSelf());
}

KDint kdPostThreadEvent(KDEvent* event, KDThread* thread) {
    if (event == nullptr || thread == nullptr) {
        kdSetError(KD_EINVAL);
        return -1;
    }
    pal::detail::post(thread, event);
    return 0;
}

KDint kdInstallCallback(KDCallbackFunc* func, KDint eventtype, void* eventuserptr) {
    KDThread* self = kdThreadSelf();
    if (self == nullptr) {
        return -1;
    }
    if (func != nullptr) {
        self->callbacks[{eventtype, eventuserptr}] = func;
        return 0;
    }
    self->callbacks.erase({eventtype, eventuserptr});
    // The owner of userptr is going away: its pending events must not reach a
    // later object that happens to get the same address.
    if (eventuserptr != nullptr) {
        pal::detail::discardUndelivered(self, [eventtype, eventuserptr](const KDEvent& event) {
            return event.type == eventtype && event.userptr == eventuserptr;
        });
    }
    return 0;
}

void kdPumpEvents(void) {
    KDThread* self = kdThreadSelf();
    if (self == nullptr) {
        return;
    }
    pal::detail::fireDueTimers(self);
    pal::detail::pumpThread(self);
}

const KDEvent* kdWaitEvent(KDust timeout) {
    KDThread* self = kdThreadSelf();
    if (self == nullptr) {
        return nullptr;
    }
    delete self->lastReturned;
    self->lastReturned = nullptr;

    const bool forever = timeout == static_cast<KDust>(-1);
    const KDust deadline = forever ? 0 : kdGetTimeUST() + timeout;
    for (;;) {
        pal::detail::fireDueTimers(self);
        bool dispatchedAny = false;
        while (QueuedEvent* queued = pal::detail::popEvent(self)) {
            if (!pal::detail::dispatch(self, queued)) {
                self->lastReturned = queued;
                return &queued->event;
            }
            dispatchedAny = true;
        }
        if (dispatchedAny) {
            return nullptr;
        }
        const KDust now = kdGetTimeUST();
        if (!forever && now >= deadline) {
            return nullptr;
        }
        KDint64 wait = pal::detail::nanosUntilNextTimer(self);
        if (!forever && (wait < 0 || static_cast<KDust>(wait) > deadline - now)) {
            wait = static_cast<KDint64>(deadline - now);
        }
        std::unique_lock<std::mutex> lock(self->queueMutex);
        // Checked again under the lock: advanceTime wakes waiters under it, so
        // a time step between the check above and the wait is not missed.
        if (!self->queue.empty() || (!forever && kdGetTimeUST() >= deadline)) {
            continue;
        }
        self->ownerWaiting = true;
        // On the virtual clock a wait ends only by an event or by advanceTime
        // waking every thread; real time plays no part.
        if (wait < 0 || pal::isVirtualClock()) {
            self->queueChanged.wait(lock);
        } else {
            self->queueChanged.wait_for(lock, std::chrono::nanoseconds(wait));
        }
        self->ownerWaiting = false;
    }
}

void kdDefaultEvent(const KDEvent* event) {
    if (event != nullptr && event->type == KD_EVENT_QUIT && !pal::exitRequested()) {
        kdExit(0);
    }
}

}  // extern "C"
