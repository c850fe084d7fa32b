#pragma once

#include <KD/kdext.h>

#include <boost/shared_ptr.hpp>
#include <vector>

#include "util/callback.h"
#include "wireless/WifiScanResult.h"

namespace Wireless {

// One platform Wi-Fi scan at a time. The answer comes to the thread that
// called start(), which must pump platform events; start, cancel and destroy
// it there. A scan the platform refuses is answered with an empty list.
class WifiScanRequestImpl {
public:
    typedef callback<void (*)(const std::vector<boost::shared_ptr<WifiScanResult> >&)> Callback;

    WifiScanRequestImpl();
    ~WifiScanRequestImpl();

    // Restarts the scan if one runs; callback hears of it once, unless
    // cancel() comes first. The callback may destroy this object.
    void start(Callback onDone);
    // Silent afterwards; the callback is kept.
    void cancel();

    static void onScanCompletedWrapper(const KDEvent* event);

private:
    WifiScanRequestImpl(const WifiScanRequestImpl&) = delete;
    WifiScanRequestImpl& operator=(const WifiScanRequestImpl&) = delete;

    void onScanCompleted(const KDWifiScanResultZVR* result);

    KDint handle;
    Callback onCompleted;
};

}  // namespace Wireless
