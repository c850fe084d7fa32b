#include "DemoScene.h"

#include <KD/kd.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <mutex>

namespace demo {

namespace {

// Filled during static initialisation, so it must exist before any scene
// file's registration runs.
std::vector<DemoSceneEntry>& registry() {
    static std::vector<DemoSceneEntry>* entries = new std::vector<DemoSceneEntry>();
    return *entries;
}

// What the scenes report for the summary; written from any thread.
struct Notes {
    std::mutex mutex;
    std::vector<std::pair<std::string, std::string> > files;
    std::vector<std::pair<std::string, int> > counts;
};

Notes& notes() {
    static Notes* instance = new Notes();
    return *instance;
}

DevServer::Server* theServer = nullptr;
std::string theOutputFolder;

KDust startTime() {
    static KDust start = kdGetTimeUST();
    return start;
}

}  // namespace

void registerScene(const DemoSceneEntry& entry) {
    registry().push_back(entry);
}

std::vector<DemoSceneEntry> scenes() {
    std::vector<DemoSceneEntry> sorted = registry();
    std::stable_sort(sorted.begin(), sorted.end(),
                     [](const DemoSceneEntry& a, const DemoSceneEntry& b) { return a.order < b.order; });
    return sorted;
}

void say(const char* format, ...) {
    char text[1024];
    va_list args;
    va_start(args, format);
    std::vsnprintf(text, sizeof(text), format, args);
    va_end(args);
    KDust start = startTime();
    unsigned long long elapsedMs = (kdGetTimeUST() - start) / 1000000ull;
    std::printf("[%5llu ms] %s\n", elapsedMs, text);
    std::fflush(stdout);
}

DevServer::Server& server() {
    return *theServer;
}

const std::string& outputFolder() {
    return theOutputFolder;
}

void noteFile(const std::string& path, const std::string& what) {
    Notes& all = notes();
    std::lock_guard<std::mutex> lock(all.mutex);
    all.files.emplace_back(path, what);
}

void addCount(const std::string& name, int amount) {
    Notes& all = notes();
    std::lock_guard<std::mutex> lock(all.mutex);
    for (std::pair<std::string, int>& count : all.counts) {
        if (count.first == name) {
            count.second += amount;
            return;
        }
    }
    all.counts.emplace_back(name, amount);
}

void setEnvironment(DevServer::Server* server, const std::string& outputFolder) {
    theServer = server;
    theOutputFolder = outputFolder;
}

std::vector<std::pair<std::string, std::string> > notedFiles() {
    Notes& all = notes();
    std::lock_guard<std::mutex> lock(all.mutex);
    return all.files;
}

std::vector<std::pair<std::string, int> > counts() {
    Notes& all = notes();
    std::lock_guard<std::mutex> lock(all.mutex);
    return all.counts;
}

}  // namespace demo
