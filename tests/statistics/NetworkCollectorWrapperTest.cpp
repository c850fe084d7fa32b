// The collector switched by the "network_scanner" section of the startup
// answer, fed to the feature as the startup controller does.
#include <tinyxml.h>

#include <boost/make_shared.hpp>
#include <string>

#include "startup/StartupData.h"
#include "statistics/wifipool/NetworkCollectorWrapper.h"
#include "support/PalTest.h"

namespace {

using Statistics::NetworkCollectorWrapper;

class NetworkCollectorWrapperTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        pal::postAppResumed();
        pump();
        Startup::StartupData* data = Startup::StartupData::getInstance();
        data->setHost(Startup::StartupData::HOST_DEFAULT, "http://127.0.0.1:9/");
        data->uuid = "u-1";
        wrapper = boost::make_shared<NetworkCollectorWrapper>();
        wrapper->enableByUser(true);
    }

    void TearDown() override {
        wrapper.reset();
        PalTest::TearDown();
    }

    void deliver(const std::string& answer) {
        TiXmlDocument document;
        document.Parse(answer.c_str());
        wrapper->parseStartup(document);
        wrapper->onStartupReady();
    }

    const Statistics::NetworkCollector& collector() const { return wrapper->getNetworkCollector(); }

    boost::shared_ptr<NetworkCollectorWrapper> wrapper;
};

TEST_F(NetworkCollectorWrapperTest, FirstAnswerWithoutTheFeatureLeavesItOff) {
    const char* answers[] = {
        "<startup><features><network_scanner enabled=\"0\" scan_timeout=\"5\"/></features></startup>",
        "<startup><features/></startup>",
        "<startup/>",
        "not xml",
    };
    for (const char* answer : answers) {
        deliver(answer);
        EXPECT_FALSE(collector().isStarted()) << answer;
    }
    EXPECT_TRUE(hasLogLine("NetworkCollectorWrapper::parseStartup()[disabled]"));
    EXPECT_TRUE(
        hasLogLine("NetworkCollectorWrapper::parseStartup()[startup does not contain network_scanner tag]"));
    EXPECT_TRUE(hasLogLine("NetworkCollectorWrapper::parseStartup()[startup does not contain features tag]"));
    EXPECT_TRUE(hasLogLine("NetworkCollectorWrapper::parseStartup()[startup does not contain startup tag]"));
}

TEST_F(NetworkCollectorWrapperTest, EnablingAnswerStartsItWithItsPeriods) {
    deliver(
        "<startup><features><network_scanner enabled=\"1\" scan_timeout=\"10\" send_timeout=\"20\"/>"
        "</features></startup>");
    EXPECT_TRUE(collector().isStarted());
    EXPECT_EQ(10, collector().getScanTimeout());
    EXPECT_EQ(20, collector().getSendTimeout());

    // Missing periods take the defaults; unusable ones keep what runs.
    deliver("<startup><features><network_scanner enabled=\"1\"/></features></startup>");
    EXPECT_EQ(30, collector().getScanTimeout());
    EXPECT_EQ(120, collector().getSendTimeout());
    deliver(
        "<startup><features><network_scanner enabled=\"1\" scan_timeout=\"0\" send_timeout=\"-5\"/>"
        "</features></startup>");
    EXPECT_TRUE(collector().isStarted());
    EXPECT_EQ(30, collector().getScanTimeout());
    EXPECT_EQ(120, collector().getSendTimeout());

    // A later switch-off by the server does not stop it; the user's does.
    deliver("<startup><features><network_scanner enabled=\"0\"/></features></startup>");
    EXPECT_TRUE(collector().isStarted());
    wrapper->enableByUser(false);
    EXPECT_FALSE(collector().isStarted());
}

TEST_F(NetworkCollectorWrapperTest, PauseStopsTheTimersAndResumeRestartsThem) {
    deliver("<startup><features><network_scanner enabled=\"1\"/></features></startup>");
    int timers = pal::activeTimerCount();
    wrapper->onPaused();
    EXPECT_EQ(timers - 2, pal::activeTimerCount());
    wrapper->onResumed();
    EXPECT_EQ(timers, pal::activeTimerCount());
    EXPECT_TRUE(hasLogLine("NetworkCollectorWrapper::onPaused()"));
    EXPECT_TRUE(hasLogLine("NetworkCollectorWrapper::onResumed()"));
}

}  // namespace
