#pragma once

#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>

#include "statistics/wifipool/NetworkCollectorNode.h"
#include "statistics/wifipool/RequestInfo.h"

namespace Statistics {

// One block of response data: its size and nanoseconds since the request
// left.
class DownloadedTag : public NetworkCollectorNode, private boost::noncopyable {
public:
    DownloadedTag(const boost::shared_ptr<RequestInfo>& info, const boost::shared_ptr<ChunkInfo>& chunk)
        : info(info), chunk(chunk) {}

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    boost::shared_ptr<RequestInfo> info;
    boost::shared_ptr<ChunkInfo> chunk;
};

}  // namespace Statistics
