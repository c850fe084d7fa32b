#pragma once

#include <KD/kdext.h>
#include <arpa/inet.h>
#include <netinet/in.h>
#include <pal/Simulation.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <boost/make_shared.hpp>
#include <boost/shared_ptr.hpp>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "network/HttpRequest.h"
#include "network/HttpResponse.h"
#include "network/NetworkManager.h"
#include "network/NetworkTask.h"
#include "network/NetworkTaskBasicRetryPolicy.h"
#include "network/NetworkTaskHolder.h"
#include "network/NetworkTaskWriter.h"
#include "network/impl/NetworkManagerImpl.h"
#include "network/impl/NetworkTaskImpl.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"

// A client task that writes down everything the manager does to it, in
// order, into its own log and optionally into a log shared by several tasks.
class RecordingTask : public Network::NetworkTask {
public:
    explicit RecordingTask(const std::string& url, int priority = 1) : url(url), priority(priority) {}

    bool isReadyToPerform() const override { return ready; }
    int getPriority() const override { return priority; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override {
        ++attempts;
        note("request");
        boost::shared_ptr<Network::HttpRequest> request =
            Network::HttpRequest::create(url.c_str(), method.c_str(), timeoutMs, false);
        if (streamsBody) {
            request->getBodyStream();
        }
        return request;
    }
    bool needToGatherStatistics() const override { return gatherStatistics; }
    bool recieveResponseBodyByParts() const override { return byParts; }
    void onResponseRecieved(boost::shared_ptr<Network::HttpResponse> response) override {
        statuses.push_back(response->getStatusCode());
        note("response " + std::to_string(response->getStatusCode()));
        if (onResponse) {
            onResponse();
        }
    }
    void onBytesReceived(const std::vector<unsigned char>& bytes) override {
        body.append(bytes.begin(), bytes.end());
        note("bytes");
    }
    void onFinished(int code) override {
        finishCodes.push_back(code);
        note("finished " + std::to_string(code));
        if (onFinish) {
            onFinish(code);
        }
    }
    void onRetried() override {
        ++retries;
        note("retried");
        if (onRetry) {
            onRetry();
        }
    }

    bool finished() const { return !finishCodes.empty(); }
    int lastCode() const { return finishCodes.empty() ? 1 : finishCodes.back(); }
    boost::shared_ptr<Network::NetworkTaskImpl> state() {
        return Network::getRequestState<Network::NetworkTaskImpl>(
            boost::static_pointer_cast<Network::NetworkTask>(shared()));
    }
    // Set by the test after making the task through makeTask().
    boost::weak_ptr<RecordingTask> self;
    boost::shared_ptr<RecordingTask> shared() { return self.lock(); }

    std::string url;
    int priority;
    std::string method = "GET";
    int timeoutMs = 10000;
    bool ready = true;
    bool gatherStatistics = true;
    bool byParts = false;
    bool streamsBody = false;
    std::string name;
    std::vector<std::string>* sharedLog = nullptr;
    std::function<void()> onResponse;
    std::function<void(int)> onFinish;
    std::function<void()> onRetry;

    mutable int attempts = 0;
    int retries = 0;
    std::vector<int> statuses;
    std::vector<int> finishCodes;
    std::string body;
    mutable std::vector<std::string> log;

private:
    void note(const std::string& event) const {
        log.push_back(event);
        if (sharedLog != nullptr) {
            sharedLog->push_back(name + " " + event);
        }
    }
};

// A loopback peer that reads each request head and answers with fixed raw
// bytes (possibly none) before closing, for answers no HTTP server would give.
class RawReplyServer {
public:
    explicit RawReplyServer(const std::string& answer) : answer(answer) {
        listener = ::socket(AF_INET, SOCK_STREAM, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t length = sizeof(address);
        ::bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof(address));
        ::listen(listener, 16);
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
            std::string head;
            char buffer[1024];
            while (head.find("\r\n\r\n") == std::string::npos) {
                ssize_t count = ::recv(client, buffer, sizeof(buffer), 0);
                if (count <= 0) {
                    break;
                }
                head.append(buffer, static_cast<std::size_t>(count));
            }
            ::send(client, answer.data(), answer.size(), MSG_NOSIGNAL);
            ::close(client);
        }
    }

    std::string answer;
    int listener = -1;
    int port = 0;
    std::atomic<bool> stopping{false};
    std::thread thread;
};

// The platform on the virtual clock, the application resumed, and a loopback
// server. Real exchanges end real waits; retry and deadline timers move only
// when the test advances the clock.
class NetworkTest : public PalTest {
protected:
    typedef TestHttpServer::Reply Reply;

    void SetUp() override {
        PalTest::SetUp();
        pal::postAppResumed();
        pump();
        server.reset(new TestHttpServer());
        manager = static_cast<Network::NetworkManagerImpl*>(Network::NetworkManager::getInstance());
    }
    // The manager, with its engine, goes with the platform's shutdown; the
    // server after it, so that no connection waits on it.
    void TearDown() override {
        PalTest::TearDown();
        server.reset();
    }

    std::string serve(const std::string& path, int status, const std::string& body = "",
                      Reply::Mode mode = Reply::Whole) {
        Reply reply;
        reply.status = status;
        reply.body = body;
        reply.mode = mode;
        server->on(path, reply);
        return server->url(path);
    }

    boost::shared_ptr<RecordingTask> makeTask(const std::string& url, int priority = 1) {
        boost::shared_ptr<RecordingTask> task = boost::make_shared<RecordingTask>(url, priority);
        task->self = task;
        return task;
    }

    static boost::shared_ptr<Network::NetworkTaskRetryPolicy> policy(int interval, int limit,
                                                                     bool timeout = false) {
        return boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(interval, limit, timeout);
    }

    // Blocks on the main thread's events (each exchange ends in one) until
    // done holds.
    void pumpUntil(const std::function<bool()>& done) {
        while (!done()) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
    }

    // Until done holds: waits for the network while a connection is open,
    // else moves the clock so that retry and deadline timers fire.
    bool settle(const std::function<bool()>& done, KDust stepMs = 250, int maxSteps = 20000) {
        for (int step = 0; step < maxSteps; ++step) {
            pump();
            if (done()) {
                return true;
            }
            if (manager->getNetworkActivityStatus() == Network::NetworkManager::NetworkActive) {
                kdWaitEvent(static_cast<KDust>(-1));
            } else {
                advanceMs(stepMs);
            }
        }
        return done();
    }

    std::unique_ptr<TestHttpServer> server;
    Network::NetworkManagerImpl* manager = nullptr;
};
