#include "support/PalTest.h"

#include <pal/Simulation.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "util/SingletonStorage.h"

namespace {

std::string makeTempFolder() {
    std::string pattern = (std::filesystem::temp_directory_path() / "mapcore-test-XXXXXX").string();
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    if (mkdtemp(buffer.data()) == nullptr) {
        return std::string();
    }
    return buffer.data();
}

}  // namespace

void PalTest::SetUp() {
    const char* echo = std::getenv("MAPCORE_TEST_LOG");
    echoLog = echo != nullptr && std::string(echo) == "1";
    root = makeTempFolder();
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

void PalTest::TearDown() {
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

void PalTest::shutdownPal() {
    if (!palRunning) {
        return;
    }
    palRunning = false;
    pal::shutdown();
}

void PalTest::advance(KDust nanoseconds) {
    pal::advanceTime(nanoseconds);
}

void PalTest::advanceMs(KDust milliseconds) {
    pal::advanceTime(milliseconds * 1000000ull);
}

void PalTest::pump() {
    kdPumpEvents();
}

std::vector<PalTest::Assertion> PalTest::assertions() const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    return recordedAssertions;
}

void PalTest::expectAssertion(const std::string& expression) {
    std::lock_guard<std::mutex> lock(recordsMutex);
    for (auto it = recordedAssertions.begin(); it != recordedAssertions.end(); ++it) {
        if (it->expression == expression) {
            recordedAssertions.erase(it);
            return;
        }
    }
    ADD_FAILURE() << "no assertion recorded for: " << expression;
}

std::vector<std::string> PalTest::logLines() const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    return recordedLog;
}

bool PalTest::hasLogLine(const std::string& line) const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    for (const std::string& recorded : recordedLog) {
        if (recorded == line) {
            return true;
        }
    }
    return false;
}

int PalTest::countLogLines(const std::string& substring) const {
    std::lock_guard<std::mutex> lock(recordsMutex);
    int count = 0;
    for (const std::string& recorded : recordedLog) {
        if (recorded.find(substring) != std::string::npos) {
            ++count;
        }
    }
    return count;
}

void PalTest::clearLog() {
    std::lock_guard<std::mutex> lock(recordsMutex);
    recordedLog.clear();
}

std::string PalTest::hostPath(const std::string& platformPath) const {
    return pal::hostPath(platformPath.c_str());
}

void PalTest::recordAssertion(const char* expression, const char* file, int line) {
    if (echoLog) {
        std::fprintf(stderr, "[assertion] %s:%d: %s\n", file, line, expression);
    }
    std::lock_guard<std::mutex> lock(recordsMutex);
    recordedAssertions.push_back({expression, file, line});
}

void PalTest::recordLogLine(const char* line) {
    if (echoLog) {
        std::fprintf(stderr, "[log] %s\n", line);
    }
    std::lock_guard<std::mutex> lock(recordsMutex);
    recordedLog.push_back(line);
}
