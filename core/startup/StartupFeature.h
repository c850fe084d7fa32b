#pragma once

#include <boost/enable_shared_from_this.hpp>

#include "lifecycle/PauseResumeListener.h"
#include "startup/StartupListener.h"

namespace Startup {

// A service that runs only while both the user's switch and the server's
// switch (read from the feature's own section of the startup answer) are on.
// Own it through a shared_ptr, call init() to register it with the startup
// controller and the pause/resume handler, and shutdown() before it goes.
// Main thread only.
class StartupFeature : public StartupListener,
                       public Lifecycle::PauseResumeListener,
                       public boost::enable_shared_from_this<StartupFeature> {
public:
    StartupFeature();
    ~StartupFeature() override;

    void parseStartup(const TiXmlDocument& document) override;
    void onStartupReady() override;
    bool onPaused() override = 0;
    bool onResumed() override = 0;

    // Subclasses that override these call the base version.
    virtual void init();
    virtual void shutdown();

    void enableByUser(bool value);
    // Called by the subclass while it reads its section of the answer.
    void enableFromStartup(bool value);

    bool isEnabledByUser() const { return enabledByUser; }
    bool isEnabledFromStartup() const { return enabledFromStartup; }

protected:
    // Both switches are on after a startup answer or a switch-on by the user;
    // may come again while already active.
    virtual void doOnStartupReadyAndEnabled() = 0;
    virtual void doParseStartup(const TiXmlDocument& document) = 0;
    virtual void doOnStopByUser() = 0;

private:
    bool enabledByUser;
    bool enabledFromStartup;
};

}  // namespace Startup
