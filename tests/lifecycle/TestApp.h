#pragma once

#include <vector>

#include "BaseApp.h"
#include "support/PalTest.h"

// The application of this test binary. The platform layer keeps start hooks
// for the whole process, so it is registered once and its behaviour is set
// per test.
class TestApp : public BaseApp {
public:
    static void registerOnce();
    static TestApp* get() { return static_cast<TestApp*>(BaseApp::get()); }

    // Read at the next start.
    static bool failInit;
    static int destroyedCount;
    // The handler's registrations around the last BaseApp::shutdown().
    static size_t handlerListenersBeforeShutdown;
    static size_t handlerListenersAfterShutdown;

    ~TestApp() override { ++destroyedCount; }

    bool init() override;
    void shutdown() override;
    bool onPaused() override;
    bool onResumed() override;

    std::vector<bool> pausedResults;
    std::vector<bool> resumedResults;

private:
    static BaseApp* make() { return new TestApp(); }
};

// Starts the platform layer with a TestApp.
class LifecycleTest : public PalTest {
protected:
    void beforePalStart() override {
        TestApp::registerOnce();
        TestApp::failInit = failInitOnStart;
    }
    bool failInitOnStart = false;
};
