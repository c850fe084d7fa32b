#include "statistics/wifipool/NetworkSpeedCollectorImpl.h"

#include <algorithm>
#include <boost/make_shared.hpp>

#include "location/LocationManager.h"
#include "network/HttpConnection.h"
#include "util/Logger.h"

namespace Statistics {

namespace {

// One report on its way from the reporting thread to the owner thread.
class NetworkSpeedCollectorContext : public Util::ThreadCallback::Context {
public:
    NetworkSpeedCollectorContext(int id, const boost::shared_ptr<RequestInfo>& requestInfo,
                                 const boost::shared_ptr<ChunkInfo>& chunkInfo)
        : id(id), requestInfo(requestInfo), chunkInfo(chunkInfo) {}

    int id;
    boost::shared_ptr<RequestInfo> requestInfo;
    boost::shared_ptr<ChunkInfo> chunkInfo;
};

typedef NetworkSpeedCollectorContext Report;

// The user pointer of the events that hand a collector back to its owner thread.
char deleteEventToken;

}  // namespace

NetworkSpeedCollectorImpl::NetworkSpeedCollectorImpl()
    : onRequestSentCallback(
          Util::ThreadCallback::Function::make<NetworkSpeedCollectorImpl,
                                               &NetworkSpeedCollectorImpl::onRequestSentImpl>(this)),
      onRequestFinishedCallback(
          Util::ThreadCallback::Function::make<NetworkSpeedCollectorImpl,
                                               &NetworkSpeedCollectorImpl::onRequestFinishedImpl>(this)),
      onChunkReceivedCallback(
          Util::ThreadCallback::Function::make<NetworkSpeedCollectorImpl,
                                               &NetworkSpeedCollectorImpl::onChunkReceivedImpl>(this)),
      onRequestCanceledCallback(
          Util::ThreadCallback::Function::make<NetworkSpeedCollectorImpl,
                                               &NetworkSpeedCollectorImpl::onRequestCanceledImpl>(this)),
      recording(true),
      refusedCount(0) {}

boost::shared_ptr<NetworkSpeedCollectorImpl> NetworkSpeedCollectorImpl::create() {
    kdInstallCallback(&NetworkSpeedCollectorImpl::onDeleteEvent, KD_EVENT_USER, &deleteEventToken);
    return boost::shared_ptr<NetworkSpeedCollectorImpl>(new NetworkSpeedCollectorImpl(),
                                                        &NetworkSpeedCollectorImpl::deleteOnOwnerThread);
}

// Its thread callback may only go on the owner thread, where the events it
// posted wait; deleted elsewhere it would leave them pointing at freed memory.
void NetworkSpeedCollectorImpl::deleteOnOwnerThread(NetworkSpeedCollectorImpl* collector) {
    KDThread* owner = collector->threadCallback.getThread();
    if (kdThreadSelf() == owner) {
        delete collector;
        return;
    }
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_USER;
    event->userptr = &deleteEventToken;
    event->timestamp = kdGetTimeUST();
    event->data.p[0] = collector;
    kdPostThreadEvent(event, owner);
}

void NetworkSpeedCollectorImpl::onDeleteEvent(const KDEvent* event) {
    delete static_cast<NetworkSpeedCollectorImpl*>(event->data.p[0]);
}

void NetworkSpeedCollectorImpl::onRequestSent(int id, Network::HttpConnection* httpConnection) {
    KD_ASSERT(httpConnection);
    if (httpConnection == nullptr) {
        return;
    }
    // Filled completely here, before it crosses threads. The position is
    // added on the owner thread: the location manager lives there.
    boost::shared_ptr<RequestInfo> info = boost::make_shared<RequestInfo>();
    info->id = id;
    info->path = httpConnection->getRequestPath();
    info->uploadSize = httpConnection->getRequestSize();
    info->startTime = kdGetTimeUST();
    post(onRequestSentCallback, id, info, boost::shared_ptr<ChunkInfo>());
}

void NetworkSpeedCollectorImpl::onDataChunkReceived(int id, Network::DataChunk* dataChunk) {
    KD_ASSERT(dataChunk);
    if (dataChunk == nullptr) {
        return;
    }
    boost::shared_ptr<ChunkInfo> chunk =
        boost::make_shared<ChunkInfo>(static_cast<long long>(dataChunk->size()), kdGetTimeUST());
    post(onChunkReceivedCallback, id, boost::shared_ptr<RequestInfo>(), chunk);
}

void NetworkSpeedCollectorImpl::onRequestFinished(int id) {
    post(onRequestFinishedCallback, id, boost::shared_ptr<RequestInfo>(), boost::shared_ptr<ChunkInfo>());
}

void NetworkSpeedCollectorImpl::onRequestCanceled(int id) {
    post(onRequestCanceledCallback, id, boost::shared_ptr<RequestInfo>(), boost::shared_ptr<ChunkInfo>());
}

void NetworkSpeedCollectorImpl::post(Util::ThreadCallback::Function function, int id,
                                     const boost::shared_ptr<RequestInfo>& requestInfo,
                                     const boost::shared_ptr<ChunkInfo>& chunkInfo) {
    // Always queued, also on the owner thread, so that reports keep the
    // order in which they were made whichever thread made them.
    threadCallback.asyncPerform(function, boost::make_shared<Report>(id, requestInfo, chunkInfo));
}

void NetworkSpeedCollectorImpl::onRequestSentImpl(ContextPtr context) {
    KD_ASSERT(context);
    boost::shared_ptr<Report> report = boost::static_pointer_cast<Report>(context);
    KD_ASSERT(report->requestInfo);
    if (!report->requestInfo || !recording) {
        return;
    }
    Location::LocationManager* locationManager = Location::LocationManager::getInstance();
    report->requestInfo->location = locationManager->getLastLocation();
    report->requestInfo->precision = locationManager->getPrecision();
    for (boost::shared_ptr<RequestInfo>& oldItem : requests) {
        if (oldItem->id == report->id) {
            KD_ASSERT(oldItem->finished && "unfinished request with the same id already exists");
            oldItem = report->requestInfo;
            return;
        }
    }
    // pop() would drop it unseen.
    if (requests.size() >= static_cast<std::size_t>(MAX_REQUEST_COUNT)) {
        ++refusedCount;
        return;
    }
    requests.push_back(report->requestInfo);
}

void NetworkSpeedCollectorImpl::onChunkReceivedImpl(ContextPtr context) {
    KD_ASSERT(context);
    boost::shared_ptr<Report> report = boost::static_pointer_cast<Report>(context);
    KD_ASSERT(report->chunkInfo);
    boost::shared_ptr<RequestInfo> info = findRequestInfo(report->id);
    if (info && report->chunkInfo) {
        info->chunks.push_back(report->chunkInfo);
    }
}

void NetworkSpeedCollectorImpl::onRequestFinishedImpl(ContextPtr context) {
    KD_ASSERT(context);
    boost::shared_ptr<RequestInfo> info = findRequestInfo(boost::static_pointer_cast<Report>(context)->id);
    if (info) {
        info->finished = true;
    }
}

void NetworkSpeedCollectorImpl::onRequestCanceledImpl(ContextPtr context) {
    // A cancelled request keeps its record, unfinished, until the next pop.
    (void)context;
}

void NetworkSpeedCollectorImpl::pop(std::vector<boost::shared_ptr<RequestInfo> >& outRequests) {
    KD_ASSERT(outRequests.empty());
    std::size_t count = std::min(requests.size(), static_cast<std::size_t>(MAX_REQUEST_COUNT));
    outRequests.insert(outRequests.end(), requests.begin(), requests.begin() + count);
    Logger::log(Logger::Debug, "NetworkSpeedCollectorImpl::pop()[requests count: %d; output list size: %d]",
                static_cast<int>(requests.size()) + refusedCount, static_cast<int>(count));
    requests.clear();
    refusedCount = 0;
}

void NetworkSpeedCollectorImpl::setRecording(bool on) {
    recording = on;
    if (!on) {
        requests.clear();
        refusedCount = 0;
    }
}

boost::shared_ptr<RequestInfo> NetworkSpeedCollectorImpl::findRequestInfo(int id) const {
    for (const boost::shared_ptr<RequestInfo>& info : requests) {
        if (info->id == id) {
            return info;
        }
    }
    return boost::shared_ptr<RequestInfo>();
}

}  // namespace Statistics
