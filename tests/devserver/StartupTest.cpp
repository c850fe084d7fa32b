#include <tinyxml.h>

#include <map>
#include <regex>
#include <set>

#include "DevServerFixture.h"
#include "startup/StartupData.h"
#include "startup/impl/DefaultStartupListener.h"
#include "support/PalTest.h"

namespace {

struct Answer {
    std::string uuid;
    std::map<std::string, std::string> hosts;
    const TiXmlElement* scanner = nullptr;
    TiXmlDocument document;
};

void readAnswer(const std::string& body, Answer& answer) {
    answer.document.Parse(body.c_str());
    ASSERT_FALSE(answer.document.Error()) << body;
    const TiXmlElement* startup = answer.document.FirstChildElement("startup");
    ASSERT_NE(nullptr, startup);
    ASSERT_NE(nullptr, startup->FirstChildElement("uuid"));
    answer.uuid = startup->FirstChildElement("uuid")->GetText();
    for (const TiXmlElement* host = startup->FirstChildElement("query_hosts")->FirstChildElement("host");
         host != nullptr; host = host->NextSiblingElement("host")) {
        answer.hosts[host->Attribute("type")] = host->GetText();
    }
    answer.scanner = startup->FirstChildElement("features")->FirstChildElement("network_scanner");
}

class PrefixedStartupTest : public DevServerFixture {
protected:
    DevServer::Config configure(DevServer::Config config) override {
        config = DevServerFixture::configure(config);
        config.uuidPrefix = "dev-";
        config.hosts["tiles"] = "http://tiles.invalid/";
        config.scanTimeout = 3;
        config.sendTimeout = 6;
        return config;
    }
};

TEST_F(PrefixedStartupTest, GivesNewClientsAUuidAndKeepsAKnownOne) {
    httplib::Result first = get("/startup?uuid=&lang=de-DE&model=Pixel%20%3C7%3E&utf=1");
    ASSERT_TRUE(first);
    ASSERT_EQ(200, first->status);
    Answer answer;
    readAnswer(first->body, answer);
    EXPECT_EQ("dev-1", answer.uuid);
    EXPECT_EQ(server->baseUrl(), answer.hosts["default"]);
    EXPECT_EQ(server->baseUrl(), answer.hosts["startup"]);
    EXPECT_EQ(server->baseUrl(), answer.hosts["cellid"]);
    EXPECT_EQ("http://tiles.invalid/", answer.hosts["tiles"]);
    ASSERT_NE(nullptr, answer.scanner);
    EXPECT_STREQ("1", answer.scanner->Attribute("enabled"));
    EXPECT_STREQ("3", answer.scanner->Attribute("scan_timeout"));
    EXPECT_STREQ("6", answer.scanner->Attribute("send_timeout"));

    httplib::Result second = get("/startup?uuid=dev-1&lang=de-DE&utf=1");
    ASSERT_TRUE(second);
    Answer secondAnswer;
    readAnswer(second->body, secondAnswer);
    EXPECT_EQ("dev-1", secondAnswer.uuid);
    httplib::Result other = get("/startup?lang=en-US");
    ASSERT_TRUE(other);
    Answer otherAnswer;
    readAnswer(other->body, otherAnswer);
    EXPECT_EQ("dev-2", otherAnswer.uuid);

    const DevServer::Journal journal = server->journal();
    ASSERT_EQ(3u, journal.startups.size());
    EXPECT_EQ("", journal.startups[0].sentUuid);
    EXPECT_EQ("dev-1", journal.startups[0].answeredUuid);
    EXPECT_EQ("Pixel <7>", journal.startups[0].params.at("model"));
    EXPECT_EQ("dev-1", journal.startups[1].sentUuid);
    EXPECT_EQ("dev-1", journal.startups[1].answeredUuid);
    EXPECT_EQ("dev-2", journal.startups[2].answeredUuid);
}

TEST_F(PrefixedStartupTest, EscapesTheUuidItEchoesAndRefusesAMalformedOne) {
    httplib::Result echoed = get("/startup?uuid=a%3C%2Fuuid%3E%26b");
    ASSERT_TRUE(echoed);
    Answer answer;
    readAnswer(echoed->body, answer);
    EXPECT_EQ("a</uuid>&b", answer.uuid);

    httplib::Result control = get("/startup?uuid=a%0Ab");
    ASSERT_TRUE(control);
    EXPECT_EQ(400, control->status);
    EXPECT_TRUE(logged("refused GET /startup from 127.0.0.1: malformed uuid (HTTP 400)"));
    expectServing();
}

using RandomUuidTest = DevServerFixture;

TEST_F(RandomUuidTest, GivesEveryNewClientADifferentRandomUuid) {
    const std::regex form("[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}");
    std::set<std::string> uuids;
    for (int i = 0; i < 5; ++i) {
        httplib::Result result = get("/startup");
        ASSERT_TRUE(result);
        Answer answer;
        readAnswer(result->body, answer);
        EXPECT_TRUE(std::regex_match(answer.uuid, form)) << answer.uuid;
        uuids.insert(answer.uuid);
    }
    EXPECT_EQ(5u, uuids.size());
}

// The library's own reading of the answer takes the uuid and every host.
class StartupAnswerReadByLibraryTest : public PalTest {};

TEST_F(StartupAnswerReadByLibraryTest, DefaultListenerStoresUuidAndHosts) {
    DevServer::Config config = DevServer::Config::defaults();
    config.quiet = true;
    config.uuidPrefix = "lib-";
    DevServer::Server server(config, "");
    ASSERT_TRUE(server.start());
    httplib::Client client("127.0.0.1", server.port());
    httplib::Result result = client.Get("/startup?lang=en-US&utf=1");
    ASSERT_TRUE(result);

    TiXmlDocument document;
    document.Parse(result->body.c_str());
    Startup::StartupData data;
    Startup::DefaultStartupListener(&data).parseStartup(document);
    EXPECT_EQ("lib-1", data.uuid);
    EXPECT_EQ(server.baseUrl(), data.getHost(Startup::StartupData::HOST_CELLID));
    EXPECT_EQ(server.baseUrl(), data.getHost(Startup::StartupData::HOST_STARTUP));
    EXPECT_EQ(server.baseUrl(), data.getHost(Startup::StartupData::HOST_DEFAULT));
}

}  // namespace
