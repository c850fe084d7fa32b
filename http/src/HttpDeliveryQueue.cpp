#include "HttpDeliveryQueue.h"

#include <cstdint>
#include <unordered_map>

#include "HttpTransfer.h"
#include "network/HttpConnection.h"

namespace Network {

namespace {

// The user pointer of our events: one binding per caller thread serves all
// its connections, and no other code binds to this address.
char deliveryEventToken;

// Body bytes that may wait for a caller in parts mode; receiving resumes once
// half of them have been taken. A megabyte keeps a fast link busy for the
// time a busy caller thread takes to come back, without letting a slow one
// pile up a whole download.
const std::size_t kMaxBacklogBytes = 1024 * 1024;
const std::size_t kResumeBacklogBytes = kMaxBacklogBytes / 2;

// Wake-up events name their queue by number instead of holding it: an event
// its thread never handles (the thread ended, the platform shut down) then
// owns nothing, and one handled after the queue went away finds no queue and
// delivers nothing. The connection keeps its queue alive meanwhile.
struct Registry {
    KDThreadMutex* mutex = kdThreadMutexCreate(nullptr);
    std::uintptr_t lastId = 0;
    std::unordered_map<std::uintptr_t, HttpDeliveryQueue*> queues;
};

Registry& registry() {
    static Registry* instance = new Registry();
    return *instance;
}

}  // namespace

HttpDeliveryQueue::HttpDeliveryQueue(const boost::weak_ptr<HttpConnection>& connection)
    : id(0),
      callerThread(kdThreadSelf()),
      connection(connection),
      mutex(kdThreadMutexCreate(nullptr)),
      pendingBodyBytes(0),
      readerWaiting(false),
      eventPosted(false),
      detached(false) {
    kdInstallCallback(&HttpDeliveryQueue::onEvent, KD_EVENT_USER, &deliveryEventToken);
    Registry& known = registry();
    kdThreadMutexLock(known.mutex);
    id = ++known.lastId;
    known.queues[id] = this;
    kdThreadMutexUnlock(known.mutex);
}

HttpDeliveryQueue::~HttpDeliveryQueue() {
    Registry& known = registry();
    kdThreadMutexLock(known.mutex);
    known.queues.erase(id);
    kdThreadMutexUnlock(known.mutex);
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

void HttpDeliveryQueue::setBacklogReader(const boost::weak_ptr<HttpTransfer>& reader) {
    kdThreadMutexLock(mutex);
    backlogReader = reader;
    kdThreadMutexUnlock(mutex);
}

bool HttpDeliveryQueue::hasRoomForBody() {
    kdThreadMutexLock(mutex);
    bool room = pendingBodyBytes < kMaxBacklogBytes;
    readerWaiting = readerWaiting || !room;
    kdThreadMutexUnlock(mutex);
    return room;
}

void HttpDeliveryQueue::detach() {
    kdThreadMutexLock(mutex);
    detached = true;
    pending.clear();
    pendingBodyBytes = 0;
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
        pendingBodyBytes += delivery.chunk ? delivery.chunk->size() : 0;
    }
    kdThreadMutexUnlock(mutex);
}

void HttpDeliveryQueue::flush() {
    kdThreadMutexLock(mutex);
    // One event delivers everything queued by the time it is handled.
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
    event->data.words[0] = static_cast<intptr_t>(id);
    kdPostThreadEvent(event, callerThread);
}

void HttpDeliveryQueue::onEvent(const KDEvent* event) {
    Registry& known = registry();
    boost::shared_ptr<HttpDeliveryQueue> queue;
    kdThreadMutexLock(known.mutex);
    auto found = known.queues.find(static_cast<std::uintptr_t>(event->data.words[0]));
    // A queue whose last owner is gone may still be listed until its
    // destructor gets the lock; lock() then finds it expired.
    if (found != known.queues.end()) {
        queue = found->second->weak_from_this().lock();
    }
    kdThreadMutexUnlock(known.mutex);
    if (queue) {
        queue->deliverPending();
    }
}

bool HttpDeliveryQueue::takeNext(Delivery& delivery) {
    kdThreadMutexLock(mutex);
    if (detached || pending.empty()) {
        kdThreadMutexUnlock(mutex);
        return false;
    }
    delivery = pending.front();
    pending.pop_front();
    kdThreadMutexUnlock(mutex);
    if (delivery.chunk) {
        noteBodyTaken(delivery.chunk->size());
    }
    return true;
}

void HttpDeliveryQueue::noteBodyTaken(std::size_t size) {
    kdThreadMutexLock(mutex);
    pendingBodyBytes -= size < pendingBodyBytes ? size : pendingBodyBytes;
    bool wake = readerWaiting && pendingBodyBytes <= kResumeBacklogBytes;
    readerWaiting = readerWaiting && !wake;
    boost::shared_ptr<HttpTransfer> reader = wake ? backlogReader.lock() : boost::shared_ptr<HttpTransfer>();
    kdThreadMutexUnlock(mutex);
    if (reader) {
        reader->onBacklogDrained();
    }
}

void HttpDeliveryQueue::deliverPending() {
    kdThreadMutexLock(mutex);
    std::size_t budget = pending.size();
    kdThreadMutexUnlock(mutex);
    Delivery delivery;
    for (; budget > 0 && takeNext(delivery); --budget) {
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
    // What arrived meanwhile waits for an event of its own, so that a fast
    // transfer cannot keep the caller thread from its other events.
    kdThreadMutexLock(mutex);
    eventPosted = false;
    kdThreadMutexUnlock(mutex);
    flush();
}

}  // namespace Network
