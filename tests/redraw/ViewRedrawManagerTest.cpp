// The redraw loop on the virtual clock: the 60 Hz timer fires at exact
// multiples of 16,666,666 ns from the moment it starts.
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <boost/scoped_ptr.hpp>
#include <vector>

#include "redraw/UpdateGenerator.h"
#include "redraw/ViewRedrawManager.h"
#include "redraw/ViewRedrawManagerDelegate.h"
#include "support/PalTest.h"

namespace {

const KDust kTick = 16666666;
const KDust kSecond = 1000000000ull;

class RecordingDelegate : public Redraw::ViewRedrawManagerDelegate {
public:
    void update(int elapsedMs) override {
        updates.push_back(elapsedMs);
        if (redrawOnUpdate) {
            manager->scheduleRedraw();
        }
    }
    void redraw() override { ++redraws; }

    Redraw::ViewRedrawManager* manager = nullptr;
    bool redrawOnUpdate = false;
    std::vector<int> updates;
    int redraws = 0;
};

class ViewRedrawManagerTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        manager.reset(new Redraw::ViewRedrawManager(delegate));
        delegate.manager = manager.get();
    }

    void TearDown() override {
        manager.reset();
        PalTest::TearDown();
    }

    // Resumes through the platform's view event and lets the first,
    // empty tick stop the timer.
    void resumeAndSettle() {
        pal::postViewResumed();
        pump();
        advance(kTick);
        ASSERT_FALSE(manager->getIsTimerStarted());
        delegate.updates.clear();
        delegate.redraws = 0;
    }

    RecordingDelegate delegate;
    boost::scoped_ptr<Redraw::ViewRedrawManager> manager;
};

TEST_F(ViewRedrawManagerTest, ScheduledRedrawRunsOnceAndTheTimerStopsAtThatTick) {
    resumeAndSettle();

    manager->scheduleRedraw();
    EXPECT_TRUE(manager->getIsTimerStarted());
    advance(kTick);

    EXPECT_EQ(delegate.redraws, 1);
    EXPECT_TRUE(delegate.updates.empty());
    EXPECT_FALSE(manager->getIsTimerStarted());
    EXPECT_EQ(pal::activeTimerCount(), 0);
    // Idle again: not a single wake-up.
    std::uint64_t firesAfter = pal::timerFireCount();
    advance(10 * 60 * kSecond);
    EXPECT_EQ(delegate.redraws, 1);
    EXPECT_TRUE(delegate.updates.empty());
    EXPECT_EQ(pal::timerFireCount(), firesAfter);
}

TEST_F(ViewRedrawManagerTest, ScheduledUpdateAfterIdleSpellIsOneTickLong) {
    resumeAndSettle();
    advance(60 * kSecond);
    manager->onUserActivity();

    manager->scheduleUpdate();
    manager->scheduleUpdate();
    advance(3 * kTick);

    EXPECT_EQ(delegate.updates, (std::vector<int>{16}));
    EXPECT_FALSE(manager->getIsTimerStarted());
}

TEST_F(ViewRedrawManagerTest, GeneratorsUpdateEveryTickUntilTheLastGoesAndAScheduledUpdateJoinsThem) {
    resumeAndSettle();
    manager->scheduleUpdate();
    boost::scoped_ptr<Redraw::UpdateGenerator> outer(new Redraw::UpdateGenerator(*manager));
    boost::scoped_ptr<Redraw::UpdateGenerator> inner(new Redraw::UpdateGenerator(*manager));
    advance(6 * kTick);
    EXPECT_EQ(delegate.updates, (std::vector<int>(6, 16)));

    outer.reset();
    advance(2 * kTick);
    EXPECT_EQ(delegate.updates.size(), 8u);
    EXPECT_TRUE(manager->getIsTimerStarted());

    inner.reset();
    advance(2 * kTick);
    EXPECT_EQ(delegate.updates.size(), 8u);
    EXPECT_FALSE(manager->getIsTimerStarted());
}

TEST_F(ViewRedrawManagerTest, ThrottlesTo40msAfter10sWithoutUserInputWhileViewIsActive) {
    resumeAndSettle();
    advance(12 * kSecond);
    manager->onViewActivity();
    EXPECT_EQ(manager->getMinUpdatePeriod(), 40000000);

    Redraw::UpdateGenerator generator(*manager);
    advance(30 * kTick);

    // Every third tick is more than 40 ms after the last accepted one.
    EXPECT_EQ(delegate.updates, (std::vector<int>(10, 49)));
}

TEST_F(ViewRedrawManagerTest, ThrottlesTo100msAfter5sWithoutViewActivity) {
    resumeAndSettle();
    advance(12 * kSecond);
    EXPECT_EQ(manager->getMinUpdatePeriod(), 100000000);

    Redraw::UpdateGenerator generator(*manager);
    advance(42 * kTick);

    EXPECT_EQ(delegate.updates, (std::vector<int>(6, 116)));
}

TEST_F(ViewRedrawManagerTest, ElapsedTimeIsClampedTo5And200ms) {
    resumeAndSettle();
    Redraw::UpdateGenerator generator(*manager);
    advance(2000000);
    manager->tick();
    EXPECT_EQ(delegate.updates, (std::vector<int>{5}));

    // A main thread stalled for half a second: the paused view's timer
    // does not run, and the late tick sees the whole gap.
    pal::postViewPaused();
    pump();
    advance(500000000);
    manager->tick();

    EXPECT_EQ(delegate.updates, (std::vector<int>{5, 200}));
}

TEST_F(ViewRedrawManagerTest, CountsFramesAndUpdatesOfTheFirstFullSecond) {
    delegate.redrawOnUpdate = true;
    pal::postViewResumed();
    pump();
    Redraw::UpdateGenerator generator(*manager);

    advance(60 * kTick);
    EXPECT_EQ(manager->getFPS(), 0);
    EXPECT_EQ(manager->getUPS(), 0);

    advance(kTick);
    EXPECT_EQ(manager->getFPS(), 60);
    EXPECT_EQ(manager->getUPS(), 60);
}

TEST_F(ViewRedrawManagerTest, SchedulingOffTheMainThreadIsReportedAndRefused) {
    resumeAndSettle();
    struct Worker {
        static void* run(void* argument) {
            Redraw::ViewRedrawManager* target = static_cast<Redraw::ViewRedrawManager*>(argument);
            target->scheduleRedraw();
            target->scheduleUpdate();
            return nullptr;
        }
    };
    KDThread* worker = kdThreadCreate(nullptr, &Worker::run, manager.get());
    ASSERT_NE(worker, nullptr);
    kdThreadJoin(worker, nullptr);

    expectAssertion("kdThreadIsMainZVR()");
    expectAssertion("kdThreadIsMainZVR()");
    EXPECT_FALSE(manager->getIsTimerStarted());
    EXPECT_EQ(pal::activeTimerCount(), 0);
}

TEST_F(ViewRedrawManagerTest, GeneratorCountBelowZeroIsReportedAndRepaired) {
    resumeAndSettle();

    manager->decreaseUpdateGeneratorCount();
    expectAssertion("updateGeneratorCount >= 0");

    {
        Redraw::UpdateGenerator generator(*manager);
        advance(kTick);
    }
    advance(kTick);
    EXPECT_EQ(delegate.updates.size(), 1u);
    EXPECT_FALSE(manager->getIsTimerStarted());
}

}  // namespace
