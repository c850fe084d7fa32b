#pragma once

#include <string>

#include "location/Location.h"

namespace Location {

class LocationManager;

enum ProviderStatus : int { StatusDisabled = 0, StatusEnabled = 1, StatusAvailable = 2 };

// A source of positions for the location manager, which owns it. Main thread
// only. Reports reach the manager only while the provider is enabled.
class LocationProvider {
public:
    LocationProvider(const char* name, LocationManager* manager);
    virtual ~LocationProvider() {}

    virtual LocationPrecision getPrecision() const { return precision; }
    virtual int getProperties() const { return 7; }
    // The last reported record; RawLocation::unknown before the first.
    virtual const Location& getLastLocation() const { return lastLocation; }
    virtual void enable() = 0;
    virtual void disable() = 0;

    ProviderStatus getStatus() const { return status; }
    const std::string& getName() const { return name; }

protected:
    void setStatus(ProviderStatus newStatus);
    void changePrecision(LocationPrecision newPrecision);
    void reportNewLocation(const Location& location);

    std::string name;
    LocationManager* manager;

private:
    bool isReporting() const;

    ProviderStatus status;
    LocationPrecision precision;
    Location lastLocation;
};

}  // namespace Location
