#pragma once

#include <KD/kd.h>

#include "util/callback.h"

namespace Util {

// A platform timer delivered as event 42 to the thread that constructed it;
// construct, start, cancel and destroy it on that thread only.
class Timer {
public:
    typedef int TimerType;
    static constexpr TimerType OneShot = KD_TIMER_ONESHOT;
    static constexpr TimerType PeriodicAverage = KD_TIMER_PERIODIC_AVERAGE;
    static constexpr TimerType PeriodicMinimum = KD_TIMER_PERIODIC_MINIMUM;

    explicit Timer(callback<void (*)()> onFired);
    ~Timer();

    // Restarts the timer if it runs. Intervals are nanoseconds. Called on
    // another thread, it asserts and changes nothing.
    void start(TimerType timerType, long long intervalNs);
    void cancel();
    bool isStarted() const { return timer != nullptr; }

    static void firedWrapper(const KDEvent* event);

private:
    Timer(const Timer&) = delete;
    Timer& operator=(const Timer&) = delete;

    KDThread* const ownerThread;
    TimerType type;
    callback<void (*)()> onFired;
    KDTimer* timer;
};

}  // namespace Util
