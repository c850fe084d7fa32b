// The exact text of the upload document's elements.
#include <boost/make_shared.hpp>
#include <functional>
#include <string>
#include <vector>

#include "statistics/wifipool/BssidTag.h"
#include "statistics/wifipool/BssidsTag.h"
#include "statistics/wifipool/CellInfoTag.h"
#include "statistics/wifipool/CellInfosTag.h"
#include "statistics/wifipool/ChunkTag.h"
#include "statistics/wifipool/DownloadedTag.h"
#include "statistics/wifipool/GpsDataTag.h"
#include "statistics/wifipool/RequestInfoTag.h"
#include "statistics/wifipool/UploadedTag.h"
#include "statistics/wifipool/WifiPoolTag.h"
#include "support/PalTest.h"
#include "support/ScopedLocale.h"

namespace {

using namespace Statistics;

typedef boost::shared_ptr<NetworkCollectorNode> Node;

std::string text(const Node& node) {
    std::string out;
    node->appendContent(out);
    return out;
}

boost::shared_ptr<RequestInfo> request(const std::string& path, Location::LocationPrecision precision) {
    boost::shared_ptr<RequestInfo> info = boost::make_shared<RequestInfo>();
    info->path = path;
    info->precision = precision;
    info->location.latitude = 55.7558f;
    info->location.longitude = 37.6173f;
    info->uploadSize = 321;
    info->startTime = 5000;
    return info;
}

struct XmlCase {
    const char* name;
    std::function<Node()> make;
    const char* expected;
};

void PrintTo(const XmlCase& xmlCase, std::ostream* os) {
    *os << xmlCase.name;
}

const XmlCase kCases[] = {
    {"DefaultRoot", [] { return Node(new WifiPoolTag()); },
     "<wifipool uuid=\"\" app_version=\"\" app_platform=\"\" clid=\"0\" manufacter=\"\" "
     "model=\"\"></wifipool>"},
    {"EmptyBssids", [] { return Node(new BssidsTag()); }, "<bssids ></bssids>"},
    {"RequestWithoutSatelliteFix",
     [] { return Node(new RequestInfoTag(request("/tiles/1", Location::PrecisionNetwork))); },
     "<r type=\"/tiles/1\"></r>"},
    {"RequestWithSatelliteFix",
     [] { return Node(new RequestInfoTag(request("/tiles/1", Location::PrecisionSatellite))); },
     "<r type=\"/tiles/1\" lat=\"55.7558\"  lon=\"37.6173\"></r>"},
    {"Uploaded", [] { return Node(new UploadedTag(request("/", Location::PrecisionNone))); },
     "<u size=\"321\"></u>"},
    {"DownloadedTimeIsSinceSending",
     [] {
         return Node(new DownloadedTag(request("/", Location::PrecisionNone),
                                       boost::make_shared<ChunkInfo>(77, 1500)));
     },
     "<d size=\"77\" time=\"-3500\"></d>"},
    {"GpsWithSixDecimals",
     [] {
         boost::shared_ptr<GpsDataTag> gps = boost::make_shared<GpsDataTag>(55.5f, -37.25f);
         gps->setSpeed(-1);
         gps->setCourse(90.125f);
         return Node(gps);
     },
     "<gps lat=\"55.500000\" lon=\"-37.250000\" speed=\"-1.000000\" course=\"90.125000\"></gps>"},
    {"GpsWithoutOptionalValues", [] { return Node(new GpsDataTag(1, 2)); },
     "<gps lat=\"1.000000\" lon=\"2.000000\"></gps>"},
    {"Cell",
     [] {
         Node cells(new CellInfosTag("UNKNOWN", "NONE"));
         cells->addChild(Node(new CellInfoTag(4294967295u, 7, "01", "250", -71)));
         return cells;
     },
     "<cellinfos network_type=\"UNKNOWN\" radio_type=\"NONE\"><cellinfo cellid=\"4294967295\" lac=\"7\" "
     "operatorid=\"01\" countrycode=\"250\" sigstr=\"-71\" age=\"0\"></cellinfo></cellinfos>"},
    {"BssidNameInBase64", [] { return Node(new BssidTag("home", "001A2B3C4D5E", 0, -40)); },
     "<bssid name=\"aG9tZQ==\" channel=\"0\" sigstr=\"-40\" age=\"0\">001A2B3C4D5E</bssid>"},
    {"ValuesAreEscaped",
     [] {
         boost::shared_ptr<WifiPoolTag> root = boost::make_shared<WifiPoolTag>();
         root->setModel("Phone \"X\" <5> & co");
         root->setManufacter("Ünï");
         root->addChild(Node(new RequestInfoTag(request("/a?b&c<d>", Location::PrecisionNone))));
         root->addChild(Node(new BssidTag("<&>", "A&B", 0, 1)));
         return Node(root);
     },
     "<wifipool uuid=\"\" app_version=\"\" app_platform=\"\" clid=\"0\" manufacter=\"&#xDC;n&#xEF;\" "
     "model=\"Phone &quot;X&quot; &lt;5&gt; &amp; co\"><r type=\"/a?b&amp;c&lt;d&gt;\"></r>"
     "<bssid name=\"PCY+\" channel=\"0\" sigstr=\"1\" age=\"0\">A&amp;B</bssid></wifipool>"},
};

class WifiPoolXmlTest : public ::testing::TestWithParam<XmlCase> {};

TEST_P(WifiPoolXmlTest, WritesExactText) {
    EXPECT_EQ(GetParam().expected, text(GetParam().make()));
}

TEST_P(WifiPoolXmlTest, WritesTheSameTextUnderADecimalCommaLocale) {
    ScopedLocale german("de_DE.UTF-8");
    if (!german.active()) {
        GTEST_SKIP() << "no de_DE.UTF-8 locale";
    }
    EXPECT_EQ(GetParam().expected, text(GetParam().make()));
}

INSTANTIATE_TEST_SUITE_P(Elements, WifiPoolXmlTest, ::testing::ValuesIn(kCases),
                         [](const ::testing::TestParamInfo<XmlCase>& info) {
                             return std::string(info.param.name);
                         });

struct EscapeCase {
    const char* text;
    const char* expected;
};

class EscapeTest : public ::testing::TestWithParam<EscapeCase> {};

TEST_P(EscapeTest, KeepsTheDocumentWellFormedInItsDeclaredEncoding) {
    EXPECT_EQ(GetParam().expected, NetworkCollectorNode::escape(GetParam().text));
}

INSTANTIATE_TEST_SUITE_P(Texts, EscapeTest,
                         ::testing::Values(EscapeCase{"plain text/path?x=1", "plain text/path?x=1"},
                                           EscapeCase{"\"a\" & <b>", "&quot;a&quot; &amp; &lt;b&gt;"},
                                           EscapeCase{"\xD0\x98\xD0\xB2", "&#x418;&#x432;"},
                                           EscapeCase{"\xF0\x9F\x98\x80", "&#x1F600;"},
                                           EscapeCase{"a\x01\tb", "a&#xFFFD;\tb"},
                                           EscapeCase{"\xFF", "&#xFFFD;"},
                                           EscapeCase{"\xC0\x80", "&#xFFFD;&#xFFFD;"},
                                           EscapeCase{"\xE2\x82", "&#xFFFD;&#xFFFD;"},
                                           EscapeCase{"\xED\xA0\x80x", "&#xFFFD;&#xFFFD;&#xFFFD;x"}));

class ChunkTagTest : public PalTest {};

TEST_F(ChunkTagTest, TimeIsWallClockOfCreationInUtc) {
    // The virtual clock starts at 1 January 2026, 00:00:00 UTC.
    advance(3723ull * 1000000000ull);
    boost::shared_ptr<ChunkTag> chunk = boost::make_shared<ChunkTag>();
    chunk->setType("normal");
    chunk->setConnection("wifi");
    EXPECT_EQ("<chunk type=\"normal\" time=\"01012026:010203\" connection=\"wifi\"></chunk>", text(chunk));
}

}  // namespace
