#include "wireless/WifiScanRequest.h"

namespace Wireless {

WifiScanRequest::WifiScanRequest() {}

WifiScanRequest::~WifiScanRequest() {
    cancel();
}

void WifiScanRequest::start(Callback onDone) {
    cancel();
    onCompleted = onDone;
    impl.reset(new WifiScanRequestImpl());
    impl->start(Callback::make<WifiScanRequest, &WifiScanRequest::onScanCompleted>(this));
    timer.reset(
        new Util::Timer(callback<void (*)()>::make<WifiScanRequest, &WifiScanRequest::onTimerFired>(this)));
    timer->start(Util::Timer::OneShot, kScanTimeoutNs);
}

void WifiScanRequest::cancel() {
    impl.reset();
    timer.reset();
}

void WifiScanRequest::onScanCompleted(const std::vector<boost::shared_ptr<WifiScanResult> >& results) {
    cancel();
    const Callback callback = onCompleted;
    callback(results);
}

void WifiScanRequest::onTimerFired() {
    cancel();
    const Callback callback = onCompleted;
    callback(std::vector<boost::shared_ptr<WifiScanResult> >());
}

}  // namespace Wireless
