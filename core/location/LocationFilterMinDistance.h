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
    float lastLatitude;
    float lastLongitude;
};

}  // namespace Location
