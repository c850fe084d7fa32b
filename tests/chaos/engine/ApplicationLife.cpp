#include "ApplicationLife.h"

#include <KD/kdext.h>
#include <pal/Simulation.h>
#include <pal/SimulationInput.h>
#include <stdlib.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>

#include "ChaosApp.h"
#include "RealTimeBound.h"
#include "location/LocationManager.h"
#include "network/NetworkManager.h"
#include "network/impl/NetworkManagerImpl.h"
#include "redraw/ViewRedrawManager.h"
#include "startup/StartupController.h"
#include "startup/StartupData.h"
#include "statistics/wifipool/NetworkCollector.h"
#include "util/SingletonStorage.h"

namespace {

const int kPositioningSlots = 3;
const int kIdlePumps = 5;
const std::size_t kRecentLogLines = 40;
const int kDrainRounds = 300;
const KDust kMillisecond = 1000000ull;
const KDust kSecond = 1000 * kMillisecond;
const std::chrono::milliseconds kLongestRealWait(30000);
const KDust kTimeSteps[] = {16666666ull, 100 * kMillisecond, kSecond,
                            5 * kSecond, 15 * kSecond,       61 * kSecond};
const int kContextSizes[][2] = {{480, 800}, {800, 480}, {320, 240}};
// The text of the assertion that hiding a view which is not shown makes.
const char kHideNotShownAssertion[] = "it != runningViews.end()";

enum WatcherAction {
    StopCollectorOnPosition,
    DestroyCollectorOnPosition,
    RemoveWatcherOnPosition,
    ActionCount
};

Network::NetworkManagerImpl* existingManager() {
    return Util::Singleton<Network::NetworkManagerImpl>::getExistingInstance();
}

std::string makeTempFolder() {
    std::string pattern = (std::filesystem::temp_directory_path() / "mapcore-chaos-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) {
        return std::string();
    }
    return pattern;
}

}  // namespace

const ApplicationLife::Step ApplicationLife::kSteps[] = {
    {"advance time", &ApplicationLife::advanceTime},
    {"pause app", &ApplicationLife::pauseApp},
    {"resume app", &ApplicationLife::resumeApp},
    {"pause view", &ApplicationLife::pauseView},
    {"resume view", &ApplicationLife::resumeView},
    {"show view", &ApplicationLife::showView},
    {"hide view", &ApplicationLife::hideView},
    {"arm view re-entry", &ApplicationLife::armView},
    {"touch view", &ApplicationLife::touchView},
    {"change reachability", &ApplicationLife::changeReachability},
    {"toggle offline mode", &ApplicationLife::toggleOfflineMode},
    {"submit task", &ApplicationLife::submitTask},
    {"submit task", &ApplicationLife::submitTask},
    {"cancel task", &ApplicationLife::cancelTask},
    {"release task", &ApplicationLife::releaseTask},
    {"make task ready", &ApplicationLife::makeTaskReady},
    {"submit positioning", &ApplicationLife::submitPositioning},
    {"cancel positioning", &ApplicationLife::cancelPositioning},
    {"drop positioning", &ApplicationLife::dropPositioning},
    {"start location", &ApplicationLife::startLocation},
    {"stop location", &ApplicationLife::stopLocation},
    {"satellite fix", &ApplicationLife::satelliteFix},
    {"satellite status", &ApplicationLife::satelliteStatus},
    {"create collector", &ApplicationLife::createCollector},
    {"stop collector", &ApplicationLife::stopCollector},
    {"destroy collector", &ApplicationLife::destroyCollector},
    {"switch server answer", &ApplicationLife::switchServerAnswer},
    {"wait for answers", &ApplicationLife::waitForAnswers},
    {"hide a view not shown", &ApplicationLife::hideViewNotShown},
    {"fetch startup", &ApplicationLife::fetchStartup},
    {"advance time", &ApplicationLife::advanceTime},
};
const int ApplicationLife::kStepCount = sizeof(kSteps) / sizeof(kSteps[0]);

ApplicationLife::ApplicationLife(ChaosServer& server)
    : server(server),
      taskPool(report),
      watcher([this] { onLocationHeard(); }),
      watcherAction(StopCollectorOnPosition),
      watching(false),
      answer(ChaosServer::Ok),
      reachability(1),
      appPaused(true),
      contextSizeIndex(0),
      steps(0) {
    const char* echo = std::getenv("MAPCORE_CHAOS_LOG");
    echoLog = echo != nullptr && std::string(echo) == "1";
    for (int i = 0; i < kPositioningSlots; ++i) {
        positioning.emplace_back(new PositioningSlot(report));
    }
}

ApplicationLife::~ApplicationLife() {
    if (!fileRoot.empty()) {
        std::error_code ignored;
        std::filesystem::remove_all(fileRoot, ignored);
    }
}

bool ApplicationLife::live(ByteScript& script, int maxSteps) {
    boot();
    startApplication();
    while (report.holds() && steps < maxSteps && !script.exhausted()) {
        ++steps;
        const Step& step = kSteps[script.pick(kStepCount)];
        report.enterStep(steps, step.name);
        if (echoLog) {
            std::fprintf(stderr, "[step %d] %s\n", steps, step.name);
        }
        playStep(step, script);
    }
    report.enterStep(steps + 1, "drain");
    try {
        drain();
    } catch (const std::exception& exception) {
        report.breach(std::string("exception escaped: ") + exception.what());
    }
    report.enterStep(steps + 1, "shut down");
    shutDown();
    return report.holds();
}

void ApplicationLife::playStep(const Step& step, ByteScript& script) {
    // The library promises no exceptions; one that escapes is a finding like any other.
    try {
        (this->*step.play)(script);
        kdPumpEvents();
    } catch (const std::exception& exception) {
        report.breach(std::string("exception escaped: ") + exception.what());
    }
    hiddenThisStep.clear();
    checkInvariants();
}

std::string ApplicationLife::failure() const {
    std::string text = report.first();
    std::lock_guard<std::mutex> lock(recordsMutex);
    text += "\nlast log lines:";
    for (const std::string& line : recentLog) {
        text += "\n  " + line;
    }
    return text;
}

void ApplicationLife::boot() {
    fileRoot = makeTempFolder();
    if (fileRoot.empty()) {
        std::perror("mapcore chaos: cannot create a temporary folder");
        std::abort();
    }
    pal::setFileRoot(fileRoot);
    pal::resetSimulation();
    pal::useVirtualClock();
    pal::setAssertionHandler(
        [this](const char* expression, const char* file, int line) { onAssertion(expression, file, line); });
    pal::setLogSink([this](const char* line) { onLogLine(line); });
    Util::SingletonStorage::resetForNextPalCycle();
    ChaosApp::registerOnce();
    pal::start();
}

void ApplicationLife::startApplication() {
    ChaosApp* app = ChaosApp::running();
    if (app == nullptr) {
        report.breach("the application did not start");
        return;
    }
    app->setPauseHook([this](bool paused) { onAppPauseChanged(paused); });
    Startup::StartupData* startup = Startup::StartupData::getInstance();
    startup->uuid = "chaos-client";
    // The startup cycle has its own tests; here the answer is taken as received.
    startup->startupReady = true;
    setAnswer(ChaosServer::Ok);
    pal::scriptWifiScan(pal::Answer::after(0),
                        {{"00:1a:2b:3c:4d:5e", "chaos", -60}, {"00:1a:2b:3c:4d:5f", "", -85}});
    pal::scriptCellInfo(pal::Answer::after(0), {true, 23010, 4021, "26201", "262"});
    pal::scriptSignalStrength(pal::Answer::after(0), true, -71);
    pal::setReachability(reachability);
    pal::postAppResumed();
    kdPumpEvents();
}

// --- Invariants -------------------------------------------------------------------------------

void ApplicationLife::checkInvariants() {
    checkAssertions();
    if (ChaosTask::liveCount() > kMaxLiveTasks) {
        report.breach(std::to_string(ChaosTask::liveCount()) + " tasks alive");
    }
    Network::NetworkManagerImpl* manager = existingManager();
    if (manager != nullptr && manager->getTaskCount() + manager->getUnreadyCount() > kMaxLiveTasks) {
        report.breach("the network manager holds " + std::to_string(manager->getTaskCount()) + " tasks and " +
                      std::to_string(manager->getUnreadyCount()) + " held back");
    }
    if (taskPool.bufferedBytes() > kMaxQueuedBytes) {
        report.breach(std::to_string(taskPool.bufferedBytes()) + " bytes buffered by tasks");
    }
}

void ApplicationLife::checkAssertions() {
    std::vector<std::string> recorded;
    {
        std::lock_guard<std::mutex> lock(recordsMutex);
        recorded.swap(assertions);
    }
    for (const std::string& assertion : recorded) {
        report.breach("assertion " + assertion);
    }
}

void ApplicationLife::onAssertion(const char* expression, const char* file, int line) {
    if (echoLog) {
        std::fprintf(stderr, "[assertion] %s:%d: %s\n", file, line, expression);
    }
    std::lock_guard<std::mutex> lock(recordsMutex);
    if (!expectedAssertion.empty() && expectedAssertion == expression) {
        expectedAssertion.clear();
        return;
    }
    assertions.push_back(std::string(expression) + " at " + file + ":" + std::to_string(line));
}

void ApplicationLife::onLogLine(const char* line) {
    if (echoLog) {
        std::fprintf(stderr, "[log] %s\n", line);
    }
    std::lock_guard<std::mutex> lock(recordsMutex);
    recentLog.push_back(line);
    if (recentLog.size() > kRecentLogLines) {
        recentLog.pop_front();
    }
}

bool ApplicationLife::networkBusy() const {
    Network::NetworkManagerImpl* manager = existingManager();
    return manager != nullptr &&
           manager->getNetworkActivityStatus() == Network::NetworkManager::NetworkActive;
}

void ApplicationLife::settle() {
    std::unique_ptr<RealTimeBound> bound;
    for (int idlePumps = 0; idlePumps < kIdlePumps;) {
        kdPumpEvents();
        if (!networkBusy()) {
            ++idlePumps;
            continue;
        }
        idlePumps = 0;
        if (!bound) {
            bound.reset(new RealTimeBound(kLongestRealWait));
        }
        kdWaitEvent(static_cast<KDust>(-1));
        if (bound->expired()) {
            report.breach("no answer from the loopback server within 30 s of real time");
            return;
        }
    }
}

// --- The end of a life ---------------------------------------------------------------------------

void ApplicationLife::drain() {
    checkInvariants();
    finishHeldTasks();
    ChaosApp* app = ChaosApp::running();
    for (std::unique_ptr<ChaosView>& view : views) {
        if (view && app != nullptr) {
            app->hideView(view.get());
        }
        view.reset();
    }
    taskPool.releaseAll();
    for (std::unique_ptr<PositioningSlot>& slot : positioning) {
        slot->drop();
    }
    if (watching) {
        Location::LocationManager::getInstance()->removeLocationListener(&watcher);
        watching = false;
    }
    collector.reset();
    // Paused, the location manager's providers stop asking.
    if (!appPaused) {
        pal::postAppPaused();
    }
    Network::NetworkManagerImpl* manager = existingManager();
    int round = 0;
    for (; round < kDrainRounds && report.holds(); ++round) {
        settle();
        endOfflineMode();
        if (manager->getTaskCount() + manager->getUnreadyCount() == 0) {
            break;
        }
        pal::advanceTime(kSecond);
    }
    if (round == kDrainRounds) {
        report.breach("the network manager did not drain: " + std::to_string(manager->getTaskCount()) +
                      " tasks and " + std::to_string(manager->getUnreadyCount()) + " held back after " +
                      std::to_string(kDrainRounds) + " s");
    }
    checkInvariants();
}

// With the network back, the server answering and the application running,
// every task its owner still holds must come to its final callback: a retry
// lost while the application was in the background shows here.
void ApplicationLife::finishHeldTasks() {
    setAnswer(ChaosServer::Ok);
    if (appPaused) {
        pal::postAppResumed();
        kdPumpEvents();
    }
    reachability = 1;
    pal::setReachability(reachability);
    taskPool.readyAll();
    // Held-back tasks are looked at again when offline mode ends.
    Network::NetworkManager::getInstance()->changeOfflineModeStatus(Network::NetworkManager::OfflineModeOn);
    for (int round = 0; round < kDrainRounds && report.holds(); ++round) {
        settle();
        endOfflineMode();
        if (taskPool.unfinishedCount() == 0) {
            return;
        }
        pal::advanceTime(kSecond);
    }
    if (taskPool.unfinishedCount() != 0) {
        report.breach(std::to_string(taskPool.unfinishedCount()) + " held tasks never finished within " +
                      std::to_string(kDrainRounds) + " s with the network and the server back");
    }
}

// Only the application switches offline mode off, as one does that sees the
// network back; a finish made offline and delivered late switches it on again.
void ApplicationLife::endOfflineMode() {
    Network::NetworkManager::getInstance()->changeOfflineModeStatus(Network::NetworkManager::OfflineModeOff);
    kdPumpEvents();
}

void ApplicationLife::shutDown() {
    pal::shutdown();
    checkAssertions();
    checkLeftovers();
    pal::setAssertionHandler(pal::AssertionHandler());
    pal::setLogSink(pal::LogSink());
}

void ApplicationLife::checkLeftovers() {
    if (ChaosTask::liveCount() != 0) {
        report.breach(std::to_string(ChaosTask::liveCount()) + " tasks alive after shutdown");
    }
    if (pal::activeTimerCount() != 0) {
        report.breach(std::to_string(pal::activeTimerCount()) + " timers left after shutdown");
    }
    if (pal::reachabilityListeners() != 0) {
        report.breach("reachability still listened to after shutdown");
    }
    if (pal::isLocationStarted()) {
        report.breach("satellite location still started after shutdown");
    }
    if (pal::unreleasedRecords() != 0 || pal::pendingWifiScans() != 0 ||
        pal::pendingCellInfoRequests() != 0 || pal::pendingSignalStrengthRequests() != 0) {
        report.breach("radio requests or records left after shutdown");
    }
}

// --- Steps -----------------------------------------------------------------------------------------

void ApplicationLife::advanceTime(ByteScript& script) {
    const KDust step = kTimeSteps[script.pick(sizeof(kTimeSteps) / sizeof(kTimeSteps[0]))];
    // Time stands still while requests are on the wire, so every answer
    // arrives at the same virtual instant in every run.
    settle();
    pal::advanceTime(step);
}

// The platform alternates pause and resume; a second pause in a row is a
// programming error of the platform, asserted by the library.
void ApplicationLife::pauseApp(ByteScript&) {
    if (!appPaused) {
        pal::postAppPaused();
    }
}

void ApplicationLife::resumeApp(ByteScript&) {
    if (appPaused) {
        pal::postAppResumed();
    }
}

void ApplicationLife::pauseView(ByteScript&) {
    pal::postViewPaused();
}

void ApplicationLife::resumeView(ByteScript&) {
    pal::postViewResumed();
}

void ApplicationLife::showView(ByteScript& script) {
    std::unique_ptr<ChaosView>& slot = views[script.pick(2)];
    ChaosApp* app = ChaosApp::running();
    if (slot || app == nullptr) {
        return;
    }
    slot.reset(new ChaosView([this](ChaosView& view, bool deleteNow) { hideNow(view, deleteNow); }));
    app->showView(slot.get());
}

void ApplicationLife::hideView(ByteScript& script) {
    std::unique_ptr<ChaosView>& slot = views[script.pick(2)];
    if (slot) {
        hideNow(*slot, script.chance(2));
    }
}

void ApplicationLife::hideNow(ChaosView& view, bool deleteNow) {
    for (std::unique_ptr<ChaosView>& slot : views) {
        if (slot.get() == &view) {
            ChaosApp::running()->hideView(&view);
            if (deleteNow) {
                slot.reset();
            } else {
                hiddenThisStep.push_back(std::move(slot));
            }
            return;
        }
    }
}

void ApplicationLife::armView(ByteScript& script) {
    std::unique_ptr<ChaosView>& slot = views[script.pick(2)];
    const ChaosView::Reentry reentry = static_cast<ChaosView::Reentry>(script.pick(ChaosView::ReentryCount));
    const bool deleteToo = script.chance(2);
    if (slot) {
        slot->arm(reentry, deleteToo);
    }
}

void ApplicationLife::touchView(ByteScript& script) {
    ChaosView* view = views[script.pick(2)].get();
    const int what = script.pick(4);
    if (what == 0) {
        contextSizeIndex = (contextSizeIndex + 1) % 3;
        pal::setContextSize(kContextSizes[contextSizeIndex][0], kContextSizes[contextSizeIndex][1]);
    }
    if (view == nullptr) {
        return;
    }
    switch (what) {
        case 1:
            pal::postPointerMove(view, 10 + script.pick(100), 20 + script.pick(100));
            pal::postPointerSelect(view, script.chance(2));
            break;
        case 2:
            view->getRedrawManager()->scheduleUpdate();
            break;
        case 3:
            view->getRedrawManager()->scheduleRedraw();
            break;
        default:
            break;
    }
}

void ApplicationLife::changeReachability(ByteScript& script) {
    reachability = script.pick(3);
    pal::setReachability(reachability);
}

void ApplicationLife::toggleOfflineMode(ByteScript&) {
    Network::NetworkManager* manager = Network::NetworkManager::getInstance();
    manager->changeOfflineModeStatus(manager->getOfflineModeStatus() == Network::NetworkManager::OfflineModeOn
                                         ? Network::NetworkManager::OfflineModeOff
                                         : Network::NetworkManager::OfflineModeOn);
}

void ApplicationLife::submitTask(ByteScript& script) {
    taskPool.submit(script);
}

void ApplicationLife::cancelTask(ByteScript& script) {
    taskPool.cancel(script);
}

void ApplicationLife::releaseTask(ByteScript& script) {
    taskPool.release(script);
}

void ApplicationLife::makeTaskReady(ByteScript& script) {
    taskPool.makeReady(script);
}

void ApplicationLife::submitPositioning(ByteScript& script) {
    PositioningSlot& slot = *positioning[script.pick(kPositioningSlots)];
    const PositioningSlot::Reentry reentry =
        static_cast<PositioningSlot::Reentry>(script.pick(PositioningSlot::ReentryCount));
    slot.submit(reentry);
}

void ApplicationLife::cancelPositioning(ByteScript& script) {
    positioning[script.pick(kPositioningSlots)]->cancel();
}

void ApplicationLife::dropPositioning(ByteScript& script) {
    positioning[script.pick(kPositioningSlots)]->drop();
}

void ApplicationLife::startLocation(ByteScript& script) {
    watcherAction = script.pick(ActionCount);
    const bool arm = script.chance(3);
    if (watching) {
        return;
    }
    Location::LocationManager::getInstance()->addLocationListener(&watcher);
    watching = true;
    if (arm) {
        watcher.arm();
    }
}

void ApplicationLife::stopLocation(ByteScript&) {
    if (watching) {
        Location::LocationManager::getInstance()->removeLocationListener(&watcher);
        watching = false;
    }
}

void ApplicationLife::onLocationHeard() {
    switch (watcherAction) {
        case StopCollectorOnPosition:
            if (collector) {
                collector->stop();
            }
            break;
        case DestroyCollectorOnPosition:
            collector.reset();
            break;
        default:
            Location::LocationManager::getInstance()->removeLocationListener(&watcher);
            watching = false;
            break;
    }
}

void ApplicationLife::satelliteFix(ByteScript& script) {
    KDLocationFixZVR fix;
    fix.latitude = 48.0f + script.pick(100) / 100.0f;
    fix.longitude = 11.0f + script.pick(100) / 100.0f;
    fix.speed = static_cast<KDfloat32>(script.pick(40));
    fix.bearing = static_cast<KDfloat32>(script.pick(36) * 10);
    fix.accuracy = static_cast<KDfloat32>(3 + script.pick(60));
    fix.altitude = 520.0f;
    fix.precision = Location::PrecisionSatellite;
    pal::injectLocationFix(fix);
}

void ApplicationLife::satelliteStatus(ByteScript& script) {
    pal::injectLocationStatus(script.pick(3));
}

void ApplicationLife::createCollector(ByteScript& script) {
    const int scanSeconds = 1 + script.pick(5);
    const int sendSeconds = 2 + script.pick(10);
    if (!collector) {
        collector.reset(new Statistics::NetworkCollector());
        collector->setUuid("chaos-client");
        collector->setModel("Chaos");
        collector->setBaseUrl(server.host(answer).c_str());
        collector->setScanTimeout(scanSeconds);
        collector->setSendTimeout(sendSeconds);
    }
    collector->start();
    if (appPaused) {
        collector->onPaused();
    }
}

void ApplicationLife::stopCollector(ByteScript&) {
    if (collector) {
        collector->stop();
    }
}

void ApplicationLife::destroyCollector(ByteScript&) {
    collector.reset();
}

void ApplicationLife::onAppPauseChanged(bool paused) {
    appPaused = paused;
    if (!collector) {
        return;
    }
    if (paused) {
        collector->onPaused();
    } else {
        collector->onResumed();
    }
}

void ApplicationLife::switchServerAnswer(ByteScript& script) {
    setAnswer(static_cast<ChaosServer::Answer>(script.pick(ChaosServer::AnswerCount)));
}

void ApplicationLife::setAnswer(ChaosServer::Answer value) {
    answer = value;
    const std::string host = server.host(answer);
    Startup::StartupData* startup = Startup::StartupData::getInstance();
    startup->setHost(Startup::StartupData::HOST_DEFAULT, host);
    startup->setHost(Startup::StartupData::HOST_STARTUP, host);
    startup->setHost(Startup::StartupData::HOST_CELLID, host);
    taskPool.setHost(host);
    if (collector) {
        collector->setBaseUrl(host.c_str());
    }
}

void ApplicationLife::waitForAnswers(ByteScript&) {
    settle();
}

void ApplicationLife::hideViewNotShown(ByteScript&) {
    ChaosView stranger([](ChaosView&, bool) {});
    {
        std::lock_guard<std::mutex> lock(recordsMutex);
        expectedAssertion = kHideNotShownAssertion;
    }
    ChaosApp::running()->hideView(&stranger);
    std::lock_guard<std::mutex> lock(recordsMutex);
    if (!expectedAssertion.empty()) {
        report.breach("hiding a view that is not shown did not assert");
        expectedAssertion.clear();
    }
}

// The first call makes the controller, which fetches at once and on every
// resume; later calls start a new cycle over a running one.
void ApplicationLife::fetchStartup(ByteScript&) {
    if (Startup::StartupController::getExistingInstance() == nullptr) {
        Startup::StartupController::getInstance();
    } else {
        Startup::StartupController::getInstance()->fetchStartup();
    }
}
