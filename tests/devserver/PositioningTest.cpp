#include <vector>

#include "DevServerFixture.h"
#include "wireless/impl/LbsResponseParser.h"

namespace {

using DevServer::AccessPoint;
using DevServer::Cell;

struct Query {
    const char* name;
    const char* query;
    int status;
    // 0: a position; otherwise the error code of the answer.
    int error;
    double latitude = 0;
    double longitude = 0;
    double accuracy = 0;
};

class PositioningTest : public DevServerFixture, public ::testing::WithParamInterface<Query> {
protected:
    DevServer::Config configure(DevServer::Config config) override {
        config = DevServerFixture::configure(config);
        AccessPoint near;
        near.bssid = "0000000000aa";
        near.latitude = 10.0;
        near.longitude = 20.0;
        near.range = 30;
        AccessPoint far = near;
        far.bssid = "0000000000bb";
        far.longitude = 20.001;
        far.range = 80;
        Cell german;
        german.mcc = 262;
        german.mnc = 1;
        german.lac = 4021;
        german.cid = 23011;
        german.latitude = 11;
        german.longitude = 21;
        german.range = 1500;
        Cell russian = german;
        russian.mcc = 250;
        russian.lac = 7713;
        russian.cid = 20961;
        russian.latitude = 12;
        russian.longitude = 22;
        russian.range = 2000;
        config.accessPoints = {near, far};
        config.cells = {german, russian};
        return config;
    }
};

TEST_P(PositioningTest, AnswersInTheFormTheLibraryReads) {
    const Query& query = GetParam();
    httplib::Result result = get(std::string("/cellid_location/?uuid=u1") + query.query);
    ASSERT_TRUE(result);
    EXPECT_EQ(query.status, result->status);
    const std::vector<unsigned char> body(result->body.begin(), result->body.end());
    const Wireless::LbsNetworkRequest::Response answer =
        Wireless::LbsResponseParser::parse(body, result->status, !body.empty());
    EXPECT_EQ(query.error, answer.error) << result->body;
    if (query.error == 0) {
        EXPECT_NEAR(query.latitude, answer.latitude, 1e-5);
        EXPECT_NEAR(query.longitude, answer.longitude, 1e-5);
        EXPECT_NEAR(query.accuracy, answer.accuracy, 0.05);
    }

    const DevServer::Journal journal = server->journal();
    ASSERT_EQ(1u, journal.positionings.size());
    EXPECT_EQ("u1", journal.positionings[0].uuid);
    EXPECT_EQ(query.error == 0, journal.positionings[0].found);
    if (query.status != 200) {
        EXPECT_TRUE(logged("refused GET /cellid_location/")) << query.name;
        expectServing();
    }
}

// Signal amplitudes of -60 and -80 dBm weigh 10:1.
INSTANTIATE_TEST_SUITE_P(
    Queries, PositioningTest,
    ::testing::Values(
        Query{"WeighsAccessPointsBySignal", "&wifinetworks=0000000000aa:-60,0000000000bb:-80", 200, 0, 10.0,
              20.0 + 0.001 / 11, (10 * 30 + 80) / 11.0},
        Query{"MatchesBssidsInAnyCase", "&wifinetworks=0000000000AA:-70,00000000ffff:-40", 200, 0, 10.0, 20.0,
              30},
        Query{"PrefersAccessPointsToTheCell",
              "&wifinetworks=0000000000bb:-75&lac=4021&cellid=23011&operatorid=26201&countrycode=262", 200, 0,
              10.0, 20.001, 80},
        Query{"FallsBackToTheCell",
              "&wifinetworks=00000000ffff:-50&lac=4021&cellid=23011&operatorid=26201&countrycode=262"
              "&signalstrength=-85",
              200, 0, 11, 21, 1500},
        Query{"ReadsAnOperatorIdWithoutTheCountry", "&lac=7713&cellid=20961&operatorid=01&countrycode=250",
              200, 0, 12, 22, 2000},
        Query{"AnswersAnErrorForUnknownRadios", "&wifinetworks=00000000ffff:-50&lac=1&cellid=2", 200, 404},
        Query{"AnswersAnErrorForNoRadios", "", 200, 404},
        Query{"RefusesAWifiEntryWithoutLevel", "&wifinetworks=0000000000aa", 400, 400},
        Query{"RefusesAnEmptyWifiEntry", "&wifinetworks=0000000000aa:-50,", 400, 400},
        Query{"RefusesANonNumericCell", "&lac=4021&cellid=x", 400, 400},
        Query{"RefusesANonNumericSignal", "&lac=4021&cellid=23011&signalstrength=loud", 400, 400}),
    [](const ::testing::TestParamInfo<Query>& info) { return std::string(info.param.name); });

TEST_F(PositioningTest, RecordsWhichRadiosWereKnown) {
    ASSERT_TRUE(
        get("/cellid_location/?uuid=u2&wifinetworks=0000000000aa:-60,00000000ffff:-40"
            "&lac=4021&cellid=23011&operatorid=26201&countrycode=262&signalstrength=-90"));
    const DevServer::Journal journal = server->journal();
    ASSERT_EQ(1u, journal.positionings.size());
    const std::vector<DevServer::SeenRadio>& radios = journal.positionings[0].radios;
    ASSERT_EQ(3u, radios.size());
    EXPECT_EQ("0000000000aa", radios[0].id);
    EXPECT_TRUE(radios[0].known);
    EXPECT_EQ(-60, radios[0].signal);
    EXPECT_FALSE(radios[1].known);
    EXPECT_EQ("cell", radios[2].kind);
    EXPECT_EQ("262/1/4021/23011", radios[2].id);
    EXPECT_EQ(-90, radios[2].signal);
    EXPECT_TRUE(radios[2].known);
}

}  // namespace
