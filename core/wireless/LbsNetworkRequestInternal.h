#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <vector>

#include "network/NetworkTask.h"

namespace Wireless {

class LbsNetworkRequest;

// The HTTP exchange of one positioning query, run by the network manager at
// the highest priority once the startup answer has arrived. Made anew for
// each query; finished (idle) outside it. Network manager's thread only.
class LbsNetworkRequestInternal : public Network::NetworkTask,
                                  public boost::enable_shared_from_this<LbsNetworkRequestInternal> {
public:
    // owner is not owned; it cancels this task before it lets it go, and the
    // task forgets it then.
    explicit LbsNetworkRequestInternal(LbsNetworkRequest* owner);

    void submit();
    void cancel();

    bool isReadyToPerform() const override;
    int getPriority() const override { return 0; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override;
    // A position or an error: a few hundred bytes.
    long long getMaxResponseBodySize() const override { return 64 << 10; }
    void onResponseRecieved(boost::shared_ptr<Network::HttpResponse> response) override;
    void onBytesReceived(const std::vector<unsigned char>& bytes) override;
    void onFinished(int code) override;
    void onRetried() override;

private:
    LbsNetworkRequest* owner;
    bool isFinished;
    std::vector<unsigned char> body;
    // The manager keeps the body of an answer outside 2xx from us; this
    // tells a failed answer that had one from one that had none.
    bool errorBodyAnnounced;
};

}  // namespace Wireless
