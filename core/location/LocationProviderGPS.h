#pragma once

#include <KD/kdext.h>

#include <boost/scoped_ptr.hpp>

#include "location/LocationFilterAverage.h"
#include "location/LocationProvider.h"

namespace Simulator {
class AbstractSimulator;
}

namespace Location {

// Satellite fixes from the platform (events 101 and 102), smoothed by the
// filter chain. At most one exists, owned by the location manager; main
// thread only.
class LocationProviderGPS : public LocationProvider {
public:
    explicit LocationProviderGPS(LocationManager* manager);
    ~LocationProviderGPS() override;

    void enable() override;
    void disable() override;

    // Not owned; null for none.
    void setSimulator(Simulator::AbstractSimulator* newSimulator) { simulator = newSimulator; }

    static void onLocationEventWrapper(const KDEvent* e);
    static void onStatusEventWrapper(const KDEvent* e);

private:
    void onLocationEvent(const KDEvent* e);
    void onStatusEvent(const KDEvent* e);
    // Whether a fix passes the simulator's replay and record hooks.
    bool admit(const RawLocation& fix, bool simulated);

    boost::scoped_ptr<LocationFilterAverage> filter;
    Simulator::AbstractSimulator* simulator;

    static LocationProviderGPS* theLocationProviderGPS;
};

}  // namespace Location
