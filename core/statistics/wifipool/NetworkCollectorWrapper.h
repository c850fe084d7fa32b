#pragma once

#include "startup/StartupFeature.h"
#include "statistics/wifipool/NetworkCollector.h"

namespace Statistics {

// The network collector as a startup feature: the "network_scanner" section
// of the startup answer switches it on and sets its periods, pause and resume
// stop and restart its timers. The uuid, language and upload host come from
// the startup data. Main thread only; own it through a shared_ptr and call
// init() and shutdown().
class NetworkCollectorWrapper : public Startup::StartupFeature {
public:
    NetworkCollectorWrapper();

    void setApiKey(const char* value) { collector.setApiKey(value); }
    void setAppVersion(const char* value) { collector.setAppVersion(value); }
    void setModel(const char* value) { collector.setModel(value); }
    void setManufacter(const char* value) { collector.setManufacter(value); }
    void setClid(const char* value) { collector.setClid(value); }
    void setAppPlatform(const char* value) { collector.setAppPlatform(value); }

    void startNetworkCollector() { collector.start(); }
    void stopNetworkCollector() { collector.stop(); }
    const NetworkCollector& getNetworkCollector() const { return collector; }

    bool onPaused() override;
    bool onResumed() override;
    void init() override;
    void shutdown() override;

protected:
    void doOnStartupReadyAndEnabled() override;
    void doParseStartup(const TiXmlDocument& document) override;
    void doOnStopByUser() override;

private:
    void setParamsFromStartup();

    NetworkCollector collector;
    int scanTimeout;
    int sendTimeout;
};

}  // namespace Statistics
