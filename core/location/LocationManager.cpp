#include "location/LocationManager.h"

#include <algorithm>
#include <boost/make_shared.hpp>

#include "lifecycle/PauseResumeHandler.h"
#include "location/LocationProviderGPS.h"
#include "location/LocationProviderWireless.h"

namespace Location {

LocationManager::LocationManager()
    : locationProviderGPS(new LocationProviderGPS(this)),
      locationProviderWireless(new LocationProviderWireless(this)),
      pauseResumeListenerWrapper(boost::make_shared<Lifecycle::PauseResumeListenerWrapper>(this)),
      lastLocation(RawLocation::unknown),
      precision(PrecisionNone),
      isPaused(true) {
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    KD_ASSERT(handler != nullptr);
    if (handler != nullptr) {
        handler->addListener(pauseResumeListenerWrapper);
        isPaused = handler->getIsAppPaused();
    }
    if (!isPaused) {
        resume();
    }
}

LocationManager::~LocationManager() {
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr) {
        handler->removeListener(pauseResumeListenerWrapper.get());
    }
}

void LocationManager::addLocationListener(LocationListener* listener) {
    KD_ASSERT(find(listeners.begin(), listeners.end(), listener) == listeners.end());
    if (!isListening(listener)) {
        listeners.push_back(listener);
    }
}

void LocationManager::removeLocationListener(LocationListener* listener) {
    std::vector<LocationListener*>::iterator it = std::find(listeners.begin(), listeners.end(), listener);
    if (it != listeners.end()) {
        listeners.erase(it);
    }
}

bool LocationManager::isListening(const LocationListener* listener) const {
    return std::find(listeners.begin(), listeners.end(), listener) != listeners.end();
}

void LocationManager::setSimulator(Simulator::AbstractSimulator* simulator) {
    locationProviderGPS->setSimulator(simulator);
}

bool LocationManager::checkProvider(const LocationProvider* provider) const {
    KD_ASSERT(provider == locationProviderGPS.get() || provider == locationProviderWireless.get());
    return provider == locationProviderGPS.get() || provider == locationProviderWireless.get();
}

void LocationManager::resume() {
    isPaused = false;
    locationProviderGPS->enable();
    locationProviderWireless->enable();
}

bool LocationManager::onResumed() {
    KD_ASSERT(isPaused);
    resume();
    return true;
}

bool LocationManager::onPaused() {
    KD_ASSERT(!isPaused);
    isPaused = true;
    locationProviderGPS->disable();
    locationProviderWireless->disable();
    return true;
}

void LocationManager::onProviderLocationChanged(LocationProvider* provider, const Location& location) {
    if (!checkProvider(provider)) {
        return;
    }
    if (provider == locationProviderGPS.get()) {
        locationProviderWireless->disable();
        // Back from network positioning, the overall precision is the
        // satellite provider's again.
        setPrecision(locationProviderGPS->getPrecision());
    }
    lastLocation = location;
    // A snapshot, and each listener checked again: one listener may remove
    // (and destroy) another while being told.
    const std::vector<LocationListener*> snapshot = listeners;
    for (size_t i = 0; i < snapshot.size(); ++i) {
        if (isListening(snapshot[i])) {
            snapshot[i]->onLocationChanged(this, location);
        }
    }
}

// Losing the satellite fix (or the receiver) hands over to network
// positioning, whose first answer is asked for at once.
void LocationManager::onProviderStatusChanged(LocationProvider* provider, ProviderStatus,
                                              ProviderStatus newStatus) {
    if (!checkProvider(provider) || provider != locationProviderGPS.get() || newStatus == StatusAvailable ||
        isPaused) {
        return;
    }
    // Already running, it is left alone: enabling again would drop the query
    // on its way and start another.
    if (locationProviderWireless->getStatus() == StatusDisabled) {
        locationProviderWireless->enable();
    }
    setPrecision(locationProviderWireless->getPrecision());
}

// A network precision does not override a satellite provider that has a fix,
// and a precision of none (an answer without a usable accuracy) says nothing
// about how well the position is known: the overall precision stays.
void LocationManager::onProviderPrecisionChanged(LocationProvider* provider, LocationPrecision,
                                                 LocationPrecision newPrecision) {
    if (!checkProvider(provider) || newPrecision == PrecisionNone ||
        (provider == locationProviderWireless.get() && locationProviderGPS->getStatus() == StatusAvailable)) {
        return;
    }
    setPrecision(newPrecision);
}

void LocationManager::setSmoother(LocationSmoother::Kind kind) {
    locationProviderGPS->setSmoother(kind);
}

LocationSmoother::Kind LocationManager::getSmoother() const {
    return locationProviderGPS->getSmoother();
}

void LocationManager::setPrecision(LocationPrecision newPrecision) {
    const LocationPrecision oldPrecision = precision;
    precision = newPrecision;
    if (oldPrecision == newPrecision) {
        return;
    }
    const std::vector<LocationListener*> snapshot = listeners;
    for (size_t i = 0; i < snapshot.size(); ++i) {
        if (isListening(snapshot[i])) {
            snapshot[i]->onLocationPrecisionChanged(this, oldPrecision, newPrecision);
        }
    }
}

}  // namespace Location
