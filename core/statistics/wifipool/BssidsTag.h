#pragma once

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// Holds the access points of one scan; present in every chunk, even empty.
class BssidsTag : public NetworkCollectorNode {
public:
    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;
};

}  // namespace Statistics
