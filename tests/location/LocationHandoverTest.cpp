#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>

#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "location/LocationManager.h"
#include "location/LocationProviderGPS.h"
#include "network/NetworkManager.h"
#include "startup/StartupData.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"

namespace {

using Location::LocationManager;

const char kAnswer[] =
    "<location><coordinates latitude=\"48.1372\" longitude=\"11.5756\" accuracy=\"150\"/></location>";

class Positions : public Location::LocationListener {
public:
    void onLocationChanged(LocationManager*, const Location::Location& location) override {
        heard.push_back(location);
    }
    void onLocationPrecisionChanged(LocationManager*, Location::LocationPrecision oldPrecision,
                                    Location::LocationPrecision newPrecision) override {
        precisionChanges.push_back(std::make_pair(oldPrecision, newPrecision));
    }
    size_t networkFixes() const {
        size_t count = 0;
        for (const Location::Location& location : heard) {
            count += location.precision == Location::PrecisionSatellite ? 0 : 1;
        }
        return count;
    }
    std::vector<Location::Location> heard;
    std::vector<std::pair<int, int> > precisionChanges;
};

// Network positioning against a positioning server on loopback, with the
// radios scripted to answer at once; satellite fixes from the simulated
// receiver. The HTTP exchange takes real time, so waits are bounded by a
// generous real-time limit; timers run on the virtual clock.
class LocationHandoverTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        reply.contentType = "text/xml";
        reply.body = kAnswer;
        server.on("/cellid_location/", reply);
        pal::scriptWifiScan(pal::Answer::after(0), {{"00:11:22:33:44:55", "home", -61}});
        pal::scriptCellInfo(pal::Answer::after(0), {true, 4711, 815, "26201", "262"});
        pal::scriptSignalStrength(pal::Answer::after(0), true, -80);
        Startup::StartupData* startup = Startup::StartupData::getInstance();
        startup->setHost(Startup::StartupData::HOST_CELLID, server.url("/"));
        startup->uuid = "test-client";
        startup->startupReady = true;
        manager = LocationManager::getInstance();
        manager->addLocationListener(&positions);
    }
    void TearDown() override {
        manager->removeLocationListener(&positions);
        PalTest::TearDown();
    }

    // Pumps until condition holds or the generous real-time bound runs out.
    // It polls: the server's side posts nothing to this thread, and on the
    // virtual clock a wait for an event would not end by itself.
    bool waitFor(const std::function<bool()>& condition) {
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (!condition()) {
            if (std::chrono::steady_clock::now() >= end) {
                return false;
            }
            pump();
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return true;
    }
    bool waitForNetworkFixes(size_t count) {
        return waitFor([this, count] { return positions.networkFixes() >= count; });
    }
    // Whether network positioning still runs while satellite fixes keep
    // coming: with the cell never answering, any attempt in the next minute
    // leaves a cell request open.
    bool positioningRunsInTheNextMinute() {
        pal::scriptCellInfo(pal::Answer::never(), {});
        for (int second = 0; second < 60; ++second) {
            advanceMs(1000);
            satelliteFix(48.2f);
        }
        return pal::pendingCellInfoRequests() > 0;
    }
    // From now on a network positioning attempt stays open, so that
    // positioningAsked() tells whether one started.
    void holdPositioningAttempts() { pal::scriptCellInfo(pal::Answer::never(), {}); }
    bool positioningAsked() {
        pump();
        return pal::pendingCellInfoRequests() > 0;
    }
    // Until the server has answered the next request and the answer has been
    // handed over on this thread.
    bool waitForAnswer(size_t requestsBefore) {
        Network::NetworkManager* network = Network::NetworkManager::getInstance();
        return waitFor([this, network, requestsBefore] {
            return server.requestCount() > requestsBefore &&
                   network->getNetworkActivityStatus() == Network::NetworkManager::NetworkIdle;
        });
    }
    void satelliteFix(float latitude) {
        pal::injectLocationFix({latitude, 11.5f, 12.0f, 90.0f, 8.0f, 520.0f, 2});
        pump();
    }
    void resume() {
        pal::postAppResumed();
        pump();
    }

    TestHttpServer server;
    TestHttpServer::Reply reply;
    LocationManager* manager = nullptr;
    Positions positions;
};

TEST_F(LocationHandoverTest, NetworkPositionsUntilTheFirstSatelliteFix) {
    resume();
    ASSERT_TRUE(waitForNetworkFixes(1));
    const Location::Location& network = positions.heard[0];
    EXPECT_EQ(48.1372f, network.latitude);
    EXPECT_EQ(11.5756f, network.longitude);
    EXPECT_EQ(150.0f, network.accuracy);
    EXPECT_EQ(Location::PrecisionNetwork, network.precision);
    EXPECT_EQ(-1.0f, network.speed);
    EXPECT_EQ(-1.0f, network.altitude);
    EXPECT_EQ("/cellid_location/", server.received()[0].path);

    // Every 15 s while there is no satellite fix.
    advanceMs(15000);
    ASSERT_TRUE(waitForNetworkFixes(2));

    satelliteFix(48.2f);
    ASSERT_EQ(3u, positions.heard.size());
    EXPECT_EQ(Location::PrecisionSatellite, positions.heard[2].precision);
    EXPECT_EQ(Location::PrecisionSatellite, manager->getPrecision());
    EXPECT_FALSE(positioningRunsInTheNextMinute());
    EXPECT_EQ(2u, positions.networkFixes());
}

TEST_F(LocationHandoverTest, LosingTheSatelliteFixHandsOverToNetworkAndBack) {
    resume();
    ASSERT_TRUE(waitForNetworkFixes(1));
    satelliteFix(48.2f);
    positions.precisionChanges.clear();

    // A repeated "available" changes nothing.
    pal::injectLocationStatus(2);
    pump();
    EXPECT_TRUE(positions.precisionChanges.empty());

    pal::injectLocationStatus(1);
    pump();
    ASSERT_EQ(1u, positions.precisionChanges.size());
    EXPECT_EQ(std::make_pair(2, 1), positions.precisionChanges[0]);
    ASSERT_TRUE(waitForNetworkFixes(2));
    EXPECT_EQ(Location::PrecisionNetwork, manager->getLastLocation().precision);

    pal::injectLocationStatus(2);
    satelliteFix(48.2001f);
    EXPECT_EQ(Location::PrecisionSatellite, manager->getLastLocation().precision);
    EXPECT_EQ(Location::PrecisionSatellite, manager->getPrecision());
    EXPECT_FALSE(positioningRunsInTheNextMinute());
}

TEST_F(LocationHandoverTest, PauseStopsBothProvidersAndResumeStartsThemAgain) {
    resume();
    ASSERT_TRUE(waitForNetworkFixes(1));
    pal::postAppPaused();
    pump();
    EXPECT_FALSE(pal::isLocationStarted());
    EXPECT_FALSE(positioningRunsInTheNextMinute());
    EXPECT_EQ(1u, positions.heard.size());

    resume();
    EXPECT_TRUE(pal::isLocationStarted());
    EXPECT_EQ(1, pal::pendingCellInfoRequests());
}

TEST_F(LocationHandoverTest, BadPositioningAnswersNeverReachListenersAsPositions) {
    const char* const answers[] = {
        "<location><coordinates latitude=\"nan\" longitude=\"11\" accuracy=\"10\"/></location>",
        "<location><coordinates latitude=\"95\" longitude=\"11\" accuracy=\"10\"/></location>",
        "<location><coordinates latitude=\"48\" longitude=\"11\"/></location>",
        "<error code=\"17\"/>",
        "<location><coordinates latitude=\"48\"",
        "",
    };
    resume();
    ASSERT_TRUE(waitForNetworkFixes(1));
    for (const char* answer : answers) {
        reply.body = answer;
        server.on("/cellid_location/", reply);
        const size_t requests = server.requestCount();
        advanceMs(15000);
        ASSERT_TRUE(waitForAnswer(requests)) << answer;
    }
    reply.status = 503;
    reply.body = kAnswer;
    server.on("/cellid_location/", reply);
    const size_t requests = server.requestCount();
    advanceMs(15000);
    ASSERT_TRUE(waitForAnswer(requests));
    EXPECT_EQ(1u, positions.heard.size());

    // A negative accuracy gives a fix of precision none, which does not
    // change the overall precision.
    reply.status = 200;
    reply.body = "<location><coordinates latitude=\"48\" longitude=\"11\" accuracy=\"-5\"/></location>";
    server.on("/cellid_location/", reply);
    const Location::LocationPrecision overall = manager->getPrecision();
    const size_t heardBefore = positions.heard.size();
    advanceMs(15000);
    ASSERT_TRUE(waitFor([&] { return positions.heard.size() > heardBefore; }));
    EXPECT_EQ(Location::PrecisionNone, positions.heard.back().precision);
    EXPECT_LT(positions.heard.back().accuracy, 0.0f);
    EXPECT_EQ(overall, manager->getPrecision());
}

// The receiver reports searching, then a fix (which stops network
// positioning), then searching again: that is a lost fix too.
TEST_F(LocationHandoverTest, FixLostAgainAfterAFixWhileSearchingHandsOver) {
    resume();
    ASSERT_TRUE(waitForNetworkFixes(1));
    pal::injectLocationStatus(1);
    pump();
    satelliteFix(48.2f);
    holdPositioningAttempts();
    ASSERT_FALSE(positioningAsked());
    positions.precisionChanges.clear();

    pal::injectLocationStatus(1);
    EXPECT_TRUE(positioningAsked());
    ASSERT_EQ(1u, positions.precisionChanges.size());
    EXPECT_EQ(std::make_pair(2, 1), positions.precisionChanges[0]);
}

// A receiver that just stops delivering (no status event) is taken as having
// lost its fix after the timeout, and the server's first answer is delivered.
TEST_F(LocationHandoverTest, FixesStoppingWithoutAStatusHandOverAfterTheTimeout) {
    resume();
    ASSERT_TRUE(waitForNetworkFixes(1));
    satelliteFix(48.2f);
    advanceMs(1000);
    satelliteFix(48.2001f);
    holdPositioningAttempts();
    advanceMs(Location::LocationProviderGPS::kFixLostAfterMs - 1);
    ASSERT_FALSE(positioningAsked());
    EXPECT_EQ(Location::PrecisionSatellite, manager->getPrecision());

    pal::scriptCellInfo(pal::Answer::after(0), {true, 4711, 815, "26201", "262"});
    advanceMs(1);
    ASSERT_TRUE(waitForNetworkFixes(2));
    EXPECT_EQ(Location::PrecisionNetwork, manager->getPrecision());
    EXPECT_EQ(Location::PrecisionNetwork, manager->getLastLocation().precision);
}

TEST_F(LocationHandoverTest, AnswerWithoutAccuracyAfterHandoverKeepsNetworkPrecision) {
    resume();
    ASSERT_TRUE(waitForNetworkFixes(1));
    satelliteFix(48.2f);
    pal::injectLocationStatus(1);
    pump();
    ASSERT_TRUE(waitForNetworkFixes(2));
    ASSERT_EQ(Location::PrecisionNetwork, manager->getPrecision());
    positions.precisionChanges.clear();

    reply.body = "<location><coordinates latitude=\"48\" longitude=\"11\" accuracy=\"-5\"/></location>";
    server.on("/cellid_location/", reply);
    const size_t heardBefore = positions.heard.size();
    advanceMs(15000);
    ASSERT_TRUE(waitFor([&] { return positions.heard.size() > heardBefore; }));
    EXPECT_EQ(Location::PrecisionNone, positions.heard.back().precision);
    EXPECT_EQ(Location::PrecisionNetwork, manager->getPrecision());
    EXPECT_TRUE(positions.precisionChanges.empty());
}

}  // namespace
