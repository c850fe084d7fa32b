#pragma once

#include <boost/shared_ptr.hpp>
#include <vector>

#include "startup/StartupListener.h"

namespace Wireless {
class WifiScanRequest;
class WifiScanResult;
}  // namespace Wireless

namespace Startup {

// Tells the startup server the visible access points as one "wifi"
// parameter, "00:11:22:aa:bb:cc,-61;00:11:22:aa:bb:cd,-80", absent when the
// scan saw none. Main thread only.
class WifiStartupListener : public StartupListener {
public:
    WifiStartupListener();
    ~WifiStartupListener() override;

    void collectStartupParams(CollectCallback done) override;
    void cancelCollectStartupParams() override;

    void onWifiScanCompleted(const std::vector<boost::shared_ptr<Wireless::WifiScanResult> >& results);

    // The "wifi" value; access points whose BSSID is not 12 hexadecimal
    // digits are logged and left out. Empty when none is left.
    static std::string encode(const std::vector<boost::shared_ptr<Wireless::WifiScanResult> >& results);

private:
    boost::shared_ptr<Wireless::WifiScanRequest> request;
    CollectCallback done;
};

}  // namespace Startup
