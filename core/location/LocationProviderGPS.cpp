#include "location/LocationProviderGPS.h"

#include "location/AbstractSimulator.h"
#include "util/Logger.h"

namespace Location {

LocationProviderGPS* LocationProviderGPS::theLocationProviderGPS = nullptr;

LocationProviderGPS::LocationProviderGPS(LocationManager* manager)
    : LocationProvider("GPS", manager),
      simulator(nullptr),
      fixTimeout(callback<void (*)()>::make<LocationProviderGPS, &LocationProviderGPS::onFixTimeout>(this)) {
    KD_ASSERT(theLocationProviderGPS == __null);
    theLocationProviderGPS = this;
    kdInstallCallback(&LocationProviderGPS::onLocationEventWrapper, KD_EVENT_LOCATION_ZVR, nullptr);
    kdInstallCallback(&LocationProviderGPS::onStatusEventWrapper, KD_EVENT_LOCATION_STATUS_ZVR, nullptr);
}

// Leaves quietly: the manager that owns it is going away too.
LocationProviderGPS::~LocationProviderGPS() {
    if (getStatus() != StatusDisabled) {
        kdLocationStopZVR();
    }
    kdInstallCallback(nullptr, KD_EVENT_LOCATION_STATUS_ZVR, nullptr);
    kdInstallCallback(nullptr, KD_EVENT_LOCATION_ZVR, nullptr);
    KD_ASSERT(theLocationProviderGPS == this);
    if (theLocationProviderGPS == this) {
        theLocationProviderGPS = nullptr;
    }
}

void LocationProviderGPS::enable() {
    fixAvailable();
    kdLocationStartZVR();
}

void LocationProviderGPS::disable() {
    fixTimeout.cancel();
    kdLocationStopZVR();
    setStatus(StatusDisabled);
}

void LocationProviderGPS::fixAvailable() {
    fixTimeout.start(Util::Timer::OneShot, kFixLostAfterMs * 1000000ll);
    setStatus(StatusAvailable);
}

void LocationProviderGPS::onFixTimeout() {
    if (getStatus() == StatusAvailable) {
        setStatus(StatusEnabled);
    }
}

void LocationProviderGPS::onLocationEventWrapper(const KDEvent* e) {
    if (theLocationProviderGPS != nullptr) {
        theLocationProviderGPS->onLocationEvent(e);
    } else if (e->type == KD_EVENT_LOCATION_ZVR) {
        kdFree(e->data.p[0]);
    }
}

void LocationProviderGPS::onStatusEventWrapper(const KDEvent* e) {
    if (theLocationProviderGPS != nullptr) {
        theLocationProviderGPS->onStatusEvent(e);
    }
}

void LocationProviderGPS::onStatusEvent(const KDEvent* e) {
    KD_ASSERT(e->type == 102);
    if (getStatus() == StatusDisabled) {
        return;
    }
    switch (e->data.words[0]) {
        case 0:
        case 1:
            fixTimeout.cancel();
            setStatus(StatusEnabled);
            break;
        case 2:
            fixAvailable();
            break;
        default:
            // The platform's to give, not ours to be wrong about.
            Logger::log(Logger::Warning, "LocationProviderGPS: unknown satellite status %d ignored",
                        static_cast<int>(e->data.words[0]));
            break;
    }
}

void LocationProviderGPS::onLocationEvent(const KDEvent* e) {
    KD_ASSERT(e->type == 101);
    auto* payload = static_cast<KDLocationFixZVR*>(e->data.p[0]);
    if (payload == nullptr) {
        return;
    }
    const KDLocationFixZVR fix = *payload;
    kdFree(payload);
    if (getStatus() == StatusDisabled) {
        return;
    }
    const bool simulated = e->timestamp == static_cast<KDust>(-1);
    RawLocation raw = {fix.latitude,
                       fix.longitude,
                       fix.speed,
                       fix.bearing,
                       fix.accuracy,
                       fix.altitude,
                       static_cast<LocationPrecision>(fix.precision),
                       0,
                       kdGetTimeUST()};
    // Fixes without a usable position, accuracy or precision go silently.
    if (!raw.sanitize()) {
        return;
    }
    if (!admit(raw, simulated)) {
        return;
    }
    fixAvailable();
    Location location(raw);
    location.initFromRaw();
    Location result = smoother.filter(location);
    if (result.accuracy < 0.0f || result.precision == PrecisionNone || !result.hasUsablePosition()) {
        return;
    }
    if (simulated) {
        result.fixTime = -1;
    }
    // The receiver's precision, not the record's: the chain marks a fix it
    // has no course for yet as network level, yet the receiver has its fix.
    if (raw.precision != getPrecision()) {
        changePrecision(raw.precision);
    }
    reportNewLocation(result);
}

bool LocationProviderGPS::admit(const RawLocation& fix, bool simulated) {
    if (simulator == nullptr) {
        return !simulated;
    }
    if (!simulated && simulator->isReplaying()) {
        return false;
    }
    if (simulator->isRecording()) {
        simulator->recordLocation(fix.latitude, fix.longitude, fix.speed, fix.bearing, fix.accuracy,
                                  fix.altitude, fix.precision);
    }
    return true;
}

}  // namespace Location
