#pragma once

#include "lifecycle/PauseResumeListener.h"

namespace Lifecycle {

// The object a listener registers with the handler: the listener owns it
// through a shared_ptr, so the handler's weak entry expires together with the
// listener. Main thread only.
class PauseResumeListenerWrapper : public PauseResumeListener {
public:
    explicit PauseResumeListenerWrapper(PauseResumeListener* listener) : listener(listener) {}

    bool onPaused() override { return listener->onPaused(); }
    bool onResumed() override { return listener->onResumed(); }
    bool onViewPaused() override { return listener->onViewPaused(); }
    bool onViewResumed() override { return listener->onViewResumed(); }

private:
    PauseResumeListener* listener;
};

}  // namespace Lifecycle
