#include "DemoScene.h"

#include <KD/kd.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>

namespace demo {

namespace {

// Filled during static initialisation, so it must exist before any scene
// file's registration runs.
std::vector<DemoSceneEntry>& registry() {
    static std::vector<DemoSceneEntry>* entries = new std::vector<DemoSceneEntry>();
    return *entries;
}

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

}  // namespace demo
