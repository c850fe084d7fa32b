#pragma once

#include <string>

namespace Wireless {

// The serving cell of the telephony network, or no cell (invalid). Immutable;
// any thread.
class TelephonyNetworkInfo {
public:
    // No cell: invalid, with empty texts.
    TelephonyNetworkInfo();
    // A known cell.
    TelephonyNetworkInfo(int cellId, int lac, const std::string& operatorId, const std::string& countryCode);

    bool isValid() const { return valid; }
    int getCellID() const { return cellId; }
    int getLocationAreaCode() const { return lac; }
    const std::string& getOperatorId() const { return operatorId; }
    const std::string& getCountryCode() const { return countryCode; }

private:
    bool valid;
    int cellId;
    int lac;
    std::string operatorId;
    std::string countryCode;
};

}  // namespace Wireless
