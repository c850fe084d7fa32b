// Timers on the virtual clock: due times, modes and cancellation.
#include <vector>

#include "support/PalTest.h"

namespace {

struct TimerProbe {
    std::vector<KDust> fireTimes;
    KDTimer* timer = nullptr;
    bool restartOnFire = false;
    bool cancelOnFire = false;
};

void onTimer(const KDEvent* event) {
    auto* probe = static_cast<TimerProbe*>(event->userptr);
    probe->fireTimes.push_back(kdGetTimeUST());
    if (probe->cancelOnFire) {
        kdCancelTimer(probe->timer);
        probe->timer = nullptr;
    }
    if (probe->restartOnFire && probe->fireTimes.size() < 3) {
        kdCancelTimer(probe->timer);
        probe->timer = kdSetTimer(100, KD_TIMER_ONESHOT, probe);
    }
}

class TimersTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        start = kdGetTimeUST();
        kdInstallCallback(onTimer, KD_EVENT_TIMER, nullptr);
    }
    void TearDown() override {
        kdInstallCallback(nullptr, KD_EVENT_TIMER, nullptr);
        PalTest::TearDown();
    }
    KDust start = 0;
};

TEST_F(TimersTest, OneShotFiresOnceAtItsDueTime) {
    TimerProbe probe;
    probe.timer = kdSetTimer(500, KD_TIMER_ONESHOT, &probe);
    pal::advanceTime(499);
    EXPECT_TRUE(probe.fireTimes.empty());
    pal::advanceTime(10000);
    EXPECT_EQ(probe.fireTimes, std::vector<KDust>{start + 500});
    EXPECT_EQ(pal::activeTimerCount(), 0);
    kdCancelTimer(probe.timer);  // a spent one-shot may still be cancelled
}

TEST_F(TimersTest, PeriodicAverageKeepsItsRateWithinOneAdvanceAndStopsWhenCancelled) {
    TimerProbe probe;
    const std::uint64_t firedBefore = pal::timerFireCount();
    probe.timer = kdSetTimer(100, KD_TIMER_PERIODIC_AVERAGE, &probe);
    pal::advanceTime(1000);
    ASSERT_EQ(probe.fireTimes.size(), 10u);
    for (std::size_t i = 0; i < probe.fireTimes.size(); ++i) {
        EXPECT_EQ(probe.fireTimes[i], start + 100 * (i + 1));
    }
    EXPECT_EQ(pal::timerFireCount() - firedBefore, 10u);
    kdCancelTimer(probe.timer);
    pal::advanceTime(1000);
    EXPECT_EQ(probe.fireTimes.size(), 10u);
}

TEST_F(TimersTest, TimersOfOneAdvanceFireInTimeOrder) {
    TimerProbe slow;
    TimerProbe fast;
    slow.timer = kdSetTimer(300, KD_TIMER_PERIODIC_AVERAGE, &slow);
    fast.timer = kdSetTimer(200, KD_TIMER_PERIODIC_AVERAGE, &fast);
    pal::advanceTime(600);
    // 200 fast, 300 slow, 400 fast, 600 slow, 600 fast (created later, fires second)
    EXPECT_EQ(fast.fireTimes, (std::vector<KDust>{start + 200, start + 400, start + 600}));
    EXPECT_EQ(slow.fireTimes, (std::vector<KDust>{start + 300, start + 600}));
    kdCancelTimer(slow.timer);
    kdCancelTimer(fast.timer);
}

TEST_F(TimersTest, OneShotRestartedFromItsCallbackFiresWithinTheSameAdvance) {
    TimerProbe probe;
    probe.restartOnFire = true;
    probe.timer = kdSetTimer(100, KD_TIMER_ONESHOT, &probe);
    pal::advanceTime(1000);
    EXPECT_EQ(probe.fireTimes, (std::vector<KDust>{start + 100, start + 200, start + 300}));
    kdCancelTimer(probe.timer);
}

TEST_F(TimersTest, CancelledTimerDiscardsItsQueuedEvent) {
    TimerProbe probe;
    probe.timer = kdSetTimer(100, KD_TIMER_PERIODIC_AVERAGE, &probe);
    // Advanced from another thread, the timer's event is only queued here.
    KDThread* advancer = kdThreadCreate(
        nullptr,
        [](void*) -> void* {
            pal::advanceTime(100);
            return nullptr;
        },
        nullptr);
    kdThreadJoin(advancer, nullptr);
    kdCancelTimer(probe.timer);
    kdPumpEvents();
    EXPECT_TRUE(probe.fireTimes.empty());
}

TEST_F(TimersTest, TimerCancelledInsideItsOwnCallbackStops) {
    TimerProbe probe;
    probe.cancelOnFire = true;
    probe.timer = kdSetTimer(100, KD_TIMER_PERIODIC_MINIMUM, &probe);
    pal::advanceTime(1000);
    EXPECT_EQ(probe.fireTimes.size(), 1u);
}

TEST_F(TimersTest, TimerOfAnEndedThreadNeverFiresAndCanStillBeCancelled) {
    KDTimer* orphan = nullptr;
    KDThread* owner = kdThreadCreate(
        nullptr,
        [](void* out) -> void* {
            *static_cast<KDTimer**>(out) = kdSetTimer(100, KD_TIMER_PERIODIC_AVERAGE, nullptr);
            return nullptr;
        },
        &orphan);
    kdThreadJoin(owner, nullptr);
    const std::uint64_t firedBefore = pal::timerFireCount();
    pal::advanceTime(1000);
    EXPECT_EQ(pal::timerFireCount(), firedBefore);
    EXPECT_EQ(pal::activeTimerCount(), 0);
    kdCancelTimer(orphan);
}

TEST_F(TimersTest, VirtualWallClockFollowsVirtualTime) {
    const KDtime before = kdTime(nullptr);
    pal::advanceTime(155ull * 1000000000ull);
    EXPECT_EQ(kdTime(nullptr), before + 155);
    EXPECT_EQ(kdGetTimeUST(), start + 155ull * 1000000000ull);
}

}  // namespace
