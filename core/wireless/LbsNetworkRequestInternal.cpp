#include "wireless/LbsNetworkRequestInternal.h"

#include <KD/kd.h>

#include <string>

#include "network/NetworkManager.h"
#include "startup/StartupData.h"
#include "util/UrlCoder.h"
#include "wireless/LbsNetworkRequest.h"

namespace Wireless {

namespace {

const char* const kLocationPath = "cellid_location/";
const int kRequestTimeoutMs = 30000;

}  // namespace

LbsNetworkRequestInternal::LbsNetworkRequestInternal(LbsNetworkRequest* owner)
    : owner(owner), isFinished(true), errorBodyAnnounced(false) {}

void LbsNetworkRequestInternal::submit() {
    KD_ASSERT(isFinished);
    isFinished = false;
    Network::NetworkManager::getInstance()->submit(shared_from_this());
}

// Also after the task finished: one that finished offline is queued to run
// again, and that run would reach an owner that has let it go.
void LbsNetworkRequestInternal::cancel() {
    isFinished = true;
    owner = nullptr;
    Network::NetworkManager::getInstance()->cancel(shared_from_this());
}

bool LbsNetworkRequestInternal::isReadyToPerform() const {
    return Startup::StartupData::getInstance()->startupReady;
}

boost::shared_ptr<Network::HttpRequest> LbsNetworkRequestInternal::issueRequest() const {
    KD_ASSERT(owner != nullptr && "a cancelled positioning request is not run again");
    if (owner == nullptr) {
        return boost::shared_ptr<Network::HttpRequest>();
    }
    const Startup::StartupData* startupData = Startup::StartupData::getInstance();
    // The uuid comes from a server: escaped, it cannot add parameters.
    const std::string url = startupData->getHost(Startup::StartupData::HOST_CELLID) + kLocationPath +
                            "?uuid=" + Util::UrlCoder::urlEncodeString(startupData->uuid) + owner->getQuery();
    boost::shared_ptr<Network::HttpRequest> request =
        Network::HttpRequest::create(url.c_str(), "GET", kRequestTimeoutMs, false);
    // The query says where the device is: it may move within its host, or to
    // https, but goes nowhere else.
    request->setRedirectPolicy(Network::HttpRequest::SameHostRedirects);
    return request;
}

void LbsNetworkRequestInternal::onResponseRecieved(boost::shared_ptr<Network::HttpResponse> response) {
    const int status = response->getStatusCode();
    errorBodyAnnounced = (status < 200 || status > 299) && response->getContentLength() != 0;
}

void LbsNetworkRequestInternal::onBytesReceived(const std::vector<unsigned char>& bytes) {
    body = bytes;
}

void LbsNetworkRequestInternal::onFinished(int code) {
    KD_ASSERT(isFinished == false);
    if (isFinished || owner == nullptr) {
        return;
    }
    isFinished = true;
    // The owner drops its reference to us; the body must outlive its call.
    const boost::shared_ptr<LbsNetworkRequestInternal> self = shared_from_this();
    owner->onLbsNetworkRequestCompeted(body, code, errorBodyAnnounced);
}

// A new attempt starts from nothing, so a body of a failed attempt is never
// taken for the answer of a later one.
void LbsNetworkRequestInternal::onRetried() {
    body.clear();
    errorBodyAnnounced = false;
}

}  // namespace Wireless
