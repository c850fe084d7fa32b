#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>

#include <string>
#include <vector>

namespace {

// Hooks stay registered for the life of the process, so each test arms only
// its own and the others stay silent when tests share a process.
std::vector<std::string> g_calls;
const char* g_armed = "";

void record(const char* test, const char* call) {
    if (std::string(g_armed) == test) {
        g_calls.push_back(call);
    }
}

void initA(void*) { record("order", "init 0"); }
void shutdownA(void*) { record("order", "shutdown 0"); }
// Each run adds its own late hook (a fresh userdata), so a repeated run
// still adds one during shutdown; earlier runs' late hooks stay silent.
int g_lateHookMarkers[256];
int g_run = 0;
void shutdownLate(void* userdata) {
    if (userdata == &g_lateHookMarkers[g_run % 256]) {
        record("order", "shutdown 3 (added late)");
    }
}
void initB(void*) { record("order", "init 4"); }
void shutdownB(void*) { record("order", "shutdown 4"); }
void shutdownAddingAnother(void*) {
    record("order", "shutdown 1");
    kdAddPalCallbacksZVR(nullptr, shutdownLate, 3, &g_lateHookMarkers[g_run % 256]);
}
void initFailing(void*) {
    if (std::string(g_armed) == "exit") {
        g_calls.push_back("init 2 fails");
        kdExit(-1);
    }
}
void initAfterFailing(void*) { record("exit", "init after the failure"); }

TEST(BootTest, HooksStartFromHighestKeyAndShutDownFromLowest) {
    static int userdata = 0;
    g_calls.clear();
    g_armed = "order";
    ++g_run;
    kdAddPalCallbacksZVR(initA, shutdownA, 10, &userdata);
    kdAddPalCallbacksZVR(initB, shutdownB, 14, &userdata);
    kdAddPalCallbacksZVR(initB, shutdownB, 14, &userdata);  // same hooks again: no effect
    kdAddPalCallbacksZVR(nullptr, shutdownAddingAnother, 11, &userdata);
    pal::useVirtualClock();
    pal::start();
    pal::shutdown();
    const std::vector<std::string> expected{"init 4", "init 0", "shutdown 0", "shutdown 1",
                                            "shutdown 3 (added late)", "shutdown 4"};
    EXPECT_EQ(g_calls, expected);
    g_armed = "";
}

void* exitFromWorker(void*) {
    kdExit(3);
    return nullptr;
}

TEST(BootTest, RunEndsWhenAWorkerCallsExit) {
    pal::useRealClock();
    static KDThread* worker = nullptr;
    g_armed = "worker";
    kdAddPalCallbacksZVR(
        [](void*) {
            if (std::string(g_armed) == "worker") {
                worker = kdThreadCreate(nullptr, exitFromWorker, nullptr);
            }
        },
        [](void*) {
            if (worker != nullptr) {
                kdThreadJoin(worker, nullptr);
                worker = nullptr;
            }
        },
        50, nullptr);
    EXPECT_EQ(pal::run(), 3);
    EXPECT_TRUE(pal::exitRequested());
    g_armed = "";
}

TEST(BootTest, ExitDuringStartSkipsTheRemainingStartHooks) {
    g_calls.clear();
    g_armed = "exit";
    kdAddPalCallbacksZVR(initFailing, nullptr, -20, nullptr);
    kdAddPalCallbacksZVR(initAfterFailing, nullptr, -21, nullptr);
    pal::useVirtualClock();
    pal::start();
    EXPECT_TRUE(pal::exitRequested());
    EXPECT_EQ(pal::exitStatus(), -1);
    pal::shutdown();
    EXPECT_EQ(g_calls, std::vector<std::string>{"init 2 fails"});
    g_armed = "";
}

}  // namespace
