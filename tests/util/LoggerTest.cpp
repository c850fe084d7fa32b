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

TEST_F(LoggerTest, WritesFormattedMessagesUpToTheLevelWhichDefaultsToAll) {
    Logger::log(Logger::Debug, "tile %d of %s", 3, "z12");
    EXPECT_TRUE(hasLogLine("tile 3 of z12"));

    Logger::level = Logger::Warning;
    clearLog();
    Logger::log(Logger::Error, "error");
    Logger::log(Logger::Warning, "warning");
    Logger::log(Logger::Info, "info");
    Logger::log(Logger::Debug, "debug");
    EXPECT_EQ((std::vector<std::string>{"error", "warning"}), logLines());
}
