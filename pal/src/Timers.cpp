// The clock (real or virtual) and the timers built on it.
//
// Timers are owned by the thread that set them and fire into that thread's
// queue. On the real clock a thread fires its due timers whenever it pumps or
// waits. On the virtual clock time stands still until advanceTime moves it;
// due timers then fire in time order, and the advancing thread dispatches its
// own events after each firing, so a timer callback that sets a new timer
// sees it fire within the same advance when it falls due in time.

#include <KD/kdext.h>
#include <pal/Simulation.h>
#include <time.h>

#include <algorithm>
#include <atomic>
#include <mutex>
#include <vector>

#include "Runtime.h"
#include "ThreadRecord.h"

struct KDTimer {
    KDThread* owner = nullptr;
    KDust due = 0;
    KDint64 interval = 0;
    KDint mode = KD_TIMER_ONESHOT;
    void* userptr = nullptr;
    std::function<void()> action;  // scheduled actions run this instead of posting event 42
    std::uint64_t id = 0;          // creation order, breaks ties between equal due times
    bool active = true;            // false once a one-shot has fired
};

namespace {

// Writers hold mutex; the two atomics are also read without it, so that
// reading the time (on every posted call) never waits for the timer list.
struct Clock {
    std::mutex mutex;
    std::atomic<bool> isVirtual{false};
    std::atomic<KDust> virtualNow{0};
    KDust virtualStart = 0;
    KDtime wallAtStart = 0;
    std::vector<KDTimer*> timers;
    std::uint64_t nextTimerId = 1;
    std::uint64_t fireCount = 0;
};

Clock& theClock() {
    static Clock* instance = new Clock();  // never destroyed: threads may use it during exit
    return *instance;
}

KDust realMonotonicNanos() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<KDust>(now.tv_sec) * 1000000000ull + static_cast<KDust>(now.tv_nsec);
}

KDust currentTime(const Clock& c) {
    return c.isVirtual.load() ? c.virtualNow.load() : realMonotonicNanos();
}

// Moves a fired timer to its next due time; returns the event to post.
KDEvent* fireLocked(Clock& c, KDTimer* timer, KDust now) {
    ++c.fireCount;
    if (timer->mode == KD_TIMER_PERIODIC_AVERAGE) {
        timer->due += static_cast<KDust>(std::max<KDint64>(timer->interval, 1));
    } else if (timer->mode == KD_TIMER_PERIODIC_MINIMUM) {
        timer->due = now + static_cast<KDust>(std::max<KDint64>(timer->interval, 1));
    } else {
        timer->active = false;
    }
    KDEvent* event = kdCreateEvent();
    pal::detail::QueuedEvent* queued = pal::detail::queuedEventOf(event);
    event->timestamp = now;
    if (timer->action) {
        queued->action = timer->action;
    } else {
        event->type = KD_EVENT_TIMER;
        event->userptr = timer->userptr;
    }
    queued->timer = timer;
    return event;
}

KDTimer* earliestDueLocked(Clock& c, KDust limit, KDThread* ownerOrNull) {
    KDTimer* earliest = nullptr;
    for (KDTimer* timer : c.timers) {
        if (!timer->active || timer->due > limit || (ownerOrNull != nullptr && timer->owner != ownerOrNull)) {
            continue;
        }
        if (earliest == nullptr || timer->due < earliest->due ||
            (timer->due == earliest->due && timer->id < earliest->id)) {
            earliest = timer;
        }
    }
    return earliest;
}

KDTimer* addTimer(KDThread* owner, KDint64 interval, KDint mode, void* userptr,
                  std::function<void()> action) {
    Clock& c = theClock();
    KDTimer* timer = new KDTimer();
    timer->owner = owner;
    timer->interval = interval;
    timer->mode = mode;
    timer->userptr = userptr;
    timer->action = std::move(action);
    std::lock_guard<std::mutex> lock(c.mutex);
    timer->id = c.nextTimerId++;
    timer->due = currentTime(c) + static_cast<KDust>(std::max<KDint64>(interval, 0));
    c.timers.push_back(timer);
    ++owner->timerCount;
    return timer;
}

void removeTimer(KDTimer* timer) {
    Clock& c = theClock();
    {
        std::lock_guard<std::mutex> lock(c.mutex);
        c.timers.erase(std::remove(c.timers.begin(), c.timers.end(), timer), c.timers.end());
        if (timer->owner != nullptr) {
            --timer->owner->timerCount;
        }
    }
    if (timer->owner != nullptr) {
        pal::detail::discardEvents(timer->owner, [timer](const KDEvent& event) {
            return pal::detail::queuedEventOf(const_cast<KDEvent*>(&event))->timer == timer;
        });
    }
    delete timer;
}

}  // namespace

namespace pal::detail {

void fireDueTimers(KDThread* self) {
    if (self->timerCount.load() == 0) {
        return;
    }
    Clock& c = theClock();
    std::vector<KDEvent*> fired;
    {
        std::lock_guard<std::mutex> lock(c.mutex);
        const KDust now = currentTime(c);
        std::vector<KDTimer*> due;
        for (KDTimer* timer : c.timers) {
            if (timer->active && timer->owner == self && timer->due <= now) {
                due.push_back(timer);
            }
        }
        std::sort(due.begin(), due.end(),
                  [](KDTimer* a, KDTimer* b) { return a->due != b->due ? a->due < b->due : a->id < b->id; });
        // Each due timer fires once per pump: a late periodic timer catches up
        // over the next pumps rather than in a burst.
        for (KDTimer* timer : due) {
            fired.push_back(fireLocked(c, timer, now));
        }
    }
    for (KDEvent* event : fired) {
        post(self, event);
    }
}

void orphanTimersOf(KDThread* thread) {
    Clock& c = theClock();
    std::lock_guard<std::mutex> lock(c.mutex);
    for (KDTimer* timer : c.timers) {
        if (timer->owner == thread) {
            // The handle stays valid for a later kdCancelTimer; it just never fires.
            timer->owner = nullptr;
            timer->active = false;
        }
    }
    thread->timerCount.store(0);
}

KDint64 nanosUntilNextTimer(KDThread* self) {
    if (self->timerCount.load() == 0) {
        return -1;
    }
    Clock& c = theClock();
    std::lock_guard<std::mutex> lock(c.mutex);
    KDTimer* next = earliestDueLocked(c, static_cast<KDust>(-1), self);
    if (next == nullptr) {
        return -1;
    }
    const KDust now = currentTime(c);
    return next->due > now ? static_cast<KDint64>(next->due - now) : 0;
}

ActionId scheduleAction(KDThread* owner, KDust delay, std::function<void()> action) {
    KDTimer* timer =
        addTimer(owner, static_cast<KDint64>(delay), KD_TIMER_ONESHOT, nullptr, std::move(action));
    if (owner != kdThreadSelf()) {
        owner->queueChanged.notify_all();  // its wait may need to end sooner now
    }
    return timer->id;
}

void cancelAction(ActionId id) {
    Clock& c = theClock();
    KDTimer* found = nullptr;
    {
        std::lock_guard<std::mutex> lock(c.mutex);
        for (KDTimer* timer : c.timers) {
            if (timer->id == id && timer->action) {
                found = timer;
            }
        }
    }
    if (found != nullptr) {
        removeTimer(found);
    }
}

}  // namespace pal::detail

namespace pal {

void useVirtualClock(KDust startUst, KDtime wallSeconds) {
    Clock& c = theClock();
    std::lock_guard<std::mutex> lock(c.mutex);
    c.isVirtual = true;
    c.virtualNow = startUst;
    c.virtualStart = startUst;
    c.wallAtStart = wallSeconds;
}

void useRealClock() {
    Clock& c = theClock();
    std::lock_guard<std::mutex> lock(c.mutex);
    c.isVirtual = false;
}

bool isVirtualClock() {
    return theClock().isVirtual.load();
}

void advanceTime(KDust nanoseconds) {
    Clock& c = theClock();
    KDThread* self = kdThreadSelf();
    if (self == nullptr) {
        return;
    }
    KDust target;
    {
        std::lock_guard<std::mutex> lock(c.mutex);
        KD_ASSERT(c.isVirtual);
        target = c.virtualNow + nanoseconds;
    }
    for (;;) {
        KDEvent* event = nullptr;
        KDThread* owner = nullptr;
        {
            std::lock_guard<std::mutex> lock(c.mutex);
            KDTimer* timer = earliestDueLocked(c, target, nullptr);
            if (timer == nullptr) {
                c.virtualNow = target;
                break;
            }
            c.virtualNow = std::max(c.virtualNow.load(), timer->due);
            owner = timer->owner;
            event = fireLocked(c, timer, c.virtualNow.load());
        }
        detail::post(owner, event);
        if (owner == self) {
            detail::pumpThread(self);
        }
    }
    detail::pumpThread(self);
    detail::wakeAllThreads();
}

int activeTimerCount() {
    Clock& c = theClock();
    std::lock_guard<std::mutex> lock(c.mutex);
    return static_cast<int>(
        std::count_if(c.timers.begin(), c.timers.end(), [](KDTimer* t) { return t->active; }));
}

std::uint64_t timerFireCount() {
    Clock& c = theClock();
    std::lock_guard<std::mutex> lock(c.mutex);
    return c.fireCount;
}

namespace detail {

void resetTimerFireCount() {
    Clock& c = theClock();
    std::lock_guard<std::mutex> lock(c.mutex);
    c.fireCount = 0;
}

}  // namespace detail

}  // namespace pal

extern "C" {

KDust kdGetTimeUST(void) {
    return currentTime(theClock());
}

KDtime kdTime(KDtime* timep) {
    KDtime seconds;
    {
        Clock& c = theClock();
        std::lock_guard<std::mutex> lock(c.mutex);
        seconds = c.isVirtual
                      ? c.wallAtStart + static_cast<KDtime>((c.virtualNow - c.virtualStart) / 1000000000ull)
                      : static_cast<KDtime>(::time(nullptr));
    }
    if (timep != nullptr) {
        *timep = seconds;
    }
    return seconds;
}

KDTimer* kdSetTimer(KDint64 interval, KDint periodic, void* eventuserptr) {
    if (periodic != KD_TIMER_ONESHOT && periodic != KD_TIMER_PERIODIC_AVERAGE &&
        periodic != KD_TIMER_PERIODIC_MINIMUM) {
        kdSetError(KD_EINVAL);
        return nullptr;
    }
    KDThread* self = kdThreadSelf();
    if (self == nullptr) {
        return nullptr;
    }
    return addTimer(self, interval, periodic, eventuserptr, nullptr);
}

KDint kdCancelTimer(KDTimer* timer) {
    if (timer == nullptr) {
        kdSetError(KD_EINVAL);
        return -1;
    }
    removeTimer(timer);
    return 0;
}

}  // extern "C"
