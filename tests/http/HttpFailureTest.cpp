#include <set>
#include <string>

#include "HttpTest.h"
#include "RawReplyServer.h"

using Network::HttpRequest;

class HttpFailureTest : public HttpTest {};

TEST_F(HttpFailureTest, SilenceBeforeOrDuringTheBodyEndsInTimeoutCode) {
    const std::string stalled = serve("/stall", Reply::StallBeforeReply);
    const std::string half = serve("/half", Reply::StallMidBody, std::string(20000, 'x'));

    // The half body must arrive within the silence timeout, so that one leaves room for a slow
    // server thread on a loaded machine (or under ThreadSanitizer); all three run at once.
    Recorder beforeReply(Recorder::get(stalled, 300));
    Recorder whole(Recorder::get(half, 2000), true);
    Recorder parts(Recorder::get(half, 2000), false);
    ASSERT_TRUE(Recorder::runAll({&beforeReply, &whole, &parts}));

    EXPECT_EQ((std::vector<std::string>{"finished"}), beforeReply.events);
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, beforeReply.code);
    // A whole body never arrives in part.
    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), whole.events);
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, whole.code);
    EXPECT_EQ("response", parts.events.front());
    EXPECT_EQ(std::string(10000, 'x'), parts.body);
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, parts.code);
}

TEST_F(HttpFailureTest, RefusedConnectionAndConnectionLostMidBodyHaveDistinctCodes) {
    std::unique_ptr<Recorder> refused =
        fetch("http://127.0.0.1:" + std::to_string(TestHttpServer::closedPort()) + "/");
    std::unique_ptr<Recorder> dropped = fetch(serve("/drop", Reply::DropMidBody, std::string(50000, 'y')));

    EXPECT_EQ((std::vector<std::string>{"finished"}), refused->events);
    EXPECT_EQ(Network::HTTP_CONNECTION_REFUSED_ERROR_CODE, refused->code);
    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), dropped->events);
    EXPECT_EQ(Network::HTTP_CONNECTION_LOST_ERROR_CODE, dropped->code);
}

TEST_F(HttpFailureTest, RequestsThatCannotBeMadeEndInTheirCodesWithoutTraffic) {
    // A label longer than 63 characters fails in the local resolver, so no
    // query leaves the machine.
    std::unique_ptr<Recorder> unresolvable = fetch("http://" + std::string(70, 'a') + ".invalid/");
    std::unique_ptr<Recorder> otherScheme = fetch("file:///etc/hostname");
    std::unique_ptr<Recorder> notAUrl = fetch("not a url at all");
    Recorder smuggling(
        HttpRequest::create(server->url("/x").c_str(), "GET /y HTTP/1.1\r\nX-Evil:", 10000, false));
    ASSERT_TRUE(Recorder::runAll({&smuggling}));

    EXPECT_EQ(Network::HTTP_HOST_NOT_RESOLVED_ERROR_CODE, unresolvable->code);
    EXPECT_EQ(Network::HTTP_BAD_REQUEST_ERROR_CODE, otherScheme->code);
    EXPECT_EQ(Network::HTTP_BAD_REQUEST_ERROR_CODE, notAUrl->code);
    EXPECT_EQ(Network::HTTP_BAD_REQUEST_ERROR_CODE, smuggling.code);
    EXPECT_EQ((std::vector<std::string>{"finished"}), smuggling.events);
    EXPECT_EQ(0u, server->requestCount());
}

TEST_F(HttpFailureTest, AnswersThatBreakHttpEndInTheBadResponseCode) {
    const std::string chunkedHead = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";
    std::string manyFields = "HTTP/1.1 200 OK\r\n";
    for (int i = 0; i < 400; ++i) {
        manyFields += "X-Field-" + std::to_string(i) + ": " + std::string(1000, 'v') + "\r\n";
    }
    const struct {
        const char* name;
        std::string answer;
    } cases[] = {
        {"not http", "this is not http\r\n\r\n"},
        {"unreadable status", "HTTP/1.1 abc\r\nContent-Length: 2\r\n\r\nok"},
        {"status line then close", "HTTP/1.1 200 OK\r\n"},
        {"head cut after a field", "HTTP/1.1 200 OK\r\nContent-Type: text/plain\r\n"},
        {"length not a number", "HTTP/1.1 200 OK\r\nContent-Length: abc\r\n\r\nabc"},
        {"length too large", "HTTP/1.1 200 OK\r\nContent-Length: 99999999999999999999999\r\n\r\nabc"},
        {"lengths that disagree", "HTTP/1.1 200 OK\r\nContent-Length: 3\r\nContent-Length: 5\r\n\r\nabcde"},
        {"chunk size not hex", chunkedHead + "zz\r\nabc\r\n0\r\n\r\n"},
        {"chunk without its line end", chunkedHead + "3\r\nabcXX0\r\n\r\n"},
        {"chunk size too large", chunkedHead + "fffffffffffffffffffff\r\nabc\r\n0\r\n\r\n"},
        {"field line too long", "HTTP/1.1 200 OK\r\nX-Big: " + std::string(400000, 'h') + "\r\n\r\n"},
        {"head too large", manyFields + "\r\n"},
    };
    for (const auto& entry : cases) {
        SCOPED_TRACE(entry.name);
        RawReplyServer peer(entry.answer);

        std::unique_ptr<Recorder> recorder = fetch(peer.url());

        EXPECT_EQ(Network::HTTP_BAD_RESPONSE_ERROR_CODE, recorder->code);
        EXPECT_EQ("finished", recorder->events.back());
        EXPECT_TRUE(recorder->body.empty());
    }
}

TEST_F(HttpFailureTest, AnswersCutShortByThePeerEndInTheConnectionLostCode) {
    RawReplyServer::Options reset;
    reset.reset = true;
    const struct {
        const char* name;
        std::string answer;
        RawReplyServer::Options options;
    } cases[] = {
        {"nothing", "", RawReplyServer::Options()},
        {"body shorter than announced", "HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nonly this",
         RawReplyServer::Options()},
        {"chunked body closed early", "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n3\r\nabc\r\n",
         RawReplyServer::Options()},
        {"reset inside the head", "HTTP/1.1 200 OK\r\nX-A: b\r\n", reset},
        {"reset inside a chunked body", "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n3\r\nabc\r\n",
         reset},
    };
    for (const auto& entry : cases) {
        SCOPED_TRACE(entry.name);
        RawReplyServer peer(entry.answer, entry.options);

        EXPECT_EQ(Network::HTTP_CONNECTION_LOST_ERROR_CODE, fetch(peer.url())->code);
    }
}

TEST_F(HttpFailureTest, RepeatedLengthsThatAgreeAreAccepted) {
    RawReplyServer peer("HTTP/1.1 200 OK\r\nContent-Length: 3\r\nContent-Length: 3\r\n\r\nabc");

    std::unique_ptr<Recorder> recorder = fetch(peer.url());

    EXPECT_EQ(0, recorder->code);
    EXPECT_EQ("abc", recorder->body);
    ASSERT_NE(nullptr, recorder->response);
    EXPECT_EQ(3, recorder->response->getContentLength());
}

TEST_F(HttpFailureTest, HeadBytesTricklingInKeepTheConnectionAliveButSilenceInsideTheHeadDoesNot) {
    // One byte every 20 ms: each line takes far longer than the timeout.
    const std::string answer =
        "HTTP/1.1 200 OK\r\nX-Padding: " + std::string(40, 'p') + "\r\nContent-Length: 2\r\n\r\nok";
    RawReplyServer::Options trickling;
    trickling.byteIntervalMs = 20;
    RawReplyServer slowPeer(answer, trickling);
    RawReplyServer::Options silent;
    silent.stayOpen = true;
    RawReplyServer stalledPeer("HTTP/1.1 200 OK\r\nX-Padding: ppp", silent);

    std::unique_ptr<Recorder> slow = fetch(slowPeer.url(), 500);
    std::unique_ptr<Recorder> stalled = fetch(stalledPeer.url(), 300);

    EXPECT_EQ((std::vector<std::string>{"finished"}), stalled->events);
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, stalled->code);
    EXPECT_EQ(0, slow->code);
    EXPECT_EQ("ok", slow->body);
    ASSERT_NE(nullptr, slow->response);
    EXPECT_EQ(std::string(40, 'p'), slow->response->getHeader("X-Padding"));
}

TEST_F(HttpFailureTest, OfflineAtStartFinishesWithOfflineCodeWithoutTraffic) {
    pal::setReachability(0);

    std::unique_ptr<Recorder> recorder = fetch(server->url("/any"));

    EXPECT_EQ((std::vector<std::string>{"finished"}), recorder->events);
    EXPECT_EQ(Network::HTTP_OFFLINE_ERROR_CODE, recorder->code);
    EXPECT_EQ(0u, server->requestCount());
}

TEST_F(HttpFailureTest, FailureWhileUnreachableReportsOfflineCode) {
    Recorder recorder(Recorder::get(serve("/stall", Reply::StallBeforeReply), 300));
    recorder.start();

    // Reachable when it started; unreachable when it times out.
    pal::setReachability(0);
    ASSERT_TRUE(waitFor([&] { return recorder.finished(); }));

    EXPECT_EQ(Network::HTTP_OFFLINE_ERROR_CODE, recorder.code);
}

TEST_F(HttpFailureTest, FinishCodesAreDistinctNegativesApartFromTheFixedOfflineCode) {
    const std::set<int> codes = {Network::HTTP_GENERIC_ERROR_CODE,
                                 Network::HTTP_TIMEOUT_ERROR_CODE,
                                 Network::HTTP_CONNECTION_REFUSED_ERROR_CODE,
                                 Network::HTTP_HOST_NOT_RESOLVED_ERROR_CODE,
                                 Network::HTTP_CONNECTION_LOST_ERROR_CODE,
                                 Network::HTTP_BAD_RESPONSE_ERROR_CODE,
                                 Network::HTTP_BAD_REQUEST_ERROR_CODE,
                                 Network::HTTP_TLS_ERROR_CODE,
                                 Network::HTTP_NO_ENGINE_ERROR_CODE,
                                 Network::HTTP_OFFLINE_ERROR_CODE,
                                 -1073741826};
    EXPECT_EQ(11u, codes.size());
    EXPECT_LT(*codes.rbegin(), 0);
    EXPECT_EQ(-1073741825, Network::HTTP_OFFLINE_ERROR_CODE);
}

TEST_F(HttpFailureTest, StartWithoutEngineIsAnErrorThatStillFinishes) {
    engine.reset();

    std::unique_ptr<Recorder> recorder = fetch(server->url("/any"));

    expectAssertion("core && \"an HttpEngine exists\"");
    EXPECT_EQ(Network::HTTP_NO_ENGINE_ERROR_CODE, recorder->code);
}

TEST_F(HttpFailureTest, StoppingTheEngineFinishesRunningConnections) {
    Recorder recorder(Recorder::get(serve("/stall", Reply::StallBeforeReply)));
    recorder.start();
    ASSERT_TRUE(waitFor([&] { return server->requestCount() == 1; }));

    engine.reset();
    ASSERT_TRUE(waitFor([&] { return recorder.finished(); }));

    EXPECT_EQ((std::vector<std::string>{"finished"}), recorder.events);
    EXPECT_EQ(Network::HTTP_NO_ENGINE_ERROR_CODE, recorder.code);
}
