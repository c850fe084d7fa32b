// The startup cycle against the development server, as an application runs
// it: the application names only the startup host; the first start has no
// client identifier, so two requests go out back to back (the second with the
// identifier the first answer gave); a simulated resume then sends one more.
// The answer points every host at the server and switches on the statistics
// collector, registered here as a startup feature, with short periods: from
// then on it collects chunks and uploads them in the background.
#include <pal/Simulation.h>
#include <tinyxml.h>

#include <boost/make_shared.hpp>
#include <string>

#include "DemoScene.h"
#include "devserver/Server.h"
#include "startup/StartupController.h"
#include "startup/StartupData.h"
#include "startup/StartupListener.h"
#include "statistics/wifipool/NetworkCollectorWrapper.h"
#include "util/Timer.h"

namespace {

using Startup::StartupData;

class StartupScene;

// Hears the complete answers for the scene. Main thread.
class ReadyListener : public Startup::StartupListener {
public:
    explicit ReadyListener(StartupScene* scene) : scene(scene) {}
    void onStartupReady() override;

private:
    StartupScene* scene;
};

// Main thread.
class StartupScene : public DemoScene {
public:
    StartupScene()
        : readyCount(0),
          resumeTimer(callback<void (*)()>::make<StartupScene, &StartupScene::simulateResume>(this)) {}

    ~StartupScene() override {
        if (collector) {
            collector->shutdown();
        }
    }

    void run(Done done) override {
        finished = done;
        // What the radios report to the startup listeners and, later, to the
        // collector's chunks: the car parked at the start of the drive.
        pal::scriptSignalStrength(pal::Answer::after(5 * 1000000ull), true, -71);
        pal::scriptCellInfo(pal::Answer::after(5 * 1000000ull), {true, 23010, 4021, "26201", "262"});
        pal::scriptWifiScan(
            pal::Answer::after(20 * 1000000ull),
            {{"00:1A:2B:00:00:01", "Caf\xC3\xA9 & Bar", -48}, {"00:1A:2B:00:00:02", "home", -80}});

        const std::string host = demo::server().baseUrl();
        demo::say("the application names one host, the startup host: %s", host.c_str());
        StartupData::getInstance()->setHost(StartupData::HOST_STARTUP, host);
        listener = boost::make_shared<ReadyListener>(this);
        collector = boost::make_shared<Statistics::NetworkCollectorWrapper>();
        collector->setModel("Demo \"Phone\" <A&B>");
        collector->setManufacter("mapcore");
        collector->setAppVersion("1.0");
        collector->setAppPlatform("android");
        collector->enableByUser(true);
        demo::say("the statistics collector registers as a startup feature; the first cycle starts");
        Startup::StartupController* controller = Startup::StartupController::getInstance();
        controller->updateClientStartupParams({{"client", "demo"}});
        collector->init();
        controller->addListener(listener);
    }

    void onReady() {
        ++readyCount;
        const StartupData* data = StartupData::getInstance();
        demo::say("startup ready #%d; uuid %s, lang %s", readyCount, data->uuid.c_str(), data->lang.c_str());
        for (const char* type :
             {StartupData::HOST_CELLID, StartupData::HOST_DEFAULT, StartupData::HOST_TILES}) {
            demo::say("  host %-8s -> %s", type, data->getHost(type).c_str());
        }
        const Statistics::NetworkCollector& running = collector->getNetworkCollector();
        demo::say("  statistics collector %s by the answer: chunks every %lld s, uploads every %lld s",
                  running.isStarted() ? "switched on" : "left off",
                  static_cast<long long>(running.getScanTimeout()),
                  static_cast<long long>(running.getSendTimeout()));
        if (readyCount == 1) {
            resumeTimer.start(Util::Timer::OneShot, 0);
            return;
        }
        const DevServer::Journal journal = demo::server().journal();
        for (const DevServer::StartupRecord& record : journal.startups) {
            demo::say("  server saw a startup request with uuid [%s], answered uuid %s, %zu parameters",
                      record.sentUuid.c_str(), record.answeredUuid.c_str(), record.params.size());
        }
        Startup::StartupController::getInstance()->removeListener(listener.get());
        finished();
    }

private:
    void simulateResume() {
        demo::say("simulating the platform sending the app to the background and back: one more cycle");
        pal::postAppPaused();
        pal::postAppResumed();
    }

    Done finished;
    int readyCount;
    boost::shared_ptr<ReadyListener> listener;
    boost::shared_ptr<Statistics::NetworkCollectorWrapper> collector;
    Util::Timer resumeTimer;
};

void ReadyListener::onStartupReady() {
    scene->onReady();
}

DemoSceneRegistration<StartupScene> registration("Startup", 58);

}  // namespace
