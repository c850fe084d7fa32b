// Collecting one chunk over the simulated radios.
#include <boost/make_shared.hpp>
#include <string>
#include <vector>

#include "statistics/wifipool/impl/WifiPoolChunk.h"
#include "support/PalTest.h"

namespace {

using Statistics::ChunkInfo;
using Statistics::RequestInfo;
using Statistics::WifiPoolChunk;

const KDust kMs = 1000000ull;

typedef std::vector<boost::shared_ptr<RequestInfo> > Requests;

class WifiPoolChunkTest : public PalTest {
protected:
    void TearDown() override {
        EXPECT_EQ(0, pal::unreleasedRecords());
        PalTest::TearDown();
    }

    // Collects the chunk to the end and returns its text.
    std::string collect(const boost::shared_ptr<WifiPoolChunk>& chunk) {
        chunk->collect(
            WifiPoolChunk::ChunkCollectedCallback::make<WifiPoolChunkTest, &WifiPoolChunkTest::onCollected>(
                this));
        settle();
        EXPECT_EQ(1, finished);
        std::string out;
        chunk->node()->appendContent(out);
        return out;
    }

    // Lets the scripted radios answer one after the other.
    void settle() {
        for (int step = 0; step < 10; ++step) {
            advanceMs(1);
            pump();
        }
    }

public:
    void onCollected(boost::shared_ptr<WifiPoolChunk> chunk) {
        EXPECT_TRUE(chunk);
        ++finished;
    }

protected:
    static Location::Location fix(float accuracy) {
        Location::Location location;
        location.latitude = 55.75f;
        location.longitude = 37.5f;
        location.speed = 3.5f;
        location.bearing = -1;
        location.accuracy = accuracy;
        return location;
    }

    int finished = 0;
};

TEST_F(WifiPoolChunkTest, NothingObservedLeavesOnlyAnEmptyBssids) {
    pal::scriptSignalStrength(pal::Answer::after(kMs), false, 0);
    pal::scriptWifiScan(pal::Answer::after(kMs), {});
    EXPECT_EQ(
        "<chunk type=\"normal\" time=\"01012026:000000\" connection=\"wifi\"><bssids ></bssids></chunk>",
        collect(boost::make_shared<WifiPoolChunk>("normal", Requests())));
}

TEST_F(WifiPoolChunkTest, EverythingObservedInFixedOrder) {
    pal::scriptSignalStrength(pal::Answer::after(kMs), true, -67);
    pal::scriptCellInfo(pal::Answer::after(kMs), {true, 123456, 4321, "01", "250"});
    pal::scriptWifiScan(pal::Answer::after(kMs), {{"00:1A:2B:3C:4D:5E", "home", -40}, {"AA:BB", "", -90}});
    boost::shared_ptr<RequestInfo> measured = boost::make_shared<RequestInfo>();
    measured->path = "/search";
    measured->uploadSize = 200;
    measured->startTime = 1000;
    for (long long size : {10, 20, 30}) {
        measured->chunks.push_back(boost::make_shared<ChunkInfo>(size, 1000 + size * 100));
    }
    EXPECT_EQ(
        "<chunk type=\"error\" time=\"01012026:000000\" connection=\"wifi\">"
        "<request-timings ><r type=\"/search\"><u size=\"200\"></u><d size=\"10\" time=\"1000\"></d>"
        "<d size=\"20\" time=\"2000\"></d><d size=\"30\" time=\"3000\"></d></r></request-timings>"
        "<gps lat=\"55.750000\" lon=\"37.500000\" speed=\"3.500000\" course=\"-1.000000\"></gps>"
        "<cellinfos network_type=\"UNKNOWN\" radio_type=\"NONE\"><cellinfo cellid=\"123456\" lac=\"4321\" "
        "operatorid=\"01\" countrycode=\"250\" sigstr=\"-67\" age=\"0\"></cellinfo></cellinfos>"
        "<bssids ><bssid name=\"aG9tZQ==\" channel=\"0\" sigstr=\"-40\" age=\"0\">001A2B3C4D5E</bssid>"
        "<bssid name=\"\" channel=\"0\" sigstr=\"-90\" age=\"0\">AABB</bssid></bssids></chunk>",
        collect(boost::make_shared<WifiPoolChunk>("error", Requests{measured}, fix(-1))));
}

TEST_F(WifiPoolChunkTest, InaccurateFixAndUnknownCellAreLeftOut) {
    pal::scriptSignalStrength(pal::Answer::after(kMs), true, -67);
    pal::scriptCellInfo(pal::Answer::after(kMs), {false, 0, 0, "", ""});
    pal::scriptWifiScan(pal::Answer::after(kMs), {});
    EXPECT_EQ(
        "<chunk type=\"normal\" time=\"01012026:000000\" connection=\"wifi\"><bssids ></bssids></chunk>",
        collect(boost::make_shared<WifiPoolChunk>("normal", Requests(), fix(70.5f))));
}

TEST_F(WifiPoolChunkTest, SilentScannerStillFinishesTheChunk) {
    pal::scriptSignalStrength(pal::Answer::refuse(), true, 0);
    pal::scriptWifiScan(pal::Answer::never(), {});
    boost::shared_ptr<WifiPoolChunk> chunk = boost::make_shared<WifiPoolChunk>("normal", Requests(), fix(70));
    chunk->collect(
        WifiPoolChunk::ChunkCollectedCallback::make<WifiPoolChunkTest, &WifiPoolChunkTest::onCollected>(
            this));
    settle();
    EXPECT_EQ(0, finished);
    advance(Wireless::WifiScanRequest::kScanTimeoutNs);
    pump();
    EXPECT_EQ(1, finished);
    std::string out;
    chunk->node()->appendContent(out);
    EXPECT_NE(std::string::npos, out.find("<gps "));
    EXPECT_NE(std::string::npos, out.find("<bssids ></bssids></chunk>"));
}

TEST_F(WifiPoolChunkTest, SecondCollectIsRefused) {
    pal::scriptSignalStrength(pal::Answer::after(kMs), false, 0);
    pal::scriptWifiScan(pal::Answer::after(kMs), {});
    boost::shared_ptr<WifiPoolChunk> chunk = boost::make_shared<WifiPoolChunk>("normal", Requests());
    collect(chunk);
    chunk->collect(
        WifiPoolChunk::ChunkCollectedCallback::make<WifiPoolChunkTest, &WifiPoolChunkTest::onCollected>(
            this));
    expectAssertion("finishCallback == ChunkCollectedCallback()");
    settle();
    EXPECT_EQ(1, finished);
}

}  // namespace
