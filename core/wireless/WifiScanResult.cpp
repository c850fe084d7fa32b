#include "wireless/WifiScanResult.h"

namespace Wireless {

WifiScanResult::WifiScanResult(const char* bssid, const char* ssid, int signalStrength)
    : ssid(ssid != nullptr ? ssid : ""), signalStrength(signalStrength) {
    for (const char* c = bssid; c != nullptr && *c != '\0'; ++c) {
        if (*c != ':') {
            this->bssid += *c;
        }
    }
}

}  // namespace Wireless
