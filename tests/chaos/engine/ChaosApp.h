#pragma once

#include <functional>

#include "BaseApp.h"

// The scenario's application object, made by the platform layer's start hook
// in every life. Tells the scenario when the application is paused and
// resumed, as an application forwards these to the features it owns. Main
// thread only.
class ChaosApp : public BaseApp {
public:
    typedef std::function<void(bool paused)> PauseHook;

    // Registers the factory once per process, before the first start.
    static void registerOnce();
    // The running application, or null outside a life.
    static ChaosApp* running() { return current; }

    ~ChaosApp() override;

    void setPauseHook(PauseHook hook) { pauseHook = hook; }
    bool onPaused() override;
    bool onResumed() override;

private:
    ChaosApp();
    static BaseApp* make();

    static ChaosApp* current;
    PauseHook pauseHook;
};
