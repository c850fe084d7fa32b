#pragma once

#include <KD/kd.h>

#include <string>

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// The serving cell with the signal strength measured just before.
class CellInfoTag : public NetworkCollectorNode {
public:
    CellInfoTag(KDuint32 cellId, KDuint32 lac, const std::string& operatorId, const std::string& countryCode,
                int signalStrength)
        : cellId(cellId),
          lac(lac),
          operatorId(operatorId),
          countryCode(countryCode),
          signalStrength(signalStrength) {}

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    KDuint32 cellId;
    KDuint32 lac;
    std::string operatorId;
    std::string countryCode;
    int signalStrength;
};

}  // namespace Statistics
