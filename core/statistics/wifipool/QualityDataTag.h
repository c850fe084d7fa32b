#pragma once

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// An element for the application's own quality reports; the collector never
// makes one.
class QualityDataTag : public NetworkCollectorNode {
public:
    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;
};

}  // namespace Statistics
