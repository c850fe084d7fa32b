#pragma once

#include <string>

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// Holds the serving cell.
class CellInfosTag : public NetworkCollectorNode {
public:
    CellInfosTag(const std::string& networkType, const std::string& radioType)
        : networkType(networkType), radioType(radioType) {}

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    std::string networkType;
    std::string radioType;
};

}  // namespace Statistics
