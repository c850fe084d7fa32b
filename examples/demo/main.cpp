// The demo application: the platform layer runs it as it would on a device,
// on the real clock. It resumes, runs every registered scene in order, pauses
// and exits; each step is printed as it happens.

#include <KD/kd.h>
#include <pal/Simulation.h>
#include <stdlib.h>

#include <filesystem>
#include <string>
#include <vector>

#include "BaseApp.h"
#include "DemoScene.h"
#include "lifecycle/PauseResumeHandler.h"
#include "util/Timer.h"

namespace {

const long long kSceneTimeoutNs = 10ll * 1000000000ll;

class DemoApp;

// One scene's turn; its done callback is bound to this record, so a scene
// that reports after its timeout cannot end the next scene's turn.
struct SceneRun {
    DemoApp* app;
    const char* name;
    DemoScene* scene;
    bool finished;
    void done();
};

// Main thread only, like every application object.
class DemoApp : public BaseApp {
public:
    static BaseApp* make() { return new DemoApp(); }

    DemoApp()
        : entries(demo::scenes()),
          nextEntry(0),
          current(nullptr),
          allScenesDone(false),
          stepTimer(callback<void (*)()>::make<DemoApp, &DemoApp::runNextScene>(this)),
          watchdog(callback<void (*)()>::make<DemoApp, &DemoApp::onSceneTimeout>(this)) {
        demo::say("DemoApp created by the factory (scenes registered: %zu)", entries.size());
    }

    ~DemoApp() override { demo::say("DemoApp deleted"); }

    bool init() override {
        if (!BaseApp::init()) {
            return false;
        }
        demo::say("DemoApp::init: the pause/resume handler (start hook 4) ran before us: %s",
                  Lifecycle::PauseResumeHandler::getInstance() != nullptr ? "yes" : "no");
        demo::say("DemoApp::init: paused until the platform resumes it (getIsPaused() = %s)",
                  getIsPaused() ? "true" : "false");
        demo::say("DemoApp::init: simulating the platform resuming the app (pal::postAppResumed)");
        pal::postAppResumed();
        return true;
    }

    bool onResumed() override {
        bool changed = BaseApp::onResumed();
        demo::say("DemoApp::onResumed -> %s (handler paused: %s)", changed ? "true" : "false",
                  Lifecycle::PauseResumeHandler::getInstance()->getIsAppPaused() ? "true" : "false");
        if (changed && nextEntry == 0) {
            stepTimer.start(Util::Timer::OneShot, 0);
        }
        return changed;
    }

    bool onPaused() override {
        bool changed = BaseApp::onPaused();
        demo::say("DemoApp::onPaused -> %s", changed ? "true" : "false");
        if (changed && allScenesDone) {
            demo::say("DemoApp: calling kdExit(0)");
            kdExit(0);
        }
        return changed;
    }

    void shutdown() override {
        demo::say("DemoApp::shutdown: deleting %zu scenes, newest first", runs.size());
        watchdog.cancel();
        stepTimer.cancel();
        for (std::vector<SceneRun*>::reverse_iterator it = runs.rbegin(); it != runs.rend(); ++it) {
            delete (*it)->scene;
            delete *it;
        }
        runs.clear();
        BaseApp::shutdown();
    }

    void sceneFinished(SceneRun* run) {
        if (run != current) {
            demo::say("scene \"%s\" finished after its timeout; ignored", run->name);
            return;
        }
        demo::say("scene \"%s\" done", run->name);
        watchdog.cancel();
        current = nullptr;
        // The next scene starts from the event loop, not inside the callback
        // of the scene that just finished.
        stepTimer.start(Util::Timer::OneShot, 0);
    }

private:
    void runNextScene() {
        if (nextEntry == entries.size()) {
            allScenesDone = true;
            demo::say("all scenes done; simulating the platform pausing the app (pal::postAppPaused)");
            pal::postAppPaused();
            return;
        }
        const DemoSceneEntry& entry = entries[nextEntry++];
        demo::say("=== scene \"%s\" (order %d) ===", entry.name, entry.order);
        current = new SceneRun{this, entry.name, entry.create(), false};
        runs.push_back(current);
        watchdog.start(Util::Timer::OneShot, kSceneTimeoutNs);
        current->scene->run(DemoScene::Done::make<SceneRun, &SceneRun::done>(current));
    }

    void onSceneTimeout() {
        demo::say("scene \"%s\" did not finish in time; moving on", current->name);
        current = nullptr;
        stepTimer.start(Util::Timer::OneShot, 0);
    }

    std::vector<DemoSceneEntry> entries;
    size_t nextEntry;
    std::vector<SceneRun*> runs;
    SceneRun* current;
    bool allScenesDone;
    Util::Timer stepTimer;
    Util::Timer watchdog;
};

void SceneRun::done() {
    if (!finished) {
        finished = true;
        app->sceneFinished(this);
    }
}

std::string makeTempFolder() {
    std::string pattern = (std::filesystem::temp_directory_path() / "mapcore-demo-XXXXXX").string();
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    return mkdtemp(buffer.data()) != nullptr ? std::string(buffer.data()) : std::string();
}

const int registered = BaseApp::globalInit(&DemoApp::make);

}  // namespace

int main() {
    std::string root = makeTempFolder();
    if (root.empty()) {
        demo::say("cannot create a temporary folder");
        return 1;
    }
    pal::setFileRoot(root);
    pal::setLogSink([](const char* line) { demo::say("  log| %s", line); });
    demo::say("main: file root %s, real clock; BaseApp::globalInit returned %d", root.c_str(), registered);
    demo::say("main: pal::run() starts the platform layer");
    int status = pal::run();
    demo::say("main: pal::run() returned %d", status);
    pal::setLogSink(pal::LogSink());
    std::error_code ignored;
    std::filesystem::remove_all(root, ignored);
    return status;
}
