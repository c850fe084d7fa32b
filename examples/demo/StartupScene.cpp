// The startup cycle against a loopback startup server: the first start has no
// client identifier, so two requests go out back to back (the second with the
// identifier the first answer gave); a simulated resume then sends one more.
// Every request the server sees and the host table that comes back are
// printed.
#include <httplib.h>
#include <pal/Simulation.h>
#include <tinyxml.h>

#include <atomic>
#include <boost/make_shared.hpp>
#include <string>
#include <thread>

#include "DemoScene.h"
#include "startup/StartupController.h"
#include "startup/StartupData.h"
#include "startup/StartupListener.h"
#include "util/Timer.h"

namespace {

using Startup::StartupData;

class StartupScene;

// Hears the complete answers for the scene. Main thread.
class ReadyListener : public Startup::StartupListener {
public:
    explicit ReadyListener(StartupScene* scene) : scene(scene) {}
    void parseStartup(const TiXmlDocument& document) override;
    void onStartupReady() override;

private:
    StartupScene* scene;
};

// Main thread; the server answers on its own threads.
class StartupScene : public DemoScene {
public:
    StartupScene()
        : port(0),
          requests(0),
          readyCount(0),
          resumeTimer(callback<void (*)()>::make<StartupScene, &StartupScene::simulateResume>(this)) {}

    ~StartupScene() override {
        if (serverThread.joinable()) {
            server.stop();
            serverThread.join();
        }
    }

    void run(Done done) override {
        finished = done;
        startServer();
        if (port <= 0) {
            demo::say("could not bind a loopback port; skipping");
            finished();
            return;
        }
        demo::say("startup server listening on 127.0.0.1:%d", port);
        StartupData::getInstance()->setHost(StartupData::HOST_STARTUP, url("/"));
        listener = boost::make_shared<ReadyListener>(this);
        demo::say("creating the startup controller while the application runs: the first cycle starts");
        Startup::StartupController* controller = Startup::StartupController::getInstance();
        controller->updateClientStartupParams({{"client", "demo"}});
        controller->addListener(listener);
    }

    void onParsed(const std::string& uuid) {
        demo::say("  answer parsed by the listeners (uuid in it: %s)", uuid.c_str());
    }

    void onReady() {
        ++readyCount;
        const StartupData* data = StartupData::getInstance();
        demo::say("startup ready #%d after %d requests; uuid %s, lang %s", readyCount, requests.load(),
                  data->uuid.c_str(), data->lang.c_str());
        for (const char* type : {StartupData::HOST_DEFAULT, StartupData::HOST_TILES, StartupData::HOST_SEARCH,
                                 StartupData::HOST_ROUTER}) {
            demo::say("  host %-8s -> %s", type, data->getHost(type).c_str());
        }
        if (readyCount == 1) {
            resumeTimer.start(Util::Timer::OneShot, 0);
        } else {
            demo::say("summary: %d startup requests for %d ready answers", requests.load(), readyCount);
            finished();
        }
    }

private:
    std::string url(const std::string& path) const {
        return "http://127.0.0.1:" + std::to_string(port) + path;
    }

    void startServer() {
        server.Get("/startup", [this](const httplib::Request& request, httplib::Response& response) {
            ++requests;
            const std::string uuid = request.get_param_value("uuid");
            demo::say("  server: startup request #%d, uuid [%s], model [%s], client [%s]", requests.load(),
                      uuid.c_str(), request.get_param_value("model").c_str(),
                      request.get_param_value("client").c_str());
            response.set_content(answer(), "text/xml");
        });
        port = server.bind_to_any_port("127.0.0.1");
        if (port > 0) {
            serverThread = std::thread([this] { server.listen_after_bind(); });
        }
    }

    std::string answer() const {
        const std::string self = url("/");
        return "<startup><uuid>demo-client-1</uuid><query_hosts>"
               "<host type=\"default\">" +
               self +
               "</host>"
               "<host type=\"tiles\">" +
               url("/tiles") +
               "</host>"
               "<host type=\"search\">" +
               url("/search") +
               "</host>"
               "</query_hosts><features><voice><asr>enabled</asr></voice>"
               "<network_scanner enabled=\"1\" scan_timeout=\"30\" "
               "send_timeout=\"120\"/></features></startup>";
    }

    void simulateResume() {
        demo::say("simulating the platform sending the app to the background and back");
        pal::postAppPaused();
        pal::postAppResumed();
    }

    Done finished;
    httplib::Server server;
    std::thread serverThread;
    int port;
    std::atomic<int> requests;
    int readyCount;
    boost::shared_ptr<ReadyListener> listener;
    Util::Timer resumeTimer;
};

void ReadyListener::parseStartup(const TiXmlDocument& document) {
    const TiXmlElement* root = document.FirstChildElement("startup");
    const TiXmlElement* uuid = root != nullptr ? root->FirstChildElement("uuid") : nullptr;
    scene->onParsed(uuid != nullptr && uuid->GetText() != nullptr ? uuid->GetText() : "");
}

void ReadyListener::onStartupReady() {
    scene->onReady();
}

DemoSceneRegistration<StartupScene> registration("Startup", 58);

}  // namespace
