#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <boost/unordered_set.hpp>
#include <string>

#include "location/LocationListener.h"
#include "network/NetworkManager.h"
#include "statistics/wifipool/NetworkSpeedCollectorImpl.h"
#include "statistics/wifipool/WifiPoolTag.h"

namespace Statistics {

class NetworkCollectorRequest;
class WifiPoolChunk;

// Collects Wi-Fi pool chunks on a scan timer and on network events, and
// uploads the finished ones on a send timer as one gzip-compressed,
// scrambled document. Owned by the thread that constructs it (which must
// pump platform events); every call belongs there.
//
// At most one upload is pending at a time: a send period that finds one
// still waiting (for its answer, or in the network manager's offline queue)
// or the network unreachable keeps its chunks for the next period's body.
class NetworkCollector : public Location::LocationListener {
public:
    NetworkCollector();
    ~NetworkCollector() override;

    // The first scan chunk comes one scan period after start().
    void start();
    // Drops uploads in flight and chunks being collected; finished chunks
    // wait for the next upload after a restart.
    void stop();
    bool isStarted() const { return started; }

    void setUuid(const char* value);
    void setAppVersion(const char* value);
    void setAppPlatform(const char* value);
    void setManufacter(const char* value);
    void setModel(const char* value);
    void setClid(const char* value);
    // A null key is ignored; without a key the upload carries no "api_key".
    void setApiKey(const char* value);
    void setLang(const char* value);
    void setBaseUrl(const char* value);
    // Periods in seconds. A changed period restarts both timers when started;
    // a period below one second is refused and the current one kept.
    void setScanTimeout(int seconds);
    void setSendTimeout(int seconds);
    long long getScanTimeout() const { return scanTimeout; }
    long long getSendTimeout() const { return sendTimeout; }

    boost::shared_ptr<NetworkSpeedCollectorImpl> getNetworkSpeedCollector() const { return speedCollector; }

    // Pause stops the timers and keeps started; resume gives them full periods.
    // Request measurements are taken only while started and not paused.
    void onPaused();
    void onResumed();

    void onLocationChanged(Location::LocationManager* manager, const Location::Location& location) override;

    static void onScanTimerFiredWrapper(const KDEvent* event);
    static void onSendTimerFiredWrapper(const KDEvent* event);

private:
    friend class NetworkCollectorRequest;

    // The user pointer of one timer and its handler.
    struct TimerContext {
        NetworkCollector* collector;
    };

    NetworkCollector(const NetworkCollector&) = delete;
    NetworkCollector& operator=(const NetworkCollector&) = delete;

    void updateRecording();
    void startTimers();
    void cancelTimers();
    void cancelAllRequests();
    bool setTimeout(long long& timeout, int seconds, const char* name);

    void onScanTimerFired();
    void onSendTimerFired();
    void onNetworkReachabilityChanged(Network::NetworkManager::NetworkReachabilityStatus status);
    void onNetworkErrorStatusChanged(Network::NetworkManager::NetworkErrorStatus status);
    void requestChunkData(const char* type);
    void onChunkCollected(boost::shared_ptr<WifiPoolChunk> chunk);

    Network::NetworkManager::NetworkReachabilityStatusCallback reachabilityCallback();
    Network::NetworkManager::NetworkErrorStatusCallback errorCallback();

    KDThread* thread;
    bool started;
    bool paused;
    boost::shared_ptr<WifiPoolTag> root;
    TimerContext scanTimerContext;
    TimerContext sendTimerContext;
    KDTimer* scanTimer;
    KDTimer* sendTimer;
    long long scanTimeout;
    long long sendTimeout;
    std::string baseUrl;
    std::string apiKey;
    std::string lang;
    Location::Location lastLocation;
    bool hasLocation;
    boost::unordered_set<boost::shared_ptr<NetworkCollectorRequest> > networkRequests;
    boost::unordered_set<boost::shared_ptr<WifiPoolChunk> > requestedChunks;
    boost::shared_ptr<NetworkSpeedCollectorImpl> speedCollector;
};

}  // namespace Statistics
