#include "statistics/wifipool/NetworkCollector.h"

#include <boost/make_shared.hpp>

#include "location/LocationManager.h"
#include "statistics/wifipool/impl/NetworkCollectorRequest.h"
#include "statistics/wifipool/impl/WifiPoolChunk.h"
#include "util/DateTime.h"
#include "util/Logger.h"
#include "util/UrlBuilder.h"

namespace Statistics {

namespace {

const long long kDefaultScanTimeout = 30;
const long long kDefaultSendTimeout = 120;
const long long kNsPerSecond = 1000000000LL;

const char* const kXmlDeclaration = "<?xml version=\"1.0\" encoding=\"windows-1251\" ?>\n";

std::string text(const char* value) {
    return value != nullptr ? value : "";
}

}  // namespace

NetworkCollector::NetworkCollector()
    : thread(kdThreadSelf()),
      started(false),
      paused(false),
      root(boost::make_shared<WifiPoolTag>()),
      scanTimerContext{this},
      sendTimerContext{this},
      scanTimer(nullptr),
      sendTimer(nullptr),
      scanTimeout(kDefaultScanTimeout),
      sendTimeout(kDefaultSendTimeout),
      hasLocation(false),
      speedCollector(NetworkSpeedCollectorImpl::create()) {
    kdInstallCallback(&NetworkCollector::onScanTimerFiredWrapper, KD_EVENT_TIMER, &scanTimerContext);
    kdInstallCallback(&NetworkCollector::onSendTimerFiredWrapper, KD_EVENT_TIMER, &sendTimerContext);
    updateRecording();
    Network::NetworkManager::getInstance()->setNetworkSpeedCollector(
        boost::weak_ptr<Network::NetworkSpeedCollector>(speedCollector));
}

NetworkCollector::~NetworkCollector() {
    stop();
    cancelTimers();
    kdInstallCallback(nullptr, KD_EVENT_TIMER, &scanTimerContext);
    kdInstallCallback(nullptr, KD_EVENT_TIMER, &sendTimerContext);
}

void NetworkCollector::start() {
    KD_ASSERT(thread == kdThreadSelf());
    Logger::log(Logger::Debug, "NetworkCollector::start()");
    if (started) {
        return;
    }
    Location::LocationManager::getInstance()->addLocationListener(this);
    Network::NetworkManager* manager = Network::NetworkManager::getInstance();
    manager->addNetworkReachabilityStatusCallback(reachabilityCallback());
    manager->addNetworkErrorStatusCallback(errorCallback());
    started = true;
    updateRecording();
    startTimers();
}

void NetworkCollector::stop() {
    KD_ASSERT(thread == kdThreadSelf());
    if (!started) {
        return;
    }
    started = false;
    updateRecording();
    cancelTimers();
    cancelAllRequests();
    Network::NetworkManager* manager = Network::NetworkManager::getInstance();
    manager->removeNetworkReachabilityStatusCallback(reachabilityCallback());
    manager->removeNetworkErrorStatusCallback(errorCallback());
    // Gone already when the singletons are torn down before us.
    Location::LocationManager* locationManager = Location::LocationManager::getExistingInstance();
    if (locationManager != nullptr) {
        locationManager->removeLocationListener(this);
    }
}

void NetworkCollector::setUuid(const char* value) {
    root->setUuid(text(value));
}

void NetworkCollector::setAppVersion(const char* value) {
    root->setAppVersion(text(value));
}

void NetworkCollector::setAppPlatform(const char* value) {
    root->setAppPlatform(text(value));
}

void NetworkCollector::setManufacter(const char* value) {
    root->setManufacter(text(value));
}

void NetworkCollector::setModel(const char* value) {
    root->setModel(text(value));
}

void NetworkCollector::setClid(const char* value) {
    root->setClid(text(value));
}

void NetworkCollector::setApiKey(const char* value) {
    if (value != nullptr) {
        apiKey = value;
    }
}

void NetworkCollector::setLang(const char* value) {
    lang = text(value);
}

void NetworkCollector::setBaseUrl(const char* value) {
    baseUrl = text(value);
    KD_ASSERT(!baseUrl.empty());
}

void NetworkCollector::setScanTimeout(int seconds) {
    if (setTimeout(scanTimeout, seconds, "scan") && started) {
        startTimers();
    }
}

void NetworkCollector::setSendTimeout(int seconds) {
    if (setTimeout(sendTimeout, seconds, "send") && started) {
        startTimers();
    }
}

bool NetworkCollector::setTimeout(long long& timeout, int seconds, const char* name) {
    if (seconds == timeout) {
        return false;
    }
    // A period of zero would make the timer fire without pause; the value may
    // come from a server's answer.
    if (seconds < 1) {
        Logger::log(Logger::Warning, "NetworkCollector::setTimeout()[%s timeout %d refused]", name, seconds);
        return false;
    }
    timeout = seconds;
    return true;
}

void NetworkCollector::onPaused() {
    paused = true;
    updateRecording();
    cancelTimers();
}

void NetworkCollector::onResumed() {
    paused = false;
    updateRecording();
    if (started) {
        startTimers();
    }
}

void NetworkCollector::onLocationChanged(Location::LocationManager* manager,
                                         const Location::Location& location) {
    (void)manager;
    lastLocation = location;
    hasLocation = true;
}

void NetworkCollector::onScanTimerFiredWrapper(const KDEvent* event) {
    static_cast<TimerContext*>(event->userptr)->collector->onScanTimerFired();
}

void NetworkCollector::onSendTimerFiredWrapper(const KDEvent* event) {
    static_cast<TimerContext*>(event->userptr)->collector->onSendTimerFired();
}

// Measurements made while no chunk can take them would only pile up, and
// while the feature is off they are not ours to send.
void NetworkCollector::updateRecording() {
    speedCollector->setRecording(started && !paused);
}

void NetworkCollector::startTimers() {
    cancelTimers();
    scanTimer = kdSetTimer(scanTimeout * kNsPerSecond, KD_TIMER_PERIODIC_AVERAGE, &scanTimerContext);
    sendTimer = kdSetTimer(sendTimeout * kNsPerSecond, KD_TIMER_PERIODIC_AVERAGE, &sendTimerContext);
}

void NetworkCollector::cancelTimers() {
    if (scanTimer != nullptr) {
        kdCancelTimer(scanTimer);
        scanTimer = nullptr;
    }
    if (sendTimer != nullptr) {
        kdCancelTimer(sendTimer);
        sendTimer = nullptr;
    }
}

void NetworkCollector::cancelAllRequests() {
    Network::NetworkManager* manager = Network::NetworkManager::getInstance();
    // A copy: a cancelled request may report its end and leave the set.
    boost::unordered_set<boost::shared_ptr<NetworkCollectorRequest> > requests = networkRequests;
    for (const boost::shared_ptr<NetworkCollectorRequest>& request : requests) {
        manager->cancel(request);
    }
    networkRequests.clear();
    requestedChunks.clear();
}

void NetworkCollector::onScanTimerFired() {
    requestChunkData("normal");
}

void NetworkCollector::onNetworkReachabilityChanged(
    Network::NetworkManager::NetworkReachabilityStatus status) {
    KD_ASSERT(kdThreadSelf() == thread);
    requestChunkData(status == Network::NetworkManager::NetworkNotReachable ? "disconnected" : "connected");
}

void NetworkCollector::onNetworkErrorStatusChanged(Network::NetworkManager::NetworkErrorStatus status) {
    KD_ASSERT(kdThreadSelf() == thread);
    if (status == Network::NetworkManager::NetworkError) {
        requestChunkData("error");
    }
}

void NetworkCollector::requestChunkData(const char* type) {
    std::vector<boost::shared_ptr<RequestInfo> > requests;
    speedCollector->pop(requests);
    boost::shared_ptr<WifiPoolChunk> chunk;
    if (hasLocation) {
        // A fix goes into one chunk only.
        hasLocation = false;
        chunk = boost::make_shared<WifiPoolChunk>(type, requests, lastLocation);
    } else {
        chunk = boost::make_shared<WifiPoolChunk>(type, requests);
    }
    requestedChunks.insert(chunk);
    chunk->collect(
        WifiPoolChunk::ChunkCollectedCallback::make<NetworkCollector, &NetworkCollector::onChunkCollected>(
            this));
}

void NetworkCollector::onChunkCollected(boost::shared_ptr<WifiPoolChunk> chunk) {
    KD_ASSERT(kdThreadSelf() == thread);
    boost::unordered_set<boost::shared_ptr<WifiPoolChunk> >::iterator it = requestedChunks.find(chunk);
    KD_ASSERT(it != requestedChunks.end());
    if (it == requestedChunks.end()) {
        return;
    }
    requestedChunks.erase(it);
    root->addChild(chunk->node());
}

void NetworkCollector::onSendTimerFired() {
    Logger::log(Logger::Debug, "NetworkCollector::onSendTimerFired()[begin]");
    if (root->getChildren().empty()) {
        Logger::log(Logger::Debug, "NetworkCollector::onSendTimerFired()[empty]");
        return;
    }
    // One upload at a time: while one waits for its answer, or in the network
    // manager's offline queue, the chunks made since join the next body.
    if (!networkRequests.empty()) {
        Logger::log(Logger::Debug, "NetworkCollector::onSendTimerFired()[upload pending]");
        return;
    }
    // Started now, the upload would fail at once and switch the network
    // manager into offline mode, which only the application ends; the chunks
    // rather wait here for a period with a network.
    if (Network::NetworkManager::getInstance()->getNetworkReachabilityStatus() ==
        Network::NetworkManager::NetworkNotReachable) {
        Logger::log(Logger::Debug, "NetworkCollector::onSendTimerFired()[not reachable]");
        return;
    }
    UrlBuilder builder(baseUrl);
    builder.setAdditionPath("wifipool/2.x/");
    root->appendParams(builder);
    if (!apiKey.empty()) {
        builder.addStringParam("api_key", apiKey);
    }
    builder.addStringParam("lang", lang);
    builder.addStringParam("sendtime", Util::formatDateTime(kdTime(nullptr), Util::DATE_TIME_COMPACT, false));
    builder.addIntParam("gzip", 1);

    std::string body = kXmlDeclaration;
    root->appendContent(body);

    boost::shared_ptr<NetworkCollectorRequest> request = boost::make_shared<NetworkCollectorRequest>(this);
    request->setLang(lang.c_str());
    request->submit(builder.buildString(), body);
    // The chunks now live in the upload alone: a failed one loses them, one
    // that finds the network offline waits in the network manager's queue.
    root->removeChildren();
}

Network::NetworkManager::NetworkReachabilityStatusCallback NetworkCollector::reachabilityCallback() {
    return Network::NetworkManager::NetworkReachabilityStatusCallback::make<
        NetworkCollector, &NetworkCollector::onNetworkReachabilityChanged>(this);
}

Network::NetworkManager::NetworkErrorStatusCallback NetworkCollector::errorCallback() {
    return Network::NetworkManager::NetworkErrorStatusCallback::make<
        NetworkCollector, &NetworkCollector::onNetworkErrorStatusChanged>(this);
}

}  // namespace Statistics
