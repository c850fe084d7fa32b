#include <string>

#include "startup/StartupData.h"
#include "support/PalTest.h"

namespace {

using Startup::StartupData;

class StartupDataTest : public PalTest {};

TEST_F(StartupDataTest, StartsEmptyAndUnreadyWithTheLocaleAsLanguage) {
    pal::setLocale("de", "AT");
    StartupData* data = StartupData::getInstance();
    EXPECT_EQ(data, StartupData::getInstance());
    EXPECT_EQ("startup", data->startupPath);
    EXPECT_TRUE(data->uuid.empty());
    EXPECT_TRUE(data->hosts.empty());
    EXPECT_FALSE(data->startupReady);
    EXPECT_EQ("de-AT", data->lang);

    pal::setLocale("fr", "CA");
    data->cacheLang();
    EXPECT_EQ("fr-CA", data->lang);
}

TEST_F(StartupDataTest, StoredHostsEndWithOneSlash) {
    StartupData* data = StartupData::getInstance();
    const struct {
        const char* given;
        const char* stored;
    } cases[] = {
        {"http://a.example/api", "http://a.example/api/"},
        {"http://a.example/api/", "http://a.example/api/"},
        {"", ""},
    };
    for (const auto& c : cases) {
        data->setHost(StartupData::HOST_TILES, c.given);
        EXPECT_EQ(c.stored, data->getHost(StartupData::HOST_TILES)) << c.given;
    }
}

TEST_F(StartupDataTest, AbsentTypeFallsBackToTheDefaultHostAndLaterHostsReplaceEarlierOnes) {
    StartupData* data = StartupData::getInstance();
    data->setHost(StartupData::HOST_DEFAULT, "http://default.example");
    EXPECT_EQ("http://default.example/", data->getHost(StartupData::HOST_SEARCH));

    data->setHost(StartupData::HOST_SEARCH, "http://search.example");
    EXPECT_EQ("http://search.example/", data->getHost(StartupData::HOST_SEARCH));
    data->setHost(StartupData::HOST_SEARCH, "http://search2.example/");
    EXPECT_EQ("http://search2.example/", data->getHost(StartupData::HOST_SEARCH));
    EXPECT_EQ("http://default.example/", data->getHost(StartupData::HOST_CELLID));
}

TEST_F(StartupDataTest, NoHostAtAllAssertsAndGivesAnEmptyHost) {
    EXPECT_EQ("", StartupData::getInstance()->getHost(StartupData::HOST_STARTUP));
    expectAssertion("it != hosts.end()");
}

}  // namespace
