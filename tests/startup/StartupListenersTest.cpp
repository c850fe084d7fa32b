// The built-in startup listeners: what they collect from the simulated device
// and radios, and what they take from an answer.
#include <tinyxml.h>

#include <boost/make_shared.hpp>
#include <string>
#include <vector>

#include "location/LocationManager.h"
#include "startup/StartupData.h"
#include "startup/impl/DefaultStartupListener.h"
#include "startup/impl/TelephonyStartupListener.h"
#include "startup/impl/WifiStartupListener.h"
#include "support/PalTest.h"
#include "support/ScopedLocale.h"
#include "wireless/WifiScanResult.h"

namespace {

using Startup::StartupData;
using Startup::StartupParams;

const KDust kMs = 1000000ull;

class StartupListenersTest : public PalTest {
protected:
    Startup::StartupListener::CollectCallback collector() {
        return Startup::StartupListener::CollectCallback::make<StartupListenersTest,
                                                               &StartupListenersTest::onCollected>(this);
    }
    void onCollected(const StartupParams& params) { collected.push_back(params); }

    StartupParams collectDefault() {
        Startup::DefaultStartupListener listener(StartupData::getInstance());
        collected.clear();
        listener.collectStartupParams(collector());
        EXPECT_EQ(1u, collected.size()) << "the default listener answers at once";
        return collected.empty() ? StartupParams() : collected.back();
    }

    void parse(const std::string& xml) {
        TiXmlDocument document;
        document.Parse(xml.c_str());
        Startup::DefaultStartupListener(StartupData::getInstance()).parseStartup(document);
    }

    std::vector<StartupParams> collected;
};

TEST_F(StartupListenersTest, DefaultParametersDescribeTheDevice) {
    pal::setDeviceString(KD_STRING_DEVICE_MODEL_ZVR, "Pixel");
    pal::setDeviceString(KD_STRING_MANUFACTURER_ZVR, "Maker");
    pal::setDeviceString(KD_STRING_OS_VERSION_ZVR, "14");
    pal::setDeviceString(KD_STRING_APP_PLATFORM_ZVR, "android");
    pal::setDeviceString(KD_STRING_BUILD_NUMBER_ZVR, "77");
    pal::setDeviceId("", false);
    const struct {
        const char* version;
        KDint dpi;
        const char* appVersion;
        const char* scale;
    } cases[] = {{"3.259", 240, "325", "1.5"},
                 {"0", 160, "0", "1.0"},
                 {"garbage", 120, "0", "0.8"},
                 {"-2", 320, "0", "2.0"},
                 {"1e30", 160, "0", "1.0"}};
    for (const auto& c : cases) {
        pal::setDeviceString(KD_STRING_APP_VERSION_ZVR, c.version);
        pal::setDotsPerInch(c.dpi);
        StartupParams params = collectDefault();
        EXPECT_EQ(c.appVersion, params["app_version"]) << c.version;
        EXPECT_EQ(c.scale, params["scalefactor"]) << c.dpi;
        EXPECT_EQ("Pixel", params["model"]);
        EXPECT_EQ("Maker", params["manufacturer"]);
        EXPECT_EQ("14", params["os_version"]);
        EXPECT_EQ("android", params["app_platform"]);
        EXPECT_EQ("77", params["build_number"]);
        EXPECT_EQ(0u, params.count("deviceid")) << "no device-id support, no key";
        EXPECT_EQ(0u, params.count("ll")) << "no location yet";
    }
}

TEST_F(StartupListenersTest, NumbersKeepTheirDecimalPointUnderADecimalCommaLocale) {
    ScopedLocale german("de_DE.UTF-8");
    if (!german.active()) {
        GTEST_SKIP() << "no de_DE.UTF-8 locale";
    }
    pal::setDeviceString(KD_STRING_APP_VERSION_ZVR, "3.259");
    pal::setDotsPerInch(240);
    StartupParams params = collectDefault();
    EXPECT_EQ("325", params["app_version"]);
    EXPECT_EQ("1.5", params["scalefactor"]);
}

TEST_F(StartupListenersTest, DeviceIdIsSentWhenSupportedEvenWhenEmpty) {
    pal::setDeviceId("", true);
    EXPECT_EQ("", collectDefault().at("deviceid"));
    pal::setDeviceId("dev-42", true);
    EXPECT_EQ("dev-42", collectDefault().at("deviceid"));
}

TEST_F(StartupListenersTest, LastLocationIsSentOnlyWhenItIsKnown) {
    StartupData::getInstance()->setHost(StartupData::HOST_DEFAULT, "http://127.0.0.1:1/");
    Location::LocationManager* manager = Location::LocationManager::getInstance();
    pal::postAppResumed();
    pump();
    EXPECT_EQ(0u, collectDefault().count("ll"));
    KDLocationFixZVR fix = {52.5f, 13.25f, -1.0f, -1.0f, 10.0f, -1.0f, 2};
    advanceMs(1000);
    pal::injectLocationFix(fix);
    pump();
    ASSERT_NE(Location::PrecisionNone, manager->getLastLocation().precision);
    EXPECT_EQ("52.500000,13.250000", collectDefault().at("ll"));
    pal::postAppPaused();
    pump();
}

TEST_F(StartupListenersTest, AnswerFillsIdentifierHostsDeviceIdAndVoice) {
    pal::setDeviceId("old", true);
    parse(
        "<startup><uuid>u-7</uuid><deviceid>dev-9</deviceid><query_hosts>"
        "<host type=\"tiles\">http://tiles.example/</host><host type=\"cellid\">https://a.example</host>"
        "<host type=\"cellid\">https://b.example</host></query_hosts>"
        "<features><voice><asr>on</asr><logging></logging></voice></features></startup>");
    StartupData* data = StartupData::getInstance();
    EXPECT_EQ("u-7", data->uuid);
    EXPECT_EQ("dev-9", pal::deviceIdSetByLibrary());
    EXPECT_EQ("http://tiles.example/", data->getHost("tiles"));
    EXPECT_EQ("https://b.example/", data->getHost("cellid")) << "a later host of a type wins";
    EXPECT_EQ("on", data->voiceAsr);
    EXPECT_EQ("", data->voiceLogging) << "an empty element leaves the value";
    EXPECT_FALSE(data->startupReady);
    Startup::DefaultStartupListener(data).onStartupReady();
    EXPECT_TRUE(data->startupReady);
}

// The answer is untrusted: whatever is missing or malformed is skipped with a
// warning, and what was known before stays.
TEST_F(StartupListenersTest, MalformedAnswersKeepWhatIsKnown) {
    StartupData* data = StartupData::getInstance();
    const char* answers[] = {
        "<other><uuid>x</uuid></other>",
        "<startup><query_hosts><host type=\"tiles\">ftp://bad/</host></query_hosts></startup>",
        "<startup><uuid/><query_hosts><host>http://no-type/</host><host "
        "type=\"tiles\"/></query_hosts></startup>",
        "<startup><uuid>u-2</uuid></startup>",
        "<startup><uuid>u-3</uuid><query_hosts><host type=\"tiles\">javascript:alert(1)</host>"
        "<host type=\"search\">https://search/</host></query_hosts></startup>",
    };
    data->uuid = "u-1";
    data->setHost("tiles", "http://tiles/");
    for (const char* answer : answers) {
        parse(answer);
        EXPECT_EQ("http://tiles/", data->getHost("tiles")) << answer;
    }
    EXPECT_EQ("u-3", data->uuid);
    EXPECT_EQ("https://search/", data->getHost("search"));
    EXPECT_GE(countLogLines("DefaultStartupListener:"), 6);
    EXPECT_TRUE(assertions().empty());
}

TEST_F(StartupListenersTest, CellParametersOrNoneWithoutACell) {
    Startup::TelephonyStartupListener listener;
    pal::scriptCellInfo(pal::Answer::after(10 * kMs), {true, 12345, 678, "26201", "262"});
    listener.collectStartupParams(collector());
    EXPECT_TRUE(collected.empty()) << "the cell is asked for asynchronously";
    advanceMs(10);
    pump();
    ASSERT_EQ(1u, collected.size());
    EXPECT_EQ(
        (StartupParams{{"operatorid", "26201"}, {"countrycode", "262"}, {"cellid", "12345"}, {"lac", "678"}}),
        collected[0]);

    listener.cancelCollectStartupParams();
    pal::scriptCellInfo(pal::Answer::refuse(), {});
    listener.collectStartupParams(collector());
    pump();
    ASSERT_EQ(2u, collected.size());
    EXPECT_TRUE(collected[1].empty());
}

TEST_F(StartupListenersTest, CancelledCollectionNeverAnswers) {
    Startup::TelephonyStartupListener telephony;
    Startup::WifiStartupListener wifi;
    pal::scriptCellInfo(pal::Answer::after(10 * kMs), {true, 1, 2, "3", "4"});
    pal::scriptWifiScan(pal::Answer::after(10 * kMs), {{"001122aabbcc", "a", -61}});
    telephony.collectStartupParams(collector());
    wifi.collectStartupParams(collector());
    telephony.cancelCollectStartupParams();
    wifi.cancelCollectStartupParams();
    advanceMs(5000);
    pump();
    EXPECT_TRUE(collected.empty());
    EXPECT_EQ(0, pal::unreleasedRecords());
}

TEST_F(StartupListenersTest, WifiParameterJoinsAccessPointsAndLeavesOutBadBssids) {
    typedef boost::shared_ptr<Wireless::WifiScanResult> Result;
    const std::vector<Result> two = {
        boost::make_shared<Wireless::WifiScanResult>("00:11:22:aa:bb:cc", "a", -61),
        boost::make_shared<Wireless::WifiScanResult>("001122aabbcd", "b", -80)};
    EXPECT_EQ("00:11:22:aa:bb:cc,-61;00:11:22:aa:bb:cd,-80", Startup::WifiStartupListener::encode(two));
    EXPECT_EQ("00:11:22:aa:bb:cc,-61", Startup::WifiStartupListener::encode({two[0]}));

    const std::vector<Result> bad = {
        boost::make_shared<Wireless::WifiScanResult>("0011", "short", -1),
        boost::make_shared<Wireless::WifiScanResult>("00112233445g", "nothex", -2),
        boost::make_shared<Wireless::WifiScanResult>("0011223344556", "long", -3), two[1]};
    EXPECT_EQ("00:11:22:aa:bb:cd,-80", Startup::WifiStartupListener::encode(bad));
    EXPECT_EQ(3, countLogLines("is not 12 hexadecimal digits"));

    Startup::WifiStartupListener listener;
    pal::scriptWifiScan(pal::Answer::after(0), {});
    listener.collectStartupParams(collector());
    pump();
    ASSERT_EQ(1u, collected.size());
    EXPECT_EQ(0u, collected[0].count("wifi")) << "an empty scan sends no key";
}

}  // namespace
