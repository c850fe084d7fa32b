// Event dispatch, cross-thread posting and waiting, threads of the platform.
#include <sched.h>

#include <atomic>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "support/PalTest.h"

namespace {

// Which handler saw an event for which user pointer.
typedef std::vector<std::pair<std::string, void*>> Calls;
Calls gCalls;

void exactHandler(const KDEvent* event) {
    gCalls.emplace_back("exact", event->userptr);
}
void fallbackHandler(const KDEvent* event) {
    gCalls.emplace_back("fallback", event->userptr);
}
void replacementHandler(const KDEvent* event) {
    gCalls.emplace_back("replacement", event->userptr);
}

void postUserEvent(int type, void* userptr, intptr_t word0 = 0) {
    KDEvent* event = kdCreateEvent();
    event->type = type;
    event->userptr = userptr;
    event->data.words[0] = word0;
    kdPostEvent(event);
}

class EventsTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        gCalls.clear();
    }
    void TearDown() override {
        for (int type : {KD_EVENT_USER, KD_EVENT_USER + 1}) {
            for (void* userptr : {static_cast<void*>(nullptr), objectA, objectB}) {
                kdInstallCallback(nullptr, type, userptr);
            }
        }
        PalTest::TearDown();
    }
    int objects[2] = {0, 0};
    void* objectA = &objects[0];
    void* objectB = &objects[1];
};

// A handler may remove another handler whose event waits in the same pump,
// remove itself, and pump again from inside its call.
void removingHandler(const KDEvent* event) {
    gCalls.emplace_back("removing", event->userptr);
    int* objects = static_cast<int*>(event->userptr);
    kdInstallCallback(nullptr, KD_EVENT_USER, &objects[1]);
    kdInstallCallback(nullptr, KD_EVENT_USER, event->userptr);
    kdPumpEvents();
}

TEST_F(EventsTest, HandlerMayRemoveAnotherAndItselfAndPumpAgainFromInsideItsCall) {
    kdInstallCallback(removingHandler, KD_EVENT_USER, objectA);
    kdInstallCallback(exactHandler, KD_EVENT_USER, objectB);
    kdInstallCallback(fallbackHandler, KD_EVENT_USER + 1, nullptr);
    postUserEvent(KD_EVENT_USER, objectA);
    postUserEvent(KD_EVENT_USER, objectB);
    postUserEvent(KD_EVENT_USER + 1, objectB);
    postUserEvent(KD_EVENT_USER, objectA);
    kdPumpEvents();
    kdPumpEvents();
    EXPECT_EQ(gCalls, (Calls{{"removing", objectA}, {"fallback", objectB}}));
}

TEST_F(EventsTest, DispatchPrefersExactUserPointerThenFallsBackToNull) {
    kdInstallCallback(exactHandler, KD_EVENT_USER, objectA);
    kdInstallCallback(fallbackHandler, KD_EVENT_USER, nullptr);
    postUserEvent(KD_EVENT_USER, objectA);
    postUserEvent(KD_EVENT_USER, objectB);
    postUserEvent(KD_EVENT_USER + 1, objectA);  // no handler for this type: dropped
    kdPumpEvents();
    EXPECT_EQ(gCalls, (Calls{{"exact", objectA}, {"fallback", objectB}}));
}

TEST_F(EventsTest, InstallingAgainReplacesAndNullRemoves) {
    kdInstallCallback(exactHandler, KD_EVENT_USER, objectA);
    kdInstallCallback(replacementHandler, KD_EVENT_USER, objectA);
    postUserEvent(KD_EVENT_USER, objectA);
    kdPumpEvents();
    kdInstallCallback(nullptr, KD_EVENT_USER, objectA);
    postUserEvent(KD_EVENT_USER, objectA);
    kdPumpEvents();
    EXPECT_EQ(gCalls, (Calls{{"replacement", objectA}}));
}

TEST_F(EventsTest, RemovingACallbackDiscardsItsQueuedEventsButNotOthers) {
    kdInstallCallback(exactHandler, KD_EVENT_USER, objectA);
    kdInstallCallback(exactHandler, KD_EVENT_USER, objectB);
    postUserEvent(KD_EVENT_USER, objectA);
    postUserEvent(KD_EVENT_USER, objectB);
    kdInstallCallback(nullptr, KD_EVENT_USER, objectA);
    // A new owner at the same address must not receive the old owner's events.
    kdInstallCallback(replacementHandler, KD_EVENT_USER, objectA);
    kdPumpEvents();
    EXPECT_EQ(gCalls, (Calls{{"exact", objectB}}));
}

TEST_F(EventsTest, OnePumpDispatchesOnlyWhatWasQueuedWhenItStarted) {
    kdInstallCallback(
        [](const KDEvent* event) {
            exactHandler(event);
            postUserEvent(KD_EVENT_USER, event->userptr);
        },
        KD_EVENT_USER, objectA);
    postUserEvent(KD_EVENT_USER, objectA);
    kdPumpEvents();
    EXPECT_EQ(gCalls.size(), 1u);
    kdPumpEvents();
    EXPECT_EQ(gCalls.size(), 2u);
}

std::vector<intptr_t> gValues;

void* postSequence(void* target) {
    for (int i = 0; i < 1000; ++i) {
        KDEvent* event = kdCreateEvent();
        event->type = KD_EVENT_USER;
        event->data.words[0] = i;
        kdPostThreadEvent(event, static_cast<KDThread*>(target));
    }
    return nullptr;
}

TEST_F(EventsTest, EventsFromAnotherThreadArriveInOrderOnTheTarget) {
    gValues.clear();
    kdInstallCallback([](const KDEvent* event) { gValues.push_back(event->data.words[0]); }, KD_EVENT_USER,
                      nullptr);
    KDThread* worker = kdThreadCreate(nullptr, postSequence, kdThreadSelf());
    ASSERT_NE(worker, nullptr);
    ASSERT_EQ(kdThreadJoin(worker, nullptr), 0);
    kdPumpEvents();
    ASSERT_EQ(gValues.size(), 1000u);
    for (int i = 0; i < 1000; ++i) {
        ASSERT_EQ(gValues[i], i);
    }
}

TEST_F(EventsTest, WaitEventReturnsAnEventWithoutCallbackAndTimesOutOnVirtualTime) {
    postUserEvent(KD_EVENT_USER + 1, objectB, 7);
    const KDEvent* event = kdWaitEvent(0);
    ASSERT_NE(event, nullptr);
    EXPECT_EQ(event->type, KD_EVENT_USER + 1);
    EXPECT_EQ(event->data.words[0], 7);
    EXPECT_EQ(kdWaitEvent(0), nullptr);

    // Real time passing never ends a wait; moving virtual time does. The
    // waiter may start late, so time moves in steps until it has timed out.
    std::atomic<int> result{0};
    KDThread* waiter = kdThreadCreate(
        nullptr,
        [](void* out) -> void* {
            static_cast<std::atomic<int>*>(out)->store(kdWaitEvent(1000000000ull) == nullptr ? 1 : 2);
            return nullptr;
        },
        &result);
    for (int step = 0; step < 1000000 && result.load() == 0; ++step) {
        pal::advanceTime(250000000ull);
        kdThreadYieldZVR();
    }
    kdThreadJoin(waiter, nullptr);
    EXPECT_EQ(result.load(), 1);
}

TEST_F(EventsTest, MainThreadIsTheOneThatStarted) {
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
    if (!backgroundClassGranted()) {
        GTEST_SKIP() << backgroundClassSkipReason();
    }
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
    EXPECT_EQ(sched_getscheduler(0), SCHED_IDLE);
    ASSERT_EQ(kdThreadSetSchedParamZVR(self, savedPolicy, &savedParam), 0);
    kdThreadGetSchedParamZVR(self, &policy, &param);
    EXPECT_EQ(policy, savedPolicy);
    EXPECT_EQ(sched_getscheduler(0), SCHED_OTHER);
    EXPECT_EQ(kdThreadSetSchedParamZVR(self, 7, &zero), -1);
}

TEST(ThreadsTest, BackgroundClassIsRefusedWhenTheThreadCouldNotLeaveIt) {
    if (backgroundClassGranted()) {
        GTEST_SKIP() << "this process may leave the background class, so it is granted";
    }
    // On a thread of its own: if the refusal broke, this one would be stuck.
    KDint result = 0;
    KDint error = 0;
    KDint policy = -1;
    int posixPolicy = -1;
    std::thread demoted([&] {
        const KDint zero = 0;
        result = kdThreadSetSchedParamZVR(kdThreadSelf(), KD_THREAD_POLICY_BACKGROUND_ZVR, &zero);
        error = kdGetError();
        kdThreadGetSchedParamZVR(kdThreadSelf(), &policy, nullptr);
        posixPolicy = sched_getscheduler(0);
    });
    demoted.join();
    EXPECT_EQ(result, -1);
    EXPECT_EQ(error, KD_EACCES);
    EXPECT_EQ(policy, KD_THREAD_POLICY_NORMAL_ZVR);
    EXPECT_EQ(posixPolicy, SCHED_OTHER);
}

// Payloads of events that never reach a callback are released all the same.
class UndeliveredPayloadTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        pal::scriptWifiScan(pal::Answer::after(0), {{"00:11:22:33:44:55", "cafe", -60}});
    }
    // Starts a scan whose answer is queued at once.
    KDint startScan() {
        const KDint handle = kdStartWifiScanZVR(&requester);
        EXPECT_NE(handle, 0);
        EXPECT_EQ(pal::unreleasedRecords(), 1);
        return handle;
    }
    int requester = 0;
};

TEST_F(UndeliveredPayloadTest, RemovingTheHandlerBeforeCancellingReleasesTheQueuedRecord) {
    kdInstallCallback([](const KDEvent*) {}, KD_EVENT_WIFI_SCAN_ZVR, &requester);
    const KDint handle = startScan();
    // The order a request object uses when it is cancelled: handler first.
    kdInstallCallback(nullptr, KD_EVENT_WIFI_SCAN_ZVR, &requester);
    kdCancelWifiScanZVR(handle);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(UndeliveredPayloadTest, AnAnswerNobodyListensToIsReleasedWhenDropped) {
    startScan();
    kdPumpEvents();
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(UndeliveredPayloadTest, ShutdownReleasesAnswersStillQueued) {
    startScan();
    pal::shutdown();
    EXPECT_EQ(pal::unreleasedRecords(), 0);
    pal::start();
}

}  // namespace
