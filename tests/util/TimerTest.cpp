#include <pal/Simulation.h>

#include <boost/scoped_ptr.hpp>
#include <vector>

#include "support/PalTest.h"
#include "util/Timer.h"

namespace {

const long long kSecond = 1000000000ll;

// Counts firings and can act from inside its own callback.
class TimerOwner {
public:
    TimerOwner()
        : timer(new Util::Timer(callback<void (*)()>::make<TimerOwner, &TimerOwner::onFired>(this))) {}

    void onFired() {
        ++fired;
        startedInsideCallback.push_back(timer->isStarted());
        if (restartsLeft > 0) {
            --restartsLeft;
            timer->start(Util::Timer::OneShot, kSecond);
        }
        if (deleteOnFire) {
            timer.reset();
        }
    }

    boost::scoped_ptr<Util::Timer> timer;
    int fired = 0;
    int restartsLeft = 0;
    bool deleteOnFire = false;
    std::vector<bool> startedInsideCallback;
};

class TimerTest : public PalTest {};

void* startOneShot(void* timer) {
    static_cast<Util::Timer*>(timer)->start(Util::Timer::OneShot, kSecond);
    return nullptr;
}

}  // namespace

TEST_F(TimerTest, OneShotFiresOnceWhenItsIntervalHasPassedAndCancelOnAnIdleOneDoesNothing) {
    TimerOwner owner;
    owner.timer->cancel();
    owner.timer->start(Util::Timer::OneShot, kSecond);
    EXPECT_TRUE(owner.timer->isStarted());
    advanceMs(999);
    EXPECT_EQ(0, owner.fired);
    advanceMs(1);
    EXPECT_EQ(1, owner.fired);
    EXPECT_FALSE(owner.timer->isStarted());
    owner.timer->cancel();
    advanceMs(5000);
    EXPECT_EQ(1, owner.fired);
    EXPECT_EQ(0, pal::activeTimerCount());
}

TEST_F(TimerTest, OneShotIsIdleInsideItsCallbackAndMayRestartItself) {
    TimerOwner owner;
    owner.restartsLeft = 2;
    owner.timer->start(Util::Timer::OneShot, kSecond);
    advanceMs(1000);
    advanceMs(1000);
    advanceMs(1000);
    advanceMs(1000);
    EXPECT_EQ(3, owner.fired);
    EXPECT_EQ((std::vector<bool>{false, false, false}), owner.startedInsideCallback);
    EXPECT_FALSE(owner.timer->isStarted());
}

TEST_F(TimerTest, PeriodicKeepsFiringUntilCancelled) {
    TimerOwner owner;
    owner.timer->start(Util::Timer::PeriodicAverage, kSecond / 10);
    advanceMs(1000);
    EXPECT_EQ(10, owner.fired);
    EXPECT_TRUE(owner.timer->isStarted());
    EXPECT_EQ(std::vector<bool>(10, true), owner.startedInsideCallback);
    owner.timer->cancel();
    EXPECT_FALSE(owner.timer->isStarted());
    advanceMs(1000);
    EXPECT_EQ(10, owner.fired);
    EXPECT_EQ(0, pal::activeTimerCount());
}

TEST_F(TimerTest, StartingAStartedTimerRestartsItWithoutDisturbingAnother) {
    TimerOwner restarted;
    TimerOwner other;
    restarted.timer->start(Util::Timer::OneShot, kSecond);
    other.timer->start(Util::Timer::OneShot, kSecond);
    advanceMs(600);
    restarted.timer->start(Util::Timer::OneShot, kSecond);
    EXPECT_EQ(2, pal::activeTimerCount());
    advanceMs(400);
    EXPECT_EQ(0, restarted.fired);
    EXPECT_EQ(1, other.fired);
    advanceMs(600);
    EXPECT_EQ(1, restarted.fired);
}

TEST_F(TimerTest, DestroyedStartedTimerNeverFires) {
    TimerOwner owner;
    owner.timer->start(Util::Timer::PeriodicAverage, kSecond);
    advanceMs(1000);
    ASSERT_EQ(1, owner.fired);
    owner.timer.reset();
    EXPECT_EQ(0, pal::activeTimerCount());
    advanceMs(10000);
    pump();
    EXPECT_EQ(1, owner.fired);
}

TEST_F(TimerTest, TimerDeletedByItsOwnCallbackStopsCleanly) {
    TimerOwner owner;
    owner.deleteOnFire = true;
    owner.timer->start(Util::Timer::PeriodicAverage, kSecond);
    advanceMs(3000);
    EXPECT_EQ(1, owner.fired);
    EXPECT_EQ(0, pal::activeTimerCount());
}

TEST_F(TimerTest, StartOnAnotherThreadIsRefusedAndLeavesTheTimerToItsOwner) {
    TimerOwner owner;
    KDThread* other = kdThreadCreate(nullptr, startOneShot, owner.timer.get());
    ASSERT_NE(other, nullptr);
    kdThreadJoin(other, nullptr);
    expectAssertion("kdThreadSelf() == ownerThread");
    EXPECT_FALSE(owner.timer->isStarted());
    EXPECT_EQ(0, pal::activeTimerCount());

    owner.timer->start(Util::Timer::OneShot, kSecond);
    advanceMs(1000);
    EXPECT_EQ(1, owner.fired);
}
