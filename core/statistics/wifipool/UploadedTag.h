#pragma once

#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>

#include "statistics/wifipool/NetworkCollectorNode.h"
#include "statistics/wifipool/RequestInfo.h"

namespace Statistics {

// The bytes a measured request sent.
class UploadedTag : public NetworkCollectorNode, private boost::noncopyable {
public:
    explicit UploadedTag(const boost::shared_ptr<RequestInfo>& info) : info(info) {}

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    boost::shared_ptr<RequestInfo> info;
};

}  // namespace Statistics
