#include "support/PalTest.h"
#include "util/Logger.h"

namespace {

class LoggerTest : public PalTest {
protected:
    void TearDown() override {
        Logger::level = savedLevel;
        PalTest::TearDown();
    }
    int savedLevel = Logger::level;
};

}  // namespace

TEST_F(LoggerTest, WritesTheFormattedMessageWithoutPrefix) {
    Logger::log(Logger::Info, "tile %d of %s", 3, "z12");
    EXPECT_TRUE(hasLogLine("tile 3 of z12"));
}

TEST_F(LoggerTest, DropsMessagesAboveTheLevel) {
    Logger::level = Logger::Warning;
    clearLog();
    Logger::log(Logger::Error, "error");
    Logger::log(Logger::Warning, "warning");
    Logger::log(Logger::Info, "info");
    Logger::log(Logger::Debug, "debug");
    EXPECT_EQ((std::vector<std::string>{"error", "warning"}), logLines());
}

TEST_F(LoggerTest, DefaultLevelWritesEverything) {
    EXPECT_EQ(Logger::Debug, Logger::level);
    Logger::log(Logger::Debug, "debug");
    EXPECT_TRUE(hasLogLine("debug"));
}
