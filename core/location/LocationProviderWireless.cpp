#include "location/LocationProviderWireless.h"

#include <boost/make_shared.hpp>

#include "network/NetworkManager.h"

namespace Location {

namespace {

const KDint64 kIntervalNs = 15ll * 1000000000ll;

}  // namespace

LocationProviderWireless::LocationProviderWireless(LocationManager* manager)
    : LocationProvider("Wireless", manager), timer(nullptr) {
    // Made first, so that the network manager is torn down after us and can
    // still take the cancel of a request we drop on the way out.
    Network::NetworkManager::getInstance();
}

LocationProviderWireless::~LocationProviderWireless() {
    stopTimer();
    request.reset();
}

void LocationProviderWireless::enable() {
    setStatus(StatusAvailable);
    startTimer();
}

void LocationProviderWireless::disable() {
    setStatus(StatusDisabled);
    stopTimer();
    request.reset();
}

void LocationProviderWireless::startTimer() {
    stopTimer();
    kdInstallCallback(&LocationProviderWireless::onTimerEventWrapper, KD_EVENT_TIMER, this);
    timer = kdSetTimer(kIntervalNs, KD_TIMER_PERIODIC_AVERAGE, this);
    onTimerEvent();
}

void LocationProviderWireless::stopTimer() {
    if (timer == nullptr) {
        return;
    }
    kdInstallCallback(nullptr, KD_EVENT_TIMER, this);
    kdCancelTimer(timer);
    timer = nullptr;
}

void LocationProviderWireless::onTimerEventWrapper(const KDEvent* e) {
    static_cast<LocationProviderWireless*>(e->userptr)->onTimerEvent();
}

void LocationProviderWireless::onTimerEvent() {
    request = boost::make_shared<Wireless::LbsNetworkRequest>();
    request->submit(Wireless::LbsNetworkRequest::Callback::make<
                    LocationProviderWireless, &LocationProviderWireless::onLbsNetworkRequestCompleted>(this));
}

void LocationProviderWireless::onLbsNetworkRequestCompleted(
    const Wireless::LbsNetworkRequest::Response& response) {
    if (response.error != 0) {
        return;
    }
    RawLocation raw = RawLocation::unknown;
    raw.latitude = response.latitude;
    raw.longitude = response.longitude;
    raw.accuracy = response.accuracy;
    raw.time = kdGetTimeUST();
    if (!raw.hasUsablePosition()) {
        return;
    }
    // An answer without a usable accuracy still goes out, at precision none,
    // so that nobody takes it for a position.
    if (!(raw.accuracy >= 0.0f && raw.accuracy <= 1.0e9f)) {
        raw.accuracy = -1.0f;
    }
    raw.precision = raw.accuracy >= 0.0f ? PrecisionNetwork : PrecisionNone;
    Location location(raw);
    location.initFromRaw();
    if (location.precision != getPrecision()) {
        changePrecision(location.precision);
    }
    reportNewLocation(location);
}

}  // namespace Location
