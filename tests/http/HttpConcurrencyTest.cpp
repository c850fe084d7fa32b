#include <map>
#include <string>
#include <vector>

#include "HttpTest.h"

using Network::HttpRequest;

namespace {

struct WorkerRun {
    std::string url;
    boost::shared_ptr<RecordingCollector> collector;
    KDThread* thread = nullptr;
    std::vector<std::string> events;
    std::vector<KDThread*> callbackThreads;
    std::string body;
    bool finished = false;
};

// The whole life of a connection on a second thread, which pumps its own
// events.
void* runOnWorker(void* argument) {
    WorkerRun* run = static_cast<WorkerRun*>(argument);
    run->thread = kdThreadSelf();
    Recorder recorder(Recorder::get(run->url), true, run->collector, 1);
    recorder.start();
    run->finished = waitFor([&] { return recorder.finished(); });
    // The engine reports the finish to the collector after posting it here;
    // waiting for that report keeps this thread's record alive until the
    // engine is done with it (the platform layer may still be waking it).
    waitFor([&] { return run->collector->count("finished") == 1; });
    run->events = recorder.events;
    run->callbackThreads = recorder.threads;
    run->body = recorder.body;
    return nullptr;
}

}  // namespace

class HttpConcurrencyTest : public HttpTest {};

TEST_F(HttpConcurrencyTest, CallbacksRunOnTheStartingThreadWhenItIsNotTheMainThread) {
    WorkerRun run;
    run.url = serve("/work", Reply::Whole, "for the worker");
    run.collector = boost::make_shared<RecordingCollector>();

    KDThread* worker = kdThreadCreate(nullptr, &runOnWorker, &run);
    ASSERT_NE(nullptr, worker);
    kdThreadJoin(worker, nullptr);

    ASSERT_TRUE(run.finished);
    EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), run.events);
    EXPECT_EQ("for the worker", run.body);
    EXPECT_EQ(std::vector<KDThread*>(3, run.thread), run.callbackThreads);
}

TEST_F(HttpConcurrencyTest, TwoHundredConcurrentConnectionsEachFinishExactlyOnce) {
    TestHttpServer::Options options;
    options.keepAliveMaxCount = 1;
    // A connection waits in the server until the engine, busy with the other 199, sends its
    // request: seconds on a loaded machine. The engine closes its connections before the
    // server stops, so the longer wait costs nothing at the end.
    options.keepAliveTimeoutSeconds = 60;
    server.reset(new TestHttpServer(options));
    const int count = 200;
    std::vector<std::unique_ptr<Recorder> > recorders;
    for (int i = 0; i < count; ++i) {
        const std::string url =
            serve("/item/" + std::to_string(i), Reply::Whole, "item " + std::to_string(i));
        recorders.emplace_back(new Recorder(Recorder::get(url, 30000)));
        recorders.back()->start();
    }
    auto allFinished = [&] {
        for (const std::unique_ptr<Recorder>& recorder : recorders) {
            if (!recorder->finished()) {
                return false;
            }
        }
        return true;
    };
    ASSERT_TRUE(waitFor(allFinished, std::chrono::seconds(60)));
    // Anything still on its way for the 200 is delivered before the probe's end.
    fetch(server->url("/item/0"));

    for (int i = 0; i < count; ++i) {
        EXPECT_EQ(1, recorders[i]->finishCount) << i;
        EXPECT_EQ(0, recorders[i]->code) << i;
        EXPECT_EQ("item " + std::to_string(i), recorders[i]->body) << i;
    }
}

TEST_F(HttpConcurrencyTest, SpeedCollectorSeesSentChunksAndFinishWithTheirSizes) {
    serve("/echo", Reply::Echo);
    const std::string payload(300 * 1024, 'p');
    boost::shared_ptr<HttpRequest> request =
        HttpRequest::create(server->url("/echo?x=1").c_str(), "POST", 10000, false);
    request->getBodyStream()->write(payload.data(), static_cast<unsigned int>(payload.size()));
    request->getBodyStream()->closeWrite();
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder recorder(request, true, collector, 77);

    recorder.start();
    // The collector hears of the finish from the engine thread, after the
    // connection does.
    ASSERT_TRUE(waitFor([&] { return recorder.finished() && collector->count("finished") == 1; }));

    std::vector<RecordingCollector::Report> reports = collector->reports();
    ASSERT_GE(reports.size(), 3u);
    EXPECT_EQ("sent", reports.front().kind);
    EXPECT_EQ("/echo", reports.front().path);
    EXPECT_GT(reports.front().size, static_cast<long long>(payload.size()));
    EXPECT_EQ("finished", reports.back().kind);
    long long received = 0;
    int chunks = 0;
    for (const RecordingCollector::Report& report : reports) {
        EXPECT_EQ(77, report.id);
        // Reports come from the engine thread, never from the caller's.
        EXPECT_NE(kdThreadSelf(), report.thread);
        if (report.kind == "chunk") {
            received += report.size;
            ++chunks;
        }
    }
    EXPECT_EQ(static_cast<long long>(payload.size()), received);
    EXPECT_GT(chunks, 1);
    EXPECT_EQ(1, collector->count("sent"));
    EXPECT_EQ(1, collector->count("finished"));
    EXPECT_EQ(0, collector->count("canceled"));
    EXPECT_GE(recorder.connection->getRequestSize(), reports.front().size);
}

TEST_F(HttpConcurrencyTest, CancelIsReportedToTheCollectorAndAGoneCollectorToNobody) {
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder cancelled(Recorder::get(serve("/stall", Reply::StallBeforeReply)), true, collector, 8);
    boost::shared_ptr<RecordingCollector> gone = boost::make_shared<RecordingCollector>();
    Recorder orphan(Recorder::get(serve("/fine", Reply::Whole, "fine")), true, gone, 9);

    cancelled.start();
    ASSERT_TRUE(waitFor([&] { return server->requestCount() == 1; }));
    cancelled.connection->cancel();
    ASSERT_TRUE(waitFor([&] { return collector->count("canceled") == 1; }));
    gone.reset();
    ASSERT_TRUE(Recorder::runAll({&orphan}));

    EXPECT_EQ(0, collector->count("finished"));
    EXPECT_TRUE(cancelled.events.empty());
    EXPECT_EQ(0, orphan.code);
    EXPECT_EQ("fine", orphan.body);
}

TEST_F(HttpConcurrencyTest, RequestIsReportedSentOnceItHasLeftAnswerOrNot) {
    // The server takes each request whole, then never answers.
    const std::string url = serve("/stall", Reply::StallBeforeReply);
    const std::string payload(300 * 1024, 'p');
    auto post = [&](int timeoutMs) { return HttpRequest::create(url.c_str(), "POST", timeoutMs, false); };
    // Waits for the test thread to write the rest of its body: patient.
    boost::shared_ptr<HttpRequest> streamed = post(3000);
    streamed->getBodyStream()->write(payload.data(), 1000);
    boost::shared_ptr<HttpRequest> fixed = post(400);
    boost::shared_ptr<HttpRequest::MultipartBuilder> form = HttpRequest::MultipartBuilder::create("b0undary");
    form->addField("data", payload, true, false, "");
    fixed->setBody(form->getBoundary(), form->getEncodedContent());
    boost::shared_ptr<HttpRequest> neverClosed = post(400);
    neverClosed->getBodyStream()->write("abc", 3);
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    Recorder streamedPost(streamed, true, collector, 1);
    Recorder get(Recorder::get(url, 400), true, collector, 2);
    Recorder fixedPost(fixed, true, collector, 3);
    Recorder openPost(neverClosed, true, collector, 4);

    streamedPost.start();
    get.start();
    fixedPost.start();
    openPost.start();
    // The GET has left, so the streamed body, started before it, is sent
    // chunked: its end is written only now.
    ASSERT_TRUE(waitFor([&] { return collector->count("sent") >= 1; }));
    streamed->getBodyStream()->write(payload.data() + 1000, static_cast<unsigned int>(payload.size() - 1000));
    streamed->getBodyStream()->closeWrite();
    ASSERT_TRUE(waitFor([&] { return collector->count("finished") == 4; }));

    std::map<int, std::vector<std::string> > kinds;
    std::map<int, long long> sentSizes;
    for (const RecordingCollector::Report& report : collector->reports()) {
        kinds[report.id].push_back(report.kind);
        sentSizes[report.id] += report.kind == "sent" ? report.size : 0;
    }
    const std::vector<std::string> sentThenFinished = {"sent", "finished"};
    EXPECT_EQ(sentThenFinished, kinds[1]);
    EXPECT_EQ(sentThenFinished, kinds[2]);
    EXPECT_EQ(sentThenFinished, kinds[3]);
    // A body that never ended never left.
    EXPECT_EQ((std::vector<std::string>{"finished"}), kinds[4]);
    EXPECT_GT(sentSizes[1], static_cast<long long>(payload.size()));
    EXPECT_GT(sentSizes[2], 0);
    EXPECT_GT(sentSizes[3], static_cast<long long>(payload.size()));
    for (Recorder* recorder : {&streamedPost, &get, &fixedPost, &openPost}) {
        EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, recorder->code);
    }
    int chunkedBodies = 0;
    for (const TestHttpServer::Received& received : server->received()) {
        chunkedBodies += received.header("Transfer-Encoding") == "chunked" ? 1 : 0;
    }
    EXPECT_EQ(1, chunkedBodies);
}
