#include "wireless/impl/LbsQuery.h"

#include <KD/kd.h>

#include "util/UrlCoder.h"

namespace Wireless {

void LbsQuery::appendWifi(std::string& query,
                          const std::vector<boost::shared_ptr<WifiScanResult> >& results) {
    if (results.empty()) {
        return;
    }
    query += "&wifinetworks=";
    for (size_t i = 0; i < results.size(); ++i) {
        if (i > 0) {
            query += ',';
        }
        char level[64];
        kdSprintf_s(level, sizeof(level), "%d", results[i]->getSignalStrength());
        query += Util::UrlCoder::urlEncodeString(results[i]->getBssid());
        query += ':';
        query += level;
    }
}

void LbsQuery::appendCell(std::string& query, const TelephonyNetworkInfo& info) {
    if (!info.isValid()) {
        return;
    }
    char numbers[256];
    kdSprintf_s(numbers, sizeof(numbers), "&lac=%u&cellid=%u",
                static_cast<unsigned>(info.getLocationAreaCode()), static_cast<unsigned>(info.getCellID()));
    query += numbers;
    query += "&operatorid=" + Util::UrlCoder::urlEncodeString(info.getOperatorId());
    query += "&countrycode=" + Util::UrlCoder::urlEncodeString(info.getCountryCode());
}

void LbsQuery::appendSignalStrength(std::string& query, bool success, int strength) {
    if (!success) {
        return;
    }
    char text[64];
    kdSprintf_s(text, sizeof(text), "&signalstrength=%d", strength);
    query += text;
}

}  // namespace Wireless
