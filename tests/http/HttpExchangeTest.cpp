#include <curl/curl.h>

#include <string>
#include <thread>

#include "HttpTest.h"

using Network::HttpRequest;

namespace {

std::string patternBody(std::size_t size) {
    std::string body(size, '\0');
    for (std::size_t i = 0; i < size; ++i) {
        body[i] = static_cast<char>((i * 7 + i / 251) & 0xff);
    }
    return body;
}

// Notes how much body a recorder had when a posted event of its thread ran.
struct BodyMark {
    const Recorder* recorder;
    std::size_t bodySize;

    static void onEvent(const KDEvent* event) {
        BodyMark* mark = static_cast<BodyMark*>(event->userptr);
        mark->bodySize = mark->recorder->body.size();
    }
};

boost::shared_ptr<HttpRequest> request(const std::string& url, const char* method, bool follow = false) {
    return HttpRequest::create(url.c_str(), method, 10000, follow);
}

}  // namespace

class HttpExchangeTest : public HttpTest {};

TEST_F(HttpExchangeTest, GetDeliversResponseThenBodyThenFinish) {
    Reply reply;
    reply.body = "hello world";
    reply.headers = {{"X-Answer", "42"}};
    server->on("/hello", reply);

    std::unique_ptr<Recorder> recorder = fetch(server->url("/hello?lang=en"));

    EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), recorder->events);
    EXPECT_EQ(0, recorder->code);
    EXPECT_EQ(200, recorder->status());
    EXPECT_EQ("42", recorder->response->getHeader("x-answer"));
    EXPECT_EQ("text/plain", recorder->response->getContentType());
    EXPECT_EQ(11, recorder->response->getContentLength());
    EXPECT_EQ("hello world", recorder->body);
    EXPECT_EQ("/hello", recorder->connection->getRequestPath());
    ASSERT_EQ(1u, server->requestCount());
    EXPECT_EQ("GET", server->received()[0].method);
}

TEST_F(HttpExchangeTest, PostSendsMultipartFieldsTheServerParses) {
    const std::string url = serve("/upload", Reply::Whole, "stored");
    std::string binary = patternBody(3000);
    // Values that contain the boundary line and quotes in the name must not
    // break the body apart.
    binary += "\r\n--0123456789ABCDEF0\r\n";
    boost::shared_ptr<HttpRequest::MultipartBuilder> builder =
        HttpRequest::MultipartBuilder::create("0123456789ABCDEF0");
    builder->addField("data", binary, true, false, "");
    builder->addField("lang", "en", false, false, "");
    builder->addField("report", "line one\nline two", false, true, "text/plain");
    builder->addField("say \"hi\"", "quoted", false, false, "");
    boost::shared_ptr<HttpRequest> post = request(url, "POST");
    post->setBody(builder->getBoundary(), builder->getEncodedContent());
    EXPECT_NE("0123456789ABCDEF0", builder->getBoundary());

    Recorder recorder(post);
    ASSERT_TRUE(Recorder::runAll({&recorder}));

    EXPECT_EQ(0, recorder.code);
    EXPECT_EQ("stored", recorder.body);
    ASSERT_EQ(1u, server->requestCount());
    TestHttpServer::Received received = server->received()[0];
    EXPECT_EQ("POST", received.method);
    ASSERT_EQ(4u, received.parts.size());
    const struct {
        const char* name;
        std::string content;
        const char* fileName;
        const char* contentType;
    } expected[] = {{"data", binary, "", "application/octet-stream"},
                    {"lang", "en", "", ""},
                    {"report", "line one\nline two", "report", "text/plain"},
                    {"say %22hi%22", "quoted", "", ""}};
    for (const auto& field : expected) {
        SCOPED_TRACE(field.name);
        const TestHttpServer::Part* part = received.part(field.name);
        ASSERT_NE(nullptr, part);
        EXPECT_EQ(field.content, part->content);
        EXPECT_EQ(field.fileName, part->fileName);
        EXPECT_EQ(field.contentType, part->contentType);
    }
}

TEST_F(HttpExchangeTest, BodyStreamedWhileTheRequestRunsArrivesComplete) {
    const std::string payload = patternBody(200 * 1024);
    boost::shared_ptr<HttpRequest> post = request(serve("/echo", Reply::Echo), "POST");
    boost::shared_ptr<HttpRequest::HttpBodyStream> stream = post->getBodyStream();
    stream->write(payload.data(), 1000);
    Recorder recorder(post);
    recorder.start();
    // Once a connection started later has finished, the engine has opened
    // this one with its body still open, so the body goes chunked.
    fetch(server->url("/probe"));
    std::thread writer([&] {
        for (std::size_t offset = 1000; offset < payload.size(); offset += 7000) {
            std::size_t count = std::min<std::size_t>(7000, payload.size() - offset);
            stream->write(payload.data() + offset, static_cast<unsigned int>(count));
            std::this_thread::yield();
        }
        stream->closeWrite();
    });
    bool finished = waitFor([&] { return recorder.finished(); });
    writer.join();

    ASSERT_TRUE(finished);
    EXPECT_EQ(0, recorder.code);
    EXPECT_EQ(200, recorder.status());
    ASSERT_EQ(2u, server->requestCount());
    const TestHttpServer::Received sent = server->received()[1];
    EXPECT_EQ("POST", sent.method);
    EXPECT_TRUE(sent.body == payload);
    EXPECT_TRUE(recorder.body == payload);
    EXPECT_EQ("application/octet-stream", sent.header("Content-Type"));
    EXPECT_EQ("chunked", sent.header("Transfer-Encoding"));
}

TEST_F(HttpExchangeTest, ClosedBodyStreamIsSentWithItsLengthAndAgainByASecondConnection) {
    boost::shared_ptr<HttpRequest> put = request(serve("/echo", Reply::Echo), "PUT");
    put->addHeader("Content-Type", "application/x-test");
    put->getBodyStream()->write("abc", 3);
    put->getBodyStream()->write("def", 3);
    put->getBodyStream()->closeWrite();
    Recorder first(put);
    Recorder second(put);
    ASSERT_TRUE(Recorder::runAll({&first, &second}));

    EXPECT_EQ("abcdef", first.body);
    EXPECT_EQ("abcdef", second.body);
    ASSERT_EQ(2u, server->requestCount());
    for (const TestHttpServer::Received& received : server->received()) {
        EXPECT_EQ("PUT", received.method);
        EXPECT_EQ("6", received.header("Content-Length"));
        EXPECT_EQ("application/x-test", received.header("Content-Type"));
    }
}

TEST_F(HttpExchangeTest, WholeBodyComesInOneCallAndPartsInSeveral) {
    Reply chunked;
    chunked.mode = Reply::Chunked;
    chunked.body = patternBody(256 * 1024);
    chunked.chunkSize = 4096;
    server->on("/big", chunked);

    Recorder whole(Recorder::get(server->url("/big")), true);
    Recorder parts(Recorder::get(server->url("/big")), false);
    ASSERT_TRUE(Recorder::runAll({&whole, &parts}));

    EXPECT_EQ(1u, whole.partSizes.size());
    EXPECT_TRUE(whole.body == chunked.body);
    EXPECT_GT(parts.partSizes.size(), 1u);
    EXPECT_TRUE(parts.body == chunked.body);
    EXPECT_EQ("response", parts.events.front());
    EXPECT_EQ("finished", parts.events.back());
    EXPECT_EQ(0, whole.code);
    EXPECT_EQ(0, parts.code);
}

TEST_F(HttpExchangeTest, ErrorStatusesAndAnswersWithoutBodyAreResponsesNotFailures) {
    Recorder missing(Recorder::get(server->url("/missing")));
    Recorder broken(Recorder::get(serve("/fail", Reply::Whole, "boom", 500)));
    Recorder noContent(Recorder::get(serve("/empty", Reply::Whole, "", 204)));
    Recorder head(request(server->url("/empty"), "HEAD"));
    ASSERT_TRUE(Recorder::runAll({&missing, &broken, &noContent, &head}));

    EXPECT_EQ(404, missing.status());
    EXPECT_EQ("not found", missing.body);
    EXPECT_EQ(500, broken.status());
    EXPECT_EQ("boom", broken.body);
    EXPECT_EQ(204, noContent.status());
    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), noContent.events);
    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), head.events);
    for (Recorder* recorder : {&missing, &broken, &noContent, &head}) {
        EXPECT_EQ(0, recorder->code);
    }
}

TEST_F(HttpExchangeTest, RedirectsAreFollowedOnlyWhenAsked) {
    Reply moved;
    moved.status = 302;
    moved.body = "moved";
    moved.headers = {{"Location", "/target"}};
    server->on("/old", moved);
    serve("/target", Reply::Whole, "arrived");

    Reply notModified;
    notModified.status = 304;
    notModified.headers = {{"Location", "/target"}, {"ETag", "\"v1\""}};
    server->on("/cached", notModified);

    Recorder following(request(server->url("/old"), "GET", true));
    Recorder staying(request(server->url("/old"), "GET", false));
    // A 304 is final even when it names a Location.
    Recorder conditional(request(server->url("/cached"), "GET", true));
    ASSERT_TRUE(Recorder::runAll({&following, &staying, &conditional}));

    EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), following.events);
    EXPECT_EQ(200, following.status());
    EXPECT_EQ("arrived", following.body);
    EXPECT_EQ(302, staying.status());
    EXPECT_EQ("/target", staying.response->getHeader("Location"));
    EXPECT_EQ("moved", staying.body);
    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), conditional.events);
    EXPECT_EQ(0, conditional.code);
    EXPECT_EQ(304, conditional.status());
    ASSERT_NE(nullptr, conditional.response);
    EXPECT_EQ("\"v1\"", conditional.response->getHeader("ETag"));
    int targetRequests = 0;
    for (const TestHttpServer::Received& received : server->received()) {
        targetRequests += received.path == "/target" ? 1 : 0;
    }
    EXPECT_EQ(1, targetRequests);
}

TEST_F(HttpExchangeTest, SameHostRedirectsStayOnTheHostOrGoToHttpsAndOthersAreHandedOverAndLogged) {
    const std::string port = std::to_string(server->port());
    auto redirect = [&](const std::string& path, const std::string& location) {
        Reply moved;
        moved.status = 301;
        moved.body = "moved";
        moved.headers = {{"Location", location}};
        server->on(path, moved);
        return server->url(path);
    };
    auto sameHostOnly = [](const std::string& url) {
        boost::shared_ptr<HttpRequest> request = Recorder::get(url);
        request->setRedirectPolicy(HttpRequest::SameHostRedirects);
        return request;
    };
    serve("/target", Reply::Whole, "arrived");
    redirect("/hop", "/target");
    Recorder relative(sameHostOnly(redirect("/relative", "hop")));
    Recorder absolute(sameHostOnly(redirect("/absolute", "http://127.0.0.1:" + port + "/target")));
    // The name leads to the same server, but it is another host.
    Recorder otherHost(sameHostOnly(redirect("/away", "http://localhost:" + port + "/target")));
    Recorder upgraded(sameHostOnly(redirect("/secure", "https://127.0.0.1:" + port + "/target")));
    Recorder nonsense(sameHostOnly(redirect("/nonsense", "http://")));
    ASSERT_TRUE(Recorder::runAll({&relative, &absolute, &otherHost, &upgraded, &nonsense}));

    for (Recorder* followed : {&relative, &absolute}) {
        EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), followed->events);
        EXPECT_EQ(200, followed->status());
        EXPECT_EQ("arrived", followed->body);
    }
    for (Recorder* refused : {&otherHost, &nonsense}) {
        EXPECT_EQ(0, refused->code);
        EXPECT_EQ(301, refused->status());
    }
    EXPECT_EQ(1, countLogLines("not following the redirect to http://localhost:" + port +
                               "/target: it leaves the host"));
    EXPECT_EQ(1, countLogLines("not following the redirect to http://: not a URL"));
    // Followed: the plain server cannot speak TLS, so the upgraded hop fails there.
    EXPECT_EQ(Network::HTTP_TLS_ERROR_CODE, upgraded.code);
    EXPECT_EQ(2, countLogLines("not following the redirect"));
    int targetRequests = 0;
    for (const TestHttpServer::Received& received : server->received()) {
        targetRequests += received.path == "/target" ? 1 : 0;
    }
    EXPECT_EQ(2, targetRequests);
}

TEST_F(HttpExchangeTest, PartsWaitingForASlowCallerHoldTheTransferBack) {
    const std::string body = patternBody(2 * 1024 * 1024);
    boost::shared_ptr<RecordingCollector> collector = boost::make_shared<RecordingCollector>();
    // The caller stays away longer than the silence timeout.
    Recorder recorder(Recorder::get(serve("/big", Reply::Whole, body), 3000), false, collector, 1);
    const long long bound = 1024 * 1024;
    // libcurl hands over at most this much at once.
    const long long oneRead = CURL_MAX_WRITE_SIZE;
    auto waiting = [&] { return collector->receivedBytes() - static_cast<long long>(recorder.body.size()); };

    recorder.start();
    // The server must answer within the timeout: a generous one.
    ASSERT_TRUE(waitUnpumped([&] { return waiting() >= bound; }))
        << "received " << collector->receivedBytes() << ", engine finished " << collector->count("finished");
    // Not a timing expectation: however long the caller stays away, no more
    // is taken in.
    EXPECT_FALSE(waitUnpumped([&] { return waiting() > bound + oneRead; }, std::chrono::milliseconds(3500)));
    // An event of the thread's own, queued behind the parts waiting now, runs
    // before the parts that come after them.
    BodyMark mark = {&recorder, 0};
    kdInstallCallback(&BodyMark::onEvent, KD_EVENT_USER, &mark);
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_USER;
    event->userptr = &mark;
    kdPostEvent(event);
    ASSERT_TRUE(waitFor([&] { return recorder.finished(); }));
    kdInstallCallback(nullptr, KD_EVENT_USER, &mark);

    EXPECT_EQ(0, recorder.code);
    EXPECT_TRUE(recorder.body == body);
    EXPECT_LE(static_cast<long long>(mark.bodySize), bound + oneRead);
}
