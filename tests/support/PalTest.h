#pragma once

#include <KD/kd.h>
#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>
#include <stdlib.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "util/SingletonStorage.h"

// Whether the platform moves threads of this process into the background
// class: only when it could take them out again, which on Linux needs
// CAP_SYS_NICE or an RLIMIT_NICE of 20. Asked on a thread of its own.
inline bool backgroundClassGranted() {
    KDint result = -1;
    std::thread probe([&result] {
        const KDint zero = 0;
        result = kdThreadSetSchedParamZVR(kdThreadSelf(), KD_THREAD_POLICY_BACKGROUND_ZVR, &zero);
    });
    probe.join();
    return result == 0;
}

// The reason given by tests that skip without that privilege.
inline const char* backgroundClassSkipReason() {
    return "leaving the background class again needs CAP_SYS_NICE or an RLIMIT_NICE of 20";
}

// Boots the platform layer for one test: a fresh host folder as file root, a
// virtual clock, a recording assertion handler (which returns, so the code
// goes on) and a log capture. Set MAPCORE_TEST_LOG=1 to echo the log to
// stderr. The test body runs on the platform's main thread.
//
// An assertion recorded and not claimed with expectAssertion() fails the test.
//
// Header-only, so that every test area gets it with the include path alone.
class PalTest : public ::testing::Test {
public:
    struct Assertion {
        std::string expression;
        std::string file;
        int line;
    };

protected:
    void SetUp() override;
    void TearDown() override;

    // Runs before pal::start(), e.g. to register start hooks.
    virtual void beforePalStart() {}

    // Runs the shutdown hooks now, so a test can observe them; TearDown then
    // only cleans up.
    void shutdownPal();

    // Moves the virtual clock; the main thread's due timers fire before these
    // return.
    void advance(KDust nanoseconds);
    void advanceMs(KDust milliseconds);
    // Dispatches the events queued for the calling thread.
    void pump();

    std::vector<Assertion> assertions() const;
    // Claims the first recorded assertion with exactly this expression text;
    // fails the test when there is none.
    void expectAssertion(const std::string& expression);

    std::vector<std::string> logLines() const;
    bool hasLogLine(const std::string& line) const;
    int countLogLines(const std::string& substring) const;
    void clearLog();

    // The host path behind a platform path such as "/data/x".
    std::string hostPath(const std::string& platformPath) const;

private:
    void recordAssertion(const char* expression, const char* file, int line);
    void recordLogLine(const char* line);

    std::string root;
    bool palRunning = false;
    bool echoLog = false;
    mutable std::mutex recordsMutex;
    std::vector<Assertion> recordedAssertions;
    std::vector<std::string> recordedLog;
};

namespace pal_test_detail {

inline std::string makeTempFolder() {
    std::string pattern = (std::filesystem::temp_directory_path() / "mapcore-test-XXXXXX").string();
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    if (mkdtemp(buffer.data()) == nullptr) {
        return std::string();
    }
    return buffer.data();
}

}  // namespace pal_test_detail

inline void PalTest::SetUp() {
    const char* echo = std::getenv("MAPCORE_TEST_LOG");
    echoLog = echo != nullptr && std::string(echo) == "1";
    root = pal_test_detail::makeTempFolder();
    ASSERT_FALSE(root.empty()) << "cannot create a temporary folder";
    pal::setFileRoot(root);
    pal::resetSimulation();
    pal::useVirtualClock();
    pal::setAssertionHandler([this](const char* expression, const char* file, int line) {
        recordAssertion(expression, file, line);
    });
    pal::setLogSink([this](const char* line) { recordLogLine(line); });
    Util::SingletonStorage::resetForNextPalCycle();
    beforePalStart();
    pal::start();
    palRunning = true;
}

inline void PalTest::TearDown() {
    shutdownPal();
    pal::setAssertionHandler(pal::AssertionHandler());
    pal::setLogSink(pal::LogSink());
    std::lock_guard<std::mutex> lock(recordsMutex);
    for (const Assertion& assertion : recordedAssertions) {
        ADD_FAILURE() << "unexpected assertion: " << assertion.expression << " at " << assertion.file << ":"
                      << assertion.line;
    }
    recordedAssertions.clear();
    if (!root.empty()) {
        std::error_code ignored;
        std::filesystem::remove_all(root, ignored);
    }
}

inline void PalTest::shutdownPal() {
    if (!palRunning) {
        return;
    }
    palRunning = false;
    pal::shutdown();
}

inline void PalTest::advance(KDust nanoseconds) {
    pal::advanceTime(nanoseconds);
}

inline void PalTest::advanceMs(KDust milliseconds) {
    pal::advanceTime(milliseconds * 1000000ull);
}

inline void PalTest::pump() {
    kdPumpEvents();
}

inline std::vector<PalTest::Assertion> PalTest::assertions() const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    return recordedAssertions;
}

inline void PalTest::expectAssertion(const std::string& expression) {
    std::lock_guard<std::mutex> lock(recordsMutex);
    for (auto it = recordedAssertions.begin(); it != recordedAssertions.end(); ++it) {
        if (it->expression == expression) {
            recordedAssertions.erase(it);
            return;
        }
    }
    ADD_FAILURE() << "no assertion recorded for: " << expression;
}

inline std::vector<std::string> PalTest::logLines() const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    return recordedLog;
}

inline bool PalTest::hasLogLine(const std::string& line) const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    for (const std::string& recorded : recordedLog) {
        if (recorded == line) {
            return true;
        }
    }
    return false;
}

inline int PalTest::countLogLines(const std::string& substring) const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    int count = 0;
    for (const std::string& recorded : recordedLog) {
        if (recorded.find(substring) != std::string::npos) {
            ++count;
        }
    }
    return count;
}

inline void PalTest::clearLog() {
    std::lock_guard<std::mutex> lock(recordsMutex);
    recordedLog.clear();
}

inline std::string PalTest::hostPath(const std::string& platformPath) const {
    return pal::hostPath(platformPath.c_str());
}

inline void PalTest::recordAssertion(const char* expression, const char* file, int line) {
    if (echoLog) {
        std::fprintf(stderr, "[assertion] %s:%d: %s\n", file, line, expression);
    }
    std::lock_guard<std::mutex> lock(recordsMutex);
    recordedAssertions.push_back({expression, file, line});
}

inline void PalTest::recordLogLine(const char* line) {
    if (echoLog) {
        std::fprintf(stderr, "[log] %s\n", line);
    }
    std::lock_guard<std::mutex> lock(recordsMutex);
    recordedLog.push_back(line);
}
