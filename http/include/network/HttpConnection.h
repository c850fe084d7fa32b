#pragma once

#include <KD/kd.h>

#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <string>

#include "network/DataChunk.h"
#include "network/HttpRequest.h"
#include "network/HttpResponse.h"
#include "network/NetworkSpeedCollector.h"
#include "util/callback.h"

namespace Network {

class HttpDeliveryQueue;
class HttpTransfer;

// One HTTP exchange run by the HttpEngine. Owned through a shared pointer.
// Configure, start and cancel it on one thread, the caller thread, which must
// pump platform events: every callback runs there, posted as a platform user
// event. For one started connection:
// - the response callback runs at most once, before any body data;
// - the body callback gets the whole body in one call or the parts as they
//   arrive, as setOnBodyDataReceivedCallback asked;
// - the finished callback runs exactly once, last, with HTTP_FINISHED_OK or a
//   negative code of network/HttpFinishCodes.h (an HTTP error status such as
//   404 is a response, not a failure);
// - after cancel() no callback runs, even when its event is already queued.
// The destructor cancels; it may run on any thread.
class HttpConnection : public boost::enable_shared_from_this<HttpConnection> {
public:
    // The body limit of a whole-body connection unless setMaxBodySize says
    // otherwise: the whole body is held in memory until it is complete.
    static constexpr long long kDefaultMaxWholeBodySize = 32LL << 20;
    // In whole-body mode, what is kept of the body of an answer outside
    // 200..299; the rest is received and dropped. Such a body is read at most
    // for a message.
    static constexpr std::size_t kMaxKeptErrorBodySize = 64 << 10;

    typedef callback<void (*)(boost::shared_ptr<HttpConnection>, int)> OnFinishedCallback;
    typedef callback<void (*)(boost::shared_ptr<HttpConnection>, boost::shared_ptr<HttpResponse>)>
        OnResponseReceivedCallback;
    typedef callback<void (*)(boost::shared_ptr<HttpConnection>, boost::shared_ptr<DataChunk>)>
        OnBodyDataReceivedCallback;

    // The collector, while it lives, gets this connection's measurements under
    // id (from the engine thread).
    HttpConnection(boost::shared_ptr<HttpRequest> request,
                   boost::weak_ptr<NetworkSpeedCollector> speedCollector, int id);
    ~HttpConnection();

    void setOnFinishedCallback(OnFinishedCallback callback);
    void setOnResponseReceivedCallback(OnResponseReceivedCallback callback);
    // wholeBody true: the body arrives in one call when complete (not at all
    // when it is empty or the transfer fails); false: in parts as received.
    // Parts are held back, not piled up, while about a megabyte of them waits
    // for the caller thread; the silence timeout does not run meanwhile.
    void setOnBodyDataReceivedCallback(OnBodyDataReceivedCallback callback, bool wholeBody);

    // The most body bytes the connection receives, whatever the answer's
    // status; the first byte beyond ends the transfer with
    // HTTP_BODY_TOO_LARGE_ERROR_CODE. Positive: that many bytes; 0: no limit;
    // negative (the initial value): kDefaultMaxWholeBodySize in whole-body
    // mode and no limit in parts mode, whose caller takes the body as it
    // comes. Set before start().
    void setMaxBodySize(long long bytes);

    // Starts the exchange; the calling thread becomes the caller thread. A
    // connection starts once; starting after cancel() does nothing.
    void start();
    // Stops the exchange and every callback. Safe at any time, repeatedly,
    // also from inside a callback and after the finish.
    void cancel();

    int getId() const { return id; }
    const boost::shared_ptr<HttpRequest>& getRequest() const { return request; }
    // The path of the request URL, without query: what statistics are kept by.
    std::string getRequestPath() const { return requestPath; }
    // Bytes sent so far, request line and headers included; any thread.
    long long getRequestSize() const;

private:
    friend class HttpDeliveryQueue;

    HttpConnection(const HttpConnection&) = delete;
    HttpConnection& operator=(const HttpConnection&) = delete;

    // Caller thread, from the delivery queue's event handler.
    void deliverResponse(const boost::shared_ptr<HttpResponse>& response);
    void deliverBodyData(const boost::shared_ptr<DataChunk>& chunk);
    void deliverFinished(int code);

    boost::shared_ptr<HttpRequest> request;
    boost::weak_ptr<NetworkSpeedCollector> speedCollector;
    int id;
    std::string requestPath;
    OnFinishedCallback onFinished;
    OnResponseReceivedCallback onResponseReceived;
    OnBodyDataReceivedCallback onBodyDataReceived;
    bool wholeBody;
    long long maxBodySize;
    bool started;
    bool cancelled;
    boost::shared_ptr<HttpTransfer> transfer;
    // Kept here so that results queued for this thread wait for it as long as
    // the connection lives.
    boost::shared_ptr<HttpDeliveryQueue> deliveries;
};

}  // namespace Network
