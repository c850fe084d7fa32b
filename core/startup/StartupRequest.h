#pragma once

#include <boost/shared_ptr.hpp>

#include "network/NetworkTask.h"
#include "startup/StartupListener.h"
#include "util/callback.h"

class TiXmlDocument;

namespace Startup {

// The GET of the startup document on the "startup" host, carrying the
// client identifier, the language and the collected parameters. Hands the
// parsed answer on when the exchange finishes; a body that is not XML is
// handed to nobody. Main thread only.
class StartupRequest : public Network::NetworkTask {
public:
    typedef callback<void (*)(TiXmlDocument*)> ReadyCallback;

    // Takes the parameters over: params is empty afterwards.
    StartupRequest(StartupParams& params, ReadyCallback onReady);
    ~StartupRequest() override;

    bool isReadyToPerform() const override { return true; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override;
    // Hosts and feature sections: a few kilobytes.
    long long getMaxResponseBodySize() const override { return 256 << 10; }
    void onBytesReceived(const std::vector<unsigned char>& bytes) override;
    void onFinished(int code) override;

    // The URL issueRequest() asks for.
    std::string buildUrl() const;

private:
    bool parsed;
    StartupParams params;
    ReadyCallback onReady;
    boost::shared_ptr<TiXmlDocument> document;
};

}  // namespace Startup
