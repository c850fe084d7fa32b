// The Wi-Fi pool collector with short periods against a loopback statistics
// server: chunks every second over the simulated radios, an upload every two
// seconds. The server undoes the scrambling, gunzips and parses each upload
// and prints one line about what it received.
#include <httplib.h>
#include <pal/Simulation.h>
#include <tinyxml.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "DemoScene.h"
#include "statistics/wifipool/NetworkCollector.h"
#include "statistics/wifipool/UploadConstants.h"
#include "statistics/wifipool/impl/NetworkCollectorRequest.h"
#include "util/Timer.h"
#include "util/XmlUtils.h"

namespace {

const int kUploadsShown = 2;

// Main thread; the server decodes on its own threads.
class StatisticsScene : public DemoScene {
public:
    StatisticsScene()
        : port(0),
          uploads(0),
          pollTimer(callback<void (*)()>::make<StatisticsScene, &StatisticsScene::poll>(this)) {}

    ~StatisticsScene() override {
        collector.reset();
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
        pal::scriptSignalStrength(pal::Answer::after(0), true, -71);
        pal::scriptCellInfo(pal::Answer::after(0), {true, 20961, 7713, "01", "250"});
        pal::scriptWifiScan(pal::Answer::after(0), {{"00:1A:2B:3C:4D:5E", "Caf\xC3\xA9 & Bar", -48},
                                                    {"00:1A:2B:3C:4D:5F", "home", -80}});
        collector.reset(new Statistics::NetworkCollector());
        collector->setBaseUrl(("http://127.0.0.1:" + std::to_string(port) + "/").c_str());
        collector->setModel("Demo \"Phone\" <A&B>");
        collector->setLang("en-US");
        collector->setScanTimeout(1);
        collector->setSendTimeout(2);
        demo::say("collector started: chunks every 1 s, uploads every 2 s to 127.0.0.1:%d", port);
        collector->start();
        pollTimer.start(Util::Timer::PeriodicAverage, 100 * 1000 * 1000LL);
    }

private:
    void startServer() {
        server.Post("/wifipool/2.x/", [this](const httplib::Request& request, httplib::Response& response) {
            demo::say("  server: %s", describe(request).c_str());
            ++uploads;
            response.set_content("ok", "text/plain");
        });
        port = server.bind_to_any_port("127.0.0.1");
        if (port > 0) {
            serverThread = std::thread([this] { server.listen_after_bind(); });
        }
    }

    // What one upload holds, decoded independently of the collector.
    static std::string describe(const httplib::Request& request) {
        if (!request.has_file("data")) {
            return "upload without a data field";
        }
        std::string data = request.get_file_value("data").content;
        std::vector<unsigned char> bytes(data.begin(), data.end());
        Statistics::NetworkCollectorRequest::packData(
            bytes.data(), bytes.size(), Statistics::kUploadScrambleKey, Statistics::kUploadScrambleKeyLength);
        TiXmlDocument document;
        if (!Util::XmlUtils::load(bytes, true, document)) {
            return "upload that does not decode";
        }
        const TiXmlElement* root = document.FirstChildElement("wifipool");
        int chunks = 0;
        int networks = 0;
        std::string types;
        for (const TiXmlElement* chunk = root != nullptr ? root->FirstChildElement("chunk") : nullptr;
             chunk != nullptr; chunk = chunk->NextSiblingElement("chunk")) {
            ++chunks;
            types +=
                std::string(types.empty() ? "" : ",") + Util::XmlUtils::getStringAttr(chunk, "type", "?");
            const TiXmlElement* bssids = chunk->FirstChildElement("bssids");
            for (const TiXmlElement* bssid = bssids != nullptr ? bssids->FirstChildElement("bssid") : nullptr;
                 bssid != nullptr; bssid = bssid->NextSiblingElement("bssid")) {
                ++networks;
            }
        }
        return std::to_string(data.size()) + " scrambled bytes, model \"" +
               (root != nullptr ? Util::XmlUtils::getStringAttr(root, "model", "") : "") + "\", " +
               std::to_string(chunks) + " chunks (" + types + "), " + std::to_string(networks) +
               " access points, lang " +
               (request.has_file("lang") ? request.get_file_value("lang").content : "?");
    }

    void poll() {
        if (uploads.load() < kUploadsShown) {
            return;
        }
        pollTimer.cancel();
        collector->stop();
        demo::say("collector stopped after %d uploads", kUploadsShown);
        finished();
    }

    Done finished;
    httplib::Server server;
    std::thread serverThread;
    int port;
    std::atomic<int> uploads;
    std::unique_ptr<Statistics::NetworkCollector> collector;
    Util::Timer pollTimer;
};

DemoSceneRegistration<StatisticsScene> registration("Statistics", 59);

}  // namespace
