// The startup cycle end to end: simulated device and radios, the network
// manager and a startup server on 127.0.0.1.
#include <tinyxml.h>

#include <boost/make_shared.hpp>
#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "TestFeature.h"
#include "lifecycle/PauseResumeHandler.h"
#include "startup/StartupController.h"
#include "startup/StartupData.h"
#include "startup/StartupListener.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"

namespace {

using Startup::StartupController;
using Startup::StartupData;
using Startup::StartupParams;

const KDust kMs = 1000000ull;

std::string answerWith(const std::string& inner) {
    return "<startup>" + inner + "</startup>";
}

// Records what the controller hands to a registered listener.
class RecordingListener : public Startup::StartupListener {
public:
    void collectStartupParams(CollectCallback done) override { done(params); }
    void parseStartup(const TiXmlDocument& document) override {
        const TiXmlElement* root = document.FirstChildElement("startup");
        const TiXmlElement* uuid = root != nullptr ? root->FirstChildElement("uuid") : nullptr;
        parsedUuids.push_back(uuid != nullptr && uuid->GetText() != nullptr ? uuid->GetText() : "");
    }
    void onStartupReady() override { ++readyCount; }

    StartupParams params;
    std::vector<std::string> parsedUuids;
    int readyCount = 0;
};

class StartupControllerTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        // Network positioning of the location manager, which the default
        // listener wakes, goes to the default host and is not counted here.
        StartupData::getInstance()->setHost(StartupData::HOST_DEFAULT, server.url("/"));
        StartupData::getInstance()->setHost(StartupData::HOST_STARTUP, server.url("/"));
        pal::scriptWifiScan(pal::Answer::after(0), {{"001122aabbcc", "home", -61}});
        pal::scriptCellInfo(pal::Answer::after(0), {true, 12345, 678, "26201", "262"});
        serve(answerWith(
            "<uuid>u-1</uuid><query_hosts><host type=\"tiles\">http://tiles/</host></query_hosts>"));
    }

    void TearDown() override {
        server.releaseStalls();
        PalTest::TearDown();
    }

    void serve(const std::string& body, TestHttpServer::Reply::Mode mode = TestHttpServer::Reply::Whole) {
        TestHttpServer::Reply reply;
        reply.mode = mode;
        reply.body = body;
        reply.contentType = "text/xml";
        server.on("/startup", reply);
    }

    // The controller, with the recording listener registered after the
    // built-in ones; made while the application is paused, so no cycle runs
    // until resume().
    StartupController* makeController() {
        StartupController* controller = StartupController::getInstance();
        controller->addListener(listener);
        return controller;
    }

    // Brings the application to the foreground, from the background when it
    // was there, as the platform does.
    void resume() {
        if (!Lifecycle::PauseResumeHandler::getInstance()->getIsAppPaused()) {
            pal::postAppPaused();
            pump();
        }
        pal::postAppResumed();
        pump();
    }

    // Pumps and moves the virtual clock until condition holds or a generous
    // real-time bound runs out; the server is a real peer, so this polls.
    bool runUntil(const std::function<bool()>& condition) {
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (!condition()) {
            if (std::chrono::steady_clock::now() >= end) {
                return false;
            }
            pump();
            advanceMs(100);
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return true;
    }

    // Lets whatever is still under way finish, so that an extra request or
    // callback would be seen.
    void settle() {
        for (int i = 0; i < 50; ++i) {
            pump();
            advanceMs(100);
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
        }
    }

    std::vector<std::string> targets() const {
        std::vector<std::string> result;
        for (const TestHttpServer::Received& received : server.received()) {
            if (received.path == "/startup") {
                result.push_back(received.target);
            }
        }
        return result;
    }
    size_t startupRequests() const { return targets().size(); }

    TestHttpServer server;
    boost::shared_ptr<RecordingListener> listener = boost::make_shared<RecordingListener>();
};

TEST_F(StartupControllerTest, FirstStartWithoutIdentifierAsksTwiceAndReportsReadyOnce) {
    listener->params = {{"answer", "a&b=c"}};
    makeController();
    EXPECT_EQ(0u, startupRequests()) << "nothing is fetched while the application is paused";
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 1; }));
    settle();

    const std::vector<std::string> sent = targets();
    ASSERT_EQ(2u, sent.size());
    EXPECT_EQ(0u, sent[0].find("/startup?uuid=&lang="));
    EXPECT_EQ(0u, sent[1].find("/startup?uuid=u-1&lang="));
    for (const std::string& target : sent) {
        EXPECT_NE(std::string::npos, target.find("&answer=a%26b%3Dc")) << target;
        EXPECT_NE(std::string::npos, target.find("&wifi=00%3A11%3A22%3Aaa%3Abb%3Acc%2C-61")) << target;
        EXPECT_NE(std::string::npos, target.find("&cellid=12345")) << target;
        EXPECT_EQ(target.size() - 6, target.rfind("&utf=1")) << target;
    }
    EXPECT_EQ((std::vector<std::string>{"u-1", "u-1"}), listener->parsedUuids);
    EXPECT_EQ(1, listener->readyCount);
    EXPECT_TRUE(StartupData::getInstance()->startupReady);
    EXPECT_EQ("http://tiles/", StartupData::getInstance()->getHost("tiles"));
    EXPECT_TRUE(hasLogLine("StartupController::onStartupReady()[needSecondStartup]"));

    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 2; }));
    settle();
    EXPECT_EQ(3u, startupRequests()) << "a resume with a known identifier asks once";
}

TEST_F(StartupControllerTest, ClientParametersWinOverListenerParameters) {
    StartupData::getInstance()->uuid = "known";
    listener->params = {{"model", "from-listener"}, {"extra", "1"}};
    makeController()->updateClientStartupParams({{"model", "from-client"}});
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 1; }));
    settle();
    ASSERT_EQ(1u, startupRequests());
    const std::string target = targets()[0];
    EXPECT_NE(std::string::npos, target.find("model=from-client")) << target;
    EXPECT_EQ(std::string::npos, target.find("from-listener")) << target;
    EXPECT_NE(std::string::npos, target.find("extra=1")) << target;
}

TEST_F(StartupControllerTest, ResumeDuringACycleStartsAfreshAndDropsTheOldCollection) {
    StartupData::getInstance()->uuid = "known";
    pal::scriptWifiScan(pal::Answer::after(500 * kMs), {{"001122aabbcc", "home", -61}});
    makeController();
    resume();
    advanceMs(100);
    pump();
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 1; }));
    settle();
    EXPECT_EQ(1u, startupRequests()) << "the first collection was cancelled and never reported";

    serve(answerWith("<uuid>known</uuid><query_hosts/>"), TestHttpServer::Reply::StallBeforeReply);
    resume();
    ASSERT_TRUE(runUntil([this] { return startupRequests() == 2; }));
    serve(answerWith("<uuid>known</uuid><query_hosts/>"));
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 2; }));
    server.releaseStalls();
    settle();
    EXPECT_EQ(2, listener->readyCount) << "the cancelled request's answer is never handed out";
}

TEST_F(StartupControllerTest, BodyThatIsNotXmlEndsTheCycleUntilTheNextResume) {
    StartupData::getInstance()->uuid = "known";
    serve("this is not <xml");
    makeController();
    resume();
    ASSERT_TRUE(runUntil([this] { return startupRequests() == 1; }));
    settle();
    EXPECT_TRUE(listener->parsedUuids.empty());
    EXPECT_EQ(1u, startupRequests());

    serve(answerWith("<uuid>known</uuid><query_hosts/>"));
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 1; }));
}

TEST_F(StartupControllerTest, ARedirectIsFollowedOnTheStartupHostOnlyAndAnyOtherIsLogged) {
    StartupData::getInstance()->uuid = "known";
    TestHttpServer::Reply moved;
    moved.status = 302;
    moved.headers = {{"Location", "/v2/startup"}};
    server.on("/startup", moved);
    TestHttpServer::Reply answer;
    answer.body = answerWith("<uuid>known</uuid><query_hosts/>");
    answer.contentType = "text/xml";
    server.on("/v2/startup", answer);
    makeController();
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 1; }));

    const std::string elsewhere = "http://localhost:" + std::to_string(server.port()) + "/v2/startup";
    moved.headers = {{"Location", elsewhere}};
    server.on("/startup", moved);
    resume();
    ASSERT_TRUE(runUntil([this] { return startupRequests() == 2; }));
    settle();
    EXPECT_EQ(1, listener->readyCount);
    EXPECT_EQ(1, countLogLines("not following the redirect to " + elsewhere + ": it leaves the host"));
    int moves = 0;
    for (const TestHttpServer::Received& received : server.received()) {
        moves += received.path == "/v2/startup" ? 1 : 0;
    }
    EXPECT_EQ(1, moves);
}

TEST_F(StartupControllerTest, AnswersWithoutIdentifierAskAtMostOnceMore) {
    serve(answerWith("<query_hosts/>"));
    makeController();
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 1; }));
    settle();
    EXPECT_EQ(2u, startupRequests());
    EXPECT_EQ(2u, listener->parsedUuids.size());
    EXPECT_FALSE(StartupData::getInstance()->startupReady && StartupData::getInstance()->uuid != "");
    EXPECT_EQ(1, countLogLines("the startup answers carry no uuid"));
}

TEST_F(StartupControllerTest, RegisteredFeatureHearsTheAnswerUntilItShutsDown) {
    StartupData::getInstance()->uuid = "known";
    serve(answerWith("<uuid>known</uuid><query_hosts/><features><test enabled=\"true\"/></features>"));
    makeController();
    boost::shared_ptr<TestFeature> feature = boost::make_shared<TestFeature>();
    feature->init();
    feature->enableByUser(true);
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 1; }));
    EXPECT_EQ(1, feature->parsed);
    EXPECT_EQ(1, feature->started);

    feature->shutdown();
    resume();
    ASSERT_TRUE(runUntil([this] { return listener->readyCount == 2; }));
    EXPECT_EQ(1, feature->parsed) << "a feature that shut down hears nothing";
    EXPECT_EQ(1, feature->started);
}

}  // namespace
