#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <set>
#include <string>
#include <thread>

#include "HttpTest.h"

using Network::HttpRequest;

namespace {

// A loopback peer that answers every connection with fixed raw bytes, for
// answers no HTTP server library would produce.
class RawReplyServer {
public:
    explicit RawReplyServer(const std::string& answer) : answer(answer) {
        listener = ::socket(AF_INET, SOCK_STREAM, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t length = sizeof(address);
        ::bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof(address));
        ::listen(listener, 8);
        ::getsockname(listener, reinterpret_cast<sockaddr*>(&address), &length);
        port = ntohs(address.sin_port);
        thread = std::thread([this] { serve(); });
    }
    ~RawReplyServer() {
        stopping = true;
        thread.join();
        ::close(listener);
    }
    std::string url() const { return "http://127.0.0.1:" + std::to_string(port) + "/raw"; }

private:
    void serve() {
        while (!stopping) {
            pollfd waiting = {listener, POLLIN, 0};
            if (::poll(&waiting, 1, 20) <= 0) {
                continue;
            }
            int client = ::accept(listener, nullptr, nullptr);
            if (client < 0) {
                continue;
            }
            readRequestHead(client);
            ::send(client, answer.data(), answer.size(), MSG_NOSIGNAL);
            ::close(client);
        }
    }
    static void readRequestHead(int client) {
        std::string head;
        char buffer[1024];
        while (head.find("\r\n\r\n") == std::string::npos) {
            ssize_t count = ::recv(client, buffer, sizeof(buffer), 0);
            if (count <= 0) {
                return;
            }
            head.append(buffer, static_cast<std::size_t>(count));
        }
    }

    std::string answer;
    int listener = -1;
    int port = 0;
    std::atomic<bool> stopping{false};
    std::thread thread;
};

}  // namespace

class HttpFailureTest : public HttpTest {};

TEST_F(HttpFailureTest, SilenceBeforeOrDuringTheBodyEndsInTimeoutCode) {
    const std::string stalled = serve("/stall", Reply::StallBeforeReply);
    const std::string half = serve("/half", Reply::StallMidBody, std::string(20000, 'x'));

    std::unique_ptr<Recorder> beforeReply = fetch(stalled, 300);
    std::unique_ptr<Recorder> whole = fetch(half, 500, true);
    std::unique_ptr<Recorder> parts = fetch(half, 500, false);

    EXPECT_EQ((std::vector<std::string>{"finished"}), beforeReply->events);
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, beforeReply->code);
    // A whole body never arrives in part.
    EXPECT_EQ((std::vector<std::string>{"response", "finished"}), whole->events);
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, whole->code);
    EXPECT_EQ("response", parts->events.front());
    EXPECT_EQ(std::string(10000, 'x'), parts->body);
    EXPECT_EQ(Network::HTTP_TIMEOUT_ERROR_CODE, parts->code);
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

TEST_F(HttpFailureTest, GarbageAnswersEndInFailureCodesNeverInACrash) {
    RawReplyServer notHttp("this is not http\r\n\r\n");
    RawReplyServer badStatus("HTTP/1.1 abc\r\nContent-Length: 2\r\n\r\nok");
    RawReplyServer shortBody("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nonly this");
    RawReplyServer brokenChunks(
        "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\nzz\r\nabc\r\n0\r\n\r\n");
    RawReplyServer hugeHeader("HTTP/1.1 200 OK\r\nX-Big: " + std::string(400000, 'h') + "\r\n\r\n");
    RawReplyServer nothing("");

    EXPECT_EQ(Network::HTTP_BAD_RESPONSE_ERROR_CODE, fetch(notHttp.url())->code);
    EXPECT_EQ(Network::HTTP_BAD_RESPONSE_ERROR_CODE, fetch(badStatus.url())->code);
    EXPECT_EQ(Network::HTTP_CONNECTION_LOST_ERROR_CODE, fetch(shortBody.url())->code);
    EXPECT_LT(fetch(brokenChunks.url())->code, 0);
    EXPECT_LT(fetch(hugeHeader.url())->code, 0);
    EXPECT_EQ(Network::HTTP_CONNECTION_LOST_ERROR_CODE, fetch(nothing.url())->code);
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
