#pragma once

#include <KD/kd.h>

#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <cstdint>
#include <deque>

#include "network/DataChunk.h"
#include "network/HttpResponse.h"

namespace Network {

class HttpConnection;
class HttpTransfer;

// Carries one connection's results from the engine thread to its caller
// thread. push, flush and detach may be called from any thread; construction
// and delivery happen on the caller thread.
//
// Pushing only queues; flush wakes the caller thread. The engine flushes once
// per round of work, so a response, its body and the finish that arrive
// together cost the caller thread one wake-up, not three.
//
// The connection owns its queue; a wake-up event only names it, so an event
// queued after a cancel finds the queue detached, one queued after the
// connection went away finds no queue, and either delivers nothing.
//
// Body parts waiting for a slow caller are bounded: the engine asks
// hasRoomForBody before it takes more from the socket, and hearing no, holds
// the transfer until the caller has taken enough; the queue then tells the
// transfer from the caller thread.
class HttpDeliveryQueue : public boost::enable_shared_from_this<HttpDeliveryQueue> {
public:
    struct Delivery {
        enum Kind { Response, BodyData, Finished };
        Kind kind;
        boost::shared_ptr<HttpResponse> response;
        boost::shared_ptr<DataChunk> chunk;
        int code;
    };

    // Binds the delivery handler on the calling thread, which becomes the
    // thread the results go to.
    explicit HttpDeliveryQueue(const boost::weak_ptr<HttpConnection>& connection);
    ~HttpDeliveryQueue();

    void pushResponse(const boost::shared_ptr<HttpResponse>& response);
    void pushBodyData(const boost::shared_ptr<DataChunk>& chunk);
    void pushFinished(int code);
    // The transfer to tell when body parts held back may come again.
    void setBacklogReader(const boost::weak_ptr<HttpTransfer>& reader);
    // False while the body parts not yet delivered exceed the bound; the
    // reader is then told once they have drained.
    bool hasRoomForBody();
    // Posts a wake-up event unless one is on its way or nothing is queued.
    void flush();
    // Nothing queued or pushed later is delivered any more.
    void detach();
    bool isDetached() const;

private:
    HttpDeliveryQueue(const HttpDeliveryQueue&) = delete;
    HttpDeliveryQueue& operator=(const HttpDeliveryQueue&) = delete;

    static void onEvent(const KDEvent* event);

    void push(const Delivery& delivery);
    // One result at a time, so that a cancel from inside a callback stops the
    // rest.
    bool takeNext(Delivery& delivery);
    void deliverPending();
    // Caller thread: a body part of size bytes was taken off the queue.
    void noteBodyTaken(std::size_t size);

    // The name wake-up events carry.
    std::uintptr_t id;
    KDThread* callerThread;
    boost::weak_ptr<HttpConnection> connection;
    KDThreadMutex* mutex;
    std::deque<Delivery> pending;
    std::size_t pendingBodyBytes;
    bool readerWaiting;
    boost::weak_ptr<HttpTransfer> backlogReader;
    bool eventPosted;
    bool detached;
};

}  // namespace Network
