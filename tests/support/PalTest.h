#pragma once

#include <KD/kd.h>
#include <gtest/gtest.h>

#include <mutex>
#include <string>
#include <vector>

// Boots the platform layer for one test: a fresh host folder as file root, a
// virtual clock, a recording assertion handler (which returns, so the code
// goes on) and a log capture. Set MAPCORE_TEST_LOG=1 to echo the log to
// stderr. The test body runs on the platform's main thread.
//
// An assertion recorded and not claimed with expectAssertion() fails the test.
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
