#pragma once

#include <curl/curl.h>

#include <atomic>
#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <chrono>
#include <string>

#include "HttpDeliveryQueue.h"
#include "HttpResponseHead.h"
#include "network/HttpRequest.h"
#include "network/HttpResponse.h"
#include "network/NetworkSpeedCollector.h"

namespace Network {

class HttpConnection;
class HttpEngineCore;

// The engine-side half of one connection: a libcurl easy handle's options,
// callbacks and outcome. Made on the caller thread by HttpConnection::start;
// from then on open, the curl callbacks and the finishing calls run on the
// engine thread only. cancel, onBodyAvailable, onBacklogDrained and
// getRequestSize may be called from any thread.
class HttpTransfer : public boost::enable_shared_from_this<HttpTransfer> {
public:
    typedef std::chrono::steady_clock Clock;

    HttpTransfer(const boost::shared_ptr<HttpRequest>& request, int id,
                 const boost::weak_ptr<NetworkSpeedCollector>& speedCollector, bool wholeBody,
                 long long maxBodySize, const boost::shared_ptr<HttpDeliveryQueue>& deliveries,
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
    // Any thread: the caller has taken enough of the body parts waiting for
    // it that receiving may go on.
    void onBacklogDrained();
    long long getRequestSize() const { return requestSize.load(); }

    // Engine thread. Sets the handle up for this request; false (after
    // finishing with a failure code) when the request cannot be made.
    bool open(CURL* handle);
    CURL* getHandle() const { return handle; }
    // Lifts the pauses of sending and receiving; each pauses again at once
    // if its reason remains.
    void resume();
    // Until the head of the answer is complete, bytes waiting on the socket
    // count as activity: libcurl hands lines over only when they are whole.
    bool isAwaitingAnswer() const { return !responseDelivered; }
    // The socket the transfer reads from, or CURL_SOCKET_BAD.
    curl_socket_t getSocket() const { return socket; }
    // The engine closed this socket.
    void forgetSocket(curl_socket_t closed);
    void touch() { lastActivity = Clock::now(); }
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
    // Releases what the handle used and flushes; the engine then frees the
    // handle.
    void close();

private:
    HttpTransfer(const HttpTransfer&) = delete;
    HttpTransfer& operator=(const HttpTransfer&) = delete;

    static int onConnected(void* self, char* serverAddress, char* localAddress, int serverPort,
                           int localPort);
    static int onDebug(CURL* handle, curl_infotype type, char* data, size_t size, void* self);
    static size_t onHeaderLine(char* data, size_t size, size_t count, void* self);
    static size_t onBodyBytes(char* data, size_t size, size_t count, void* self);
    static size_t onUploadRead(char* buffer, size_t size, size_t count, void* self);
    static int onUploadSeek(void* self, curl_off_t offset, int origin);

    void setMethodAndBody();
    void setHeaders();
    void noteOutgoing(curl_infotype type, size_t size);
    bool hasRequestLeft() const;
    // False when the transfer must stop at this head.
    bool headEnded();
    void deliverResponse();
    size_t receiveBody(char* data, size_t length);
    void keepWholeBody(const unsigned char* bytes, size_t length);
    // What to reserve for a whole body at its first byte; 0 when unbounded.
    size_t bodyCapacity(bool errorAnswer) const;
    void reportSent();
    bool isFramingFault(CURLcode result) const;
    void finish(int code);
    boost::shared_ptr<NetworkSpeedCollector> collector() const { return speedCollector.lock(); }

    // Fixed at construction.
    const boost::shared_ptr<HttpRequest> request;
    const int id;
    const boost::weak_ptr<NetworkSpeedCollector> speedCollector;
    const bool wholeBody;
    // 0: no limit.
    const long long maxBodySize;
    const boost::shared_ptr<HttpDeliveryQueue> deliveries;
    const boost::weak_ptr<HttpConnection> connection;
    const boost::shared_ptr<HttpRequest::HttpBodyStream> bodyStream;
    boost::weak_ptr<HttpEngineCore> core;

    // Every byte written to the socket for this request, redirects and
    // resends included.
    std::atomic<long long> requestSize;

    // Engine thread only.
    CURL* handle;
    curl_slist* headerList;
    char errorText[CURL_ERROR_SIZE];
    std::size_t uploadOffset;
    bool uploadPaused;
    // The caller has more body parts waiting than it may (parts mode).
    bool receivePaused;
    Clock::time_point lastActivity;
    curl_socket_t socket;
    // What has left so far, as libcurl reports it: whether the request's
    // head went out, body bytes (with chunk framing) sent, and those sent
    // after the body's end was handed over.
    bool headersOut;
    curl_off_t bodyBytesOut;
    curl_off_t bytesOutAfterBodyEnd;
    // The body's size when it is sent with a length, -1 when chunked.
    curl_off_t bodySize;
    bool hasBody;
    bool bodyEnded;
    // libcurl keeps the last OS error of a transfer, also one from before the
    // connection stood (a refused address tried first).
    long errnoAtConnect;
    bool connected;
    HttpResponseHead head;
    // The current head belongs to a redirect being followed or to an
    // interim (1xx) answer: neither is the response, nor is its body.
    bool skippingBlock;
    bool responseDelivered;
    bool chunkedResponse;
    // We stopped libcurl on purpose: after a complete final answer it would
    // have followed, or at a head whose framing cannot be trusted.
    bool stoppedAfterAnswer;
    bool badAnswer;
    // Body bytes of the response taken so far, kept or not.
    long long bodyBytesReceived;
    bool bodyTooLarge;
    bool outOfMemory;
    bool sentReported;
    bool finished;
    // Something was pushed to the caller since the last flush.
    bool deliveriesQueued;
    boost::shared_ptr<DataChunk> wholeBodyData;
};

}  // namespace Network
