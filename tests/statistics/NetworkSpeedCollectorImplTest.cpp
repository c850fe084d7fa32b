// Request measurements from the real HTTP engine and from other threads.
#include <atomic>
#include <boost/make_shared.hpp>
#include <string>
#include <thread>
#include <vector>

#include "http/HttpTest.h"
#include "statistics/wifipool/NetworkSpeedCollectorImpl.h"

namespace {

using Statistics::NetworkSpeedCollectorImpl;
using Statistics::RequestInfo;

typedef std::vector<boost::shared_ptr<RequestInfo> > Requests;

// Counts reports once they are queued for the owner thread, so a test knows
// when one more pump delivers them all.
class CountingCollector : public NetworkSpeedCollectorImpl {
public:
    void onRequestSent(int id, Network::HttpConnection* connection) override {
        NetworkSpeedCollectorImpl::onRequestSent(id, connection);
        ++reports;
    }
    void onRequestFinished(int id) override {
        NetworkSpeedCollectorImpl::onRequestFinished(id);
        ++finishes;
        ++reports;
    }
    void onDataChunkReceived(int id, Network::DataChunk* dataChunk) override {
        NetworkSpeedCollectorImpl::onDataChunkReceived(id, dataChunk);
        ++reports;
    }
    void onRequestCanceled(int id) override {
        NetworkSpeedCollectorImpl::onRequestCanceled(id);
        ++reports;
    }

    std::atomic<int> reports{0};
    std::atomic<int> finishes{0};
};

class NetworkSpeedCollectorImplTest : public HttpTest {
protected:
    void SetUp() override {
        HttpTest::SetUp();
        collector = boost::make_shared<CountingCollector>();
    }

    // Pumps while the reports come in, then delivers the last ones.
    void awaitReports(int count) {
        EXPECT_TRUE(waitFor([&] { return collector->reports.load() >= count; }));
        pump();
    }

    Requests pop() {
        Requests out;
        collector->pop(out);
        return out;
    }

    boost::shared_ptr<Network::HttpConnection> idleConnection(int id, const std::string& path) {
        return boost::make_shared<Network::HttpConnection>(
            Recorder::get(server->url(path)), boost::weak_ptr<Network::NetworkSpeedCollector>(), id);
    }

    static long long totalSize(const boost::shared_ptr<RequestInfo>& info) {
        long long total = 0;
        for (const boost::shared_ptr<Statistics::ChunkInfo>& chunk : info->chunks) {
            EXPECT_GE(chunk->time, info->startTime);
            total += chunk->size;
        }
        return total;
    }

    boost::shared_ptr<CountingCollector> collector;
};

TEST_F(NetworkSpeedCollectorImplTest, RecordsRealExchangesWhatWasSentAndReceived) {
    Reply reply;
    reply.mode = Reply::Chunked;
    reply.body = std::string(30000, 'x');
    reply.chunkSize = 1000;
    server->on("/tiles/7", reply);
    const std::string upload(20000, 'u');
    boost::shared_ptr<Network::HttpRequest> post =
        Network::HttpRequest::create(server->url("/tiles/7?z=1").c_str(), "POST", 10000, false);
    boost::shared_ptr<Network::HttpRequest::MultipartBuilder> form =
        Network::HttpRequest::MultipartBuilder::create("BOUNDARY0123456789A");
    form->addField("data", upload, true, false, "");
    post->setBody(form->getBoundary(), form->getEncodedContent());
    Recorder recorder(post, true, collector, 7);
    ASSERT_TRUE(Recorder::runAll({&recorder}));
    ASSERT_EQ(0, recorder.code);
    ASSERT_EQ(200, recorder.status());
    ASSERT_EQ(30000u, recorder.body.size());
    // The engine tells the collector last.
    EXPECT_TRUE(waitFor([&] { return collector->finishes.load() == 1; }));
    pump();

    Requests out = pop();
    ASSERT_EQ(1u, out.size());
    EXPECT_EQ(7, out[0]->id);
    EXPECT_EQ("/tiles/7", out[0]->path);
    EXPECT_GT(out[0]->uploadSize, static_cast<long long>(upload.size()));
    EXPECT_EQ(30000, totalSize(out[0]));
    EXPECT_TRUE(out[0]->finished);
}

TEST_F(NetworkSpeedCollectorImplTest, RequestThatTimesOutIsRecordedFinishedWithoutData) {
    std::string url = serve("/slow", Reply::StallBeforeReply);
    Recorder recorder(Recorder::get(url, 300), true, collector, 3);
    ASSERT_TRUE(Recorder::runAll({&recorder}));
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, recorder.code);
    server->releaseStalls();
    EXPECT_TRUE(waitFor([&] { return collector->finishes.load() == 1; }));
    pump();

    Requests out = pop();
    ASSERT_EQ(1u, out.size());
    EXPECT_EQ("/slow", out[0]->path);
    EXPECT_GT(out[0]->uploadSize, 0);
    EXPECT_TRUE(out[0]->chunks.empty());
    EXPECT_TRUE(out[0]->finished);
}

TEST_F(NetworkSpeedCollectorImplTest, ReportsFromAnotherThreadWhileOwnerPumpsLoseNothing) {
    const int kRequests = 12;
    std::vector<boost::shared_ptr<Network::HttpConnection> > connections;
    for (int id = 1; id <= kRequests; ++id) {
        connections.push_back(idleConnection(id, "/r" + std::to_string(id)));
    }
    std::thread reporter([&] {
        for (int id = 1; id <= kRequests; ++id) {
            collector->onRequestSent(id, connections[id - 1].get());
            for (int block = 1; block <= 3; ++block) {
                Network::DataChunk data(reinterpret_cast<const unsigned char*>("abcdef"), block);
                collector->onDataChunkReceived(id, &data);
            }
            if (id % 2 == 0) {
                collector->onRequestFinished(id);
            } else {
                collector->onRequestCanceled(id);
            }
        }
    });
    awaitReports(kRequests * 5);
    reporter.join();

    Requests out = pop();
    ASSERT_EQ(10u, out.size());
    for (int i = 0; i < 10; ++i) {
        EXPECT_EQ(i + 1, out[i]->id);
        EXPECT_EQ("/r" + std::to_string(i + 1), out[i]->path);
        ASSERT_EQ(3u, out[i]->chunks.size());
        for (int block = 0; block < 3; ++block) {
            EXPECT_EQ(block + 1, out[i]->chunks[block]->size);
        }
        EXPECT_EQ((i + 1) % 2 == 0, out[i]->finished);
    }
    EXPECT_TRUE(hasLogLine("NetworkSpeedCollectorImpl::pop()[requests count: 12; output list size: 10]"));
    EXPECT_TRUE(pop().empty());
}

// The statistics collector goes (stopped, destroyed) while the HTTP engine's
// thread holds the speed collector for a report: the last reference then goes
// on that thread, with the report still queued for the owner thread.
TEST_F(NetworkSpeedCollectorImplTest, LastReferenceDroppedOnAReportingThreadIsDeletedOnTheOwnerThread) {
    boost::shared_ptr<NetworkSpeedCollectorImpl> shared = NetworkSpeedCollectorImpl::create();
    const boost::weak_ptr<NetworkSpeedCollectorImpl> watched = shared;
    std::thread reporter([held = std::move(shared)]() mutable {
        held->onRequestFinished(7);
        held.reset();
    });
    reporter.join();
    EXPECT_TRUE(watched.expired());

    // The queued report, then the deletion, run here; nothing asserts.
    pump();
    pump();
}

TEST_F(NetworkSpeedCollectorImplTest, HandedOutRecordsAreNoLongerChanged) {
    boost::shared_ptr<Network::HttpConnection> connection = idleConnection(5, "/a");
    collector->onRequestSent(5, connection.get());
    awaitReports(1);
    Requests first = pop();
    ASSERT_EQ(1u, first.size());

    Network::DataChunk data(reinterpret_cast<const unsigned char*>("abc"), 3);
    collector->onDataChunkReceived(5, &data);
    collector->onRequestFinished(5);
    awaitReports(3);
    EXPECT_TRUE(first[0]->chunks.empty());
    EXPECT_FALSE(first[0]->finished);
    EXPECT_TRUE(pop().empty());
    EXPECT_TRUE(hasLogLine("NetworkSpeedCollectorImpl::pop()[requests count: 0; output list size: 0]"));
}

TEST_F(NetworkSpeedCollectorImplTest, IdIsReusedOnlyAfterItsRequestEnded) {
    boost::shared_ptr<Network::HttpConnection> first = idleConnection(9, "/first");
    boost::shared_ptr<Network::HttpConnection> other = idleConnection(10, "/other");
    boost::shared_ptr<Network::HttpConnection> second = idleConnection(9, "/second");
    collector->onRequestSent(9, first.get());
    collector->onRequestSent(10, other.get());
    collector->onRequestFinished(9);
    collector->onRequestSent(9, second.get());
    awaitReports(4);
    Requests out = pop();
    ASSERT_EQ(2u, out.size());
    EXPECT_EQ("/second", out[0]->path);
    EXPECT_FALSE(out[0]->finished);
    EXPECT_EQ("/other", out[1]->path);

    collector->onRequestSent(10, other.get());
    collector->onRequestSent(10, other.get());
    awaitReports(6);
    expectAssertion("oldItem->finished && \"unfinished request with the same id already exists\"");
}

// Chunks may come seldom (the scan period is the server's to set) while a
// map downloads hundreds of tiles: only what pop() can hand out is held.
TEST_F(NetworkSpeedCollectorImplTest, HoldsNoMoreRecordsThanOnePopHandsOut) {
    const int kRequests = 300;
    std::vector<boost::shared_ptr<Network::HttpConnection> > connections;
    for (int id = 1; id <= kRequests; ++id) {
        connections.push_back(idleConnection(id, "/tile/" + std::to_string(id)));
        collector->onRequestSent(id, connections.back().get());
        collector->onRequestFinished(id);
    }
    awaitReports(2 * kRequests);
    EXPECT_EQ(NetworkSpeedCollectorImpl::MAX_REQUEST_COUNT, collector->getRecordCount());

    // The same batch as without the bound.
    Requests out = pop();
    ASSERT_EQ(10u, out.size());
    for (int i = 0; i < 10; ++i) {
        EXPECT_EQ("/tile/" + std::to_string(i + 1), out[i]->path);
        EXPECT_TRUE(out[i]->finished);
    }
    EXPECT_TRUE(hasLogLine("NetworkSpeedCollectorImpl::pop()[requests count: 300; output list size: 10]"));

    // A full window refuses newcomers only: a finished id may still be reused.
    for (int id = 1; id <= 11; ++id) {
        collector->onRequestSent(id, connections[id - 1].get());
    }
    collector->onRequestFinished(3);
    collector->onRequestSent(3, connections[299].get());
    awaitReports(2 * kRequests + 13);
    out = pop();
    ASSERT_EQ(10u, out.size());
    EXPECT_EQ("/tile/300", out[2]->path);
    EXPECT_TRUE(hasLogLine("NetworkSpeedCollectorImpl::pop()[requests count: 11; output list size: 10]"));
}

TEST_F(NetworkSpeedCollectorImplTest, RecordsNothingWhileSwitchedOff) {
    boost::shared_ptr<Network::HttpConnection> first = idleConnection(1, "/first");
    boost::shared_ptr<Network::HttpConnection> second = idleConnection(2, "/second");
    collector->onRequestSent(1, first.get());
    awaitReports(1);
    collector->setRecording(false);
    EXPECT_EQ(0, collector->getRecordCount());

    Network::DataChunk data(reinterpret_cast<const unsigned char*>("abc"), 3);
    collector->onDataChunkReceived(1, &data);
    collector->onRequestSent(2, second.get());
    awaitReports(3);
    EXPECT_TRUE(pop().empty());

    collector->setRecording(true);
    collector->onRequestSent(1, first.get());
    awaitReports(4);
    Requests out = pop();
    ASSERT_EQ(1u, out.size());
    EXPECT_EQ("/first", out[0]->path);
}

TEST_F(NetworkSpeedCollectorImplTest, NullReportsAreRefused) {
    collector->onRequestSent(1, nullptr);
    collector->onDataChunkReceived(1, nullptr);
    pump();
    expectAssertion("httpConnection");
    expectAssertion("dataChunk");
    EXPECT_TRUE(pop().empty());
}

}  // namespace
