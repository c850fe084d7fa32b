#pragma once

#include <boost/noncopyable.hpp>

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// Holds one r element per measured request.
class RequestTimingsTag : public NetworkCollectorNode, private boost::noncopyable {
public:
    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;
};

}  // namespace Statistics
