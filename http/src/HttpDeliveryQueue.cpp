#include "HttpDeliveryQueue.h"

#include "network/HttpConnection.h"

namespace Network {

namespace {

// The user pointer of our events: one binding per caller thread serves all
// its connections, and no other code binds to this address.
char deliveryEventToken;

}  // namespace

HttpDeliveryQueue::HttpDeliveryQueue(const boost::weak_ptr<HttpConnection>& connection)
    : callerThread(kdThreadSelf()),
      connection(connection),
      mutex(kdThreadMutexCreate(nullptr)),
      eventPosted(false),
      detached(false) {
    kdInstallCallback(&HttpDeliveryQueue::onEvent, KD_EVENT_USER, &deliveryEventToken);
}

HttpDeliveryQueue::~HttpDeliveryQueue() {
    kdThreadMutexFree(mutex);
}

void HttpDeliveryQueue::pushResponse(const boost::shared_ptr<HttpResponse>& response) {
    Delivery delivery = {Delivery::Response, response, boost::shared_ptr<DataChunk>(), 0};
    push(delivery);
}

void HttpDeliveryQueue::pushBodyData(const boost::shared_ptr<DataChunk>& chunk) {
    Delivery delivery = {Delivery::BodyData, boost::shared_ptr<HttpResponse>(), chunk, 0};
    push(delivery);
}

void HttpDeliveryQueue::pushFinished(int code) {
    Delivery delivery = {Delivery::Finished, boost::shared_ptr<HttpResponse>(),
                         boost::shared_ptr<DataChunk>(), code};
    push(delivery);
}

void HttpDeliveryQueue::detach() {
    kdThreadMutexLock(mutex);
    detached = true;
    pending.clear();
    kdThreadMutexUnlock(mutex);
}

bool HttpDeliveryQueue::isDetached() const {
    kdThreadMutexLock(mutex);
    bool result = detached;
    kdThreadMutexUnlock(mutex);
    return result;
}

void HttpDeliveryQueue::push(const Delivery& delivery) {
    kdThreadMutexLock(mutex);
    if (!detached) {
        pending.push_back(delivery);
    }
    kdThreadMutexUnlock(mutex);
}

void HttpDeliveryQueue::flush() {
    kdThreadMutexLock(mutex);
    // One event drains everything queued until it is handled.
    bool needEvent = !detached && !pending.empty() && !eventPosted;
    eventPosted = eventPosted || needEvent;
    kdThreadMutexUnlock(mutex);
    if (!needEvent) {
        return;
    }
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_USER;
    event->userptr = &deliveryEventToken;
    event->timestamp = kdGetTimeUST();
    event->data.p[0] = new boost::shared_ptr<HttpDeliveryQueue>(shared_from_this());
    kdPostThreadEvent(event, callerThread);
}

void HttpDeliveryQueue::onEvent(const KDEvent* event) {
    boost::shared_ptr<HttpDeliveryQueue>* holder =
        static_cast<boost::shared_ptr<HttpDeliveryQueue>*>(event->data.p[0]);
    boost::shared_ptr<HttpDeliveryQueue> queue = *holder;
    delete holder;
    queue->deliverPending();
}

bool HttpDeliveryQueue::takeNext(Delivery& delivery) {
    kdThreadMutexLock(mutex);
    if (detached || pending.empty()) {
        eventPosted = false;
        kdThreadMutexUnlock(mutex);
        return false;
    }
    delivery = pending.front();
    pending.pop_front();
    kdThreadMutexUnlock(mutex);
    return true;
}

void HttpDeliveryQueue::deliverPending() {
    Delivery delivery;
    while (takeNext(delivery)) {
        // Held for the call: a callback may drop the owner's last reference.
        boost::shared_ptr<HttpConnection> target = connection.lock();
        if (!target) {
            return;
        }
        switch (delivery.kind) {
            case Delivery::Response:
                target->deliverResponse(delivery.response);
                break;
            case Delivery::BodyData:
                target->deliverBodyData(delivery.chunk);
                break;
            case Delivery::Finished:
                target->deliverFinished(delivery.code);
                break;
        }
    }
}

}  // namespace Network
