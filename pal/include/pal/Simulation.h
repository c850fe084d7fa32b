// The simulation interface of the desktop platform layer: what the embedding
// program (demo, test fixture) uses to boot the layer, drive its clock and
// script every answer the simulated device gives.
//
// Threading: boot calls (setFileRoot, useVirtualClock, start, shutdown, run)
// belong to the thread that becomes the main thread. Every other call may be
// made from any thread; the events they produce go to the thread that owns
// the request or, for application events, to the main thread.
#pragma once

#include <KD/kdext.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

namespace pal {

// --- Boot ---------------------------------------------------------------

// The host folder under which the platform's tree ("/res", "/data", "/tmp")
// lives. Must be set before the first file call.
void setFileRoot(const std::string& hostFolder);
const std::string& fileRoot();
// The host path of a platform path, or "" when the path is refused.
std::string hostPath(const char* platformPath);

// Makes the calling thread the main thread and runs the start hooks.
void start();
// Runs the shutdown hooks on the main thread.
void shutdown();
// start(), then the event loop until kdExit, then shutdown(); returns the
// status given to kdExit.
int run();
// Whether kdExit was called since the last start(), and with what status.
bool exitRequested();
int exitStatus();

// --- Clock ----------------------------------------------------------------

// Virtual mode: time stands still until advanceTime moves it.
void useVirtualClock(KDust startUst = 1000000000ull, KDtime wallSeconds = 1767225600);
void useRealClock();
bool isVirtualClock();
// Moves virtual time forward. Due timers fire in time order; the calling
// thread's events are dispatched after each firing, so its timer callbacks run
// before this returns. Timers of other threads post their events to them.
void advanceTime(KDust nanoseconds);
// Timers currently set (not cancelled, not spent one-shots).
int activeTimerCount();
// Timer events produced since start (each periodic tick counts once).
std::uint64_t timerFireCount();

// --- Assertions and log ---------------------------------------------------

using AssertionHandler = std::function<void(const char* expression, const char* file, int line)>;
// An empty handler restores the default, which logs, then aborts in a debug
// build and returns in a release build (NDEBUG).
void setAssertionHandler(AssertionHandler handler);
using LogSink = std::function<void(const char* line)>;
// An empty sink restores the default, stderr.
void setLogSink(LogSink sink);

// Restores every simulated device value and scripted answer to its default
// (the test fixture calls it before each test).
void resetSimulation();

// --- Application events (posted to the main thread) -----------------------

void postAppPaused();
void postAppResumed();
void postViewPaused();
void postViewResumed();
void postStorageUnmounted();
void postStorageMounted();
// Any other event for the main thread, e.g. input; the event is copied.
void postToMain(const KDEvent& event);

// --- Device data -----------------------------------------------------------

void setDeviceString(KDint id, const std::string& value);
void setDeviceId(const std::string& id, bool supported = true);
// What the library last passed to kdSetDeviceIdZVR.
std::string deviceIdSetByLibrary();
void setDotsPerInch(KDint dpi);
void setLocale(const std::string& language, const std::string& region);

// --- Scripted answers of request pairs --------------------------------------

struct Answer {
    enum Kind { AfterDelay, Never, Refuse };
    Kind kind = AfterDelay;
    KDust delay = 0;  // nanoseconds after the start, for AfterDelay
    static Answer after(KDust delay) { return {AfterDelay, delay}; }
    static Answer never() { return {Never, 0}; }
    static Answer refuse() { return {Refuse, 0}; }
};

struct WifiNetwork {
    std::string bssid;
    std::string ssid;
    int signalStrength = 0;
};
void scriptWifiScan(Answer answer, std::vector<WifiNetwork> networks);

struct CellInfo {
    bool known = false;
    int cellId = 0;
    int locationAreaCode = 0;
    std::string operatorCode;
    std::string countryCode;
};
void scriptCellInfo(Answer answer, CellInfo info);
void scriptSignalStrength(Answer answer, bool success, int strength);

// Requests started and neither answered nor cancelled yet.
int pendingWifiScans();
int pendingCellInfoRequests();
int pendingSignalStrengthRequests();
// Records handed out with events 107/111 and not released yet.
int unreleasedRecords();

// --- Radios and sensors ------------------------------------------------------

// Sets the reachability value; listeners get event 112 when it changes.
void setReachability(KDint status);
int reachabilityListeners();

bool isLocationStarted();
// Delivered to the thread that started location while it is started.
void injectLocationFix(const KDLocationFixZVR& fix, bool simulated = false);
void injectLocationStatus(KDint status);

int compassListeners();
void injectCompass(KDint azimuth);
int proximityListeners();
void injectProximity(bool near);

bool isAccelerometerAcquired();
bool isAccelerometerEnabled();
float accelerometerInterval();
void injectAcceleration(float x, float y, float z);
// Samples handed out with event 120 and not dismissed yet.
int undismissedAccelerations();

// --- Threads -------------------------------------------------------------------

// While refused, kdThreadCreate fails with KD_ENOMEM, as when the system has
// no threads left.
void setThreadCreationRefused(bool refused);

// --- Audio capture sessions ---------------------------------------------------

void setCaptureSessionsRefused(bool refused);
int openCaptureSessions();
bool lastCaptureSessionAlternative();

// --- Graphics ----------------------------------------------------------------------

// Size of the main context; a change takes effect at the next redraw.
void setContextSize(int width, int height);
// Redraw handler calls made since start.
int redrawCount();
// Reads the current frame as RGBA rows, bottom row first; false without a context.
bool readFrame(std::vector<std::uint8_t>& rgba, int& width, int& height);

}  // namespace pal
