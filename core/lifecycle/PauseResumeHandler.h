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

    static PauseResumeHandler* instance;
    static const int registration;
};

}  // namespace Lifecycle
