#pragma once

#include <boost/shared_ptr.hpp>
#include <vector>

#include "FileSystemMountEventDispatcher.h"
#include "lifecycle/PauseResumeListener.h"
#include "lifecycle/PauseResumeListenerWrapper.h"

class BaseView;

// The application object: made by the embedding application's factory when
// the platform layer starts, deleted at its shutdown. Keeps the running views
// (not owned). Main thread only.
class BaseApp : public Lifecycle::PauseResumeListener {
public:
    typedef BaseApp* (*Factory)();

    // Called once, before the platform layer starts. Returns 0, or -1 when
    // the call is refused (a factory is already set, or none is given).
    static int globalInit(Factory factory);
    static BaseApp* create();
    // The running application; null (after an assertion) outside its life.
    static BaseApp* get();

    ~BaseApp() override;

    // The earliest shown of the running views.
    BaseView* getCurrentView();
    void showView(BaseView* view);
    void hideView(BaseView* view);

    FileSystemMountEventDispatcher* getFileSystemEventDispatcher() { return &fileSystemEventDispatcher; }
    bool getIsPaused() const { return isPaused; }

    // False when the state did not change.
    bool onPaused() override;
    bool onResumed() override;

    // Subclasses extend these and call the base versions.
    virtual bool init();
    virtual void shutdown();

protected:
    BaseApp();

private:
    BaseApp(const BaseApp&) = delete;
    BaseApp& operator=(const BaseApp&) = delete;

    static void onPalStart(void* userdata);
    static void onPalShutdown(void* userdata);

    std::vector<BaseView*> runningViews;
    // Views whose shutdown() runs, innermost last.
    std::vector<BaseView*> viewsBeingHidden;
    FileSystemMountEventDispatcher fileSystemEventDispatcher;
    boost::shared_ptr<Lifecycle::PauseResumeListenerWrapper> pauseResumeListenerWrapper;
    bool isPaused;

    static Factory factory;
    static BaseApp* app;
};
