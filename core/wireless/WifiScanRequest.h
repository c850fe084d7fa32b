#pragma once

#include <boost/scoped_ptr.hpp>

#include "util/Timer.h"
#include "wireless/WifiScanRequestImpl.h"

namespace Wireless {

// A Wi-Fi scan that always reports once per start(), within 3 seconds: with
// the access points the platform saw, or with an empty list when it did not
// answer in time (a later answer is dropped). Owner thread only (the one
// calling start(), which must pump platform events).
class WifiScanRequest {
public:
    typedef WifiScanRequestImpl::Callback Callback;

    // How long the platform gets to answer.
    static constexpr long long kScanTimeoutNs = 3000000000LL;

    WifiScanRequest();
    ~WifiScanRequest();

    // Restarts the scan if one runs. The callback may destroy this object.
    void start(Callback onDone);
    // Silent afterwards.
    void cancel();

private:
    WifiScanRequest(const WifiScanRequest&) = delete;
    WifiScanRequest& operator=(const WifiScanRequest&) = delete;

    void onScanCompleted(const std::vector<boost::shared_ptr<WifiScanResult> >& results);
    void onTimerFired();

    Callback onCompleted;
    boost::scoped_ptr<WifiScanRequestImpl> impl;
    boost::scoped_ptr<Util::Timer> timer;
};

}  // namespace Wireless
