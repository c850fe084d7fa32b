#pragma once

#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>
#include <vector>

#include "network/NetworkSpeedCollector.h"
#include "statistics/wifipool/RequestInfo.h"
#include "util/ThreadCallback.h"

namespace Statistics {

// Turns the HTTP engine's reports into request records for the Wi-Fi pool
// chunks. The reports may come from any thread; each is posted to the owner
// thread (the constructing one, which must pump platform events), where all
// records are kept and changed, so no lock is needed. pop(), setRecording()
// and destruction belong to the owner thread.
//
// Memory is bounded whatever the traffic and however rarely pop() comes: at
// most MAX_REQUEST_COUNT records are held, the ones pop() would hand out; a
// request reported when the window is full is only counted.
class NetworkSpeedCollectorImpl : public Network::NetworkSpeedCollector, private boost::noncopyable {
public:
    // The largest batch pop() hands out, and the most records held.
    static constexpr int MAX_REQUEST_COUNT = 10;

    NetworkSpeedCollectorImpl();

    // The HTTP engine's threads hold the collector while they report, so its
    // last reference may go on one of them. A collector made here is then
    // handed back to its owner thread and deleted there, after the reports
    // queued before. Call on the owner thread.
    static boost::shared_ptr<NetworkSpeedCollectorImpl> create();

    void onRequestSent(int id, Network::HttpConnection* connection) override;
    void onRequestFinished(int id) override;
    void onDataChunkReceived(int id, Network::DataChunk* dataChunk) override;
    void onRequestCanceled(int id) override;

    // Hands out the first MAX_REQUEST_COUNT records in order of their sending
    // and forgets all records; later reports for their ids are ignored.
    void pop(std::vector<boost::shared_ptr<RequestInfo> >& outRequests);

    // On at construction. The owner switches it off while its measurements
    // would not be used (its feature off, the application paused): reports
    // are then ignored, and switching off forgets the records held.
    void setRecording(bool on);
    int getRecordCount() const { return static_cast<int>(requests.size()); }

private:
    typedef boost::shared_ptr<Util::ThreadCallback::Context> ContextPtr;

    void post(Util::ThreadCallback::Function function, int id,
              const boost::shared_ptr<RequestInfo>& requestInfo,
              const boost::shared_ptr<ChunkInfo>& chunkInfo);

    void onRequestSentImpl(ContextPtr context);
    void onRequestFinishedImpl(ContextPtr context);
    void onChunkReceivedImpl(ContextPtr context);
    void onRequestCanceledImpl(ContextPtr context);

    boost::shared_ptr<RequestInfo> findRequestInfo(int id) const;

    static void deleteOnOwnerThread(NetworkSpeedCollectorImpl* collector);
    static void onDeleteEvent(const KDEvent* event);

    Util::ThreadCallback threadCallback;
    Util::ThreadCallback::Function onRequestSentCallback;
    Util::ThreadCallback::Function onRequestFinishedCallback;
    Util::ThreadCallback::Function onChunkReceivedCallback;
    Util::ThreadCallback::Function onRequestCanceledCallback;
    bool recording;
    std::vector<boost::shared_ptr<RequestInfo> > requests;
    // Requests reported since the last pop() that found the window full.
    int refusedCount;
};

}  // namespace Statistics
