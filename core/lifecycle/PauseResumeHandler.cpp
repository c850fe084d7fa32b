#include "lifecycle/PauseResumeHandler.h"

#include <KD/kdext.h>

namespace Lifecycle {

namespace {

const KDint kHandlerOrder = 4;
const KDint kHandledEvents[] = {KD_EVENT_PAUSE, KD_EVENT_RESUME, KD_EVENT_VIEW_PAUSE_ZVR,
                                KD_EVENT_VIEW_RESUME_ZVR};
const int kHandledEventCount = sizeof(kHandledEvents) / sizeof(kHandledEvents[0]);

bool isPauseResumeEvent(KDint type) {
    for (int i = 0; i < kHandledEventCount; ++i) {
        if (kHandledEvents[i] == type) {
            return true;
        }
    }
    return false;
}

}  // namespace

PauseResumeHandler* PauseResumeHandler::instance = nullptr;

// Registered during static initialisation, before main() calls into the
// platform layer. It lives in this file because every user of the handler
// calls getInstance(), so the linker never drops it from the static library.
const int PauseResumeHandler::registration = PauseResumeHandler::registerWithPlatform();

int PauseResumeHandler::registerWithPlatform() {
    return kdAddPalCallbacksZVR(&PauseResumeHandler::createHandler, &PauseResumeHandler::destroyHandler,
                                kHandlerOrder, nullptr);
}

PauseResumeHandler* PauseResumeHandler::getInstance() {
    return instance;
}

void PauseResumeHandler::createHandler(void*) {
    KD_ASSERT(instance == nullptr);
    // A second start keeps the registrations of the first.
    if (instance == nullptr) {
        instance = new PauseResumeHandler();
    }
}

void PauseResumeHandler::destroyHandler(void*) {
    delete instance;
    instance = nullptr;
}

PauseResumeHandler::PauseResumeHandler() : isAppPaused(true), isViewPaused(true) {
    for (int i = 0; i < kHandledEventCount; ++i) {
        kdInstallCallback(&PauseResumeHandler::eventCallbackWrapper, kHandledEvents[i], nullptr);
    }
}

PauseResumeHandler::~PauseResumeHandler() {
    for (int i = kHandledEventCount - 1; i >= 0; --i) {
        kdInstallCallback(nullptr, kHandledEvents[i], nullptr);
    }
}

void PauseResumeHandler::addListener(const boost::weak_ptr<PauseResumeListener>& listener) {
    listeners.add(listener);
}

bool PauseResumeHandler::removeListener(const PauseResumeListener* listener) {
    return listeners.remove(listener);
}

void PauseResumeHandler::eventCallbackWrapper(const KDEvent* event) {
    KD_ASSERT(instance != nullptr);
    if (instance != nullptr) {
        instance->eventCallback(event);
    }
}

void PauseResumeHandler::eventCallback(const KDEvent* event) {
    KD_ASSERT(isPauseResumeEvent(event->type));
    switch (event->type) {
        case KD_EVENT_PAUSE:
            isAppPaused = true;
            listeners.notifyAll([](PauseResumeListener& listener) { listener.onPaused(); });
            break;
        case KD_EVENT_RESUME:
            isAppPaused = false;
            listeners.notifyAll([](PauseResumeListener& listener) { listener.onResumed(); });
            break;
        case KD_EVENT_VIEW_PAUSE_ZVR:
            isViewPaused = true;
            listeners.notifyAll([](PauseResumeListener& listener) { listener.onViewPaused(); });
            break;
        case KD_EVENT_VIEW_RESUME_ZVR:
            // Set first: a view shown by a listener of this very event is not
            // in the pass and must resume itself.
            isViewPaused = false;
            listeners.notifyAll([](PauseResumeListener& listener) { listener.onViewResumed(); });
            break;
    }
}

}  // namespace Lifecycle
