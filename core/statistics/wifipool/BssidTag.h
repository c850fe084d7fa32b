#pragma once

#include <string>

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// One access point: its name in Base64 (names may hold any bytes), its
// BSSID as the content.
class BssidTag : public NetworkCollectorNode {
public:
    BssidTag(const std::string& name, const std::string& bssid, int channel, int signalStrength)
        : name(name), bssid(bssid), channel(channel), signalStrength(signalStrength) {}

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    std::string name;
    std::string bssid;
    int channel;
    int signalStrength;
};

}  // namespace Statistics
