#include "network/HttpConnection.h"

#include <KD/kdext.h>
#include <curl/curl.h>

#include <boost/make_shared.hpp>

#include "HttpDeliveryQueue.h"
#include "HttpEngineCore.h"
#include "HttpTransfer.h"
#include "network/HttpFinishCodes.h"

namespace Network {

namespace {

std::string pathOf(const std::string& url) {
    std::string path;
    CURLU* parsed = curl_url();
    char* part = nullptr;
    if (parsed != nullptr && curl_url_set(parsed, CURLUPART_URL, url.c_str(), 0) == CURLUE_OK &&
        curl_url_get(parsed, CURLUPART_PATH, &part, 0) == CURLUE_OK) {
        path = part;
    }
    curl_free(part);
    curl_url_cleanup(parsed);
    return path;
}

}  // namespace

HttpConnection::HttpConnection(boost::shared_ptr<HttpRequest> request,
                               boost::weak_ptr<NetworkSpeedCollector> speedCollector, int id)
    : request(request),
      speedCollector(speedCollector),
      id(id),
      requestPath(request ? pathOf(request->getUrl()) : std::string()),
      wholeBody(true),
      maxBodySize(-1),
      started(false),
      cancelled(false) {
    KD_ASSERT(request);
}

HttpConnection::~HttpConnection() {
    if (transfer) {
        transfer->cancel();
    }
}

void HttpConnection::setOnFinishedCallback(OnFinishedCallback callback) {
    onFinished = callback;
}

void HttpConnection::setOnResponseReceivedCallback(OnResponseReceivedCallback callback) {
    onResponseReceived = callback;
}

void HttpConnection::setOnBodyDataReceivedCallback(OnBodyDataReceivedCallback callback, bool wholeBody) {
    onBodyDataReceived = callback;
    this->wholeBody = wholeBody;
}

void HttpConnection::setMaxBodySize(long long bytes) {
    maxBodySize = bytes;
}

void HttpConnection::start() {
    KD_ASSERT(!started);
    if (started || cancelled) {
        started = true;
        return;
    }
    started = true;
    deliveries = boost::make_shared<HttpDeliveryQueue>(weak_from_this());
    if (!request) {
        deliveries->pushFinished(HTTP_BAD_REQUEST_ERROR_CODE);
        deliveries->flush();
        return;
    }
    const long long bodyLimit = maxBodySize >= 0 ? maxBodySize : (wholeBody ? kDefaultMaxWholeBodySize : 0);
    transfer = boost::make_shared<HttpTransfer>(request, id, speedCollector, wholeBody, bodyLimit, deliveries,
                                                weak_from_this());
    // Offline: the request would only fail, and later; say so at once.
    if (kdGetNetworkReachabilityStatusZVR() == 0) {
        deliveries->pushFinished(HTTP_OFFLINE_ERROR_CODE);
        deliveries->flush();
        return;
    }
    boost::shared_ptr<HttpEngineCore> core = HttpEngineCore::current();
    KD_ASSERT(core && "an HttpEngine exists");
    if (!core || !transfer->begin(core)) {
        deliveries->pushFinished(HTTP_NO_ENGINE_ERROR_CODE);
        deliveries->flush();
    }
}

void HttpConnection::cancel() {
    if (cancelled) {
        return;
    }
    cancelled = true;
    onFinished = OnFinishedCallback();
    onResponseReceived = OnResponseReceivedCallback();
    onBodyDataReceived = OnBodyDataReceivedCallback();
    if (transfer) {
        transfer->cancel();
    }
}

long long HttpConnection::getRequestSize() const {
    return transfer ? transfer->getRequestSize() : 0;
}

void HttpConnection::deliverResponse(const boost::shared_ptr<HttpResponse>& response) {
    if (!cancelled) {
        onResponseReceived(shared_from_this(), response);
    }
}

void HttpConnection::deliverBodyData(const boost::shared_ptr<DataChunk>& chunk) {
    if (!cancelled) {
        onBodyDataReceived(shared_from_this(), chunk);
    }
}

void HttpConnection::deliverFinished(int code) {
    if (!cancelled) {
        onFinished(shared_from_this(), code);
    }
}

}  // namespace Network
