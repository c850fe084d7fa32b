#include "wireless/WifiScanRequestImpl.h"

#include <boost/make_shared.hpp>

#include "wireless/impl/RadioEvents.h"

namespace Wireless {

WifiScanRequestImpl::WifiScanRequestImpl() : handle(0) {}

WifiScanRequestImpl::~WifiScanRequestImpl() {
    cancel();
}

void WifiScanRequestImpl::start(Callback onDone) {
    cancel();
    onCompleted = onDone;
    kdInstallCallback(&WifiScanRequestImpl::onScanCompletedWrapper, KD_EVENT_WIFI_SCAN_ZVR, this);
    handle = kdStartWifiScanZVR(this);
    if (handle == 0) {
        postAnswerWithoutData(KD_EVENT_WIFI_SCAN_ZVR, this);
    }
}

void WifiScanRequestImpl::cancel() {
    kdInstallCallback(nullptr, KD_EVENT_WIFI_SCAN_ZVR, this);
    if (handle != 0) {
        kdCancelWifiScanZVR(handle);
        handle = 0;
    }
}

void WifiScanRequestImpl::onScanCompletedWrapper(const KDEvent* event) {
    static_cast<WifiScanRequestImpl*>(event->userptr)
        ->onScanCompleted(static_cast<const KDWifiScanResultZVR*>(event->data.recordzvr.record));
    releaseRecord(event);
}

void WifiScanRequestImpl::onScanCompleted(const KDWifiScanResultZVR* result) {
    cancel();
    std::vector<boost::shared_ptr<WifiScanResult> > results;
    if (result != nullptr && result->entries != nullptr && result->count > 0) {
        results.reserve(static_cast<size_t>(result->count));
        for (KDint32 i = 0; i < result->count; ++i) {
            const KDWifiScanEntryZVR& entry = result->entries[i];
            results.push_back(
                boost::make_shared<WifiScanResult>(entry.bssid, entry.ssid, entry.signalStrength));
        }
    }
    // The callback may destroy this object: nothing of it is touched after.
    const Callback callback = onCompleted;
    callback(results);
}

}  // namespace Wireless
