#pragma once

#include <boost/scoped_ptr.hpp>
#include <boost/shared_ptr.hpp>
#include <vector>

#include "lifecycle/PauseResumeListener.h"
#include "lifecycle/PauseResumeListenerWrapper.h"
#include "location/LocationListener.h"
#include "location/LocationProvider.h"
#include "location/LocationSmoother.h"
#include "util/Singleton.h"

namespace Simulator {
class AbstractSimulator;
}

namespace Location {

class LocationProviderGPS;
class LocationProviderWireless;

// The one stream of positions for the application: satellite fixes through
// the filter chain, with network positioning filling in while there is no
// satellite fix. Runs while the application is resumed. A singleton; main
// thread only (platform, timer and network callbacks all arrive there).
class LocationManager : public Util::Singleton<LocationManager>, public Lifecycle::PauseResumeListener {
public:
    ~LocationManager() override;

    // Listeners are not owned and are told in order of registration; one
    // must be removed before it is destroyed.
    void addLocationListener(LocationListener* listener);
    void removeLocationListener(LocationListener* listener);

    // Not owned; null for none. See Simulator::AbstractSimulator.
    void setSimulator(Simulator::AbstractSimulator* simulator);

    // How satellite fixes are smoothed; takes effect from the next fix and
    // glides there without a jump (see LocationSmoother). RMS position error
    // as a share of the raw fixes' on synthetic tracks (LocationFilterQualityBench):
    //
    //   track                         raw     Chain (default)   Kalman
    //   standing, 20 m accuracy       7.1 m        76 %           19 %
    //   walking                       5.7 m        55 %           22 %
    //   walking, noisier receiver     8.6 m        58 %           27 %
    //   driving with turns            4.1 m        62 %           40 %
    //   walking with 150 m outliers  13.3 m        23 %           20 %
    //   long stop, then driving on    4.1 m        63 %           26 %
    //   speed spike while driving     4.4 m        64 %           40 %
    //   stop and go traffic           4.2 m        59 %           33 %
    //   receiver clock steps back     4.2 m        59 %           35 %
    //
    // Neither moves the marker back along the way by more than 5 m on these
    // tracks. The chain holds a standing position still and keeps the
    // behaviour applications know; the Kalman filter is closer to the truth
    // on every track but lets the marker drift by a metre or two while
    // standing.
    void setSmoother(LocationSmoother::Kind kind);
    LocationSmoother::Kind getSmoother() const;

    // The last accepted record; RawLocation::unknown (world values -1,
    // x and y 0) before the first.
    const Location& getLastLocation() const { return lastLocation; }
    LocationPrecision getPrecision() const { return precision; }
    bool getIsPaused() const { return isPaused; }

    // Reports of the owned providers.
    void onProviderLocationChanged(LocationProvider* provider, const Location& location);
    void onProviderStatusChanged(LocationProvider* provider, ProviderStatus oldStatus,
                                 ProviderStatus newStatus);
    void onProviderPrecisionChanged(LocationProvider* provider, LocationPrecision oldPrecision,
                                    LocationPrecision newPrecision);

    bool onPaused() override;
    bool onResumed() override;

private:
    friend class Util::Singleton<LocationManager>;
    LocationManager();

    void resume();
    // Asserts when provider is not one of ours.
    bool checkProvider(const LocationProvider* provider) const;
    void setPrecision(LocationPrecision newPrecision);
    bool isListening(const LocationListener* listener) const;

    std::vector<LocationListener*> listeners;
    boost::scoped_ptr<LocationProviderGPS> locationProviderGPS;
    boost::scoped_ptr<LocationProviderWireless> locationProviderWireless;
    boost::shared_ptr<Lifecycle::PauseResumeListenerWrapper> pauseResumeListenerWrapper;
    Location lastLocation;
    LocationPrecision precision;
    bool isPaused;
};

}  // namespace Location
