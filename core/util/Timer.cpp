#include "util/Timer.h"

namespace Util {

Timer::Timer(callback<void (*)()> onFired)
    : ownerThread(kdThreadSelf()), type(OneShot), onFired(onFired), timer(nullptr) {
    kdInstallCallback(&Timer::firedWrapper, KD_EVENT_TIMER, this);
}

Timer::~Timer() {
    cancel();
    kdInstallCallback(nullptr, KD_EVENT_TIMER, this);
}

void Timer::start(TimerType timerType, long long intervalNs) {
    // A platform timer fires on the thread that sets it, and only the owner
    // has our handler installed: set anywhere else it would never fire, yet
    // count as started.
    KD_ASSERT(kdThreadSelf() == ownerThread);
    if (kdThreadSelf() != ownerThread) {
        return;
    }
    cancel();
    type = timerType;
    timer = kdSetTimer(intervalNs, timerType, this);
}

void Timer::cancel() {
    if (timer != nullptr) {
        kdCancelTimer(timer);
        timer = nullptr;
    }
}

void Timer::firedWrapper(const KDEvent* event) {
    Timer* self = static_cast<Timer*>(event->userptr);
    // Cancelling discards queued firings, so this only guards against a
    // firing that the platform layer delivered after all.
    if (!self->isStarted()) {
        return;
    }
    // A one-shot timer is idle while its callback runs, so the callback may
    // start it again. The callback may also delete this timer: nothing of
    // self is touched after the call.
    if (self->type == OneShot) {
        self->cancel();
    }
    self->onFired();
}

}  // namespace Util
