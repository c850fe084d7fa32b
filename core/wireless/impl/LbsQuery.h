#pragma once

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "wireless/TelephonyNetworkInfo.h"
#include "wireless/WifiScanResult.h"

namespace Wireless {

// The query parameters of a positioning request, appended one radio answer
// at a time. Texts from the platform are URL-escaped, so a strange one cannot
// add parameters; ordinary values (digits, hexadecimal BSSIDs) read as they
// are. Stateless; any thread.
class LbsQuery {
public:
    // "&wifinetworks=BSSID:level,BSSID:level..."; nothing for an empty scan.
    static void appendWifi(std::string& query,
                           const std::vector<boost::shared_ptr<WifiScanResult> >& results);
    // "&lac=..&cellid=..&operatorid=..&countrycode=.."; nothing without a cell.
    static void appendCell(std::string& query, const TelephonyNetworkInfo& info);
    // "&signalstrength=.."; nothing when the query failed.
    static void appendSignalStrength(std::string& query, bool success, int strength);
};

}  // namespace Wireless
