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
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "network/NetworkErrorCodes.h"
#include "network/NetworkManager.h"
#include "network/NetworkTaskBasicRetryPolicy.h"
#include "network/NetworkTaskHolder.h"
#include "network/NetworkTaskWriter.h"
#include "network/impl/NetworkManagerImpl.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"

using Network::NetworkManager;

// A loopback peer that reads a request head, answers with fixed raw bytes
// (possibly none) and closes: answers no HTTP server library would give.
class RawReplyServer {
public:
    explicit RawReplyServer(const std::string& answer) : answer(answer) {
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
            int client = ::poll(&waiting, 1, 20) > 0 ? ::accept(listener, nullptr, nullptr) : -1;
            if (client < 0) {
                continue;
            }
            std::string head;
            char buffer[1024];
            ssize_t count = 1;
            while (count > 0 && head.find("\r\n\r\n") == std::string::npos) {
                count = ::recv(client, buffer, sizeof(buffer), 0);
                head.append(buffer, count > 0 ? static_cast<std::size_t>(count) : 0);
            }
            ::send(client, answer.data(), answer.size(), MSG_NOSIGNAL);
            ::close(client);
        }
    }

    std::string answer;
    int listener = ::socket(AF_INET, SOCK_STREAM, 0);
    int port = 0;
    std::atomic<bool> stopping{false};
    std::thread thread;
};

// A client task that writes what the manager does to it into a log, its own
// or one shared by several tasks (entries then carry the task's name).
class RecordingTask : public Network::NetworkTask {
public:
    RecordingTask(const std::string& url, int priority) : url(url), priority(priority) {}

    bool isReadyToPerform() const override { return ready; }
    int getPriority() const override { return priority; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override {
        ++attempts;
        const_cast<RecordingTask*>(this)->note("request");
        boost::shared_ptr<Network::HttpRequest> request =
            Network::HttpRequest::create(url.c_str(), streamsBody ? "POST" : "GET", timeoutMs, false);
        if (streamsBody) {
            request->getBodyStream();
        }
        return request;
    }
    bool needToGatherStatistics() const override { return gatherStatistics; }
    bool recieveResponseBodyByParts() const override { return byParts; }
    void onResponseRecieved(boost::shared_ptr<Network::HttpResponse> response) override {
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
            onFinish();
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

    std::string url;
    int priority;
    int timeoutMs = 10000;
    bool ready = true;
    bool gatherStatistics = true;
    bool byParts = false;
    bool streamsBody = false;
    std::string name;
    std::vector<std::string>* sharedLog = nullptr;
    std::function<void()> onResponse, onFinish, onRetry;

    mutable int attempts = 0;
    int retries = 0;
    std::vector<int> finishCodes;
    std::string body;
    std::vector<std::string> log;

private:
    void note(const std::string& event) {
        log.push_back(event);
        if (sharedLog != nullptr) {
            sharedLog->push_back(name + " " + event);
        }
    }
};

// Writes the status signals the manager's thread receives into a log.
class StatusLog {
public:
    explicit StatusLog(std::vector<std::string>* log = nullptr) : log(log != nullptr ? log : &own) {}

    void listen(NetworkManager* manager) {
        manager->addOfflineModeStatusCallback(
            NetworkManager::OfflineModeStatusCallback::make<StatusLog, &StatusLog::onOffline>(this));
        manager->addNetworkErrorStatusCallback(
            NetworkManager::NetworkErrorStatusCallback::make<StatusLog, &StatusLog::onError>(this));
        manager->addNetworkActivityStatusCallback(
            NetworkManager::NetworkActivityStatusCallback::make<StatusLog, &StatusLog::onActivity>(this));
    }
    NetworkManager::NetworkReachabilityStatusCallback reachability() {
        return NetworkManager::NetworkReachabilityStatusCallback::make<StatusLog, &StatusLog::onReachability>(
            this);
    }

    std::vector<std::string> own;

private:
    void onOffline(NetworkManager::OfflineModeStatus status) {
        log->push_back("offline " + std::to_string(status));
    }
    void onError(NetworkManager::NetworkErrorStatus status) {
        log->push_back("error " + std::to_string(status));
    }
    void onActivity(NetworkManager::NetworkActivityStatus status) {
        log->push_back(status == NetworkManager::NetworkActive ? "active" : "idle");
    }
    void onReachability(NetworkManager::NetworkReachabilityStatus status) {
        log->push_back("reachability " + std::to_string(status));
    }

    std::vector<std::string>* log;
};

// The platform on the virtual clock, the application resumed, and a loopback
// server. Real exchanges end real waits; retry and deadline timers move only
// when the test advances the clock.
class NetworkTest : public PalTest {
protected:
    typedef TestHttpServer::Reply Reply;
    typedef boost::shared_ptr<RecordingTask> Task;

    void SetUp() override {
        PalTest::SetUp();
        pal::postAppResumed();
        pump();
        server.reset(new TestHttpServer());
        manager = static_cast<Network::NetworkManagerImpl*>(NetworkManager::getInstance());
    }
    // The manager and its engine go with the platform's shutdown, before the
    // server, so that no connection waits on it.
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
    static std::string refusedUrl() {
        return "http://127.0.0.1:" + std::to_string(TestHttpServer::closedPort()) + "/";
    }
    static Task makeTask(const std::string& url, int priority = 1) {
        return boost::make_shared<RecordingTask>(url, priority);
    }
    static boost::shared_ptr<Network::NetworkTaskRetryPolicy> policy(int interval, int limit,
                                                                     bool timeout = false) {
        return boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(interval, limit, timeout);
    }
    static boost::shared_ptr<Network::NetworkTaskImpl> stateOf(const Task& task) {
        return Network::getRequestState<Network::NetworkTaskImpl>(
            boost::shared_ptr<Network::NetworkTask>(task));
    }
    static bool allFinished(const std::vector<Task>& tasks) {
        for (const Task& task : tasks) {
            if (!task->finished()) {
                return false;
            }
        }
        return true;
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
    bool settle(const std::function<bool()>& done, KDust stepMs = 250) {
        for (int step = 0; step < 20000; ++step) {
            pump();
            if (done()) {
                return true;
            }
            if (manager->getNetworkActivityStatus() == NetworkManager::NetworkActive) {
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
