#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>

#include <atomic>
#include <vector>

namespace {

std::vector<std::pair<int, void*>> g_seen;
std::vector<const char*> g_who;

void exactHandler(const KDEvent* event) {
    g_seen.emplace_back(event->type, event->userptr);
    g_who.push_back("exact");
}
void fallbackHandler(const KDEvent* event) {
    g_seen.emplace_back(event->type, event->userptr);
    g_who.push_back("fallback");
}
void replacementHandler(const KDEvent* event) {
    g_seen.emplace_back(event->type, event->userptr);
    g_who.push_back("replacement");
}

void postUserEvent(int type, void* userptr, intptr_t word0 = 0) {
    KDEvent* event = kdCreateEvent();
    event->type = type;
    event->userptr = userptr;
    event->data.words[0] = word0;
    kdPostEvent(event);
}

class EventsTest : public ::testing::Test {
protected:
    void SetUp() override {
        g_seen.clear();
        g_who.clear();
        pal::useVirtualClock();
        pal::start();
    }
    void TearDown() override {
        for (int type : {KD_EVENT_USER, KD_EVENT_USER + 1}) {
            kdInstallCallback(nullptr, type, nullptr);
            kdInstallCallback(nullptr, type, &objectA);
            kdInstallCallback(nullptr, type, &objectB);
        }
        pal::shutdown();
    }
    int objectA = 0;
    int objectB = 0;
};

TEST_F(EventsTest, DispatchPrefersExactUserPointerThenFallsBackToNull) {
    kdInstallCallback(exactHandler, KD_EVENT_USER, &objectA);
    kdInstallCallback(fallbackHandler, KD_EVENT_USER, nullptr);
    postUserEvent(KD_EVENT_USER, &objectA);
    postUserEvent(KD_EVENT_USER, &objectB);
    postUserEvent(KD_EVENT_USER + 1, &objectA);  // no handler for this type: dropped
    kdPumpEvents();
    ASSERT_EQ(g_who.size(), 2u);
    EXPECT_STREQ(g_who[0], "exact");
    EXPECT_STREQ(g_who[1], "fallback");
    EXPECT_EQ(g_seen[1].second, &objectB);
}

TEST_F(EventsTest, InstallingAgainReplacesAndNullRemoves) {
    kdInstallCallback(exactHandler, KD_EVENT_USER, &objectA);
    kdInstallCallback(replacementHandler, KD_EVENT_USER, &objectA);
    postUserEvent(KD_EVENT_USER, &objectA);
    kdPumpEvents();
    kdInstallCallback(nullptr, KD_EVENT_USER, &objectA);
    postUserEvent(KD_EVENT_USER, &objectA);
    kdPumpEvents();
    ASSERT_EQ(g_who.size(), 1u);
    EXPECT_STREQ(g_who[0], "replacement");
}

TEST_F(EventsTest, RemovingACallbackDiscardsItsQueuedEventsButNotOthers) {
    kdInstallCallback(exactHandler, KD_EVENT_USER, &objectA);
    kdInstallCallback(exactHandler, KD_EVENT_USER, &objectB);
    postUserEvent(KD_EVENT_USER, &objectA);
    postUserEvent(KD_EVENT_USER, &objectB);
    kdInstallCallback(nullptr, KD_EVENT_USER, &objectA);
    // A new owner at the same address must not receive the old owner's events.
    kdInstallCallback(replacementHandler, KD_EVENT_USER, &objectA);
    kdPumpEvents();
    ASSERT_EQ(g_seen.size(), 1u);
    EXPECT_EQ(g_seen[0].second, &objectB);
}

struct CrossThreadPost {
    KDThread* target;
    int count;
};

void* postSequence(void* argument) {
    auto* job = static_cast<CrossThreadPost*>(argument);
    for (int i = 0; i < job->count; ++i) {
        KDEvent* event = kdCreateEvent();
        event->type = KD_EVENT_USER;
        event->data.words[0] = i;
        kdPostThreadEvent(event, job->target);
    }
    return nullptr;
}

std::vector<intptr_t> g_values;
void recordValue(const KDEvent* event) { g_values.push_back(event->data.words[0]); }

TEST_F(EventsTest, EventsFromAnotherThreadArriveInOrderOnTheTarget) {
    g_values.clear();
    kdInstallCallback(recordValue, KD_EVENT_USER, nullptr);
    CrossThreadPost job{kdThreadSelf(), 1000};
    KDThread* worker = kdThreadCreate(nullptr, postSequence, &job);
    ASSERT_NE(worker, nullptr);
    ASSERT_EQ(kdThreadJoin(worker, nullptr), 0);
    kdPumpEvents();
    ASSERT_EQ(g_values.size(), 1000u);
    for (int i = 0; i < 1000; ++i) {
        ASSERT_EQ(g_values[i], i);
    }
}

void repostSelf(const KDEvent* event) {
    g_seen.emplace_back(event->type, event->userptr);
    postUserEvent(KD_EVENT_USER, event->userptr);
}

TEST_F(EventsTest, OnePumpDispatchesOnlyWhatWasQueuedWhenItStarted) {
    kdInstallCallback(repostSelf, KD_EVENT_USER, &objectA);
    postUserEvent(KD_EVENT_USER, &objectA);
    kdPumpEvents();
    EXPECT_EQ(g_seen.size(), 1u);
    kdPumpEvents();
    EXPECT_EQ(g_seen.size(), 2u);
}

TEST_F(EventsTest, WaitEventReturnsAnEventWithoutCallbackAndTimesOutOnVirtualTime) {
    postUserEvent(KD_EVENT_USER + 1, &objectB, 7);
    const KDEvent* event = kdWaitEvent(0);
    ASSERT_NE(event, nullptr);
    EXPECT_EQ(event->type, KD_EVENT_USER + 1);
    EXPECT_EQ(event->data.words[0], 7);
    EXPECT_EQ(kdWaitEvent(0), nullptr);
}

void* waitForOneSecond(void* argument) {
    auto* result = static_cast<std::atomic<int>*>(argument);
    const KDEvent* event = kdWaitEvent(1000000000ull);
    result->store(event == nullptr ? 1 : 2);
    return nullptr;
}

TEST_F(EventsTest, WaitOnTheVirtualClockEndsOnlyWhenVirtualTimePassesTheTimeout) {
    std::atomic<int> result{0};
    KDThread* waiter = kdThreadCreate(nullptr, waitForOneSecond, &result);
    // Real time passing never ends the wait; moving virtual time does. The
    // waiter may start late, so time moves in steps until it has timed out.
    for (int step = 0; step < 1000000 && result.load() == 0; ++step) {
        pal::advanceTime(250000000ull);
        kdThreadYieldZVR();
    }
    kdThreadJoin(waiter, nullptr);
    EXPECT_EQ(result.load(), 1);
}

TEST(ThreadsTest, MutexIsRecursive) {
    KDThreadMutex* mutex = kdThreadMutexCreate(nullptr);
    ASSERT_EQ(kdThreadMutexLock(mutex), 0);
    ASSERT_EQ(kdThreadMutexLock(mutex), 0);
    EXPECT_EQ(kdThreadMutexUnlock(mutex), 0);
    EXPECT_EQ(kdThreadMutexUnlock(mutex), 0);
    kdThreadMutexFree(mutex);
}

TEST(ThreadsTest, BackgroundClassIsSetAndRestored) {
    KDThread* self = kdThreadSelf();
    KDint savedPolicy = -1;
    KDint savedParam = -1;
    ASSERT_EQ(kdThreadGetSchedParamZVR(self, &savedPolicy, &savedParam), 0);
    const KDint zero = 0;
    ASSERT_EQ(kdThreadSetSchedParamZVR(self, KD_THREAD_POLICY_BACKGROUND_ZVR, &zero), 0);
    KDint policy = -1;
    KDint param = -1;
    kdThreadGetSchedParamZVR(self, &policy, &param);
    EXPECT_EQ(policy, KD_THREAD_POLICY_BACKGROUND_ZVR);
    ASSERT_EQ(kdThreadSetSchedParamZVR(self, savedPolicy, &savedParam), 0);
    kdThreadGetSchedParamZVR(self, &policy, &param);
    EXPECT_EQ(policy, savedPolicy);
    EXPECT_EQ(kdThreadSetSchedParamZVR(self, 7, &zero), -1);
}

TEST(ThreadsTest, MainThreadIsTheOneThatStarted) {
    pal::start();
    EXPECT_TRUE(kdThreadIsMainZVR());
    KDint fromWorker = -1;
    KDThread* worker = kdThreadCreate(
        nullptr,
        [](void* out) -> void* {
            *static_cast<KDint*>(out) = kdThreadIsMainZVR();
            return nullptr;
        },
        &fromWorker);
    kdThreadJoin(worker, nullptr);
    EXPECT_EQ(fromWorker, 0);
    pal::shutdown();
}

}  // namespace

namespace {

void ignoreWifiAnswer(const KDEvent*) {}

class UndeliveredPayloadTest : public ::testing::Test {
protected:
    void SetUp() override {
        pal::resetSimulation();
        pal::useVirtualClock();
        pal::start();
        pal::scriptWifiScan(pal::Answer::after(0), {{"00:11:22:33:44:55", "cafe", -60}});
    }
    void TearDown() override { pal::shutdown(); }
    int requester = 0;
};

TEST_F(UndeliveredPayloadTest, RemovingTheHandlerBeforeCancellingReleasesTheQueuedRecord) {
    kdInstallCallback(ignoreWifiAnswer, KD_EVENT_WIFI_SCAN_ZVR, &requester);
    const KDint handle = kdStartWifiScanZVR(&requester);
    ASSERT_NE(handle, 0);
    ASSERT_EQ(pal::unreleasedRecords(), 1);
    // The order a request object uses when it is cancelled: handler first.
    kdInstallCallback(nullptr, KD_EVENT_WIFI_SCAN_ZVR, &requester);
    kdCancelWifiScanZVR(handle);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(UndeliveredPayloadTest, AnAnswerNobodyListensToIsReleasedWhenDropped) {
    ASSERT_NE(kdStartWifiScanZVR(&requester), 0);
    kdPumpEvents();
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(UndeliveredPayloadTest, ShutdownReleasesAnswersStillQueued) {
    ASSERT_NE(kdStartWifiScanZVR(&requester), 0);
    pal::shutdown();
    EXPECT_EQ(pal::unreleasedRecords(), 0);
    pal::start();
}

}  // namespace
