#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>

#include "location/LocationProvider.h"
#include "wireless/LbsNetworkRequest.h"

namespace Location {

// Network positioning: while enabled, asks the positioning service for a
// position from the visible cells and Wi-Fi networks at once and then every
// 15 s. Its fixes are not filtered. Owned by the location manager; main
// thread only (the network manager's thread).
class LocationProviderWireless : public LocationProvider {
public:
    explicit LocationProviderWireless(LocationManager* manager);
    ~LocationProviderWireless() override;

    void enable() override;
    void disable() override;

    static void onTimerEventWrapper(const KDEvent* e);

private:
    void startTimer();
    void stopTimer();
    void onTimerEvent();
    void onLbsNetworkRequestCompleted(const Wireless::LbsNetworkRequest::Response& response);

    KDTimer* timer;
    boost::shared_ptr<Wireless::LbsNetworkRequest> request;
};

}  // namespace Location
