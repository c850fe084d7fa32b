#pragma once

#include <string>

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// One observation: its trigger, when it was made, and the connection type.
class ChunkTag : public NetworkCollectorNode {
public:
    // The time is taken now.
    ChunkTag();

    void setType(const std::string& value) { type = value; }
    void setConnection(const std::string& value) { connection = value; }
    long long getTime() const { return time; }

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    std::string type;
    long long time;
    std::string connection;
};

}  // namespace Statistics
