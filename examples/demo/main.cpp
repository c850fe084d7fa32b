// The demo application: the platform layer runs it as it would on a device,
// on the real clock, against the development server started in this process
// on a free loopback port. It resumes, runs every registered scene in order,
// pauses and exits; each step is printed as it happens, and a summary of what
// the server received and what was written closes the run.

#include <KD/kd.h>
#include <pal/Simulation.h>
#include <stdlib.h>

#include <atomic>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "BaseApp.h"
#include "DemoScene.h"
#include "DemoSummary.h"
#include "devserver/Server.h"
#include "lifecycle/PauseResumeHandler.h"
#include "util/Timer.h"

namespace {

const long long kSceneTimeoutNs = 10ll * 1000000000ll;

// Scenes that did not finish in time; the run then fails. Main thread.
std::vector<std::string> lateScenes;

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
        lateScenes.push_back(current->name);
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

std::string makeTempFolder(const char* prefix) {
    std::string pattern =
        (std::filesystem::temp_directory_path() / (std::string(prefix) + "XXXXXX")).string();
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    return mkdtemp(buffer.data()) != nullptr ? std::string(buffer.data()) : std::string();
}

const int registered = BaseApp::globalInit(&DemoApp::make);

// Routine debug lines of the services that run in the background (the
// statistics collector ticks every second); shown with --verbose.
bool isRoutine(const char* line) {
    static const char* const prefixes[] = {
        "NetworkCollector", "WifiPoolChunk::",        "NetworkSpeedCollectorImpl::",
        "StartupFeature::", "StartupRequest: param[", "LbsNetworkRequest"};
    for (const char* prefix : prefixes) {
        if (std::strncmp(line, prefix, std::strlen(prefix)) == 0) {
            return true;
        }
    }
    return false;
}

std::atomic<int> hiddenLogLines(0);

// The server's radio table and switches for the demo's simulated device.
bool loadServerConfig(DevServer::Config& config) {
    const std::string path = MAPCORE_DEMO_DATA "/devserver.conf";
    std::string error;
    config = DevServer::Config::defaults();
    if (!DevServer::Config::load(path, config, error)) {
        demo::say("cannot use the server configuration: %s", error.c_str());
        return false;
    }
    demo::say("main: server configuration %s: %zu access points, %zu cells", path.c_str(),
              config.accessPoints.size(), config.cells.size());
    return true;
}

// Every upload comes from our own collector, so a refusal is a fault of the
// library or the server, and a run without any upload showed nothing.
bool allUploadsDecoded(const DevServer::Journal& journal) {
    for (const DevServer::UploadRecord& upload : journal.uploads) {
        if (!upload.accepted) {
            return false;
        }
    }
    return !journal.uploads.empty();
}

// The application's run between a started and a stopped server.
int runApplication(const std::string& output) {
    DevServer::Config config;
    if (!loadServerConfig(config)) {
        return 1;
    }
    const std::string dataFolder = output + "/devserver";
    DevServer::Server server(config, dataFolder);
    server.setSummarySink([](const std::string& line) { demo::say("  server| %s", line.c_str()); });
    server.setLogSink([](const std::string& line) { demo::say("  server log| %s", line.c_str()); });
    if (!server.start()) {
        demo::say("cannot start the development server on 127.0.0.1");
        return 1;
    }
    demo::say("main: development server on %s, data folder %s", server.baseUrl().c_str(), dataFolder.c_str());
    demo::setEnvironment(&server, output);
    const std::filesystem::file_time_type started = std::filesystem::file_time_type::clock::now();
    demo::say("main: pal::run() starts the platform layer");
    int status = pal::run();
    demo::say("main: pal::run() returned %d", status);
    const std::string baseUrl = server.baseUrl();
    server.stop();
    const DevServer::Journal journal = server.journal();
    demo::printSummary(baseUrl, journal, dataFolder, started);
    demo::setEnvironment(nullptr, output);
    if (!allUploadsDecoded(journal)) {
        demo::say("the server did not decode every upload of the statistics collector");
        status = status == 0 ? 1 : status;
    }
    for (const std::string& name : lateScenes) {
        demo::say("scene \"%s\" did not finish in time", name.c_str());
        status = status == 0 ? 1 : status;
    }
    return status;
}

}  // namespace

int main(int argc, char** argv) {
    std::string output;
    bool verbose = false;
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--output") == 0 && i + 1 < argc) {
            output = argv[++i];
        } else if (std::strcmp(argv[i], "--verbose") == 0) {
            verbose = true;
        } else {
            std::printf(
                "usage: %s [--output FOLDER] [--verbose]\n"
                "Runs the library end to end against the development server on 127.0.0.1.\n"
                "What the run writes (frames, uploads the server stored) goes to FOLDER,\n"
                "by default a new folder under the system's temporary folder.\n"
                "--verbose also prints the routine log lines of the background services.\n",
                argv[0]);
            return std::strcmp(argv[i], "--help") == 0 ? 0 : 2;
        }
    }
    std::error_code error;
    if (output.empty()) {
        output = makeTempFolder("mapcore-demo-out-");
    } else {
        std::filesystem::create_directories(output, error);
    }
    if (output.empty() || error) {
        demo::say("cannot create the output folder %s", output.c_str());
        return 1;
    }
    std::string root = makeTempFolder("mapcore-demo-device-");
    if (root.empty()) {
        demo::say("cannot create a temporary folder");
        return 1;
    }
    pal::setFileRoot(root);
    pal::setLogSink([verbose](const char* line) {
        if (!verbose && isRoutine(line)) {
            ++hiddenLogLines;
            return;
        }
        demo::say("  log| %s", line);
    });
    demo::say("main: device files under %s, output in %s, real clock; BaseApp::globalInit returned %d",
              root.c_str(), output.c_str(), registered);
    int status = runApplication(output);
    pal::setLogSink(pal::LogSink());
    if (hiddenLogLines > 0) {
        demo::say("%d routine log lines of the background services not shown (--verbose shows them)",
                  hiddenLogLines.load());
    }
    std::filesystem::remove_all(root, error);
    return status;
}
