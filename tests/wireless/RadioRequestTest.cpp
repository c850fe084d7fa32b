// The one-shot radio requests over the simulated platform radios.
#include <gmock/gmock.h>
#include <unistd.h>

#include <boost/make_shared.hpp>
#include <boost/shared_ptr.hpp>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/PalTest.h"
#include "wireless/TelephonyNetworkInfoRequest.h"
#include "wireless/TelephonySignalStrengthRequest.h"
#include "wireless/WifiScanRequest.h"

namespace {

using Wireless::TelephonyNetworkInfo;
using Wireless::TelephonyNetworkInfoRequest;
using Wireless::TelephonySignalStrengthRequest;
using Wireless::WifiScanRequest;
using Wireless::WifiScanResult;

const KDust kMs = 1000000ull;

typedef std::vector<boost::shared_ptr<WifiScanResult> > Results;

// Records each report; the request may be dropped from inside its callback.
struct Receiver {
    std::vector<Results> scans;
    std::vector<boost::shared_ptr<TelephonyNetworkInfo> > cells;
    std::vector<std::pair<bool, int> > strengths;
    boost::shared_ptr<WifiScanRequest> scanToDrop;

    void onScan(const Results& results) {
        scans.push_back(results);
        scanToDrop.reset();
    }
    void onCell(boost::shared_ptr<TelephonyNetworkInfo> info) { cells.push_back(info); }
    void onStrength(bool success, int strength) { strengths.push_back(std::make_pair(success, strength)); }

    WifiScanRequest::Callback scan() {
        return WifiScanRequest::Callback::make<Receiver, &Receiver::onScan>(this);
    }
    TelephonyNetworkInfoRequest::Callback cell() {
        return TelephonyNetworkInfoRequest::Callback::make<Receiver, &Receiver::onCell>(this);
    }
    TelephonySignalStrengthRequest::Callback strength() {
        return TelephonySignalStrengthRequest::Callback::make<Receiver, &Receiver::onStrength>(this);
    }
};

class RadioRequestTest : public PalTest {
protected:
    void TearDown() override {
        EXPECT_EQ(0, pal::unreleasedRecords());
        PalTest::TearDown();
    }

    Receiver receiver;
};

TEST_F(RadioRequestTest, ScanReportsAccessPointsInPlatformOrderWithoutColons) {
    pal::scriptWifiScan(pal::Answer::after(200 * kMs),
                        {{"00:1A:2B:3C:4D:5E", "home net", -61}, {"001a2b3c4d5f", "", -80}});
    // Dropped from inside its own callback, as its owners do.
    receiver.scanToDrop = boost::make_shared<WifiScanRequest>();
    receiver.scanToDrop->start(receiver.scan());
    advanceMs(199);
    EXPECT_TRUE(receiver.scans.empty());
    advanceMs(1);
    ASSERT_EQ(1u, receiver.scans.size());
    const Results& results = receiver.scans[0];
    ASSERT_EQ(2u, results.size());
    EXPECT_EQ("001A2B3C4D5E", results[0]->getBssid());
    EXPECT_EQ("home net", results[0]->getSsid());
    EXPECT_EQ(-61, results[0]->getSignalStrength());
    EXPECT_EQ("001a2b3c4d5f", results[1]->getBssid());
    EXPECT_EQ(-80, results[1]->getSignalStrength());
    EXPECT_EQ(0, pal::activeTimerCount());
}

TEST_F(RadioRequestTest, ScanWithoutAnswerEndsEmptyAfterThreeSecondsAndALateAnswerIsIgnored) {
    pal::scriptWifiScan(pal::Answer::after(5000 * kMs), {{"00:11:22:33:44:55", "late", -50}});
    WifiScanRequest request;
    request.start(receiver.scan());
    advanceMs(2999);
    EXPECT_TRUE(receiver.scans.empty());
    advanceMs(1);
    ASSERT_EQ(1u, receiver.scans.size());
    EXPECT_TRUE(receiver.scans[0].empty());
    EXPECT_EQ(0, pal::pendingWifiScans());
    advanceMs(10000);
    pump();
    EXPECT_EQ(1u, receiver.scans.size());
}

TEST_F(RadioRequestTest, EmptyAndRefusedScansReportAnEmptyListAtOnce) {
    for (pal::Answer answer : {pal::Answer::after(0), pal::Answer::refuse()}) {
        receiver.scans.clear();
        pal::scriptWifiScan(answer, {});
        WifiScanRequest request;
        request.start(receiver.scan());
        pump();
        ASSERT_EQ(1u, receiver.scans.size());
        EXPECT_TRUE(receiver.scans[0].empty());
        advanceMs(3000);
        EXPECT_EQ(1u, receiver.scans.size());
    }
}

TEST_F(RadioRequestTest, RestartOrCancelSilencesTheEarlierQuery) {
    pal::scriptWifiScan(pal::Answer::after(100 * kMs), {{"00:00:00:00:00:01", "first", -1}});
    pal::scriptCellInfo(pal::Answer::after(100 * kMs), {true, 1, 1, "1", "1"});
    pal::scriptSignalStrength(pal::Answer::after(100 * kMs), true, -1);
    WifiScanRequest scan;
    TelephonyNetworkInfoRequest cell;
    TelephonySignalStrengthRequest strength;
    scan.start(receiver.scan());
    cell.start(receiver.cell());
    strength.start(receiver.strength());
    advanceMs(50);

    pal::scriptWifiScan(pal::Answer::after(100 * kMs), {{"00:00:00:00:00:02", "second", -2}});
    pal::scriptCellInfo(pal::Answer::after(100 * kMs), {true, 2, 2, "2", "2"});
    scan.start(receiver.scan());
    cell.start(receiver.cell());
    strength.cancel();
    advanceMs(5000);
    pump();

    ASSERT_EQ(1u, receiver.scans.size());
    EXPECT_EQ("second", receiver.scans[0].at(0)->getSsid());
    ASSERT_EQ(1u, receiver.cells.size());
    EXPECT_EQ(2, receiver.cells[0]->getCellID());
    EXPECT_TRUE(receiver.strengths.empty());
    EXPECT_EQ(
        0, pal::pendingWifiScans() + pal::pendingCellInfoRequests() + pal::pendingSignalStrengthRequests());
}

TEST_F(RadioRequestTest, TelephonyAnswersAndRefusalsEachReportOnce) {
    const std::string operatorCode(16, '7');
    const std::string countryCode(18, '4');
    const struct {
        pal::Answer answer;
        bool known;
    } rounds[] = {
        {pal::Answer::after(0), true}, {pal::Answer::after(0), false}, {pal::Answer::refuse(), true}};
    TelephonyNetworkInfoRequest cell;
    TelephonySignalStrengthRequest strength;
    for (const auto& round : rounds) {
        pal::scriptCellInfo(round.answer, {round.known, 123456, 4321, operatorCode, countryCode});
        pal::scriptSignalStrength(round.answer, round.known, -73);
        cell.start(receiver.cell());
        strength.start(receiver.strength());
        pump();
    }

    ASSERT_EQ(3u, receiver.cells.size());
    ASSERT_EQ(3u, receiver.strengths.size());
    const TelephonyNetworkInfo& known = *receiver.cells[0];
    EXPECT_TRUE(known.isValid());
    EXPECT_EQ(123456, known.getCellID());
    EXPECT_EQ(4321, known.getLocationAreaCode());
    EXPECT_EQ(operatorCode, known.getOperatorId());
    EXPECT_EQ(countryCode, known.getCountryCode());
    EXPECT_EQ(std::make_pair(true, -73), receiver.strengths[0]);
    for (int i = 1; i < 3; ++i) {
        EXPECT_FALSE(receiver.cells[i]->isValid()) << i;
        EXPECT_EQ("", receiver.cells[i]->getOperatorId() + receiver.cells[i]->getCountryCode()) << i;
        EXPECT_FALSE(receiver.strengths[i].first) << i;
    }
}

// Runs in a child process: a request still waiting for its answer is held in
// a static and so destroyed during the exit, after the platform layer shut
// down and after the main thread's platform state went with its
// thread-local storage.
void exitWithARequestHeldInAStatic(Receiver* receiver) {
    static boost::shared_ptr<TelephonyNetworkInfoRequest> held;
    pal::scriptCellInfo(pal::Answer::never(), {true, 1, 2, "26201", "262"});
    held = boost::make_shared<TelephonyNetworkInfoRequest>();
    held->start(receiver->cell());
    pal::shutdown();
    pal::setLogSink(pal::LogSink());
    // A hang is a failure too.
    alarm(30);
    std::exit(0);
}

TEST_F(RadioRequestTest, RequestDestroyedDuringTheExitAfterShutdownIsRefusedCleanlyAndLoggedOnce) {
    GTEST_FLAG_SET(death_test_style, "fast");
    const std::string line = "platform call after the calling thread's platform state was torn down: refused";
    EXPECT_EXIT(exitWithARequestHeldInAStatic(&receiver), ::testing::ExitedWithCode(0),
                ::testing::Truly([&line](const std::string& output) {
                    const std::size_t first = output.find(line);
                    return first != std::string::npos && output.find(line, first + 1) == std::string::npos;
                }));
}

}  // namespace
