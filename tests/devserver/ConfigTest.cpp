#include <gtest/gtest.h>

#include <string>

#include "devserver/Config.h"

namespace {

using DevServer::Config;

TEST(ConfigTest, ReadsSettingsAndReplacesTheRadioTable) {
    Config config = Config::defaults();
    std::string error;
    ASSERT_TRUE(
        Config::parse("# a comment\n"
                      "\n"
                      "uuid_prefix = test-\n"
                      "network_scanner = 0\n"
                      "scan_timeout = 7\n"
                      "send_timeout=9\n"
                      "host.tiles = http://tiles.invalid/\n"
                      "quiet = 1\n"
                      "wifi = 00:11:22:AA:BB:CC 52.5 13.4 25\n"
                      "cell = 262 2 100 200 52.4 13.3 900\n",
                      "test.conf", config, error))
        << error;
    EXPECT_EQ("test-", config.uuidPrefix);
    EXPECT_FALSE(config.networkScanner);
    EXPECT_EQ(7, config.scanTimeout);
    EXPECT_EQ(9, config.sendTimeout);
    EXPECT_EQ("http://tiles.invalid/", config.hosts["tiles"]);
    EXPECT_TRUE(config.quiet);
    ASSERT_EQ(1u, config.accessPoints.size());
    EXPECT_EQ("001122aabbcc", config.accessPoints[0].bssid);
    EXPECT_DOUBLE_EQ(52.5, config.accessPoints[0].latitude);
    ASSERT_EQ(1u, config.cells.size());
    EXPECT_EQ(262, config.cells[0].mcc);
    EXPECT_EQ(2, config.cells[0].mnc);
    EXPECT_EQ(200u, config.cells[0].cid);
    EXPECT_DOUBLE_EQ(900, config.cells[0].range);
}

TEST(ConfigTest, KeepsTheRadioTableWhenTheFileListsNoRadios) {
    Config config = Config::defaults();
    std::string error;
    ASSERT_TRUE(Config::parse("quiet = 1\n", "test.conf", config, error)) << error;
    EXPECT_EQ(Config::defaults().accessPoints.size(), config.accessPoints.size());
    EXPECT_EQ(Config::defaults().cells.size(), config.cells.size());
}

struct BadConfig {
    const char* text;
    const char* error;
};

class BadConfigTest : public ::testing::TestWithParam<BadConfig> {};

TEST_P(BadConfigTest, NamesTheLineAndLeavesTheConfigAlone) {
    Config config = Config::defaults();
    std::string error;
    EXPECT_FALSE(Config::parse(GetParam().text, "my.conf", config, error));
    EXPECT_EQ(GetParam().error, error);
    EXPECT_EQ(Config::defaults().accessPoints.size(), config.accessPoints.size());
    EXPECT_TRUE(config.uuidPrefix.empty());
}

INSTANTIATE_TEST_SUITE_P(
    Lines, BadConfigTest,
    ::testing::Values(
        BadConfig{"uuid_prefix = x\nnonsense\n", "my.conf:2: expected \"name = value\""},
        BadConfig{"colour = blue", "my.conf:1: unknown setting \"colour\""},
        BadConfig{"\n\nscan_timeout = 0",
                  "my.conf:3: scan_timeout must be a whole number of seconds from 1 to 86400"},
        BadConfig{"send_timeout = 1.5",
                  "my.conf:1: send_timeout must be a whole number of seconds from 1 to 86400"},
        BadConfig{"network_scanner = yes", "my.conf:1: expected 0 or 1, got \"yes\""},
        BadConfig{"host.tiles = ftp://x/", "my.conf:1: host.tiles must be an http:// or https:// URL"},
        BadConfig{"wifi = 00:11:22:aa:bb 1 2 3",
                  "my.conf:1: \"00:11:22:aa:bb\" is not a BSSID of twelve hexadecimal digits"},
        BadConfig{"wifi = 001122aabbcc 91 2 3", "my.conf:1: latitude \"91\" is not a number from -90 to 90"},
        BadConfig{"wifi = 001122aabbcc 1 2,5 3",
                  "my.conf:1: longitude \"2,5\" is not a number from -180 to 180"},
        BadConfig{"wifi = 001122aabbcc 1 2 0", "my.conf:1: range \"0\" is not a positive number of metres"},
        BadConfig{"wifi = 001122aabbcc 1 2", "my.conf:1: expected \"wifi = BSSID LATITUDE LONGITUDE RANGE\""},
        BadConfig{"wifi = 001122aabbcc 1 2 3\nwifi = 00-11-22-AA-BB-CC 1 2 3",
                  "my.conf:2: access point 00-11-22-AA-BB-CC is listed twice"},
        BadConfig{"cell = 262 1 2 x 1 2 3",
                  "my.conf:1: CID \"x\" is not a whole number from 0 to 4294967295"},
        BadConfig{"cell = 1000 1 2 3 1 2 3", "my.conf:1: MCC \"1000\" is not a whole number from 0 to 999"},
        BadConfig{"cell = 262 1 2 3 1 2",
                  "my.conf:1: expected \"cell = MCC MNC LAC CID LATITUDE LONGITUDE RANGE\""}));

TEST(ConfigTest, ReportsAFileThatCannotBeRead) {
    Config config;
    std::string error;
    EXPECT_FALSE(Config::load("/nonexistent/devserver.conf", config, error));
    EXPECT_EQ("/nonexistent/devserver.conf: cannot read the file", error);
}

}  // namespace
