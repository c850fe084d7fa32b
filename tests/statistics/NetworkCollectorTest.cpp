// The collector's timers, triggers and uploads, decoded by an independent
// implementation.
#include <boost/make_shared.hpp>
#include <cstdio>
#include <fstream>
#include <memory>
#include <string>

#include "network/HttpRequest.h"
#include "network/NetworkManager.h"
#include "network/NetworkTaskBasicRetryPolicy.h"
#include "network/impl/NetworkManagerImpl.h"
#include "statistics/wifipool/NetworkCollector.h"
#include "statistics/wifipool/UploadConstants.h"
#include "support/PalTest.h"
#include "support/TestHttpServer.h"

namespace {

using Network::NetworkManager;
using Statistics::NetworkCollector;

const char* const kDeclaration = "<?xml version=\"1.0\" encoding=\"windows-1251\" ?>\n";

std::string chunk(const std::string& type, const std::string& time, const std::string& connection = "wifi") {
    return "<chunk type=\"" + type + "\" time=\"01012026:" + time + "\" connection=\"" + connection +
           "\"><bssids ><bssid name=\"bmV0\" channel=\"0\" sigstr=\"-50\" age=\"0\">001122334455</bssid>"
           "</bssids></chunk>";
}

std::string document(const std::string& chunks, const std::string& model = "") {
    return std::string(kDeclaration) +
           "<wifipool uuid=\"\" app_version=\"\" app_platform=\"\" clid=\"0\" manufacter=\"\" model=\"" +
           model + "\">" + chunks + "</wifipool>";
}

// A measured download, as the map's tile requests are.
class TileTask : public Network::NetworkTask {
public:
    TileTask(const std::string& url, int* finished) : url(url), finished(finished) {}

    bool isReadyToPerform() const override { return true; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override {
        return Network::HttpRequest::create(url.c_str(), "GET", 10000, false);
    }
    void onBytesReceived(const std::vector<unsigned char>&) override {}
    void onFinished(int) override { ++*finished; }

private:
    std::string url;
    int* finished;
};

// What the independent decoder read from one upload.
struct Decoded {
    bool ok = false;
    std::string text;
    std::string model;
    std::string types;
};

class NetworkCollectorTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        pal::postAppResumed();
        pump();
        server.reset(new TestHttpServer());
        server->on("/wifipool/2.x/", okReply());
        server->on("/tile", okReply());
        pal::scriptSignalStrength(pal::Answer::after(0), false, 0);
        pal::scriptWifiScan(pal::Answer::after(0), {{"00:11:22:33:44:55", "net", -50}});
        collector.reset(new NetworkCollector());
        collector->setBaseUrl(server->url("/").c_str());
        collector->setLang("ru-RU");
    }

    void TearDown() override {
        collector.reset();
        PalTest::TearDown();
        server.reset();
    }

    // Moves the clock second by second, letting the radios answer.
    void runSeconds(int seconds) {
        for (int second = 0; second < seconds; ++second) {
            advanceMs(1000);
            for (int step = 0; step < 3; ++step) {
                pump();
            }
        }
    }

    // Downloads tiles from the server and waits until the speed collector
    // has heard of every request sent: the engine reports the sending before
    // the task's end.
    void downloadTiles(int count) {
        int finished = 0;
        std::vector<boost::shared_ptr<TileTask> > tasks;
        for (int i = 0; i < count; ++i) {
            tasks.push_back(boost::make_shared<TileTask>(server->url("/tile"), &finished));
            NetworkManager::getInstance()->submit(
                tasks.back(), boost::make_shared<Network::NetworkTaskBasicRetryPolicy>(1000, 1, false));
        }
        while (finished < count) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        pump();
    }

    int chunksWithRequests(int count) const {
        return countLogLines(
            "WifiPoolChunk::addNetworkSpeedInfoToChunk()[requests.size(): " + std::to_string(count) + "]");
    }

    int chunksMade() const {
        return countLogLines("WifiPoolChunk::addNetworkSpeedInfoToChunk()[requests.size()");
    }

    // Waits until the exchanges in flight have ended, on the collector's side
    // too: the server has an upload before its answer reaches the collector.
    void awaitIdle() {
        while (NetworkManager::getInstance()->getNetworkActivityStatus() == NetworkManager::NetworkActive) {
            kdWaitEvent(static_cast<KDust>(-1));
        }
        pump();
    }

    // Waits for the uploads in flight; true when the server had count of them.
    bool awaitUploads(std::size_t count) {
        awaitIdle();
        return server->requestCount() >= count;
    }

    static TestHttpServer::Reply okReply() {
        TestHttpServer::Reply ok;
        ok.body = "ok";
        return ok;
    }

    // Answers once released, and then breaks off the answer.
    static TestHttpServer::Reply dropAfterStall() {
        TestHttpServer::Reply reply;
        reply.mode = TestHttpServer::Reply::DropAfterStall;
        reply.body = std::string(64, 'x');
        return reply;
    }

    // Tasks the network manager holds, queued or running; the location
    // manager's positioning request, waiting for a startup answer, among them.
    static int tasksHeld() {
        Network::NetworkManagerImpl* manager =
            static_cast<Network::NetworkManagerImpl*>(NetworkManager::getInstance());
        return manager->getUnreadyCount() + manager->getTaskCount();
    }

    // The upload on its way to a server scripted with dropAfterStall() fails
    // while the platform reports no network, whichever comes first: the
    // request reaching the server or the release.
    void cutOffTheUploadInFlight() {
        pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
        pump();
        server->releaseStalls();
        awaitIdle();
    }

    Decoded decode(const TestHttpServer::Received& upload) {
        Decoded decoded;
        const TestHttpServer::Part* data = upload.part("data");
        if (data == nullptr) {
            return decoded;
        }
        std::string path = hostPath("/tmp-upload");
        std::ofstream(path, std::ios::binary) << data->content;
        std::string command =
            std::string("python3 ") + UPLOAD_DECODER + " " + path + " " + Statistics::kUploadScrambleKey;
        FILE* pipe = popen(command.c_str(), "r");
        if (pipe == nullptr) {
            return decoded;
        }
        std::string output;
        char buffer[4096];
        std::size_t got;
        while ((got = fread(buffer, 1, sizeof(buffer), pipe)) > 0) {
            output.append(buffer, got);
        }
        decoded.ok = pclose(pipe) == 0;
        std::size_t separator = output.rfind("\n--\n");
        if (separator == std::string::npos) {
            decoded.ok = false;
            return decoded;
        }
        decoded.text = output.substr(0, separator);
        std::string rest = output.substr(separator + 4);
        std::size_t line = rest.find('\n');
        decoded.model = rest.substr(0, line);
        decoded.types = rest.substr(line + 1, rest.size() - line - 2);
        return decoded;
    }

    std::unique_ptr<TestHttpServer> server;
    std::unique_ptr<NetworkCollector> collector;
};

TEST_F(NetworkCollectorTest, UploadsEvery120SecondsTheChunksFinishedSince) {
    collector->start();
    runSeconds(119);
    EXPECT_EQ(3, chunksMade());
    EXPECT_EQ(0u, server->requestCount());
    runSeconds(1);
    ASSERT_TRUE(awaitUploads(1));

    TestHttpServer::Received upload = server->received()[0];
    EXPECT_EQ("POST", upload.method);
    EXPECT_EQ(
        "/wifipool/2.x/?uuid=&app_version=&app_platform=&clid=0&manufacturer=&model=&lang=ru-RU"
        "&sendtime=01012026:000200&gzip=1",
        upload.target);
    ASSERT_NE(nullptr, upload.part("lang"));
    EXPECT_EQ("ru-RU", upload.part("lang")->content);
    Decoded decoded = decode(upload);
    ASSERT_TRUE(decoded.ok);
    EXPECT_EQ(document(chunk("normal", "000030") + chunk("normal", "000100") + chunk("normal", "000130")),
              decoded.text);

    // The chunk started with the upload's tick goes out with the next one.
    runSeconds(120);
    ASSERT_TRUE(awaitUploads(2));
    decoded = decode(server->received()[1]);
    ASSERT_TRUE(decoded.ok);
    EXPECT_EQ("normal normal normal normal", decoded.types);
}

TEST_F(NetworkCollectorTest, EmptyRootSendsNothing) {
    collector->setScanTimeout(1000);
    collector->start();
    runSeconds(240);
    EXPECT_EQ(2, countLogLines("NetworkCollector::onSendTimerFired()[empty]"));
    EXPECT_EQ(0u, server->requestCount());
}

TEST_F(NetworkCollectorTest, ReachabilityChangesAddChunksAtOnceAndValuesSurviveTheParser) {
    const std::string model = "Phone \"X\" <5> & \xD0\x98\xD0\xB2 \xC3\x9C";
    collector->setModel(model.c_str());
    collector->setApiKey("KEY-1");
    collector->start();
    runSeconds(5);
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    pump();
    EXPECT_EQ(1, chunksMade());
    runSeconds(1);
    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    pump();
    EXPECT_EQ(2, chunksMade());
    runSeconds(114);
    ASSERT_TRUE(awaitUploads(1));

    TestHttpServer::Received upload = server->received()[0];
    EXPECT_NE(std::string::npos, upload.target.find("&api_key=KEY-1&lang=ru-RU&"));
    Decoded decoded = decode(upload);
    ASSERT_TRUE(decoded.ok);
    EXPECT_EQ(model, decoded.model);
    EXPECT_EQ("disconnected connected normal normal normal", decoded.types);
    EXPECT_EQ(document(chunk("disconnected", "000005", "none") + chunk("connected", "000006") +
                           chunk("normal", "000030") + chunk("normal", "000100") + chunk("normal", "000130"),
                       "Phone &quot;X&quot; &lt;5&gt; &amp; &#x418;&#x432; &#xDC;"),
              decoded.text);
}

TEST_F(NetworkCollectorTest, OnlyAChangedPeriodRestartsTheTimers) {
    collector->start();
    runSeconds(20);
    collector->setScanTimeout(30);
    collector->setScanTimeout(0);
    EXPECT_TRUE(hasLogLine("NetworkCollector::setTimeout()[scan timeout 0 refused]"));
    runSeconds(10);
    EXPECT_EQ(1, chunksMade());

    runSeconds(5);
    collector->setScanTimeout(40);
    runSeconds(39);
    EXPECT_EQ(1, chunksMade());
    runSeconds(1);
    EXPECT_EQ(2, chunksMade());
}

TEST_F(NetworkCollectorTest, PauseHoldsTheTimersAndResumeGivesFullPeriods) {
    collector->start();
    runSeconds(20);
    collector->onPaused();
    runSeconds(200);
    EXPECT_EQ(0, chunksMade());
    EXPECT_EQ(0u, server->requestCount());
    collector->onResumed();
    runSeconds(29);
    EXPECT_EQ(0, chunksMade());
    runSeconds(1);
    EXPECT_EQ(1, chunksMade());
}

TEST_F(NetworkCollectorTest, StopKeepsFinishedChunksForTheNextStart) {
    collector->start();
    runSeconds(30);
    collector->stop();
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    runSeconds(200);
    EXPECT_EQ(1, chunksMade());
    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    runSeconds(1);
    collector->start();
    runSeconds(120);
    ASSERT_TRUE(awaitUploads(1));
    Decoded decoded = decode(server->received()[0]);
    ASSERT_TRUE(decoded.ok);
    EXPECT_EQ("normal normal normal normal", decoded.types);
}

TEST_F(NetworkCollectorTest, MeasuresRequestsOnlyWhileStartedAndNotPaused) {
    downloadTiles(300);
    EXPECT_EQ(0, collector->getNetworkSpeedCollector()->getRecordCount());
    collector->start();
    runSeconds(30);
    EXPECT_EQ(1, chunksWithRequests(0));

    downloadTiles(3);
    runSeconds(30);
    EXPECT_EQ(1, chunksWithRequests(3));

    collector->onPaused();
    downloadTiles(3);
    EXPECT_EQ(0, collector->getNetworkSpeedCollector()->getRecordCount());
    collector->onResumed();
    runSeconds(30);
    EXPECT_EQ(2, chunksWithRequests(0));

    collector->stop();
    downloadTiles(3);
    EXPECT_EQ(0, collector->getNetworkSpeedCollector()->getRecordCount());
}

// The network drops while an upload is on its way: the upload finishes with
// the offline code and the network manager queues it until the application
// ends offline mode.
TEST_F(NetworkCollectorTest, UploadCutOffByTheNetworkWaitsAloneAndGoesOutOnceWhenOfflineModeEnds) {
    server->on("/wifipool/2.x/", dropAfterStall());
    collector->start();
    runSeconds(119);
    const int othersHeld = tasksHeld();
    runSeconds(1);
    cutOffTheUploadInFlight();
    ASSERT_EQ(NetworkManager::OfflineModeOn, NetworkManager::getInstance()->getOfflineModeStatus());

    // The network is back, offline mode not yet: later periods add no body.
    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    runSeconds(240);
    EXPECT_EQ(2, countLogLines("NetworkCollector::onSendTimerFired()[upload pending]"));
    EXPECT_EQ(othersHeld + 1, tasksHeld());

    server->on("/wifipool/2.x/", okReply());
    NetworkManager::getInstance()->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    ASSERT_TRUE(awaitUploads(2));
    runSeconds(120);
    ASSERT_TRUE(awaitUploads(3));

    std::vector<TestHttpServer::Received> uploads = server->received();
    ASSERT_EQ(3u, uploads.size());
    EXPECT_EQ(uploads[0].part("data")->content, uploads[1].part("data")->content);
    EXPECT_EQ("normal normal normal", decode(uploads[1]).types);
    EXPECT_EQ(
        "normal disconnected error connected normal normal normal normal normal normal normal normal "
        "normal normal normal",
        decode(uploads[2]).types);
}

// ... and belongs to its collector meanwhile: stop() withdraws it, and once
// the collector is gone nothing of it runs.
TEST_F(NetworkCollectorTest, UploadCutOffByTheNetworkIsWithdrawnByStopAndNeverRunsAfterTheCollectorWentAway) {
    server->on("/wifipool/2.x/", dropAfterStall());
    collector->start();
    runSeconds(119);
    const int othersHeld = tasksHeld();
    runSeconds(1);
    cutOffTheUploadInFlight();
    ASSERT_EQ(NetworkManager::OfflineModeOn, NetworkManager::getInstance()->getOfflineModeStatus());

    collector->stop();
    collector.reset();
    server->on("/wifipool/2.x/", okReply());
    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    NetworkManager::getInstance()->changeOfflineModeStatus(NetworkManager::OfflineModeOff);
    runSeconds(5);

    EXPECT_EQ(othersHeld, tasksHeld());
    EXPECT_EQ(1u, server->requestCount());
}

TEST_F(NetworkCollectorTest, UploadAwaitingItsAnswerHoldsBackTheNextOne) {
    TestHttpServer::Reply stall = okReply();
    stall.mode = TestHttpServer::Reply::StallBeforeReply;
    server->on("/wifipool/2.x/", stall);
    collector->start();
    runSeconds(240);
    EXPECT_TRUE(hasLogLine("NetworkCollector::onSendTimerFired()[upload pending]"));
    server->on("/wifipool/2.x/", okReply());
    server->releaseStalls();
    awaitIdle();
    runSeconds(120);
    ASSERT_TRUE(awaitUploads(2));

    EXPECT_EQ(2u, server->requestCount());
    EXPECT_EQ("normal normal normal", decode(server->received()[0]).types);
    EXPECT_EQ("normal normal normal normal normal normal normal normal", decode(server->received()[1]).types);
}

// Before, every send period of the hour queued one more body behind the
// first upload's offline failure, and offline mode stayed on after the
// network returned, so none was sent.
TEST_F(NetworkCollectorTest, AnHourOfflineQueuesNoBodyAndEveryChunkArrivesOnceWhenTheNetworkReturns) {
    collector->start();
    runSeconds(100);
    const int othersHeld = tasksHeld();
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    pump();
    runSeconds(3600);
    EXPECT_EQ(NetworkManager::OfflineModeOff, NetworkManager::getInstance()->getOfflineModeStatus());
    EXPECT_LE(tasksHeld(), othersHeld + 1);
    EXPECT_EQ(30, countLogLines("NetworkCollector::onSendTimerFired()[not reachable]"));

    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    pump();
    runSeconds(20);
    ASSERT_TRUE(awaitUploads(1));
    runSeconds(120);
    ASSERT_TRUE(awaitUploads(2));

    EXPECT_EQ(2u, server->requestCount());
    std::string expected = "normal normal normal disconnected";
    for (int i = 0; i < 120; ++i) {
        expected += " normal";
    }
    EXPECT_EQ(expected + " connected", decode(server->received()[0]).types);
    EXPECT_EQ("normal normal normal normal", decode(server->received()[1]).types);
    // All but the one started with the last upload's tick.
    EXPECT_EQ(125 + 4 + 1, chunksMade());
}

}  // namespace
