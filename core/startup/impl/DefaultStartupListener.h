#pragma once

#include <string>

#include "startup/StartupListener.h"

class TiXmlElement;

namespace Startup {

class StartupData;

// Describes the device, the application and the last position to the startup
// server, and takes the client identifier and the host table from its
// answer. The answer is untrusted: missing or malformed pieces are logged
// and skipped, and what is already known stays. Main thread only.
class DefaultStartupListener : public StartupListener {
public:
    // startupData is not owned and must outlive the listener.
    explicit DefaultStartupListener(StartupData* startupData);

    void collectStartupParams(CollectCallback done) override;
    void parseStartup(const TiXmlDocument& document) override;
    void onStartupReady() override;

private:
    void addDeviceParams(StartupParams& params) const;
    void addLocationParam(StartupParams& params) const;
    void parseHosts(const TiXmlElement* root);
    void parseVoice(const TiXmlElement* root);

    StartupData* startupData;
};

}  // namespace Startup
