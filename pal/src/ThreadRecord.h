// Internal: what the platform layer keeps per thread, and the queued form of
// an event. Shared by Threads.cpp, Events.cpp and Timers.cpp.
#pragma once

#include <KD/kd.h>
#include <pthread.h>

#include <atomic>
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <unordered_map>
#include <utility>

namespace pal::detail {

// An event as it sits in a queue. KDEvent comes first so that the KDEvent*
// handed to callers converts back to the record.
struct QueuedEvent {
    KDEvent event{};
    KDTimer* timer = nullptr;      // set for timer events, so cancelling purges them
    std::function<void()> action;  // set for scheduled actions; run instead of dispatch
};

inline QueuedEvent* queuedEventOf(KDEvent* event) {
    return reinterpret_cast<QueuedEvent*>(event);
}

struct CallbackKeyHash {
    std::size_t operator()(const std::pair<KDint, void*>& key) const {
        return std::hash<void*>()(key.second) * 31u + std::hash<KDint>()(key.first);
    }
};

}  // namespace pal::detail

// One per thread that has touched the platform layer.
struct KDThread {
    // Posting threads append to queue under queueMutex. The owner moves the
    // whole queue into inFlight at once and pops from there under its own
    // lock, which posters never take, so the two sides rarely contend. A
    // discard takes both locks (queueMutex first) and searches both lists.
    std::mutex queueMutex;
    std::condition_variable queueChanged;
    std::deque<pal::detail::QueuedEvent*> queue;
    bool ownerWaiting = false;              // guarded by queueMutex; posters notify only then
    std::atomic<int> signalsInProgress{0};  // posters between unlocking and notifying
    std::mutex inFlightMutex;
    std::deque<pal::detail::QueuedEvent*> inFlight;
    std::atomic<int> timerCount{0};  // timers owned; lets a pump skip the timer scan

    // Owner-only state: only the thread itself installs and dispatches.
    std::unordered_map<std::pair<KDint, void*>, KDCallbackFunc*, pal::detail::CallbackKeyHash> callbacks;
    pal::detail::QueuedEvent* lastReturned = nullptr;  // kdWaitEvent's result, freed at the next call

    pthread_t handle{};
    void* (*startRoutine)(void*) = nullptr;
    void* startArgument = nullptr;
    void* result = nullptr;
    std::atomic<bool> detached{false};
    std::atomic<KDint> schedPolicy{0};
    std::atomic<KDint> schedParam{0};

    ~KDThread();
};

namespace pal::detail {

// The calling thread's record, created on first use for threads the layer did
// not start (the process's main thread, test threads). Null, after one log
// line, once the thread's record has been torn down with its thread-local
// storage: a library object destroyed during the process's exit must not
// reach the freed record.
KDThread* currentThread();
// Runs action while thread's record is certain to stay alive, and returns
// true; returns false without running it when the record is gone.
bool withLiveThread(KDThread* thread, const std::function<void()>& action);
// Wakes every thread blocked in kdWaitEvent so it re-reads the clock.
void wakeAllThreads();
// Pops and dispatches queued events; used by kdPumpEvents and advanceTime.
void pumpThread(KDThread* self);
// Fires the calling thread's due timers into its own queue (Timers.cpp).
void fireDueTimers(KDThread* self);
// Nanoseconds until the thread's next timer is due, or -1 when none (Timers.cpp).
KDint64 nanosUntilNextTimer(KDThread* self);
// Stops the timers of a thread that is ending from firing into it (Timers.cpp).
void orphanTimersOf(KDThread* thread);
// Frees every event queued for the thread, payloads included (Events.cpp).
void discardAllEvents(KDThread* thread);
// Starts the count behind pal::timerFireCount again (Timers.cpp).
void resetTimerFireCount();

}  // namespace pal::detail
