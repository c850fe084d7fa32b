#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>

#include "lifecycle/PauseResumeListener.h"
#include "lifecycle/PauseResumeListenerWrapper.h"
#include "util/Timer.h"

namespace Redraw {

class ViewRedrawManagerDelegate;

// Decides when a view is updated and redrawn. A 60 Hz timer runs only while
// an update or redraw is pending or an UpdateGenerator exists; updates are
// throttled when the user has been idle for a while. Main thread only
// (asserted).
class ViewRedrawManager : public Lifecycle::PauseResumeListener {
public:
    static constexpr long long kTickIntervalNs = 16666666;

    explicit ViewRedrawManager(ViewRedrawManagerDelegate& delegate);
    ~ViewRedrawManager() override;

    void scheduleRedraw();
    void scheduleUpdate();
    void increaseUpdateGeneratorCount();
    void decreaseUpdateGeneratorCount();

    // Input from the user lifts the throttle at once.
    void onUserActivity();
    // Activity of the view itself keeps the lighter throttle.
    void onViewActivity();

    // Redraws and updates counted over the last full second of ticking.
    int getFPS() const { return fps; }
    int getUPS() const { return ups; }
    // Minimum time between two updates, in nanoseconds.
    KDint64 getMinUpdatePeriod() const;
    bool getIsTimerStarted() const { return timer.isStarted(); }
    // Expires when the manager is destroyed; lets an UpdateGenerator outlive
    // it (the view was hidden while an animation ran).
    boost::weak_ptr<void> getLifetime() const { return lifetime; }

    void startTimerIfNot();
    // The timer's callback.
    void tick();

    bool onViewPaused() override;
    bool onViewResumed() override;

private:
    ViewRedrawManager(const ViewRedrawManager&) = delete;
    ViewRedrawManager& operator=(const ViewRedrawManager&) = delete;

    static KDint64 now();
    void rollCounterWindow(KDint64 time);
    static void reportDestroyed(bool* outerTick);

    ViewRedrawManagerDelegate& delegate;
    boost::shared_ptr<Lifecycle::PauseResumeListenerWrapper> pauseResumeListenerWrapper;
    Util::Timer timer;
    KDint64 lastTickTime;
    KDint64 lastUserActivityTime;
    KDint64 lastViewActivityTime;
    int fps;
    int redrawCounter;
    int ups;
    int updateCounter;
    KDint64 counterWindowStart;
    int updateGeneratorCount;
    bool updateScheduled;
    bool redrawScheduled;
    bool isViewPaused;
    // Set by the destructor when a delegate call destroyed this manager (the
    // application hid the view from update or redraw); null outside tick().
    bool* destroyedDuringTick;
    boost::shared_ptr<void> lifetime;
};

}  // namespace Redraw
