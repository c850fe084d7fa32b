#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>

#include <limits>
#include <memory>
#include <vector>

#include "location/AbstractSimulator.h"
#include "location/LocationManager.h"
#include "location/LocationProvider.h"
#include "location/LocationTestSupport.h"
#include "support/PalTest.h"

namespace {

using Location::LocationManager;

const float kNaN = std::numeric_limits<float>::quiet_NaN();

struct Heard {
    std::vector<Location::Location> locations;
    std::vector<std::pair<int, int> > precisionChanges;
};

class RecordingListener : public Location::LocationListener {
public:
    explicit RecordingListener(Heard& heard) : heard(heard) {}
    void onLocationChanged(LocationManager*, const Location::Location& location) override {
        heard.locations.push_back(location);
    }
    void onLocationPrecisionChanged(LocationManager*, Location::LocationPrecision oldPrecision,
                                    Location::LocationPrecision newPrecision) override {
        heard.precisionChanges.push_back(std::make_pair(oldPrecision, newPrecision));
    }

private:
    Heard& heard;
};

class TestSimulator : public Simulator::AbstractSimulator {
public:
    bool isReplaying() override { return replaying; }
    bool isRecording() override { return recording; }
    void recordLocation(float latitude, float longitude, float, float, float, float, int) override {
        recorded.push_back(std::make_pair(latitude, longitude));
    }
    bool replaying = false;
    bool recording = false;
    std::vector<std::pair<float, float> > recorded;
};

KDLocationFixZVR fixAt(float north, float accuracy = 10.0f, float speed = 10.0f, float bearing = 0.0f) {
    return KDLocationFixZVR{48.0f + north / 111200.0f, 11.0f, speed, bearing, accuracy, 500.0f, 2};
}

class LocationManagerTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        manager = LocationManager::getInstance();
        manager->addLocationListener(&listener);
        resumeApp();
    }
    void TearDown() override {
        manager->removeLocationListener(&listener);
        PalTest::TearDown();
    }

    void resumeApp() {
        pal::postAppResumed();
        pump();
    }
    void pauseApp() {
        pal::postAppPaused();
        pump();
    }
    // One fix a second, as a receiver delivers them.
    void deliver(const KDLocationFixZVR& fix, bool simulated = false) {
        advanceMs(1000);
        pal::injectLocationFix(fix, simulated);
        pump();
    }

    LocationManager* manager = nullptr;
    Heard heard;
    RecordingListener listener{heard};
};

TEST_F(LocationManagerTest, SatelliteFixesReachListenersThroughTheFilters) {
    EXPECT_TRUE(pal::isLocationStarted());
    // Driving north at 10 m/s, swaying 6 m sideways from fix to fix.
    const float swayDegrees = 6.0f / 74400.0f;
    KDLocationFixZVR newest = fixAt(0.0f);
    for (int i = 0; i < 4; ++i) {
        newest = fixAt(10.0f * i);
        newest.longitude += i % 2 == 0 ? 0.0f : swayDegrees;
        deliver(newest);
    }
    ASSERT_EQ(4u, heard.locations.size());
    EXPECT_EQ(Location::PrecisionSatellite, heard.locations.back().precision);
    // The position average takes out the sway and keeps up with the drive.
    EXPECT_GT(heard.locations.back().longitude, 11.0f + 0.2f * swayDegrees);
    EXPECT_LT(heard.locations.back().longitude, 11.0f + 0.8f * swayDegrees);
    EXPECT_NEAR(newest.latitude, heard.locations.back().latitude, 1.0f / 111200.0f);
    EXPECT_EQ(0, heard.locations.back().fixTime);
    EXPECT_EQ(heard.locations.back().latitude, manager->getLastLocation().latitude);
    EXPECT_EQ(Location::PrecisionSatellite, manager->getPrecision());
    ASSERT_FALSE(heard.precisionChanges.empty());
    EXPECT_EQ(std::make_pair(0, 2), heard.precisionChanges.front());
}

TEST_F(LocationManagerTest, ListenersAreRegisteredOnceAndRemovedQuietly) {
    manager->addLocationListener(&listener);
    expectAssertion("find(listeners.begin(), listeners.end(), listener) == listeners.end()");
    Heard otherHeard;
    RecordingListener other(otherHeard);
    manager->removeLocationListener(&other);
    deliver(fixAt(0));
    EXPECT_EQ(1u, heard.locations.size());
    EXPECT_TRUE(otherHeard.locations.empty());
}

TEST_F(LocationManagerTest, PauseStopsTheReceiverUntilResume) {
    pauseApp();
    EXPECT_TRUE(manager->getIsPaused());
    EXPECT_FALSE(pal::isLocationStarted());
    deliver(fixAt(0));
    EXPECT_TRUE(heard.locations.empty());

    resumeApp();
    EXPECT_TRUE(pal::isLocationStarted());
    deliver(fixAt(0));
    EXPECT_EQ(1u, heard.locations.size());

    manager->onResumed();
    expectAssertion("isPaused");
}

TEST_F(LocationManagerTest, UnusableFixesNeverReachListeners) {
    const KDLocationFixZVR bad[] = {
        {kNaN, 11.0f, 1.0f, 0.0f, 10.0f, 0.0f, 2},  {48.0f, kNaN, 1.0f, 0.0f, 10.0f, 0.0f, 2},
        {91.0f, 11.0f, 1.0f, 0.0f, 10.0f, 0.0f, 2}, {48.0f, 181.0f, 1.0f, 0.0f, 10.0f, 0.0f, 2},
        {48.0f, 11.0f, 1.0f, 0.0f, -1.0f, 0.0f, 2}, {48.0f, 11.0f, 1.0f, 0.0f, kNaN, 0.0f, 2},
        {48.0f, 11.0f, 1.0f, 0.0f, 10.0f, 0.0f, 0}, {48.0f, 11.0f, 1.0f, 0.0f, 10.0f, 0.0f, -3},
    };
    for (const KDLocationFixZVR& fix : bad) {
        deliver(fix);
    }
    EXPECT_TRUE(heard.locations.empty());
    EXPECT_EQ(Location::PrecisionNone, manager->getPrecision());
    // Missing speed and bearing as NaN are taken as not available.
    deliver({48.0f, 11.0f, kNaN, kNaN, 10.0f, kNaN, 2});
    ASSERT_EQ(1u, heard.locations.size());
    EXPECT_EQ(48.0f, heard.locations[0].latitude);
    EXPECT_EQ(0.0f, heard.locations[0].speed);
}

TEST_F(LocationManagerTest, SimulatorReplaysAndRecordsFixes) {
    // Without a simulator, simulated fixes are dropped.
    deliver(fixAt(0), true);
    EXPECT_TRUE(heard.locations.empty());

    TestSimulator simulator;
    simulator.replaying = true;
    simulator.recording = true;
    manager->setSimulator(&simulator);
    deliver(fixAt(0), false);
    EXPECT_TRUE(heard.locations.empty());
    deliver(fixAt(5), true);
    ASSERT_EQ(1u, heard.locations.size());
    EXPECT_EQ(-1, heard.locations[0].fixTime);
    ASSERT_EQ(1u, simulator.recorded.size());
    EXPECT_EQ(fixAt(5).latitude, simulator.recorded[0].first);

    simulator.replaying = false;
    deliver(fixAt(10), false);
    EXPECT_EQ(2u, heard.locations.size());
    EXPECT_EQ(0, heard.locations[1].fixTime);
    EXPECT_EQ(2u, simulator.recorded.size());
    manager->setSimulator(nullptr);
}

TEST_F(LocationManagerTest, UnknownSatelliteStatusIsLoggedAndIgnored) {
    deliver(fixAt(0));
    pal::injectLocationStatus(7);
    pump();
    EXPECT_TRUE(hasLogLine("LocationProviderGPS: unknown satellite status 7 ignored"));
    EXPECT_EQ(Location::PrecisionSatellite, manager->getPrecision());
    EXPECT_EQ(0, pal::pendingCellInfoRequests());
}

// The chain gives a fix it has no course for yet (the first after an 83 m
// jump, without bearing) network precision; the receiver still has its fix.
TEST_F(LocationManagerTest, SatelliteFixWithoutCourseKeepsSatellitePrecision) {
    deliver(fixAt(0));
    deliver(fixAt(10));
    ASSERT_EQ(Location::PrecisionSatellite, manager->getPrecision());
    heard.precisionChanges.clear();
    deliver(fixAt(200, 10.0f, -1.0f, -1.0f));
    ASSERT_EQ(3u, heard.locations.size());
    EXPECT_EQ(Location::PrecisionNetwork, heard.locations.back().precision);
    EXPECT_EQ(Location::PrecisionSatellite, manager->getPrecision());
    EXPECT_TRUE(heard.precisionChanges.empty());
}

// Jitter around a standing point, the first fix furthest off: the chain holds
// it, the Kalman filter settles near the middle, metres apart.
TEST_F(LocationManagerTest, SmootherSwitchesWhileRunningWithoutAJump) {
    EXPECT_EQ(Location::LocationSmoother::Chain, manager->getSmoother());
    deliver(fixAt(6.0f, 20.0f, -1.0f, -1.0f));
    for (int i = 0; i < 30; ++i) {
        deliver(fixAt(i % 2 == 0 ? -4.0f : 4.0f, 20.0f, -1.0f, -1.0f));
    }
    const std::vector<Location::Location> chainOnly = heard.locations;
    for (Location::LocationSmoother::Kind kind :
         {Location::LocationSmoother::Kalman, Location::LocationSmoother::Chain}) {
        manager->setSmoother(kind);
        EXPECT_EQ(kind, manager->getSmoother());
        const size_t before = heard.locations.size();
        for (int i = 0; i < 10; ++i) {
            deliver(fixAt(i % 2 == 0 ? -4.0f : 4.0f, 20.0f, -1.0f, -1.0f));
        }
        ASSERT_EQ(before + 10, heard.locations.size());
        // A fifth of the 6 m between the two at most, and the jitter the
        // filters let through; a jump would be the whole 6 m.
        float moved = 0.0f;
        for (size_t i = before; i < heard.locations.size(); ++i) {
            const float step = location_test::metresBetween(heard.locations[i - 1], heard.locations[i]);
            EXPECT_LT(step, 2.0f) << i;
            moved += step;
        }
        // It did go over to the other filter's position.
        EXPECT_GT(moved, 3.0f);
    }
}

// A provider of the test's own, to reach the reports' state check.
class IdleProvider : public Location::LocationProvider {
public:
    explicit IdleProvider(LocationManager* manager) : LocationProvider("Idle", manager) {}
    void enable() override {}
    void disable() override {}
    void report() {
        changePrecision(Location::PrecisionSatellite);
        reportNewLocation(Location::Location());
    }
};

TEST_F(LocationManagerTest, ReportsOfADisabledProviderAreLoggedAndDropped) {
    IdleProvider idle(manager);
    idle.report();
    EXPECT_TRUE(
        hasLogLine("LocationProvider::changePrecision: Idle: Precision change reported in an incorrect "
                   "state (0)"));
    EXPECT_TRUE(
        hasLogLine("LocationProvider::reportNewLocation: Idle: Location reported in an incorrect state (0)"));
    EXPECT_TRUE(heard.locations.empty());
    EXPECT_EQ(Location::PrecisionNone, idle.getPrecision());
}

// A listener told of a fix may remove itself, remove and destroy another,
// and add a third, which hears from the next fix on.
TEST_F(LocationManagerTest, ListenerMayRemoveItselfDestroyAnotherAndAddOneWhileBeingTold) {
    struct Remover : Location::LocationListener {
        void onLocationChanged(LocationManager* from, const Location::Location&) override {
            ++calls;
            from->removeLocationListener(this);
            from->removeLocationListener(victim.get());
            victim.reset();
            from->addLocationListener(added);
        }
        void onLocationPrecisionChanged(LocationManager*, Location::LocationPrecision,
                                        Location::LocationPrecision) override {}
        int calls = 0;
        std::unique_ptr<RecordingListener> victim;
        RecordingListener* added = nullptr;
    };
    Heard victimHeard;
    Heard addedHeard;
    RecordingListener added(addedHeard);
    Remover remover;
    remover.victim.reset(new RecordingListener(victimHeard));
    remover.added = &added;
    manager->addLocationListener(&remover);
    manager->addLocationListener(remover.victim.get());

    deliver(fixAt(0));
    deliver(fixAt(10));
    manager->removeLocationListener(&added);

    EXPECT_EQ(1, remover.calls);
    EXPECT_TRUE(victimHeard.locations.empty());
    EXPECT_EQ(1u, addedHeard.locations.size());
    EXPECT_EQ(2u, heard.locations.size());
}

}  // namespace
