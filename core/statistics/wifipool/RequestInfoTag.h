#pragma once

#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>

#include "statistics/wifipool/NetworkCollectorNode.h"
#include "statistics/wifipool/RequestInfo.h"

namespace Statistics {

// One measured request: its path, and where the device was when the position
// came from satellites.
class RequestInfoTag : public NetworkCollectorNode, private boost::noncopyable {
public:
    explicit RequestInfoTag(const boost::shared_ptr<RequestInfo>& info) : info(info) {}

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    boost::shared_ptr<RequestInfo> info;
};

}  // namespace Statistics
