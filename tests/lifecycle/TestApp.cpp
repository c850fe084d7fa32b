#include "TestApp.h"

#include "lifecycle/PauseResumeHandler.h"

bool TestApp::failInit = false;
int TestApp::destroyedCount = 0;
size_t TestApp::handlerListenersBeforeShutdown = 0;
size_t TestApp::handlerListenersAfterShutdown = 0;

void TestApp::registerOnce() {
    static bool registered = false;
    if (!registered) {
        registered = true;
        BaseApp::globalInit(&TestApp::make);
    }
}

bool TestApp::init() {
    bool ok = BaseApp::init();
    return ok && !failInit;
}

void TestApp::shutdown() {
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    handlerListenersBeforeShutdown = handler != nullptr ? handler->getListenerCount() : 0;
    BaseApp::shutdown();
    handlerListenersAfterShutdown = handler != nullptr ? handler->getListenerCount() : 0;
}

bool TestApp::onPaused() {
    bool changed = BaseApp::onPaused();
    pausedResults.push_back(changed);
    return changed;
}

bool TestApp::onResumed() {
    bool changed = BaseApp::onResumed();
    resumedResults.push_back(changed);
    return changed;
}
