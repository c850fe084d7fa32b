#pragma once

#include <string>

namespace Wireless {

// One access point of a Wi-Fi scan. Immutable; any thread.
class WifiScanResult {
public:
    // Every ':' of bssid is dropped, so "00:1A:2B:3C:4D:5E" is kept as
    // "001A2B3C4D5E". A null text counts as empty.
    WifiScanResult(const char* bssid, const char* ssid, int signalStrength);

    const std::string& getBssid() const { return bssid; }
    const std::string& getSsid() const { return ssid; }
    int getSignalStrength() const { return signalStrength; }

private:
    std::string bssid;
    std::string ssid;
    int signalStrength;
};

}  // namespace Wireless
