#pragma once

#include <KD/kd.h>

#include <boost/weak_ptr.hpp>

#include "lifecycle/PauseResumeListener.h"
#include "util/WeakListenerList.h"

namespace Lifecycle {

// Fans the platform's pause and resume events out to the registered
// listeners. One per process, alive between the platform layer's start and
// shutdown hooks. Main thread only.
class PauseResumeHandler {
public:
    // Null before the platform layer started and after its shutdown.
    static PauseResumeHandler* getInstance();

    virtual ~PauseResumeHandler();

    bool getIsAppPaused() const { return isAppPaused; }
    // The platform view's state as its last event 117 or 118 told (paused
    // until the first 118), for views shown after that event.
    bool getIsViewPaused() const { return isViewPaused; }

    void addListener(const boost::weak_ptr<PauseResumeListener>& listener);
    // Unlinks the first registration of listener; false when there is none.
    bool removeListener(const PauseResumeListener* listener);
    // Registrations held, including expired ones not pruned yet.
    size_t getListenerCount() const { return listeners.size(); }

    static void eventCallbackWrapper(const KDEvent* event);
    void eventCallback(const KDEvent* event);

private:
    PauseResumeHandler();
    PauseResumeHandler(const PauseResumeHandler&) = delete;
    PauseResumeHandler& operator=(const PauseResumeHandler&) = delete;

    static void createHandler(void* userdata);
    static void destroyHandler(void* userdata);
    static int registerWithPlatform();

    Util::WeakListenerList<PauseResumeListener> listeners;
    bool isAppPaused;
    bool isViewPaused;

    static PauseResumeHandler* instance;
    static const int registration;
};

}  // namespace Lifecycle
