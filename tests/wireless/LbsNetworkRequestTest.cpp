// The positioning request end to end: simulated radios, the network manager
// and a positioning server on 127.0.0.1.
#include <tinyxml.h>

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "network/NetworkManager.h"
#include "network/impl/NetworkManagerImpl.h"
#include "startup/StartupData.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"
#include "wireless/LbsNetworkRequest.h"

namespace {

using Startup::StartupData;
using Wireless::LbsNetworkRequest;

const KDust kMs = 1000000ull;
const char* const kPath = "/cellid_location/";

std::string located(const char* latitude, const char* longitude, const char* accuracy) {
    return std::string("<location><coordinates latitude=\"") + latitude + "\" longitude=\"" + longitude +
           "\" accuracy=\"" + accuracy + "\"/></location>";
}

class LbsNetworkRequestTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        StartupData* startupData = StartupData::getInstance();
        startupData->setHost(StartupData::HOST_DEFAULT, server.url("/"));
        startupData->uuid = "u-1";
        startupData->startupReady = true;
        pal::scriptWifiScan(pal::Answer::after(0), {});
        pal::scriptCellInfo(pal::Answer::after(0), {true, 12345, 678, "26201", "262"});
        pal::scriptSignalStrength(pal::Answer::after(0), false, 0);
    }

    void TearDown() override {
        request.reset();
        server.releaseStalls();
        PalTest::TearDown();
    }

    void answer(const std::string& body, int status = 200) {
        TestHttpServer::Reply reply;
        reply.status = status;
        reply.body = body;
        reply.contentType = "text/xml";
        server.on(kPath, reply);
    }

    void submit() {
        request->submit(
            LbsNetworkRequest::Callback::make<LbsNetworkRequestTest, &LbsNetworkRequestTest::onResponse>(
                this));
    }

    // Pumps and moves the virtual clock a second at a time, so that retries
    // come due, until condition holds or the generous real-time bound runs
    // out. The network peer works in real time and a wait for an event would
    // not end on the virtual clock, so it polls.
    bool runUntil(const std::function<bool()>& condition) {
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (!condition()) {
            if (std::chrono::steady_clock::now() >= end) {
                return false;
            }
            pump();
            advanceMs(1000);
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return true;
    }

    // Submits and runs until the one response has come; further events then
    // still queued are dispatched, so a second callback would be seen.
    LbsNetworkRequest::Response submitAndWait() {
        responses.clear();
        submit();
        EXPECT_TRUE(runUntil([this] { return !responses.empty(); }));
        pump();
        EXPECT_EQ(1u, responses.size());
        return responses.empty() ? LbsNetworkRequest::Response() : responses.back();
    }

    std::string lastTarget() const {
        const std::vector<TestHttpServer::Received> received = server.received();
        return received.empty() ? std::string() : received.back().target;
    }

    void onResponse(const LbsNetworkRequest::Response& response) { responses.push_back(response); }

    TestHttpServer server;
    std::unique_ptr<LbsNetworkRequest> request{new LbsNetworkRequest()};
    std::vector<LbsNetworkRequest::Response> responses;
};

TEST_F(LbsNetworkRequestTest, CellOnlyQueryOnTheDefaultHostGivesThePosition) {
    answer(located("52.5", "13.25", "35.5"));
    const LbsNetworkRequest::Response response = submitAndWait();
    EXPECT_EQ("/cellid_location/?uuid=u-1&lac=678&cellid=12345&operatorid=26201&countrycode=262",
              lastTarget());
    EXPECT_EQ(0, response.error);
    EXPECT_FLOAT_EQ(52.5f, response.latitude);
    EXPECT_FLOAT_EQ(13.25f, response.longitude);
    EXPECT_FLOAT_EQ(35.5f, response.accuracy);
}

TEST_F(LbsNetworkRequestTest, ParametersFollowTheOrderOfTheRadioAnswers) {
    pal::scriptWifiScan(pal::Answer::after(100 * kMs),
                        {{"00:1A:2B:3C:4D:5E", "a", -61}, {"00:1A:2B:3C:4D:5F", "b", -80}});
    pal::scriptSignalStrength(pal::Answer::after(0), true, -71);
    StartupData::getInstance()->setHost(StartupData::HOST_CELLID, server.url("/"));
    StartupData::getInstance()->setHost(StartupData::HOST_DEFAULT, "http://127.0.0.1:1/");
    answer(located("1", "2", "3"));
    submitAndWait();
    EXPECT_EQ(
        "/cellid_location/?uuid=u-1&lac=678&cellid=12345&operatorid=26201&countrycode=262&signalstrength=-71"
        "&wifinetworks=001A2B3C4D5E:-61,001A2B3C4D5F:-80",
        lastTarget());
}

TEST_F(LbsNetworkRequestTest, RefusedRadiosCountAsAnsweredAndStrangeTextsAreEscaped) {
    pal::scriptWifiScan(pal::Answer::refuse(), {});
    pal::scriptCellInfo(pal::Answer::refuse(), {});
    pal::scriptSignalStrength(pal::Answer::refuse(), true, -50);
    StartupData::getInstance()->uuid = "a&b=c";
    answer(located("1", "2", "3"));
    EXPECT_EQ(0, submitAndWait().error);
    EXPECT_EQ("/cellid_location/?uuid=a%26b%3Dc", lastTarget());

    pal::scriptWifiScan(pal::Answer::after(0), {{"ab&c=d", "", -1}});
    pal::scriptCellInfo(pal::Answer::after(0), {true, 1, 2, "262&x=1", "26 2"});
    submitAndWait();
    EXPECT_EQ(
        "/cellid_location/?uuid=a%26b%3Dc&wifinetworks=ab%26c%3Dd:-1&lac=2&cellid=1&operatorid=262%26x%3D1"
        "&countrycode=26+2",
        lastTarget());
}

TEST_F(LbsNetworkRequestTest, WaitsForTheStartupAnswer) {
    StartupData::getInstance()->startupReady = false;
    answer(located("1", "2", "3"));
    submit();
    pump();
    advanceMs(5000);
    EXPECT_EQ(0u, server.requestCount());
    EXPECT_TRUE(responses.empty());

    // The manager looks at held tasks again when offline mode ends.
    StartupData::getInstance()->startupReady = true;
    Network::NetworkManager::getInstance()->changeOfflineModeStatus(Network::NetworkManager::OfflineModeOn);
    Network::NetworkManager::getInstance()->changeOfflineModeStatus(Network::NetworkManager::OfflineModeOff);
    ASSERT_TRUE(runUntil([this] { return !responses.empty(); }));
    EXPECT_EQ(0, responses[0].error);
    EXPECT_EQ(1u, server.requestCount());
}

// The network provider drops its request on pause and replaces it every 15
// seconds: an answer that found the network offline must not bring the
// exchange back once offline mode ends, whether its owner is gone or not.
TEST_F(LbsNetworkRequestTest, RequestFinishedOfflineIsNotRunAgainAfterItsOwnerWentAway) {
    answer(located("1", "2", "3"));
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    submit();
    ASSERT_TRUE(runUntil([this] { return !responses.empty(); }));
    request.reset();

    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    Network::NetworkManager::getInstance()->changeOfflineModeStatus(Network::NetworkManager::OfflineModeOff);
    pump();

    const Network::NetworkManagerImpl* manager =
        static_cast<Network::NetworkManagerImpl*>(Network::NetworkManager::getInstance());
    EXPECT_EQ(0, manager->getTaskCount());
    EXPECT_EQ(0, manager->getUnreadyCount());
    EXPECT_EQ(0u, server.requestCount());
}

TEST_F(LbsNetworkRequestTest, RequestFinishedOfflineReportsOnceAndItsOwnerCanSubmitAgain) {
    answer(located("1", "2", "3"));
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    submit();
    ASSERT_TRUE(runUntil([this] { return !responses.empty(); }));
    EXPECT_NE(0, responses[0].error);

    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    Network::NetworkManager::getInstance()->changeOfflineModeStatus(Network::NetworkManager::OfflineModeOff);
    pump();
    EXPECT_EQ(
        0, static_cast<Network::NetworkManagerImpl*>(Network::NetworkManager::getInstance())->getTaskCount());
    const LbsNetworkRequest::Response response = submitAndWait();

    EXPECT_EQ(0, response.error);
    EXPECT_EQ(1u, server.requestCount());
}

TEST_F(LbsNetworkRequestTest, FailedExchangesReportOnce) {
    answer("<error>gone</error>", 404);
    EXPECT_EQ(404, submitAndWait().error);
    answer("", 404);
    EXPECT_EQ(1, submitAndWait().error);
    const char* const broken = "<location><coordinates latitude=\"1\"";
    TiXmlDocument reference;
    reference.Parse(broken);
    answer(broken);
    EXPECT_EQ(reference.ErrorId(), submitAndWait().error);

    for (const std::string body : {"<location/>", "<error code=\"0\"/>"}) {
        answer(body);
        const LbsNetworkRequest::Response response = submitAndWait();
        EXPECT_EQ(1, response.error) << body;
        EXPECT_EQ(0.0f, response.latitude) << body;
    }

    // A transport failure ends with no body after the retries.
    StartupData::getInstance()->setHost(StartupData::HOST_CELLID,
                                        "http://127.0.0.1:" + std::to_string(TestHttpServer::closedPort()));
    EXPECT_EQ(1, submitAndWait().error);
}

TEST_F(LbsNetworkRequestTest, ARedirectIsFollowedOnThePositioningHostOnlyAndAnyOtherIsLogged) {
    TestHttpServer::Reply moved;
    moved.status = 307;
    moved.body = "moved";
    moved.headers = {{"Location", "/v2/position"}};
    server.on(kPath, moved);
    TestHttpServer::Reply position;
    position.body = located("52.5", "13.25", "35.5");
    position.contentType = "text/xml";
    server.on("/v2/position", position);
    const LbsNetworkRequest::Response followed = submitAndWait();
    EXPECT_EQ(0, followed.error);
    EXPECT_FLOAT_EQ(35.5f, followed.accuracy);

    const std::string elsewhere = "http://localhost:" + std::to_string(server.port()) + "/v2/position";
    moved.headers = {{"Location", elsewhere}};
    server.on(kPath, moved);
    EXPECT_EQ(307, submitAndWait().error);
    EXPECT_EQ(1, countLogLines("not following the redirect to " + elsewhere + ": it leaves the host"));
    int moves = 0;
    for (const TestHttpServer::Received& received : server.received()) {
        moves += received.path == "/v2/position" ? 1 : 0;
    }
    EXPECT_EQ(1, moves);
}

TEST_F(LbsNetworkRequestTest, ANewSubmitOrCancelSilencesTheRunningQuery) {
    Network::NetworkManager* manager = Network::NetworkManager::getInstance();
    TestHttpServer::Reply stall;
    stall.mode = TestHttpServer::Reply::StallBeforeReply;
    stall.body = located("1", "1", "1");
    server.on(kPath, stall);
    submit();
    ASSERT_TRUE(runUntil([this] { return server.requestCount() == 1; }));

    answer(located("2", "2", "2"));
    EXPECT_FLOAT_EQ(2.0f, submitAndWait().latitude);
    // The first exchange is still stalled at the server: only its connection
    // being closed keeps it from reporting.
    EXPECT_EQ(Network::NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());

    server.on(kPath, stall);
    responses.clear();
    submit();
    ASSERT_TRUE(runUntil([this] { return server.requestCount() == 3; }));
    request->cancel();
    EXPECT_EQ(Network::NetworkManager::NetworkIdle, manager->getNetworkActivityStatus());

    pal::scriptWifiScan(pal::Answer::after(100 * kMs), {});
    submit();
    request.reset();
    EXPECT_EQ(0, pal::pendingWifiScans());
    server.releaseStalls();
    advanceMs(5000);
    pump();
    EXPECT_TRUE(responses.empty());
}

}  // namespace
