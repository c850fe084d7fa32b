#pragma once

#include <cstddef>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "ByteScript.h"
#include "ChaosServer.h"
#include "ChaosView.h"
#include "InvariantReport.h"
#include "LocationWatcher.h"
#include "PositioningSlot.h"
#include "TaskPool.h"

namespace Statistics {
class NetworkCollector;
}

// The scenario engine: one whole life of an application on the virtual clock
// against loopback servers, steered by a byte script. It starts the platform
// layer, reads one step after another (an opcode, then its arguments) and
// plays it: pause and resume, views shown and hidden (also from inside their
// redraw callbacks), reachability and offline mode, network tasks,
// positioning requests, the location manager, satellite fixes, the statistics
// collector, the startup controller, server answers, re-entries from
// callbacks and time. After every step it checks that nothing asserted unless
// the step misused the library on purpose, that no task or request was heard
// from after its owner let it go or after its final callback, and that live
// tasks and buffered bytes stay bounded. At the end it brings the network, the
// server and the application back and requires every task still held to
// finish, takes everything down, waits for every queue to drain, shuts the
// platform layer down and checks that nothing is left.
//
// Runs on the calling thread, which becomes the platform's main thread; one
// life at a time per process.
class ApplicationLife {
public:
    // Bounds checked after every step.
    static const int kMaxLiveTasks = 64;
    static const std::size_t kMaxQueuedBytes = 256 * 1024;

    explicit ApplicationLife(ChaosServer& server);
    ~ApplicationLife();

    // Plays the script to its end or to maxSteps. True when every promise held.
    bool live(ByteScript& script, int maxSteps);
    // The first broken promise, with the last lines of the log.
    std::string failure() const;
    int stepsPlayed() const { return steps; }

private:
    ApplicationLife(const ApplicationLife&) = delete;
    ApplicationLife& operator=(const ApplicationLife&) = delete;

    typedef void (ApplicationLife::*StepFunction)(ByteScript& script);
    struct Step {
        const char* name;
        StepFunction play;
    };
    static const Step kSteps[];
    static const int kStepCount;

    void playStep(const Step& step, ByteScript& script);
    void boot();
    void startApplication();
    void drain();
    void finishHeldTasks();
    void endOfflineMode();
    void shutDown();
    void checkInvariants();
    void checkAssertions();
    void checkLeftovers();
    // Waits, bounded in real time, until no request is on the wire.
    void settle();
    bool networkBusy() const;
    void onAssertion(const char* expression, const char* file, int line);
    void onLogLine(const char* line);

    void advanceTime(ByteScript& script);
    void pauseApp(ByteScript& script);
    void resumeApp(ByteScript& script);
    void pauseView(ByteScript& script);
    void resumeView(ByteScript& script);
    void showView(ByteScript& script);
    void hideView(ByteScript& script);
    void armView(ByteScript& script);
    void touchView(ByteScript& script);
    void changeReachability(ByteScript& script);
    void toggleOfflineMode(ByteScript& script);
    void submitTask(ByteScript& script);
    void cancelTask(ByteScript& script);
    void releaseTask(ByteScript& script);
    void makeTaskReady(ByteScript& script);
    void submitPositioning(ByteScript& script);
    void cancelPositioning(ByteScript& script);
    void dropPositioning(ByteScript& script);
    void startLocation(ByteScript& script);
    void stopLocation(ByteScript& script);
    void satelliteFix(ByteScript& script);
    void satelliteStatus(ByteScript& script);
    void createCollector(ByteScript& script);
    void stopCollector(ByteScript& script);
    void destroyCollector(ByteScript& script);
    void switchServerAnswer(ByteScript& script);
    void waitForAnswers(ByteScript& script);
    void hideViewNotShown(ByteScript& script);
    void fetchStartup(ByteScript& script);

    // Hides a shown view now and deletes it now or at the end of the step.
    void hideNow(ChaosView& view, bool deleteNow);
    void onLocationHeard();
    void onAppPauseChanged(bool paused);
    void setAnswer(ChaosServer::Answer answer);

    ChaosServer& server;
    InvariantReport report;
    TaskPool taskPool;
    std::vector<std::unique_ptr<PositioningSlot> > positioning;
    std::unique_ptr<ChaosView> views[2];
    std::vector<std::unique_ptr<ChaosView> > hiddenThisStep;
    LocationWatcher watcher;
    int watcherAction;
    bool watching;
    std::unique_ptr<Statistics::NetworkCollector> collector;
    ChaosServer::Answer answer;
    int reachability;
    bool appPaused;
    int contextSizeIndex;
    int steps;
    std::string fileRoot;

    mutable std::mutex recordsMutex;
    std::vector<std::string> assertions;
    std::string expectedAssertion;
    std::deque<std::string> recentLog;
    bool echoLog;
};
