#pragma once

#include "location/LocationFilter.h"

namespace Location {

// Holds the position still while fixes jitter within half their accuracy of
// the last kept position, unless the fix reports moving at walking pace or
// faster along a bearing; speed, bearing and the rest come from the new fix.
class LocationFilterMinDistance : public LocationFilter {
public:
    LocationFilterMinDistance();

    Location filter(const Location& location) override;
    void reset() override;

private:
    // Its own flag: latitude or longitude 0 is a place like any other (the
    // equator, the prime meridian).
    bool hasLast;
    float lastLatitude;
    float lastLongitude;
};

}  // namespace Location
