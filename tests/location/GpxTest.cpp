#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>

#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "location/LocationManager.h"
#include "location/simulator/GpxPlayer.h"
#include "location/simulator/GpxReader.h"
#include "location/simulator/GpxRecorder.h"
#include "support/PalTest.h"
#include "support/ScopedLocale.h"

namespace {

using Simulator::GpxPoint;
using Simulator::GpxReader;

std::vector<unsigned char> bytesOf(const std::string& text) {
    return std::vector<unsigned char>(text.begin(), text.end());
}

std::string track(const std::string& points) {
    return "<?xml version=\"1.0\"?><gpx version=\"1.1\" "
           "xmlns=\"http://www.topografix.com/GPX/1/1\"><trk><trkseg>" +
           points + "</trkseg></trk></gpx>";
}

TEST(GpxReaderTest, ReadsATrackWrittenByPython) {
    std::ifstream file(MAPCORE_LOCATION_DATA "/python-track.gpx", std::ios::binary);
    ASSERT_TRUE(file.good());
    const std::vector<unsigned char> bytes((std::istreambuf_iterator<char>(file)),
                                           std::istreambuf_iterator<char>());
    std::vector<GpxPoint> points;
    std::string error;
    ASSERT_TRUE(GpxReader::parse(bytes, points, error)) << error;
    ASSERT_EQ(4u, points.size());
    struct Expected {
        float lat, lon, ele, speed, course, accuracy;
        long long timeMs;  // from Python's datetime
    };
    const Expected expected[] = {
        {52.520008f, 13.404954f, 34.5f, 12.5f, 90.0f, 10.0f, 1772359200000ll},
        {52.520100f, 13.405100f, -1.0f, -1.0f, -1.0f, 10.0f, 1772359201250ll},  // hdop 2 -> 10 m
        {52.520200f, 13.405300f, 35.0f, 0.0f, 359.5f, 10.0f, 1772359203500ll},
        {-33.8688f, 151.2093f, -1.0f, -1.0f, -1.0f, 10.0f, 1772359260000ll},
    };
    for (size_t i = 0; i < 4; ++i) {
        EXPECT_EQ(expected[i].lat, points[i].latitude) << i;
        EXPECT_EQ(expected[i].lon, points[i].longitude) << i;
        EXPECT_EQ(expected[i].ele, points[i].altitude) << i;
        EXPECT_EQ(expected[i].speed, points[i].speed) << i;
        EXPECT_EQ(expected[i].course, points[i].course) << i;
        EXPECT_EQ(expected[i].accuracy, points[i].accuracy) << i;
        EXPECT_EQ(expected[i].timeMs, points[i].timeMs) << i;
        EXPECT_EQ(2, points[i].precision) << i;
    }
}

TEST(GpxReaderTest, DamagedOrHostileFilesGiveAnErrorAndNoPoints) {
    const std::string good = "<trkpt lat=\"1\" lon=\"2\"><time>2026-01-01T00:00:01Z</time></trkpt>";
    std::string deep = "<gpx>";
    for (int i = 0; i < 100000; ++i) {
        deep += "<a x='/>'>";
    }
    struct Case {
        std::string text;
        const char* error;
    };
    const Case cases[] = {
        {"", "not well-formed XML"},
        {"just text", "not well-formed XML"},
        {track(good).substr(0, 90), "not well-formed XML"},
        {std::string("<gpx>\0</gpx>", 12), "not a text file"},
        {"<kml><trk><trkseg>" + good + "</trkseg></trk></kml>", "no <gpx> root element"},
        {track(""), "no track points"},
        {track("<trkpt lon=\"2\"/>"), "track point 1: latitude or longitude"},
        {track(good + "<trkpt lat=\"91\" lon=\"2\"><time>2026-01-01T00:00:02Z</time></trkpt>"),
         "track point 2: latitude or longitude"},
        {track("<trkpt lat=\"nan\" lon=\"2\"/>"), "latitude or longitude"},
        {track("<trkpt lat=\"1\" lon=\"2abc\"/>"), "latitude or longitude"},
        {track("<trkpt lat=\"1\" lon=\"-inf\"/>"), "latitude or longitude"},
        {track(good + "<trkpt lat=\"1\" lon=\"2\"><time>2026-01-01T00:00:00Z</time></trkpt>"),
         "track point 2: time goes backwards"},
        {track(good + "<trkpt lat=\"1\" lon=\"2\"/>"), "track point 2: <time> on some points only"},
        {track("<trkpt lat=\"1\" lon=\"2\"><time>2026-02-30T00:00:00Z</time></trkpt>"), "bad <time>"},
        {track("<trkpt lat=\"1\" lon=\"2\"><time>yesterday</time></trkpt>"), "bad <time>"},
        {track("<trkpt lat=\"1\" lon=\"2\"><speed>-3</speed></trkpt>"), "bad <speed>"},
        {track("<trkpt lat=\"1\" lon=\"2\"><extensions><x:course>720</x:course></extensions></trkpt>"),
         "bad <course>"},
        {track("<trkpt lat=\"1\" lon=\"2\"><ele>1e30</ele></trkpt>"), "bad <ele>"},
        {track("<trkpt lat=\"1\" lon=\"2\"><extensions><m:precision>1.5</m:precision></extensions></trkpt>"),
         "bad <precision>"},
        {deep, "elements nested deeper than 64 levels"},
    };
    for (const Case& c : cases) {
        std::vector<GpxPoint> points(1);
        std::string error;
        EXPECT_FALSE(GpxReader::parse(bytesOf(c.text), points, error)) << c.error;
        EXPECT_TRUE(points.empty()) << c.error;
        EXPECT_NE(std::string::npos, error.find(c.error)) << error;
    }
}

std::string repeat(const std::string& text, int times) {
    std::string all;
    for (int i = 0; i < times; ++i) {
        all += text;
    }
    return all;
}

// Each of these once crashed the reader, read past its buffer or took 16 s; they go through the
// library's one XML loading path now, whose checks come before TinyXML sees the text.
TEST(GpxReaderTest, HostileFilesAreRefusedBeforeTheParserSeesThem) {
    const std::string point = "<trkpt lat=\"1\" lon=\"2\"/>";
    std::string manyAttributes = "<gpx";
    for (int i = 0; i < 40000; ++i) {
        manyAttributes += " a" + std::to_string(i) + "=\"\"";
    }
    manyAttributes += "><trk><trkseg>" + point + "</trkseg></trk></gpx>";
    const struct {
        std::string text;
        const char* error;
    } cases[] = {
        // 2.2 MB: end tags before the root took the old nesting count below zero, and TinyXML's
        // recursion through the open elements after them overflowed the stack.
        {repeat("</x>", 200000) + repeat("<a>", 200000), "end tag </x> without a start tag"},
        {manyAttributes, "element <gpx> has more than 32 attributes"},
        // Ends inside a UTF-8 sequence: TinyXML stepped two bytes past the unpadded buffer.
        {"<?xml version=\"1.0\" encoding=\"UTF-8\"?><x a=\"\xF0", "not well-formed XML"},
    };
    for (const auto& c : cases) {
        std::vector<GpxPoint> points;
        std::string error;
        EXPECT_FALSE(GpxReader::parse(bytesOf(c.text), points, error));
        EXPECT_TRUE(points.empty());
        EXPECT_NE(std::string::npos, error.find(c.error)) << error;
    }
}

class GpxLocaleTest : public PalTest {};

// Under a decimal-comma locale the recorder once wrote lat="48,125" and the reader refused
// its own track.
TEST_F(GpxLocaleTest, RecordedTrackReadsBackUnderADecimalCommaLocale) {
    ScopedLocale german("de_DE.UTF-8");
    if (!german.active()) {
        GTEST_SKIP() << "no de_DE.UTF-8 locale";
    }
    Simulator::GpxRecorder recorder;
    recorder.recordLocation(48.125f, -11.5f, 3.25f, 90.5f, 4.75f, 520.25f, 2);
    const std::string text = recorder.toGpx();
    EXPECT_NE(std::string::npos, text.find("lat=\"48.125\" lon=\"-11.5\"")) << text;

    std::vector<GpxPoint> points;
    std::string error;
    ASSERT_TRUE(GpxReader::parse(bytesOf(text), points, error)) << error;
    ASSERT_EQ(1u, points.size());
    EXPECT_EQ(48.125f, points[0].latitude);
    EXPECT_EQ(-11.5f, points[0].longitude);
    EXPECT_EQ(3.25f, points[0].speed);
    EXPECT_EQ(90.5f, points[0].course);
    EXPECT_EQ(4.75f, points[0].accuracy);
    EXPECT_EQ(520.25f, points[0].altitude);
}

// Fix and status events as the location provider would receive them.
struct Delivery {
    KDust time;
    KDint32 type;
    float latitude;
    int status;
};

std::vector<Delivery>* deliveries = nullptr;

void onLocationEvent(const KDEvent* event) {
    auto* fix = static_cast<KDLocationFixZVR*>(event->data.p[0]);
    EXPECT_EQ(static_cast<KDust>(-1), event->timestamp);
    deliveries->push_back({kdGetTimeUST(), event->type, fix->latitude, -1});
    kdFree(fix);
}

void onStatusEvent(const KDEvent* event) {
    deliveries->push_back({kdGetTimeUST(), event->type, 0.0f, static_cast<int>(event->data.words[0])});
}

class GpxPlayerTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        deliveries = &heard;
        kdInstallCallback(&onLocationEvent, KD_EVENT_LOCATION_ZVR, nullptr);
        kdInstallCallback(&onStatusEvent, KD_EVENT_LOCATION_STATUS_ZVR, nullptr);
    }
    void TearDown() override {
        kdInstallCallback(nullptr, KD_EVENT_LOCATION_ZVR, nullptr);
        kdInstallCallback(nullptr, KD_EVENT_LOCATION_STATUS_ZVR, nullptr);
        deliveries = nullptr;
        PalTest::TearDown();
    }

public:
    void onFinished() { ++finishedCalls; }

protected:
    std::vector<Delivery> heard;
    int finishedCalls = 0;
};

TEST_F(GpxPlayerTest, PlaysFixesOnTheTrackTimesAndReportsGapsAsLostFixes) {
    const KDint64 t0 = 1767225600000ll;
    const std::vector<GpxPoint> points = {
        {1.0f, 0.0f, -1.0f, -1.0f, -1.0f, 5.0f, 2, t0},
        {2.0f, 0.0f, -1.0f, -1.0f, -1.0f, 5.0f, 2, t0 + 1500},
        {3.0f, 0.0f, -1.0f, -1.0f, -1.0f, 5.0f, 2, t0 + 11500},  // after a 10 s gap
    };
    Simulator::GpxPlayer player(points, 2.0f);
    const KDust start = kdGetTimeUST();
    player.start(Simulator::GpxPlayer::Finished::make<GpxPlayerTest, &GpxPlayerTest::onFinished>(this));
    pump();
    EXPECT_TRUE(player.isPlaying());
    // Posted fixes are dispatched at the next pump; steps of 250 ms keep
    // every due time on a step.
    for (int step = 0; step < 40; ++step) {
        advanceMs(250);
    }
    EXPECT_FALSE(player.isPlaying());
    EXPECT_EQ(1, finishedCalls);
    // At rate 2: fixes at 0, 0.75 s; lost 1.5 s later; found with the fix at 5.75 s.
    const Delivery expected[] = {
        {0, KD_EVENT_LOCATION_ZVR, 1.0f, -1},          {750, KD_EVENT_LOCATION_ZVR, 2.0f, -1},
        {2250, KD_EVENT_LOCATION_STATUS_ZVR, 0.0f, 1}, {5750, KD_EVENT_LOCATION_STATUS_ZVR, 0.0f, 2},
        {5750, KD_EVENT_LOCATION_ZVR, 3.0f, -1},
    };
    ASSERT_EQ(5u, heard.size());
    for (size_t i = 0; i < 5; ++i) {
        EXPECT_EQ(expected[i].time, (heard[i].time - start) / 1000000) << i;
        EXPECT_EQ(expected[i].type, heard[i].type) << i;
        EXPECT_EQ(expected[i].latitude, heard[i].latitude) << i;
        EXPECT_EQ(expected[i].status, heard[i].status) << i;
    }
}

TEST_F(GpxPlayerTest, StoppedOrEmptyPlayersPostNothingMore) {
    const std::vector<GpxPoint> points(5, GpxPoint{1.0f, 2.0f, -1.0f, -1.0f, -1.0f, 5.0f, 2, -1});
    Simulator::GpxPlayer player(points);
    player.start();
    pump();
    advanceMs(1000);
    player.stop();
    advanceMs(10000);
    EXPECT_EQ(2u, heard.size());

    Simulator::GpxPlayer empty({});
    empty.start(Simulator::GpxPlayer::Finished::make<GpxPlayerTest, &GpxPlayerTest::onFinished>(this));
    EXPECT_FALSE(empty.isPlaying());
    EXPECT_EQ(1, finishedCalls);
    advanceMs(10000);
    EXPECT_EQ(2u, heard.size());
}

// Records what the provider admits while another simulator decides replay.
class Tee : public Simulator::AbstractSimulator {
public:
    explicit Tee(Simulator::AbstractSimulator& inner) : inner(inner) {}
    bool isReplaying() override { return inner.isReplaying(); }
    bool isRecording() override { return true; }
    void recordLocation(float latitude, float longitude, float speed, float bearing, float accuracy,
                        float altitude, int precision) override {
        recorder.recordLocation(latitude, longitude, speed, bearing, accuracy, altitude, precision);
        inner.recordLocation(latitude, longitude, speed, bearing, accuracy, altitude, precision);
    }
    Simulator::AbstractSimulator& inner;
    Simulator::GpxRecorder recorder;
};

class Positions : public Location::LocationListener {
public:
    void onLocationChanged(Location::LocationManager*, const Location::Location& location) override {
        heard.push_back(location);
    }
    std::vector<Location::Location> heard;
};

class GpxDriveTest : public PalTest {};

TEST_F(GpxDriveTest, RecordedDriveReplaysAsTheSameFixes) {
    Location::LocationManager* manager = Location::LocationManager::getInstance();
    pal::postAppResumed();
    pump();
    Positions recordedDrive;
    manager->addLocationListener(&recordedDrive);
    Simulator::GpxRecorder recorder;
    manager->setSimulator(&recorder);
    // 12 fixes, 12 m apart, some without speed or bearing, at uneven intervals.
    const KDust intervalsMs[] = {1000, 1000, 1500, 1000, 2000, 1000, 1000, 1250, 1000, 1000, 1000, 1000};
    for (int i = 0; i < 12; ++i) {
        advanceMs(intervalsMs[i]);
        const float speed = i % 3 == 0 ? -1.0f : 11.5f + 0.1f * i;
        const float bearing = i % 4 == 0 ? -1.0f : 44.0f + i;
        pal::injectLocationFix(
            {47.0f + 0.000076f * i, 8.0f + 0.000112f * i, speed, bearing, 6.0f + i, 400.0f + i, 2});
        pump();
    }
    ASSERT_EQ(12u, recorder.getPoints().size());
    ASSERT_TRUE(recorder.save("/data/drive.gpx"));

    std::vector<GpxPoint> points;
    std::string error;
    ASSERT_TRUE(GpxReader::readFile("/data/drive.gpx", points, error)) << error;
    Simulator::GpxPlayer player(points);
    Tee tee(player);
    manager->setSimulator(&tee);
    manager->removeLocationListener(&recordedDrive);
    Positions replayed;
    manager->addLocationListener(&replayed);
    // The real receiver goes on meanwhile and is ignored.
    player.start();
    pump();
    for (int step = 0; step < 80; ++step) {
        if (step % 4 == 0) {
            pal::injectLocationFix({10.0f, 10.0f, 1.0f, 1.0f, 5.0f, 0.0f, 2});
        }
        advanceMs(250);
    }
    manager->setSimulator(nullptr);
    manager->removeLocationListener(&replayed);

    const std::vector<GpxPoint>& again = tee.recorder.getPoints();
    ASSERT_EQ(recorder.getPoints().size(), again.size());
    for (size_t i = 0; i < again.size(); ++i) {
        const GpxPoint& a = recorder.getPoints()[i];
        const GpxPoint& b = again[i];
        EXPECT_EQ(a.latitude, b.latitude) << i;
        EXPECT_EQ(a.longitude, b.longitude) << i;
        EXPECT_EQ(a.speed, b.speed) << i;
        EXPECT_EQ(a.course, b.course) << i;
        EXPECT_EQ(a.accuracy, b.accuracy) << i;
        EXPECT_EQ(a.altitude, b.altitude) << i;
        EXPECT_EQ(a.timeMs - recorder.getPoints()[0].timeMs, b.timeMs - again[0].timeMs) << i;
    }
    // The drive ends more than 83 m from its start, so the replay starts the
    // filters afresh and every filtered position comes out the same.
    ASSERT_EQ(recordedDrive.heard.size(), replayed.heard.size());
    for (size_t i = 0; i < replayed.heard.size(); ++i) {
        EXPECT_EQ(recordedDrive.heard[i].x, replayed.heard[i].x) << i;
        EXPECT_EQ(recordedDrive.heard[i].y, replayed.heard[i].y) << i;
        EXPECT_EQ(recordedDrive.heard[i].speed, replayed.heard[i].speed) << i;
        EXPECT_EQ(recordedDrive.heard[i].bearing, replayed.heard[i].bearing) << i;
        EXPECT_EQ(recordedDrive.heard[i].precision, replayed.heard[i].precision) << i;
        EXPECT_EQ(-1, replayed.heard[i].fixTime) << i;
    }
}

}  // namespace
