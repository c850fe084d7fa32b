#include "statistics/wifipool/impl/WifiPoolChunk.h"

#include <boost/make_shared.hpp>

#include "network/NetworkManager.h"
#include "statistics/wifipool/BssidTag.h"
#include "statistics/wifipool/BssidsTag.h"
#include "statistics/wifipool/CellInfoTag.h"
#include "statistics/wifipool/CellInfosTag.h"
#include "statistics/wifipool/DownloadedTag.h"
#include "statistics/wifipool/GpsDataTag.h"
#include "statistics/wifipool/RequestInfoTag.h"
#include "statistics/wifipool/RequestTimingsTag.h"
#include "statistics/wifipool/UploadedTag.h"
#include "util/Logger.h"

namespace Statistics {

namespace {

// Fixes less accurate than this say too little about where the networks are.
const float kMaxGpsAccuracy = 70.0f;

}  // namespace

WifiPoolChunk::WifiPoolChunk(const char* type, const std::vector<boost::shared_ptr<RequestInfo> >& requests)
    : signalStrength(0) {
    createRequests();
    initChunk(type, requests);
}

WifiPoolChunk::WifiPoolChunk(const char* type, const std::vector<boost::shared_ptr<RequestInfo> >& requests,
                             const Location::Location& location)
    : signalStrength(0) {
    createRequests();
    initChunk(type, requests);
    addGpsDataToChunk(location);
}

void WifiPoolChunk::createRequests() {
    signalStrengthRequest = boost::make_shared<Wireless::TelephonySignalStrengthRequest>();
    networkInfoRequest = boost::make_shared<Wireless::TelephonyNetworkInfoRequest>();
    wifiScanRequest = boost::make_shared<Wireless::WifiScanRequest>();
}

void WifiPoolChunk::initChunk(const char* type,
                              const std::vector<boost::shared_ptr<RequestInfo> >& requests) {
    chunk = boost::make_shared<ChunkTag>();
    chunk->setType(type != nullptr ? type : "");
    setupChunkConnection();
    addNetworkSpeedInfoToChunk(requests);
}

void WifiPoolChunk::setupChunkConnection() {
    switch (Network::NetworkManager::getInstance()->getNetworkReachabilityStatus()) {
        case Network::NetworkManager::NetworkNotReachable:
            chunk->setConnection("none");
            break;
        case Network::NetworkManager::NetworkReachableViaWifi:
            chunk->setConnection("wifi");
            break;
        case Network::NetworkManager::NetworkReachableViaMobile:
            chunk->setConnection("gprs");
            break;
        default:
            KD_ASSERT(false);
    }
}

void WifiPoolChunk::addNetworkSpeedInfoToChunk(const std::vector<boost::shared_ptr<RequestInfo> >& requests) {
    Logger::log(Logger::Debug, "WifiPoolChunk::addNetworkSpeedInfoToChunk()[requests.size(): %d]",
                static_cast<int>(requests.size()));
    boost::shared_ptr<RequestTimingsTag> timings = boost::make_shared<RequestTimingsTag>();
    for (const boost::shared_ptr<RequestInfo>& request : requests) {
        boost::shared_ptr<RequestInfoTag> requestTag = boost::make_shared<RequestInfoTag>(request);
        requestTag->addChild(boost::make_shared<UploadedTag>(request));
        for (const boost::shared_ptr<ChunkInfo>& data : request->chunks) {
            requestTag->addChild(boost::make_shared<DownloadedTag>(request, data));
        }
        timings->addChild(requestTag);
    }
    if (!timings->getChildren().empty()) {
        Logger::log(Logger::Debug, "WifiPoolChunk::addNetworkSpeedInfoToChunk()[not empty]");
        chunk->addChild(timings);
    }
}

void WifiPoolChunk::addGpsDataToChunk(const Location::Location& location) {
    // A fix without accuracy (-1) passes.
    if (location.accuracy > kMaxGpsAccuracy) {
        return;
    }
    boost::shared_ptr<GpsDataTag> gps = boost::make_shared<GpsDataTag>(location.latitude, location.longitude);
    gps->setSpeed(location.speed);
    gps->setCourse(location.bearing);
    chunk->addChild(gps);
}

void WifiPoolChunk::collect(ChunkCollectedCallback finish) {
    KD_ASSERT(finishCallback == ChunkCollectedCallback());
    if (finishCallback != ChunkCollectedCallback()) {
        return;
    }
    finishCallback = finish;
    signalStrengthRequest->start(Wireless::TelephonySignalStrengthRequest::Callback::make<
                                 WifiPoolChunk, &WifiPoolChunk::onTelephonySignalStrengthCollected>(this));
}

void WifiPoolChunk::onTelephonySignalStrengthCollected(bool ok, int strength) {
    if (ok) {
        signalStrength = strength;
        networkInfoRequest->start(Wireless::TelephonyNetworkInfoRequest::Callback::make<
                                  WifiPoolChunk, &WifiPoolChunk::onNetworkInfoCollected>(this));
        return;
    }
    wifiScanRequest->start(
        Wireless::WifiScanRequest::Callback::make<WifiPoolChunk, &WifiPoolChunk::onWifiInfoCollected>(this));
}

void WifiPoolChunk::onNetworkInfoCollected(boost::shared_ptr<Wireless::TelephonyNetworkInfo> info) {
    wifiScanRequest->start(
        Wireless::WifiScanRequest::Callback::make<WifiPoolChunk, &WifiPoolChunk::onWifiInfoCollected>(this));
    if (!info || !info->isValid()) {
        return;
    }
    boost::shared_ptr<CellInfosTag> cells = boost::make_shared<CellInfosTag>("UNKNOWN", "NONE");
    cells->addChild(boost::make_shared<CellInfoTag>(
        static_cast<KDuint32>(info->getCellID()), static_cast<KDuint32>(info->getLocationAreaCode()),
        info->getOperatorId(), info->getCountryCode(), signalStrength));
    chunk->addChild(cells);
}

void WifiPoolChunk::onWifiInfoCollected(
    const std::vector<boost::shared_ptr<Wireless::WifiScanResult> >& results) {
    boost::shared_ptr<BssidsTag> bssids = boost::make_shared<BssidsTag>();
    for (const boost::shared_ptr<Wireless::WifiScanResult>& result : results) {
        bssids->addChild(boost::make_shared<BssidTag>(result->getSsid(), result->getBssid(), 0,
                                                      result->getSignalStrength()));
    }
    chunk->addChild(bssids);
    // The collector may drop this chunk in the callback.
    boost::shared_ptr<WifiPoolChunk> self = shared_from_this();
    finishCallback(self);
}

}  // namespace Statistics
