#include "wireless/TelephonyNetworkInfo.h"

namespace Wireless {

TelephonyNetworkInfo::TelephonyNetworkInfo() : valid(false), cellId(0), lac(0) {}

TelephonyNetworkInfo::TelephonyNetworkInfo(int cellId, int lac, const std::string& operatorId,
                                           const std::string& countryCode)
    : valid(true), cellId(cellId), lac(lac), operatorId(operatorId), countryCode(countryCode) {}

}  // namespace Wireless
