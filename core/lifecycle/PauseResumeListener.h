#pragma once

namespace Lifecycle {

// Receives the application's and the view's pause and resume. Called on the
// main thread; the results are informational.
class PauseResumeListener {
public:
    virtual ~PauseResumeListener() {}
    virtual bool onPaused() { return true; }
    virtual bool onResumed() { return true; }
    virtual bool onViewPaused() { return true; }
    virtual bool onViewResumed() { return true; }
};

}  // namespace Lifecycle
