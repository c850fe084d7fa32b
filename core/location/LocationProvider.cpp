#include "location/LocationProvider.h"

#include "location/LocationManager.h"
#include "util/Logger.h"

namespace Location {

LocationProvider::LocationProvider(const char* name, LocationManager* manager)
    : name(name), manager(manager), status(StatusDisabled), precision(PrecisionNone) {}

bool LocationProvider::isReporting() const {
    return status == StatusEnabled || status == StatusAvailable;
}

void LocationProvider::setStatus(ProviderStatus newStatus) {
    const ProviderStatus oldStatus = status;
    status = newStatus;
    if (oldStatus != newStatus) {
        manager->onProviderStatusChanged(this, oldStatus, newStatus);
    }
}

// The manager hears of the change: otherwise its overall precision could only
// follow a lost satellite fix and would never show satellite level.
void LocationProvider::changePrecision(LocationPrecision newPrecision) {
    if (!isReporting()) {
        Logger::log(
            Logger::Error,
            "LocationProvider::changePrecision: %s: Precision change reported in an incorrect state (%d)",
            name.c_str(), static_cast<int>(status));
        return;
    }
    const LocationPrecision oldPrecision = precision;
    precision = newPrecision;
    if (oldPrecision != newPrecision) {
        manager->onProviderPrecisionChanged(this, oldPrecision, newPrecision);
    }
}

void LocationProvider::reportNewLocation(const Location& location) {
    if (!isReporting()) {
        Logger::log(Logger::Error,
                    "LocationProvider::reportNewLocation: %s: Location reported in an incorrect state (%d)",
                    name.c_str(), static_cast<int>(status));
        return;
    }
    lastLocation = location;
    manager->onProviderLocationChanged(this, location);
}

}  // namespace Location
