#pragma once

#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "http/RawReplyServer.h"
#include "network/NetworkErrorCodes.h"
#include "network/NetworkManager.h"
#include "network/NetworkTaskBasicRetryPolicy.h"
#include "network/NetworkTaskHolder.h"
#include "network/NetworkTaskWriter.h"
#include "network/impl/NetworkManagerImpl.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"

using Network::NetworkManager;

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
    long long getMaxResponseBodySize() const override { return maxBodySize; }
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
    long long maxBodySize = -1;
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
