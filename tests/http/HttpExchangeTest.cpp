#include <string>
#include <thread>

#include "HttpTest.h"

using Network::HttpRequest;
using Reply = TestHttpServer::Reply;

namespace {

std::string patternBody(std::size_t size) {
    std::string body(size, '\0');
    for (std::size_t i = 0; i < size; ++i) {
        body[i] = static_cast<char>((i * 7 + i / 251) & 0xff);
    }
    return body;
}

}  // namespace

class HttpExchangeTest : public HttpTest {};

TEST_F(HttpExchangeTest, GetDeliversResponseThenBodyThenFinish) {
    Reply reply;
    reply.body = "hello world";
    reply.headers = {{"X-Answer", "42"}};
    server->on("/hello", reply);

    Recorder recorder(Recorder::get(server->url("/hello?lang=en")));
    recorder.start();
    ASSERT_TRUE(waitFor([&] { return recorder.finished(); }));

    EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), recorder.events);
    EXPECT_EQ(0, recorder.code);
    EXPECT_EQ(200, recorder.status());
    EXPECT_EQ("42", recorder.response->getHeader("x-answer"));
    EXPECT_EQ("text/plain", recorder.response->getContentType());
    EXPECT_EQ(11, recorder.response->getContentLength());
    EXPECT_EQ("hello world", recorder.body);
    EXPECT_EQ("/hello", recorder.connection->getRequestPath());
    ASSERT_EQ(1u, server->requestCount());
    EXPECT_EQ("GET", server->received()[0].method);
}

TEST_F(HttpExchangeTest, PostSendsMultipartFieldsTheServerParses) {
    Reply reply;
    reply.body = "stored";
    server->on("/upload", reply);

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
    boost::shared_ptr<HttpRequest> request =
        HttpRequest::create(server->url("/upload").c_str(), "POST", 10000, false);
    request->setBody(builder->getBoundary(), builder->getEncodedContent());
    EXPECT_NE("0123456789ABCDEF0", builder->getBoundary());

    Recorder recorder(request);
    recorder.start();
    ASSERT_TRUE(waitFor([&] { return recorder.finished(); }));

    EXPECT_EQ(0, recorder.code);
    EXPECT_EQ("stored", recorder.body);
    ASSERT_EQ(1u, server->requestCount());
    TestHttpServer::Received received = server->received()[0];
    EXPECT_EQ("POST", received.method);
    ASSERT_EQ(4u, received.parts.size());
    ASSERT_NE(nullptr, received.part("data"));
    EXPECT_EQ(binary, received.part("data")->content);
    EXPECT_EQ("application/octet-stream", received.part("data")->contentType);
    ASSERT_NE(nullptr, received.part("lang"));
    EXPECT_EQ("en", received.part("lang")->content);
    EXPECT_EQ("", received.part("lang")->fileName);
    ASSERT_NE(nullptr, received.part("report"));
    EXPECT_EQ("line one\nline two", received.part("report")->content);
    EXPECT_EQ("report", received.part("report")->fileName);
    EXPECT_EQ("text/plain", received.part("report")->contentType);
    ASSERT_NE(nullptr, received.part("say %22hi%22"));
    EXPECT_EQ("quoted", received.part("say %22hi%22")->content);
}

TEST_F(HttpExchangeTest, BodyStreamedWhileTheRequestRunsArrivesComplete) {
    Reply echo;
    echo.mode = Reply::Echo;
    server->on("/echo", echo);
    const std::string payload = patternBody(200 * 1024);

    boost::shared_ptr<HttpRequest> request =
        HttpRequest::create(server->url("/echo").c_str(), "POST", 10000, false);
    boost::shared_ptr<HttpRequest::HttpBodyStream> stream = request->getBodyStream();
    stream->write(payload.data(), 1000);
    Recorder recorder(request);
    recorder.start();
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
    ASSERT_EQ(1u, server->requestCount());
    EXPECT_EQ(payload.size(), server->received()[0].body.size());
    EXPECT_TRUE(server->received()[0].body == payload);
    EXPECT_TRUE(recorder.body == payload);
    EXPECT_EQ("application/octet-stream", server->received()[0].header("Content-Type"));
    EXPECT_EQ("chunked", server->received()[0].header("Transfer-Encoding"));
}

TEST_F(HttpExchangeTest, ClosedBodyStreamIsSentWithItsLengthAndAgainByASecondConnection) {
    Reply echo;
    echo.mode = Reply::Echo;
    server->on("/echo", echo);

    boost::shared_ptr<HttpRequest> request =
        HttpRequest::create(server->url("/echo").c_str(), "PUT", 10000, false);
    request->addHeader("Content-Type", "application/x-test");
    request->getBodyStream()->write("abc", 3);
    request->getBodyStream()->write("def", 3);
    request->getBodyStream()->closeWrite();
    Recorder first(request);
    Recorder second(request);
    first.start();
    second.start();
    ASSERT_TRUE(waitFor([&] { return first.finished() && second.finished(); }));

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
    whole.start();
    parts.start();
    ASSERT_TRUE(waitFor([&] { return whole.finished() && parts.finished(); }));

    ASSERT_EQ(1u, whole.partSizes.size());
    EXPECT_TRUE(whole.body == chunked.body);
    EXPECT_GT(parts.partSizes.size(), 1u);
    EXPECT_TRUE(parts.body == chunked.body);
    EXPECT_EQ("response", parts.events.front());
    EXPECT_EQ("finished", parts.events.back());
    EXPECT_EQ(0, whole.code);
    EXPECT_EQ(0, parts.code);
}

TEST_F(HttpExchangeTest, ErrorStatusesAreResponsesNotFailures) {
    Reply failing;
    failing.status = 500;
    failing.body = "boom";
    server->on("/fail", failing);

    Recorder missing(Recorder::get(server->url("/missing")));
    Recorder broken(Recorder::get(server->url("/fail")));
    missing.start();
    broken.start();
    ASSERT_TRUE(waitFor([&] { return missing.finished() && broken.finished(); }));

    EXPECT_EQ(404, missing.status());
    EXPECT_EQ(0, missing.code);
    EXPECT_EQ("not found", missing.body);
    EXPECT_EQ(500, broken.status());
    EXPECT_EQ(0, broken.code);
    EXPECT_EQ("boom", broken.body);
}

TEST_F(HttpExchangeTest, AnswerWithoutBodyGivesResponseAndFinishOnly) {
    Reply empty;
    empty.status = 204;
    server->on("/empty", empty);

    Recorder noContent(Recorder::get(server->url("/empty")));
    Recorder head(HttpRequest::create(server->url("/empty").c_str(), "HEAD", 10000, false));
    noContent.start();
    head.start();
    ASSERT_TRUE(waitFor([&] { return noContent.finished() && head.finished(); }));

    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), noContent.events);
    EXPECT_EQ(204, noContent.status());
    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), head.events);
    EXPECT_EQ(0, head.code);
}

TEST_F(HttpExchangeTest, RedirectsAreFollowedOnlyWhenAsked) {
    Reply moved;
    moved.status = 302;
    moved.body = "moved";
    moved.headers = {{"Location", "/target"}};
    server->on("/old", moved);
    Reply target;
    target.body = "arrived";
    server->on("/target", target);

    Recorder following(HttpRequest::create(server->url("/old").c_str(), "GET", 10000, true));
    Recorder staying(HttpRequest::create(server->url("/old").c_str(), "GET", 10000, false));
    following.start();
    staying.start();
    ASSERT_TRUE(waitFor([&] { return following.finished() && staying.finished(); }));

    EXPECT_EQ((std::vector<std::string>{"response", "body", "finished"}), following.events);
    EXPECT_EQ(200, following.status());
    EXPECT_EQ("arrived", following.body);
    EXPECT_EQ(302, staying.status());
    EXPECT_EQ("/target", staying.response->getHeader("Location"));
    EXPECT_EQ("moved", staying.body);
}
