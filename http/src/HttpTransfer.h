#pragma once

#include <curl/curl.h>

#include <atomic>
#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <chrono>
#include <string>

#include "HttpDeliveryQueue.h"
#include "network/HttpRequest.h"
#include "network/HttpResponse.h"
#include "network/NetworkSpeedCollector.h"

namespace Network {

class HttpConnection;
class HttpEngineCore;

// The engine-side half of one connection: a libcurl easy handle's options,
// callbacks and outcome. Made on the caller thread by HttpConnection::start;
// from then on open, the curl callbacks and the finishing calls run on the
// engine thread only. cancel, onBodyAvailable and getRequestSize may be
// called from any thread.
class HttpTransfer : public boost::enable_shared_from_this<HttpTransfer> {
public:
    typedef std::chrono::steady_clock Clock;

    HttpTransfer(const boost::shared_ptr<HttpRequest>& request, int id,
                 const boost::weak_ptr<NetworkSpeedCollector>& speedCollector, bool wholeBody,
                 const boost::shared_ptr<HttpDeliveryQueue>& deliveries,
                 const boost::weak_ptr<HttpConnection>& connection);
    ~HttpTransfer();

    // Caller thread: hands the transfer to the engine. False when no engine
    // takes it.
    bool begin(const boost::shared_ptr<HttpEngineCore>& core);
    // Any thread: no result is delivered any more; the engine drops the
    // transfer.
    void cancel();
    bool isCancelled() const { return deliveries->isDetached(); }
    // Any thread: the body stream has new bytes or ended.
    void onBodyAvailable();
    long long getRequestSize() const { return requestSize.load(); }

    // Engine thread. Sets the handle up for this request; false (after
    // finishing with a failure code) when the request cannot be made.
    bool open(CURL* handle);
    CURL* getHandle() const { return handle; }
    void resumeUpload();
    // Whether the transfer has been silent for longer than its timeout, and
    // when it will have been.
    bool isExpired(Clock::time_point now) const;
    bool getDeadline(Clock::time_point& deadline) const;
    void complete(CURLcode result);
    // Ends a running transfer with a failure code of our own.
    void fail(int code);
    // Ends a transfer silent for longer than its timeout.
    void expire();
    // The caller cancelled a transfer still running.
    void abandon();
    // Wakes the caller thread for what this round of work queued.
    void flushDeliveries();
    // Releases the handle's resources and flushes; the handle goes back to
    // the engine.
    void close();

private:
    HttpTransfer(const HttpTransfer&) = delete;
    HttpTransfer& operator=(const HttpTransfer&) = delete;

    static int onConnected(void* self, char* serverAddress, char* localAddress, int serverPort,
                           int localPort);
    static size_t onHeaderLine(char* data, size_t size, size_t count, void* self);
    static size_t onBodyBytes(char* data, size_t size, size_t count, void* self);
    static size_t onUploadRead(char* buffer, size_t size, size_t count, void* self);
    static int onUploadSeek(void* self, curl_off_t offset, int origin);

    void setMethodAndBody();
    void setHeaders();
    void touch() { lastActivity = Clock::now(); }
    void headerLine(const std::string& line);
    void headerBlockEnded();
    void deliverResponse();
    void reportSent();
    void updateRequestSize();
    void finish(int code);
    boost::shared_ptr<NetworkSpeedCollector> collector() const { return speedCollector.lock(); }

    // Fixed at construction.
    const boost::shared_ptr<HttpRequest> request;
    const int id;
    const boost::weak_ptr<NetworkSpeedCollector> speedCollector;
    const bool wholeBody;
    const boost::shared_ptr<HttpDeliveryQueue> deliveries;
    const boost::weak_ptr<HttpConnection> connection;
    const boost::shared_ptr<HttpRequest::HttpBodyStream> bodyStream;
    boost::weak_ptr<HttpEngineCore> core;

    std::atomic<long long> requestSize;

    // Engine thread only.
    CURL* handle;
    curl_slist* headerList;
    char errorText[CURL_ERROR_SIZE];
    std::size_t uploadOffset;
    bool uploadPaused;
    Clock::time_point lastActivity;
    int statusCode;
    std::string reasonPhrase;
    HttpResponse::Headers responseHeaders;
    // The current header block belongs to a redirect being followed or to an
    // interim (1xx) answer: neither is the response, nor is its body.
    bool skippingBlock;
    bool responseDelivered;
    bool sentReported;
    bool finished;
    // Something was pushed to the caller since the last flush.
    bool deliveriesQueued;
    boost::shared_ptr<DataChunk> wholeBodyData;
};

}  // namespace Network
