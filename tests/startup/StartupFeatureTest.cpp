// A startup feature's two switches, the user's and the server's, and what
// it logs on the way.
#include <boost/make_shared.hpp>
#include <string>

#include "TestFeature.h"
#include "support/PalTest.h"

namespace {

TiXmlDocument answer(bool enabled) {
    TiXmlDocument document;
    document.Parse(enabled ? "<startup><features><test enabled=\"1\"/></features></startup>"
                           : "<startup><features><test enabled=\"0\"/></features></startup>");
    return document;
}

class StartupFeatureTest : public PalTest {
protected:
    // What the controller does with a complete answer.
    void deliver(bool enabled) {
        feature->parseStartup(answer(enabled));
        feature->onStartupReady();
    }

    boost::shared_ptr<TestFeature> feature = boost::make_shared<TestFeature>();
};

TEST_F(StartupFeatureTest, RunsOnlyWhileUserAndServerBothSayYes) {
    deliver(true);
    EXPECT_TRUE(hasLogLine("StartupFeature::parseStartup()"));
    EXPECT_TRUE(hasLogLine("StartupFeature::onStartupReady()[!enabledByUser]"));
    EXPECT_EQ(0, feature->started);

    clearLog();
    feature->enableByUser(true);
    EXPECT_EQ((std::vector<std::string>{"StartupFeature::enableByUser()[value: 1]",
                                        "StartupFeature::enableByUser()[onStartupReady]",
                                        "StartupFeature::onStartupReady()[enabled]"}),
              logLines());
    EXPECT_EQ(1, feature->started);

    clearLog();
    feature->enableByUser(true);
    EXPECT_EQ((std::vector<std::string>{"StartupFeature::enableByUser()[value: 1]"}), logLines());
    deliver(true);
    EXPECT_EQ(2, feature->started) << "every enabling answer starts it again";

    // The server's switch alone does not stop a running feature.
    deliver(false);
    EXPECT_TRUE(hasLogLine("StartupFeature::onStartupReady()[!enabledFromStartup]"));
    EXPECT_EQ(0, feature->stopped);

    feature->enableByUser(false);
    EXPECT_EQ(1, feature->stopped);
}

TEST_F(StartupFeatureTest, UserSwitchBeforeAnyAnswerWaitsForTheServer) {
    feature->enableByUser(true);
    EXPECT_TRUE(hasLogLine("StartupFeature::onStartupReady()[!enabledFromStartup]"));
    EXPECT_EQ(0, feature->started);
    deliver(true);
    EXPECT_EQ(1, feature->started);

    boost::shared_ptr<TestFeature> never = boost::make_shared<TestFeature>();
    clearLog();
    never->enableByUser(false);
    EXPECT_EQ((std::vector<std::string>{"StartupFeature::enableByUser()[value: 0]"}), logLines());
    EXPECT_EQ(0, never->stopped);
}

}  // namespace
