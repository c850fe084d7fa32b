#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <cstddef>
#include <string>
#include <vector>

#include "network/NetworkTask.h"

namespace Statistics {

class NetworkCollector;

// One upload of the Wi-Fi pool document: gzip-compressed, scrambled with the
// deployment key and posted as the "data" field of a multipart form. Made,
// submitted and finished on the collector's thread.
class NetworkCollectorRequest : public Network::NetworkTask,
                                public boost::enable_shared_from_this<NetworkCollectorRequest> {
public:
    explicit NetworkCollectorRequest(NetworkCollector* collector);

    void setLang(const char* value);
    // Compresses and scrambles body and hands the upload to the network
    // manager. One upload at a time.
    void submit(const std::string& url, const std::string& body);

    bool isReadyToPerform() const override { return true; }
    int getPriority() const override { return 0; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override;
    // Uploads are not themselves measured.
    bool needToGatherStatistics() const override { return false; }
    void onBytesReceived(const std::vector<unsigned char>& bytes) override;
    void onFinished(int resultCode) override;

    // XORs byte i with key[i mod keyLength]; applying it twice restores the
    // data, so the receiving side unscrambles with the same call.
    static void packData(unsigned char* data, std::size_t length, const char* key, std::size_t keyLength);

private:
    bool isFinished;
    NetworkCollector* collector;
    std::string url;
    std::string data;
    std::string lang;
};

}  // namespace Statistics
