#include <chrono>
#include <string>
#include <thread>

#include "HttpTest.h"

using Reply = TestHttpServer::Reply;

class HttpCancelTest : public HttpTest {
protected:
    void SetUp() override {
        HttpTest::SetUp();
        Reply probe;
        probe.body = "probe";
        server->on("/probe", probe);
    }

    // Another exchange run to its end: whatever the engine had for the
    // connection under test has reached this thread's queue by then and has
    // been pumped.
    void pumpThroughAProbe() {
        Recorder probe(Recorder::get(server->url("/probe")));
        probe.start();
        ASSERT_TRUE(waitFor([&] { return probe.finished(); }));
    }

    // Waits without pumping: the engine thread queues, this thread does not
    // deliver.
    static bool waitUnpumped(const std::function<bool()>& condition) {
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (!condition()) {
            if (std::chrono::steady_clock::now() >= end) {
                return false;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return true;
    }
};

TEST_F(HttpCancelTest, CancelBeforeStartRunsNothingAndSendsNothing) {
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder recorder(Recorder::get(server->url("/probe")), true, collector, 1);

    recorder.connection->cancel();
    recorder.start();
    pumpThroughAProbe();

    EXPECT_TRUE(recorder.events.empty());
    EXPECT_EQ(1u, server->requestCount());
    EXPECT_TRUE(collector->reports().empty());
}

TEST_F(HttpCancelTest, CancelDuringTheBodyStopsEveryLaterCallback) {
    Reply stall;
    stall.mode = Reply::StallMidBody;
    stall.body = std::string(64 * 1024, 'b');
    server->on("/half", stall);
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder recorder(Recorder::get(server->url("/half")), false, collector, 2);
    recorder.afterEvent = [&](const std::string& event) {
        if (event == "body") {
            recorder.connection->cancel();
        }
    };

    recorder.start();
    ASSERT_TRUE(waitFor([&] { return collector->count("canceled") == 1; }));
    server->releaseStalls();
    pumpThroughAProbe();

    EXPECT_EQ((std::vector<std::string>{"response", "body"}), recorder.events);
    EXPECT_EQ(0, collector->count("finished"));
}

TEST_F(HttpCancelTest, CancelInsideTheFinishedCallbackIsSafe) {
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder recorder(Recorder::get(server->url("/probe")), true, collector, 3);
    recorder.afterEvent = [&](const std::string& event) {
        if (event == "finished") {
            recorder.connection->cancel();
            recorder.connection->cancel();
        }
    };

    recorder.start();
    ASSERT_TRUE(waitFor([&] { return recorder.finished(); }));
    pumpThroughAProbe();

    EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), recorder.events);
    EXPECT_EQ(1, recorder.finishCount);
    EXPECT_EQ(0, collector->count("canceled"));
}

TEST_F(HttpCancelTest, CancelWithEverythingAlreadyQueuedDeliversNothing) {
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder recorder(Recorder::get(server->url("/probe")), false, collector, 4);

    recorder.start();
    // The engine has queued response, body and finish for this thread.
    ASSERT_TRUE(waitUnpumped([&] { return collector->count("finished") == 1; }));
    recorder.connection->cancel();
    pumpThroughAProbe();

    EXPECT_TRUE(recorder.events.empty());
}

TEST_F(HttpCancelTest, CancelInsideTheResponseCallbackDropsBodyAndFinish) {
    Recorder recorder(Recorder::get(server->url("/probe")));
    recorder.afterEvent = [&](const std::string& event) {
        if (event == "response") {
            recorder.connection->cancel();
        }
    };

    recorder.start();
    ASSERT_TRUE(waitFor([&] { return !recorder.events.empty(); }));
    pumpThroughAProbe();

    EXPECT_EQ((std::vector<std::string>{"response"}), recorder.events);
}

TEST_F(HttpCancelTest, DroppingTheLastReferenceInsideACallbackEndsTheConnection) {
    Reply stall;
    stall.mode = Reply::StallMidBody;
    stall.body = std::string(64 * 1024, 'c');
    server->on("/half", stall);
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder recorder(Recorder::get(server->url("/half")), false, collector, 5);
    boost::weak_ptr<Network::HttpConnection> watched = recorder.connection;
    recorder.afterEvent = [&](const std::string& event) {
        if (event == "response") {
            recorder.connection.reset();
        }
    };

    recorder.start();
    ASSERT_TRUE(waitFor([&] { return collector->count("canceled") == 1; }));
    server->releaseStalls();
    pumpThroughAProbe();

    EXPECT_TRUE(watched.expired());
    EXPECT_EQ((std::vector<std::string>{"response"}), recorder.events);
}
