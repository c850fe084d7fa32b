#include "BaseApp.h"

#include <KD/kdext.h>
#include <google/protobuf/stubs/common.h>

#include <algorithm>
#include <boost/make_shared.hpp>

#include "BaseView.h"
#include "lifecycle/PauseResumeHandler.h"
#include "util/Logger.h"

namespace {

const KDint kAppOrder = 0;
const KDust kNanosecondsPerMillisecond = 1000000;

int millisecondsSince(KDust start) {
    return static_cast<int>((kdGetTimeUST() - start) / kNanosecondsPerMillisecond);
}

// The log format is 32 bits wide; on 64-bit targets the address is truncated.
unsigned addressForLog(const void* pointer) {
    return static_cast<unsigned>(reinterpret_cast<uintptr_t>(pointer));
}

}  // namespace

BaseApp::Factory BaseApp::factory = nullptr;
BaseApp* BaseApp::app = nullptr;

int BaseApp::globalInit(Factory newFactory) {
    KD_ASSERT(factory == nullptr);
    KD_ASSERT(newFactory != nullptr);
    if (factory != nullptr || newFactory == nullptr) {
        return -1;
    }
    factory = newFactory;
    kdAddPalCallbacksZVR(&BaseApp::onPalStart, &BaseApp::onPalShutdown, kAppOrder, nullptr);
    return 0;
}

BaseApp* BaseApp::create() {
    KD_ASSERT(factory != nullptr);
    return factory != nullptr ? factory() : nullptr;
}

BaseApp* BaseApp::get() {
    KD_ASSERT(app != nullptr);
    return app;
}

void BaseApp::onPalStart(void*) {
    Logger::log(Logger::Info, "kdInitZVR");
    KDust start = kdGetTimeUST();
    // Stored before init() so that code run by init() can reach the app.
    app = create();
    if (app == nullptr || !app->init()) {
        Logger::log(Logger::Error, "Could not init app");
        kdExit(-1);
        return;
    }
    Logger::log(Logger::Info, "Time to load: %i ms", millisecondsSince(start));
}

void BaseApp::onPalShutdown(void*) {
    Logger::log(Logger::Info, "kdShutdownZVR");
    if (app == nullptr) {
        return;
    }
    app->shutdown();
    delete app;
    app = nullptr;
}

BaseApp::BaseApp() : isPaused(false) {}

BaseApp::~BaseApp() {}

bool BaseApp::init() {
    Logger::log(Logger::Info, "BaseApp::init");
    kdInstallCallback(&FileSystemMountEventDispatcher::onFileSystemUmountEventWrapper,
                      KD_EVENT_FS_UNMOUNTED_ZVR, nullptr);
    kdInstallCallback(&FileSystemMountEventDispatcher::onFileSystemMountEventWrapper, KD_EVENT_FS_MOUNTED_ZVR,
                      nullptr);
    // Paused until the platform reports the first resume.
    isPaused = true;
    pauseResumeListenerWrapper = boost::make_shared<Lifecycle::PauseResumeListenerWrapper>(this);
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    KD_ASSERT(handler != nullptr);
    if (handler != nullptr) {
        handler->addListener(pauseResumeListenerWrapper);
    }
    return true;
}

void BaseApp::shutdown() {
    google::protobuf::ShutdownProtobufLibrary();
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr && pauseResumeListenerWrapper) {
        handler->removeListener(pauseResumeListenerWrapper.get());
    }
    pauseResumeListenerWrapper.reset();
}

bool BaseApp::onPaused() {
    if (isPaused) {
        return false;
    }
    isPaused = true;
    return true;
}

bool BaseApp::onResumed() {
    if (!isPaused) {
        return false;
    }
    isPaused = false;
    return true;
}

BaseView* BaseApp::getCurrentView() {
    KD_ASSERT(!runningViews.empty());
    return runningViews.empty() ? nullptr : runningViews.front();
}

void BaseApp::showView(BaseView* view) {
    Logger::log(Logger::Info, "BaseApp::showView 0x%X", addressForLog(view));
    KDust start = kdGetTimeUST();
    bool running = std::find(runningViews.begin(), runningViews.end(), view) != runningViews.end();
    KD_ASSERT(!running);
    if (running) {
        return;
    }
    runningViews.push_back(view);
    if (!view->init()) {
        Logger::log(Logger::Error, "Could not init view");
        kdExit(-1);
        return;
    }
    view->resumeIfViewRunning();
    Logger::log(Logger::Info, "BaseApp::showView: Time to show: %i ms", millisecondsSince(start));
}

void BaseApp::hideView(BaseView* view) {
    Logger::log(Logger::Info, "BaseApp::hideView 0x%X", addressForLog(view));
    // Hidden again from its own shutdown(), a view would shut down forever.
    const bool beingHidden =
        std::find(viewsBeingHidden.begin(), viewsBeingHidden.end(), view) != viewsBeingHidden.end();
    KD_ASSERT(!beingHidden && "a view is not hidden again from inside its own shutdown()");
    if (beingHidden) {
        return;
    }
    std::vector<BaseView*>::iterator it = std::find(runningViews.begin(), runningViews.end(), view);
    KD_ASSERT(it != runningViews.end());
    if (it == runningViews.end()) {
        return;
    }
    viewsBeingHidden.push_back(view);
    view->shutdown();
    viewsBeingHidden.pop_back();
    // shutdown() may have shown or hidden other views.
    runningViews.erase(std::remove(runningViews.begin(), runningViews.end(), view), runningViews.end());
}
