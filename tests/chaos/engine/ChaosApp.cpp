#include "ChaosApp.h"

ChaosApp* ChaosApp::current = nullptr;

void ChaosApp::registerOnce() {
    static const bool registered = BaseApp::globalInit(&ChaosApp::make) == 0;
    (void)registered;
}

BaseApp* ChaosApp::make() {
    return new ChaosApp();
}

ChaosApp::ChaosApp() {
    current = this;
}

ChaosApp::~ChaosApp() {
    current = nullptr;
}

bool ChaosApp::onPaused() {
    const bool changed = BaseApp::onPaused();
    if (changed && pauseHook) {
        pauseHook(true);
    }
    return changed;
}

bool ChaosApp::onResumed() {
    const bool changed = BaseApp::onResumed();
    if (changed && pauseHook) {
        pauseHook(false);
    }
    return changed;
}
