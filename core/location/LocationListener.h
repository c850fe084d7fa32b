#pragma once

#include "location/Location.h"

namespace Location {

class LocationManager;

// Receives the location manager's positions and overall precision changes on
// the main thread. Both operations do nothing unless overridden.
class LocationListener {
public:
    virtual ~LocationListener() {}
    virtual void onLocationChanged(LocationManager* manager, const Location& location) {
        (void)manager;
        (void)location;
    }
    virtual void onLocationPrecisionChanged(LocationManager* manager, LocationPrecision oldPrecision,
                                            LocationPrecision newPrecision) {
        (void)manager;
        (void)oldPrecision;
        (void)newPrecision;
    }
};

}  // namespace Location
