// The network manager against a loopback cpp-httplib server: a batch of
// tasks of mixed priorities (one answering 503 twice before it succeeds, one
// missing), then the network dropping away so that a task ends offline and
// waits in the queue until the network is back and offline mode is switched
// off. Every status is printed as the listeners receive it, and a summary
// closes the scene.
#include <KD/kdext.h>
#include <httplib.h>
#include <pal/Simulation.h>

#include <atomic>
#include <boost/make_shared.hpp>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "DemoScene.h"
#include "network/HttpRequest.h"
#include "network/NetworkManager.h"
#include "network/NetworkTask.h"
#include "network/NetworkTaskBasicRetryPolicy.h"
#include "util/Timer.h"

namespace {

using Network::NetworkManager;

class NetworkScene;

// One request of the scene; reports to the scene on the main thread.
class SceneTask : public Network::NetworkTask {
public:
    SceneTask(NetworkScene* scene, const std::string& name, const std::string& url, int priority)
        : scene(scene), name(name), url(url), priority(priority) {}

    bool isReadyToPerform() const override { return true; }
    int getPriority() const override { return priority; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override;
    void onResponseRecieved(boost::shared_ptr<Network::HttpResponse> response) override;
    void onBytesReceived(const std::vector<unsigned char>& bytes) override { received += bytes.size(); }
    void onFinished(int code) override;
    void onRetried() override;

    NetworkScene* scene;
    std::string name;
    std::string url;
    int priority;
    std::size_t received = 0;
};

// Main thread; the server answers on its own threads.
class NetworkScene : public DemoScene {
public:
    NetworkScene()
        : manager(NetworkManager::getInstance()),
          port(0),
          flakyCalls(0),
          networkReturns(callback<void (*)()>::make<NetworkScene, &NetworkScene::goOnline>(this)) {}

    ~NetworkScene() override {
        stopListening();
        for (const boost::shared_ptr<SceneTask>& task : tasks) {
            manager->cancel(task);
        }
        pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
        if (serverThread.joinable()) {
            server.stop();
            serverThread.join();
        }
    }

    // The later scenes use the network too; their traffic is not this
    // scene's to print.
    void stopListening() {
        manager->removeOfflineModeStatusCallback(
            NetworkManager::OfflineModeStatusCallback::make<NetworkScene, &NetworkScene::onOffline>(this));
        manager->removeNetworkReachabilityStatusCallback(
            NetworkManager::NetworkReachabilityStatusCallback::make<NetworkScene,
                                                                    &NetworkScene::onReachability>(this));
        manager->removeNetworkErrorStatusCallback(
            NetworkManager::NetworkErrorStatusCallback::make<NetworkScene, &NetworkScene::onError>(this));
        manager->removeNetworkActivityStatusCallback(
            NetworkManager::NetworkActivityStatusCallback::make<NetworkScene, &NetworkScene::onActivity>(
                this));
    }

    void run(Done done) override {
        finished = done;
        startServer();
        if (port <= 0) {
            demo::say("could not bind a loopback port; skipping");
            finished();
            return;
        }
        demo::say("cpp-httplib server listening on 127.0.0.1:%d", port);
        listen();
        submitBatch();
    }

    std::string url(const std::string& path) const {
        return "http://127.0.0.1:" + std::to_string(port) + path;
    }

    void countAttempt() { ++attempts; }
    void countRetry() { ++retries; }

    void onTaskFinished(SceneTask* task, int code) {
        ++finishCodes[code];
        demo::say("  %s finished with %d (%zu body bytes)", task->name.c_str(), code, task->received);
        if (code == Network::OFFLINE_ERROR_CODE) {
            demo::say("  %s waits in the offline queue", task->name.c_str());
            return;
        }
        ++done;
        if (done == batchSize) {
            goOffline();
        } else if (done == batchSize + 1) {
            summarise();
        }
    }

private:
    void startServer() {
        server.set_tcp_nodelay(true);
        server.Get(R"(/tile/(\d+))", [](const httplib::Request& request, httplib::Response& response) {
            response.set_content("tile " + request.matches[1].str() + std::string(512, '.'), "text/plain");
        });
        server.Get("/flaky", [this](const httplib::Request&, httplib::Response& response) {
            if (flakyCalls++ < 2) {
                response.status = 503;
                response.set_content("busy", "text/plain");
                return;
            }
            response.set_content("finally", "text/plain");
        });
        port = server.bind_to_any_port("127.0.0.1");
        if (port > 0) {
            serverThread = std::thread([this] { server.listen_after_bind(); });
        }
    }

    void listen() {
        manager->addOfflineModeStatusCallback(
            NetworkManager::OfflineModeStatusCallback::make<NetworkScene, &NetworkScene::onOffline>(this));
        manager->addNetworkReachabilityStatusCallback(
            NetworkManager::NetworkReachabilityStatusCallback::make<NetworkScene,
                                                                    &NetworkScene::onReachability>(this));
        manager->addNetworkErrorStatusCallback(
            NetworkManager::NetworkErrorStatusCallback::make<NetworkScene, &NetworkScene::onError>(this));
        manager->addNetworkActivityStatusCallback(
            NetworkManager::NetworkActivityStatusCallback::make<NetworkScene, &NetworkScene::onActivity>(
                this));
    }

    void submit(const std::string& name, const std::string& path, int priority) {
        boost::shared_ptr<SceneTask> task = boost::make_shared<SceneTask>(this, name, url(path), priority);
        tasks.push_back(task);
        // Short intervals: the demo runs on the real clock.
        manager->submit(task, boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(200, 3, false));
    }

    void submitBatch() {
        demo::say("submitting %d tasks: six tiles of priorities 0..3, a flaky one and a missing one",
                  batchSize);
        for (int i = 0; i < 6; ++i) {
            submit("tile" + std::to_string(i), "/tile/" + std::to_string(i), i % 4);
        }
        submit("flaky", "/flaky", 1);
        submit("missing", "/missing", 2);
    }

    void goOffline() {
        demo::say("the network drops away (pal::setReachability(0)); submitting one more task");
        pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
        submit("late", "/tile/99", 1);
    }

    void goOnline() {
        demo::say("the network returns (pal::setReachability(2)); the application switches offline mode off");
        pal::setReachability(KD_NETWORK_REACHABLE_VIA_MOBILE_ZVR);
        manager->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    }

    void summarise() {
        std::string codes;
        for (const auto& entry : finishCodes) {
            codes += " " + std::to_string(entry.first) + " x" + std::to_string(entry.second);
        }
        demo::say("summary: %zu tasks, %d attempts, %d retries, finish codes:%s", tasks.size(), attempts,
                  retries, codes.c_str());
        stopListening();
        finished();
    }

    void onOffline(NetworkManager::OfflineModeStatus status) {
        demo::say("  [offline mode] %s", status == NetworkManager::OfflineModeOn ? "on" : "off");
        if (status == NetworkManager::OfflineModeOn) {
            networkReturns.start(Util::Timer::OneShot, 300000000ll);
        }
    }
    void onReachability(NetworkManager::NetworkReachabilityStatus status) {
        demo::say("  [reachability] %d", static_cast<int>(status));
    }
    void onError(NetworkManager::NetworkErrorStatus status) {
        demo::say("  [network error] %s", status == NetworkManager::NetworkError ? "yes" : "no");
    }
    void onActivity(NetworkManager::NetworkActivityStatus status) {
        demo::say("  [activity] %s", status == NetworkManager::NetworkActive ? "active" : "idle");
    }

    static const int batchSize = 8;

    NetworkManager* manager;
    httplib::Server server;
    int port;
    std::thread serverThread;
    std::atomic<int> flakyCalls;
    std::vector<boost::shared_ptr<SceneTask> > tasks;
    std::map<int, int> finishCodes;
    int attempts = 0;
    int retries = 0;
    int done = 0;
    Util::Timer networkReturns;
    Done finished;
};

boost::shared_ptr<Network::HttpRequest> SceneTask::issueRequest() const {
    scene->countAttempt();
    demo::say("  %s (priority %d) starts: GET %s", name.c_str(), priority, url.c_str());
    return Network::HttpRequest::create(url.c_str(), "GET", 30000, false);
}

void SceneTask::onResponseRecieved(boost::shared_ptr<Network::HttpResponse> response) {
    demo::say("  %s got %d", name.c_str(), response->getStatusCode());
}

void SceneTask::onFinished(int code) {
    scene->onTaskFinished(this, code);
}

void SceneTask::onRetried() {
    scene->countRetry();
    demo::say("  %s retries", name.c_str());
}

DemoSceneRegistration<NetworkScene> registration("Network manager", 55);

}  // namespace
