#pragma once

#include <KD/kd.h>
#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <boost/shared_ptr.hpp>
#include <chrono>
#include <functional>
#include <initializer_list>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "network/DataChunk.h"
#include "network/HttpConnection.h"
#include "network/HttpEngine.h"
#include "network/HttpFinishCodes.h"
#include "network/HttpRequest.h"
#include "network/HttpResponse.h"
#include "network/NetworkSpeedCollector.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"

// Pumps the calling thread's events until condition holds or the bound (a
// generous wait limit, not a timing expectation) runs out.
inline bool waitFor(const std::function<bool()>& condition,
                    std::chrono::milliseconds bound = std::chrono::seconds(10)) {
    const auto end = std::chrono::steady_clock::now() + bound;
    while (!condition()) {
        if (std::chrono::steady_clock::now() >= end) {
            return false;
        }
        kdWaitEvent(5 * 1000 * 1000);
    }
    return true;
}

// Waits without pumping: the engine thread queues, this thread does not
// deliver. False when the bound runs out first.
inline bool waitUnpumped(const std::function<bool()>& condition,
                         std::chrono::milliseconds bound = std::chrono::seconds(10)) {
    const auto end = std::chrono::steady_clock::now() + bound;
    while (!condition()) {
        if (std::chrono::steady_clock::now() >= end) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

// Records what one connection delivers, in order, on the thread that pumps.
class Recorder {
public:
    explicit Recorder(const boost::shared_ptr<Network::HttpRequest>& request, bool wholeBody = true,
                      const boost::weak_ptr<Network::NetworkSpeedCollector>& collector =
                          boost::weak_ptr<Network::NetworkSpeedCollector>(),
                      int id = 0)
        : connection(boost::make_shared<Network::HttpConnection>(request, collector, id)) {
        connection->setOnResponseReceivedCallback(
            Network::HttpConnection::OnResponseReceivedCallback::make<Recorder, &Recorder::onResponse>(this));
        connection->setOnBodyDataReceivedCallback(
            Network::HttpConnection::OnBodyDataReceivedCallback::make<Recorder, &Recorder::onBody>(this),
            wholeBody);
        connection->setOnFinishedCallback(
            Network::HttpConnection::OnFinishedCallback::make<Recorder, &Recorder::onFinished>(this));
    }

    static boost::shared_ptr<Network::HttpRequest> get(const std::string& url, int timeoutMs = 10000) {
        return Network::HttpRequest::create(url.c_str(), "GET", timeoutMs, false);
    }

    // Starts every recorder, then pumps until all have finished.
    static bool runAll(std::initializer_list<Recorder*> recorders) {
        for (Recorder* recorder : recorders) {
            recorder->start();
        }
        return waitFor([&] {
            for (Recorder* recorder : recorders) {
                if (!recorder->finished()) {
                    return false;
                }
            }
            return true;
        });
    }

    void start() { connection->start(); }
    bool finished() const { return finishCount > 0; }
    int status() const { return response ? response->getStatusCode() : 0; }

    boost::shared_ptr<Network::HttpConnection> connection;
    // "response", "body" and "finished", in delivery order.
    std::vector<std::string> events;
    boost::shared_ptr<Network::HttpResponse> response;
    std::string body;
    std::vector<std::size_t> partSizes;
    int code = 1;
    int finishCount = 0;
    std::vector<KDThread*> threads;
    // Runs after each delivery is recorded, e.g. to cancel from inside it.
    std::function<void(const std::string& event)> afterEvent;

private:
    void note(const std::string& event) {
        events.push_back(event);
        threads.push_back(kdThreadSelf());
        if (afterEvent) {
            afterEvent(event);
        }
    }
    void onResponse(boost::shared_ptr<Network::HttpConnection> from,
                    boost::shared_ptr<Network::HttpResponse> received) {
        EXPECT_EQ(from, connection);
        response = received;
        note("response");
    }
    void onBody(boost::shared_ptr<Network::HttpConnection> from,
                boost::shared_ptr<Network::DataChunk> chunk) {
        EXPECT_EQ(from, connection);
        body.append(chunk->begin(), chunk->end());
        partSizes.push_back(chunk->size());
        note("body");
    }
    void onFinished(boost::shared_ptr<Network::HttpConnection> from, int finishCode) {
        EXPECT_EQ(from, connection);
        code = finishCode;
        ++finishCount;
        note("finished");
    }
};

// A speed collector that writes down its reports (made on the engine thread).
class RecordingCollector : public Network::NetworkSpeedCollector {
public:
    struct Report {
        std::string kind;  // "sent", "chunk", "finished", "canceled"
        int id;
        long long size;    // request size for "sent", bytes for "chunk"
        std::string path;  // for "sent"
        KDThread* thread;
    };

    void onRequestSent(int id, Network::HttpConnection* connection) override {
        add({"sent", id, connection->getRequestSize(), connection->getRequestPath(), kdThreadSelf()});
    }
    void onRequestFinished(int id) override { add({"finished", id, 0, "", kdThreadSelf()}); }
    void onDataChunkReceived(int id, Network::DataChunk* chunk) override {
        add({"chunk", id, static_cast<long long>(chunk->size()), "", kdThreadSelf()});
    }
    void onRequestCanceled(int id) override { add({"canceled", id, 0, "", kdThreadSelf()}); }

    std::vector<Report> reports() const {
        std::lock_guard<std::mutex> lock(mutex);
        return recorded;
    }
    long long receivedBytes() const {
        long long total = 0;
        for (const Report& report : reports()) {
            total += report.kind == "chunk" ? report.size : 0;
        }
        return total;
    }
    int count(const std::string& kind) const {
        int total = 0;
        for (const Report& report : reports()) {
            total += report.kind == kind ? 1 : 0;
        }
        return total;
    }

private:
    void add(const Report& report) {
        std::lock_guard<std::mutex> lock(mutex);
        recorded.push_back(report);
    }

    mutable std::mutex mutex;
    std::vector<Report> recorded;
};

// The platform booted on the real clock (network waits are real) with an
// HttpEngine and a loopback server running for the test.
class HttpTest : public PalTest {
protected:
    typedef TestHttpServer::Reply Reply;

    void beforePalStart() override { pal::useRealClock(); }
    void SetUp() override {
        PalTest::SetUp();
        engine.reset(new Network::HttpEngine());
        server.reset(new TestHttpServer());
    }
    // The engine goes first: its closed connections let the server's threads
    // stop at once instead of waiting out keep-alive.
    void TearDown() override {
        engine.reset();
        server.reset();
        PalTest::TearDown();
    }

    // Scripts the answer for `path` and gives its URL.
    std::string serve(const std::string& path, Reply::Mode mode, const std::string& body = "",
                      int status = 200) {
        Reply reply;
        reply.mode = mode;
        reply.body = body;
        reply.status = status;
        server->on(path, reply);
        return server->url(path);
    }

    // Runs one GET to its end and gives its recorder.
    static std::unique_ptr<Recorder> fetch(const std::string& url, int timeoutMs = 10000,
                                           bool wholeBody = true) {
        std::unique_ptr<Recorder> recorder(new Recorder(Recorder::get(url, timeoutMs), wholeBody));
        EXPECT_TRUE(Recorder::runAll({recorder.get()}));
        return recorder;
    }

    std::unique_ptr<Network::HttpEngine> engine;
    std::unique_ptr<TestHttpServer> server;
};
