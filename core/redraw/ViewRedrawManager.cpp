#include "redraw/ViewRedrawManager.h"

#include <KD/kdext.h>

#include <boost/make_shared.hpp>

#include "lifecycle/PauseResumeHandler.h"
#include "redraw/ViewRedrawManagerDelegate.h"

namespace Redraw {

namespace {

const KDint64 kNanosecondsPerMillisecond = 1000000;
const KDint64 kCounterWindowNs = 1000000000;
// Without user input for this long, updates are throttled...
const KDint64 kUserIdleNs = 9999999999ll;
// ...to this period while the view itself is active...
const KDint64 kViewActiveNs = 4999999999ll;
const KDint64 kActiveViewUpdatePeriodNs = 40000000;
// ...and to this one when it is not.
const KDint64 kIdleViewUpdatePeriodNs = 100000000;
const int kMinElapsedMs = 5;
const int kMaxElapsedMs = 200;

// The timer belongs to the main thread, so scheduling from elsewhere is
// reported and refused.
bool isCalledOnMainThread() {
    KD_ASSERT(kdThreadIsMainZVR());
    return kdThreadIsMainZVR();
}

int clampedElapsedMs(KDint64 deltaNs) {
    KDint64 elapsed = deltaNs / kNanosecondsPerMillisecond;
    if (elapsed < kMinElapsedMs) {
        return kMinElapsedMs;
    }
    if (elapsed > kMaxElapsedMs) {
        return kMaxElapsedMs;
    }
    return static_cast<int>(elapsed);
}

}  // namespace

ViewRedrawManager::ViewRedrawManager(ViewRedrawManagerDelegate& delegate)
    : delegate(delegate),
      pauseResumeListenerWrapper(boost::make_shared<Lifecycle::PauseResumeListenerWrapper>(this)),
      timer(callback<void (*)()>::make<ViewRedrawManager, &ViewRedrawManager::tick>(this)),
      lastTickTime(now()),
      lastUserActivityTime(lastTickTime),
      lastViewActivityTime(lastTickTime),
      fps(0),
      redrawCounter(0),
      ups(0),
      updateCounter(0),
      counterWindowStart(lastTickTime),
      updateGeneratorCount(0),
      updateScheduled(false),
      redrawScheduled(false),
      isViewPaused(true),
      destroyedDuringTick(nullptr),
      lifetime(boost::make_shared<bool>(true)) {
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    KD_ASSERT(handler != nullptr);
    if (handler != nullptr) {
        handler->addListener(pauseResumeListenerWrapper);
    }
}

ViewRedrawManager::~ViewRedrawManager() {
    if (destroyedDuringTick != nullptr) {
        *destroyedDuringTick = true;
    }
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr) {
        handler->removeListener(pauseResumeListenerWrapper.get());
    }
}

KDint64 ViewRedrawManager::now() {
    return static_cast<KDint64>(kdGetTimeUST());
}

void ViewRedrawManager::startTimerIfNot() {
    if (!isCalledOnMainThread()) {
        return;
    }
    if (!timer.isStarted()) {
        timer.start(Util::Timer::PeriodicAverage, kTickIntervalNs);
    }
}

void ViewRedrawManager::scheduleRedraw() {
    if (!isCalledOnMainThread()) {
        return;
    }
    redrawScheduled = true;
    startTimerIfNot();
}

void ViewRedrawManager::scheduleUpdate() {
    if (!isCalledOnMainThread()) {
        return;
    }
    // Measured from now, not from a tick long ago: an update after an idle
    // spell is one step, not a jump.
    if (updateGeneratorCount == 0 && !updateScheduled) {
        lastTickTime = now();
        startTimerIfNot();
    }
    updateScheduled = true;
}

void ViewRedrawManager::increaseUpdateGeneratorCount() {
    if (!isCalledOnMainThread()) {
        return;
    }
    if (updateGeneratorCount == 0) {
        if (updateScheduled) {
            updateGeneratorCount = 1;
            return;
        }
        lastTickTime = now();
        startTimerIfNot();
    }
    ++updateGeneratorCount;
    KD_ASSERT(updateGeneratorCount > 0);
}

void ViewRedrawManager::decreaseUpdateGeneratorCount() {
    if (!isCalledOnMainThread()) {
        return;
    }
    --updateGeneratorCount;
    KD_ASSERT(updateGeneratorCount >= 0);
    if (updateGeneratorCount < 0) {
        updateGeneratorCount = 0;
    }
}

void ViewRedrawManager::onUserActivity() {
    lastUserActivityTime = now();
}

void ViewRedrawManager::onViewActivity() {
    lastViewActivityTime = now();
}

KDint64 ViewRedrawManager::getMinUpdatePeriod() const {
    KDint64 time = now();
    if (time - lastUserActivityTime <= kUserIdleNs) {
        return 0;
    }
    if (time - lastViewActivityTime <= kViewActiveNs) {
        return kActiveViewUpdatePeriodNs;
    }
    return kIdleViewUpdatePeriodNs;
}

// The delegate may hide the view and so destroy this manager from inside
// update() or redraw(): after each call nothing of this is touched when the
// destructor has run meanwhile. A delegate that pumps events may run a tick
// inside this one; both learn of the destruction.
void ViewRedrawManager::tick() {
    KDint64 time = now();
    KDint64 delta = time - lastTickTime;
    KD_ASSERT(delta >= 0);
    if (delta <= getMinUpdatePeriod()) {
        return;
    }
    lastTickTime = time;
    rollCounterWindow(time);
    bool destroyed = false;
    bool* const outerTick = destroyedDuringTick;
    destroyedDuringTick = &destroyed;
    if (updateScheduled || updateGeneratorCount > 0) {
        updateScheduled = false;
        delegate.update(clampedElapsedMs(delta));
        if (destroyed) {
            reportDestroyed(outerTick);
            return;
        }
        ++updateCounter;
    } else {
        // Nothing left to animate: the next schedule call starts it again.
        timer.cancel();
    }
    if (redrawScheduled) {
        redrawScheduled = false;
        delegate.redraw();
        if (destroyed) {
            reportDestroyed(outerTick);
            return;
        }
        ++redrawCounter;
    }
    destroyedDuringTick = outerTick;
}

void ViewRedrawManager::reportDestroyed(bool* outerTick) {
    if (outerTick != nullptr) {
        *outerTick = true;
    }
}

void ViewRedrawManager::rollCounterWindow(KDint64 time) {
    if (time - counterWindowStart <= kCounterWindowNs) {
        return;
    }
    counterWindowStart = time;
    fps = redrawCounter;
    ups = updateCounter;
    redrawCounter = 0;
    updateCounter = 0;
}

bool ViewRedrawManager::onViewPaused() {
    if (isViewPaused) {
        return false;
    }
    isViewPaused = true;
    timer.cancel();
    return true;
}

bool ViewRedrawManager::onViewResumed() {
    if (!isViewPaused) {
        return false;
    }
    fps = 0;
    redrawCounter = 0;
    ups = 0;
    updateCounter = 0;
    KDint64 time = now();
    counterWindowStart = time;
    lastTickTime = time;
    lastViewActivityTime = time;
    startTimerIfNot();
    isViewPaused = false;
    return true;
}

}  // namespace Redraw
