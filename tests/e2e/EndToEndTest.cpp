// The library end to end against the development server running in this
// process on 127.0.0.1: the startup cycle, network positioning on the demo's
// drive through a tunnel, and the statistics collector's uploads, checked on
// what the server received and decoded.
//
// Time is virtual and never moves while a request is on the wire, so every
// answer reaches the library at the same virtual instant as in any other run:
// the outcome does not depend on how fast the machine is.
#include <boost/make_shared.hpp>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "devserver/Server.h"
#include "location/LocationManager.h"
#include "location/simulator/GpxPlayer.h"
#include "location/simulator/GpxReader.h"
#include "network/NetworkManager.h"
#include "startup/StartupController.h"
#include "startup/StartupData.h"
#include "statistics/wifipool/NetworkCollectorWrapper.h"
#include "support/PalTest.h"

namespace {

using Startup::StartupData;

const KDust kStepMs = 100;
const int kIdlePumps = 10;
const pal::CellInfo kTunnelCell = {true, 23011, 4021, "26201", "262"};

// The positions the application hears.
class Positions : public Location::LocationListener {
public:
    void onLocationChanged(Location::LocationManager*, const Location::Location& location) override {
        heard.push_back(location);
    }
    void onLocationPrecisionChanged(Location::LocationManager*, Location::LocationPrecision,
                                    Location::LocationPrecision) override {}
    std::vector<Location::Location> heard;
};

class EndToEndTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        dataFolder = pal_test_detail::makeTempFolder();
        ASSERT_FALSE(dataFolder.empty());
        DevServer::Config config;
        std::string error;
        ASSERT_TRUE(DevServer::Config::load(MAPCORE_DEMO_DATA "/devserver.conf", config, error)) << error;
        // Periods without common multiples below 21 s, so no chunk is due at
        // the moment of an upload.
        config.scanTimeout = 3;
        config.sendTimeout = 7;
        config.quiet = true;
        configure(config);
        server.reset(new DevServer::Server(config, dataFolder));
        ASSERT_TRUE(server->start());
        pal::postAppResumed();
        pump();
        scriptRadios({{"00:1A:2B:00:00:01", "Caf\xC3\xA9", -48}, {"00:1A:2B:00:00:02", "home", -80}},
                     {true, 23010, 4021, "26201", "262"});
    }

    void TearDown() override {
        if (collector) {
            collector->shutdown();
            collector.reset();
        }
        PalTest::TearDown();
        server.reset();
        std::error_code ignored;
        std::filesystem::remove_all(dataFolder, ignored);
    }

    static void scriptRadios(const std::vector<pal::WifiNetwork>& networks, const pal::CellInfo& cell) {
        pal::scriptWifiScan(pal::Answer::after(0), networks);
        pal::scriptCellInfo(pal::Answer::after(0), cell);
        pal::scriptSignalStrength(pal::Answer::after(0), true, -71);
    }

    // Dispatches events until the requests on the wire have ended and a few
    // pumps in a row find nothing more to send: a radio answer scripted
    // without delay is posted while the previous one is dispatched, so one
    // pump is not enough. A request ends in an event on this thread, within
    // the engine's own time limit.
    void settle() {
        Network::NetworkManager* manager = Network::NetworkManager::getInstance();
        for (int idlePumps = 0; idlePumps < kIdlePumps;) {
            pump();
            if (manager->getNetworkActivityStatus() == Network::NetworkManager::NetworkActive) {
                kdWaitEvent(static_cast<KDust>(-1));
                idlePumps = 0;
            } else {
                ++idlePumps;
            }
        }
    }

    void runForMs(KDust milliseconds) {
        for (KDust elapsed = 0; elapsed < milliseconds; elapsed += kStepMs) {
            settle();
            advanceMs(kStepMs);
        }
        settle();
    }

    // The application's start: only the startup host is known, the
    // statistics collector waits for the server to switch it on.
    void startApplication() {
        StartupData::getInstance()->setHost(StartupData::HOST_STARTUP, server->baseUrl());
        collector = boost::make_shared<Statistics::NetworkCollectorWrapper>();
        collector->setModel("E2E \"Phone\" <A&B>");
        collector->enableByUser(true);
        collector->init();
        settle();
    }

    DevServer::Journal journal() const { return server->journal(); }

    virtual void configure(DevServer::Config& config) { (void)config; }

    std::string dataFolder;
    std::unique_ptr<DevServer::Server> server;
    boost::shared_ptr<Statistics::NetworkCollectorWrapper> collector;
};

TEST_F(EndToEndTest, StartupAsksWithoutUuidThenWithTheOneAnswered) {
    startApplication();
    ASSERT_TRUE(StartupData::getInstance()->startupReady);
    pal::postAppPaused();
    pal::postAppResumed();
    settle();

    const DevServer::Journal seen = journal();
    ASSERT_EQ(3u, seen.startups.size());
    const std::string uuid = seen.startups[0].answeredUuid;
    EXPECT_FALSE(uuid.empty());
    EXPECT_EQ("", seen.startups[0].sentUuid);
    EXPECT_EQ(uuid, seen.startups[1].sentUuid);
    EXPECT_EQ(uuid, seen.startups[2].sentUuid);
    EXPECT_EQ(uuid, StartupData::getInstance()->uuid);
    // The radios the startup listeners collected reached the server.
    EXPECT_EQ("23010", seen.startups[1].params.at("cellid"));
    EXPECT_EQ("4021", seen.startups[1].params.at("lac"));
    EXPECT_FALSE(seen.startups[1].params.at("wifi").empty());
    // The answer points every host back at the server and switches the
    // collector on with the configured periods.
    EXPECT_EQ(server->baseUrl(), StartupData::getInstance()->getHost(StartupData::HOST_CELLID));
    EXPECT_EQ(server->baseUrl(), StartupData::getInstance()->getHost(StartupData::HOST_DEFAULT));
    EXPECT_TRUE(collector->getNetworkCollector().isStarted());
    EXPECT_EQ(3, collector->getNetworkCollector().getScanTimeout());
    EXPECT_EQ(7, collector->getNetworkCollector().getSendTimeout());
}

TEST_F(EndToEndTest, TunnelDriveHandsOverToServerPositioningAndBack) {
    std::ifstream file(MAPCORE_DEMO_DATA "/tunnel-drive.gpx", std::ios::binary);
    std::vector<unsigned char> bytes((std::istreambuf_iterator<char>(file)),
                                     std::istreambuf_iterator<char>());
    std::vector<Simulator::GpxPoint> points;
    std::string error;
    ASSERT_TRUE(Simulator::GpxReader::parse(bytes, points, error)) << error;
    startApplication();
    scriptRadios({{"00:1a:2b:3c:4d:5e", "tunnel-cafe", -71}, {"00:1a:2b:3c:4d:5f", "tunnel-guest", -80}},
                 kTunnelCell);
    Positions positions;
    Location::LocationManager* manager = Location::LocationManager::getInstance();
    manager->addLocationListener(&positions);
    Simulator::GpxPlayer player(points);
    manager->setSimulator(&player);
    const size_t queriesBefore = journal().positionings.size();
    player.start();
    runForMs(80 * 1000);
    manager->setSimulator(nullptr);
    manager->removeLocationListener(&positions);

    // Every query made during the drive named the tunnel's radios, all known.
    const DevServer::Journal seen = journal();
    ASSERT_GT(seen.positionings.size(), queriesBefore);
    for (size_t i = queriesBefore; i < seen.positionings.size(); ++i) {
        const DevServer::PositioningRecord& query = seen.positionings[i];
        EXPECT_TRUE(query.found) << query.error;
        EXPECT_EQ(StartupData::getInstance()->uuid, query.uuid);
        ASSERT_EQ(3u, query.radios.size());
        EXPECT_EQ("001a2b3c4d5e", query.radios[0].id);
        EXPECT_EQ(-71, query.radios[0].signal);
        EXPECT_EQ("001a2b3c4d5f", query.radios[1].id);
        EXPECT_EQ("cell", query.radios[2].kind);
        for (const DevServer::SeenRadio& radio : query.radios) {
            EXPECT_TRUE(radio.known) << radio.id;
        }
    }
    // Satellite fixes, then the server's position in the tunnel, then
    // satellite fixes again; when the track has ended and no fix comes any
    // more, the server's position once more.
    std::string sources;
    for (const Location::Location& location : positions.heard) {
        const char source = location.precision == Location::PrecisionSatellite ? 's' : 'n';
        if (sources.empty() || sources.back() != source) {
            sources += source;
        }
        if (source == 'n') {
            EXPECT_NEAR(seen.positionings.back().latitude, location.latitude, 1e-4);
            EXPECT_NEAR(seen.positionings.back().longitude, location.longitude, 1e-4);
            EXPECT_NEAR(11.5866, location.longitude, 0.0015);
        }
    }
    EXPECT_EQ("snsn", sources);
    EXPECT_EQ(points.size(), player.getPlayedCount());
}

TEST_F(EndToEndTest, UploadsArriveDecodedWithTheChunksCollected) {
    startApplication();
    ASSERT_TRUE(collector->getNetworkCollector().isStarted());
    runForMs(7 * 1000);
    // Losing and regaining the network adds a chunk at once for each change.
    pal::setReachability(0);
    settle();
    pal::setReachability(1);
    settle();
    runForMs(7 * 1000);

    const DevServer::Journal seen = journal();
    ASSERT_EQ(2u, seen.uploads.size());
    const std::vector<std::string> first = {"normal", "normal"};
    const std::vector<std::string> second = {"disconnected", "connected", "normal", "normal"};
    EXPECT_EQ(first, seen.uploads[0].chunkTypes);
    EXPECT_EQ(second, seen.uploads[1].chunkTypes);
    for (const DevServer::UploadRecord& upload : seen.uploads) {
        EXPECT_TRUE(upload.accepted) << upload.status << " " << upload.reason;
        EXPECT_EQ(StartupData::getInstance()->uuid, upload.uuid);
        EXPECT_EQ("E2E \"Phone\" <A&B>", upload.model);
        EXPECT_EQ(2 * upload.chunks, upload.accessPoints);
        EXPECT_NE(std::string::npos, upload.document.find(">001A2B000001</bssid>")) << upload.document;
        EXPECT_NE(std::string::npos, upload.document.find("cellid=\"23010\" lac=\"4021\""))
            << upload.document;
        ASSERT_FALSE(upload.storedFile.empty());
        std::ifstream stored(dataFolder + "/" + upload.storedFile, std::ios::binary);
        const std::string content((std::istreambuf_iterator<char>(stored)), std::istreambuf_iterator<char>());
        EXPECT_EQ(upload.document, content);
    }
}

}  // namespace

// The uuid comes from the server's answer and the language from the platform: a space, "&",
// "+" or a non-ASCII letter in them must reach the server as they are, not break the URL (the
// request would fail locally and be retried for ever) nor add parameters.
class HostileStartupValuesTest : public EndToEndTest {
protected:
    void configure(DevServer::Config& config) override { config.uuidPrefix = "id 7&lang=xx+\xC3\xA9%41-"; }
};

TEST_F(HostileStartupValuesTest, ReachTheServerUnchangedAndTheStartupBecomesReady) {
    pal::setLocale("d\xC3\xA9 x", "A&B+C");
    startApplication();
    ASSERT_TRUE(StartupData::getInstance()->startupReady);

    const DevServer::Journal seen = journal();
    ASSERT_EQ(2u, seen.startups.size());
    const std::string uuid = "id 7&lang=xx+\xC3\xA9%41-1";
    EXPECT_EQ(uuid, seen.startups[0].answeredUuid);
    EXPECT_EQ(uuid, seen.startups[1].sentUuid);
    EXPECT_EQ(uuid, StartupData::getInstance()->uuid);
    for (const DevServer::StartupRecord& startup : seen.startups) {
        EXPECT_EQ("d\xC3\xA9 x-A&B+C", startup.params.at("lang"));
        EXPECT_EQ("1", startup.params.at("utf"));
    }
}
