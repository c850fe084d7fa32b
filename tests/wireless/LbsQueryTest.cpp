#include <gtest/gtest.h>

#include <boost/make_shared.hpp>
#include <string>
#include <vector>

#include "wireless/impl/LbsQuery.h"

namespace {

using Wireless::LbsQuery;
using Wireless::TelephonyNetworkInfo;
using Wireless::WifiScanResult;

TEST(LbsQueryTest, AppendsEachAnswerThatHasData) {
    std::string query;
    LbsQuery::appendWifi(query, {});
    LbsQuery::appendCell(query, TelephonyNetworkInfo());
    LbsQuery::appendSignalStrength(query, false, -70);
    EXPECT_EQ("", query);

    LbsQuery::appendSignalStrength(query, true, -71);
    LbsQuery::appendCell(query, TelephonyNetworkInfo(12345, 678, "26201", "262"));
    LbsQuery::appendWifi(query, {boost::make_shared<WifiScanResult>("00:1A:2B:3C:4D:5E", "a", -61),
                                 boost::make_shared<WifiScanResult>("001a2b3c4d5f", "b", 7)});
    EXPECT_EQ(
        "&signalstrength=-71&lac=678&cellid=12345&operatorid=26201&countrycode=262"
        "&wifinetworks=001A2B3C4D5E:-61,001a2b3c4d5f:7",
        query);
}

TEST(LbsQueryTest, PlatformTextsCannotAddParameters) {
    std::string query;
    LbsQuery::appendCell(query, TelephonyNetworkInfo(-1, 5, "1&x=2", "a b#"));
    LbsQuery::appendWifi(query, {boost::make_shared<WifiScanResult>("ab&c=d,e:f", "", -1)});
    EXPECT_EQ(
        "&lac=5&cellid=4294967295&operatorid=1%26x%3D2&countrycode=a+b%23&wifinetworks=ab%26c%3Dd%2Cef:-1",
        query);
}

}  // namespace
