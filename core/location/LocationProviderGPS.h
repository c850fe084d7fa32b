#pragma once

#include <KD/kdext.h>

#include "location/LocationProvider.h"
#include "location/LocationSmoother.h"
#include "util/Timer.h"

namespace Simulator {
class AbstractSimulator;
}

namespace Location {

// Satellite fixes from the platform (events 101 and 102), smoothed by the
// filter chain or the Kalman filter. At most one exists, owned by the location
// manager; main thread only.
//
// Status 2 means the receiver has a fix: a fix sets it, whatever the status
// events said before, and kFixLostAfterMs without a fix drops it to 1, so the
// manager hands over to network positioning also when the platform never says
// that the fix was lost.
class LocationProviderGPS : public LocationProvider {
public:
    // A few fix intervals of a receiver that reports once a second: long
    // enough not to hand over on one late fix, short enough that a driver
    // entering a tunnel is not left on a stale position.
    static constexpr long long kFixLostAfterMs = 5000;

    explicit LocationProviderGPS(LocationManager* manager);
    ~LocationProviderGPS() override;

    void enable() override;
    void disable() override;

    // Not owned; null for none.
    void setSimulator(Simulator::AbstractSimulator* newSimulator) { simulator = newSimulator; }
    void setSmoother(LocationSmoother::Kind kind) { smoother.select(kind); }
    LocationSmoother::Kind getSmoother() const { return smoother.getSelected(); }

    static void onLocationEventWrapper(const KDEvent* e);
    static void onStatusEventWrapper(const KDEvent* e);

private:
    void onLocationEvent(const KDEvent* e);
    void onStatusEvent(const KDEvent* e);
    // Whether a fix passes the simulator's replay and record hooks.
    bool admit(const RawLocation& fix, bool simulated);
    // Status 2, and the countdown to taking the fix as lost starts again.
    void fixAvailable();
    void onFixTimeout();

    LocationSmoother smoother;
    Simulator::AbstractSimulator* simulator;
    Util::Timer fixTimeout;

    static LocationProviderGPS* theLocationProviderGPS;
};

}  // namespace Location
