#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>
#include <vector>

#include "location/Location.h"
#include "statistics/wifipool/ChunkTag.h"
#include "statistics/wifipool/RequestInfo.h"
#include "util/callback.h"
#include "wireless/TelephonyNetworkInfo.h"
#include "wireless/TelephonyNetworkInfoRequest.h"
#include "wireless/TelephonySignalStrengthRequest.h"
#include "wireless/WifiScanRequest.h"

namespace Statistics {

// One observation: request timings and a fix given at construction, then the
// serving cell and the Wi-Fi networks asked from the platform one after the
// other by collect(). Made, collected and finished on the collector's thread,
// which must pump platform events.
class WifiPoolChunk : public boost::enable_shared_from_this<WifiPoolChunk>, private boost::noncopyable {
public:
    typedef callback<void (*)(boost::shared_ptr<WifiPoolChunk>)> ChunkCollectedCallback;

    WifiPoolChunk(const char* type, const std::vector<boost::shared_ptr<RequestInfo> >& requests);
    WifiPoolChunk(const char* type, const std::vector<boost::shared_ptr<RequestInfo> >& requests,
                  const Location::Location& location);

    // Starts collecting; finish hears once, with this chunk, when the Wi-Fi
    // scan has answered. Once per chunk.
    void collect(ChunkCollectedCallback finish);

    boost::shared_ptr<NetworkCollectorNode> node() const { return chunk; }

private:
    void createRequests();
    void initChunk(const char* type, const std::vector<boost::shared_ptr<RequestInfo> >& requests);
    void setupChunkConnection();
    void addNetworkSpeedInfoToChunk(const std::vector<boost::shared_ptr<RequestInfo> >& requests);
    void addGpsDataToChunk(const Location::Location& location);

    void onTelephonySignalStrengthCollected(bool ok, int strength);
    void onNetworkInfoCollected(boost::shared_ptr<Wireless::TelephonyNetworkInfo> info);
    void onWifiInfoCollected(const std::vector<boost::shared_ptr<Wireless::WifiScanResult> >& results);

    boost::shared_ptr<ChunkTag> chunk;
    ChunkCollectedCallback finishCallback;
    boost::shared_ptr<Wireless::TelephonySignalStrengthRequest> signalStrengthRequest;
    boost::shared_ptr<Wireless::TelephonyNetworkInfoRequest> networkInfoRequest;
    boost::shared_ptr<Wireless::WifiScanRequest> wifiScanRequest;
    int signalStrength;
};

}  // namespace Statistics
