#include <string>

#include "HttpTest.h"

class HttpCancelTest : public HttpTest {
protected:
    void SetUp() override {
        HttpTest::SetUp();
        probeUrl = serve("/probe", Reply::Whole, "probe");
        halfUrl = serve("/half", Reply::StallMidBody, std::string(64 * 1024, 'b'));
    }

    // Another exchange run to its end: whatever the engine had for the
    // connection under test has reached this thread's queue by then and has
    // been pumped.
    void pumpThroughAProbe() {
        Recorder probe(Recorder::get(probeUrl));
        ASSERT_TRUE(Recorder::runAll({&probe}));
    }

    // Runs `action` after the recorder noted `event`.
    static void onEvent(Recorder& recorder, const std::string& event, const std::function<void()>& action) {
        recorder.afterEvent = [event, action](const std::string& noted) {
            if (noted == event) {
                action();
            }
        };
    }

    std::string probeUrl;
    std::string halfUrl;
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
};

TEST_F(HttpCancelTest, CancelBeforeStartRunsNothingAndSendsNothing) {
    Recorder recorder(Recorder::get(probeUrl), true, collector, 1);

    recorder.connection->cancel();
    recorder.start();
    pumpThroughAProbe();

    EXPECT_TRUE(recorder.events.empty());
    EXPECT_EQ(1u, server->requestCount());
    EXPECT_TRUE(collector->reports().empty());
}

TEST_F(HttpCancelTest, CancelDuringTheBodyStopsEveryLaterCallback) {
    Recorder recorder(Recorder::get(halfUrl), false, collector, 2);
    onEvent(recorder, "body", [&] { recorder.connection->cancel(); });

    recorder.start();
    ASSERT_TRUE(waitFor([&] { return collector->count("canceled") == 1; }));
    server->releaseStalls();
    pumpThroughAProbe();

    EXPECT_EQ((std::vector<std::string>{"response", "body"}), recorder.events);
    EXPECT_EQ(0, collector->count("finished"));
}

TEST_F(HttpCancelTest, CancelInsideTheFinishedCallbackIsSafe) {
    Recorder recorder(Recorder::get(probeUrl), true, collector, 3);
    onEvent(recorder, "finished", [&] {
        recorder.connection->cancel();
        recorder.connection->cancel();
    });

    ASSERT_TRUE(Recorder::runAll({&recorder}));
    pumpThroughAProbe();

    EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), recorder.events);
    EXPECT_EQ(1, recorder.finishCount);
    EXPECT_EQ(0, collector->count("canceled"));
}

TEST_F(HttpCancelTest, CancelWithEverythingAlreadyQueuedDeliversNothing) {
    Recorder recorder(Recorder::get(probeUrl), false, collector, 4);

    recorder.start();
    // The engine has queued response, body and finish for this thread.
    ASSERT_TRUE(waitUnpumped([&] { return collector->count("finished") == 1; }));
    recorder.connection->cancel();
    pumpThroughAProbe();

    EXPECT_TRUE(recorder.events.empty());
}

TEST_F(HttpCancelTest, DroppingTheLastReferenceInsideTheResponseCallbackEndsTheConnection) {
    Recorder recorder(Recorder::get(halfUrl), false, collector, 5);
    boost::weak_ptr<Network::HttpConnection> watched = recorder.connection;
    onEvent(recorder, "response", [&] { recorder.connection.reset(); });

    recorder.start();
    ASSERT_TRUE(waitFor([&] { return collector->count("canceled") == 1; }));
    server->releaseStalls();
    pumpThroughAProbe();

    EXPECT_TRUE(watched.expired());
    EXPECT_EQ((std::vector<std::string>{"response"}), recorder.events);
}
