#include "statistics/wifipool/impl/NetworkCollectorRequest.h"

#include "io/ByteArrayOutputStream.h"
#include "io/zip/GzipOutputStream.h"
#include "network/NetworkErrorCodes.h"
#include "network/NetworkManager.h"
#include "statistics/wifipool/NetworkCollector.h"
#include "statistics/wifipool/UploadConstants.h"
#include "util/Logger.h"

namespace Statistics {

namespace {

const int kUploadTimeoutMs = 30000;

}  // namespace

NetworkCollectorRequest::NetworkCollectorRequest(NetworkCollector* collector)
    : isFinished(true), collector(collector) {}

void NetworkCollectorRequest::setLang(const char* value) {
    lang = value != nullptr ? value : "";
}

void NetworkCollectorRequest::submit(const std::string& requestUrl, const std::string& body) {
    KD_ASSERT(isFinished);
    isFinished = false;
    url = requestUrl;

    IO::ByteArrayOutputStream compressed;
    {
        // The gzip stream writes its data when it is finished.
        IO::Zip::GzipOutputStream gzip(&compressed);
        gzip.write(body.data(), static_cast<int>(body.size()));
    }
    std::vector<unsigned char> bytes = compressed.getData();
    packData(bytes.data(), bytes.size(), kUploadScrambleKey, kUploadScrambleKeyLength);
    data.assign(bytes.begin(), bytes.end());

    boost::shared_ptr<NetworkCollectorRequest> self = shared_from_this();
    collector->networkRequests.insert(self);
    Logger::log(Logger::Debug, "NetworkCollectorRequest::submit()[url: %s]", url.c_str());
    Network::NetworkManager::getInstance()->submit(self);
}

boost::shared_ptr<Network::HttpRequest> NetworkCollectorRequest::issueRequest() const {
    boost::shared_ptr<Network::HttpRequest> request =
        Network::HttpRequest::create(url.c_str(), "POST", kUploadTimeoutMs, false);
    boost::shared_ptr<Network::HttpRequest::MultipartBuilder> builder =
        Network::HttpRequest::MultipartBuilder::create(kUploadBoundary);
    builder->addField("data", data, true, false, "");
    builder->addField("lang", lang, false, false, "");
    request->setBody(builder->getBoundary(), builder->getEncodedContent());
    return request;
}

void NetworkCollectorRequest::onBytesReceived(const std::vector<unsigned char>& bytes) {
    (void)bytes;
}

void NetworkCollectorRequest::onFinished(int resultCode) {
    Logger::log(Logger::Debug, "NetworkCollectorRequest::onFinished()[resultCode: %d]", resultCode);
    isFinished = true;
    // An upload that found the network offline is queued to run again once
    // offline mode ends; it stays in the collector's set so that stop()
    // still withdraws it.
    if (resultCode == Network::OFFLINE_ERROR_CODE) {
        return;
    }
    // Leaving the set may release the last reference to us.
    boost::shared_ptr<NetworkCollectorRequest> thiz = shared_from_this();
    KD_ASSERT(collector->networkRequests.count(thiz));
    collector->networkRequests.erase(thiz);
}

void NetworkCollectorRequest::packData(unsigned char* data, std::size_t length, const char* key,
                                       std::size_t keyLength) {
    for (std::size_t i = 0; i < length; ++i) {
        data[i] ^= static_cast<unsigned char>(key[i % keyLength]);
    }
}

}  // namespace Statistics
