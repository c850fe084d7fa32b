#include "location/LocationFilterKalman.h"

#include "location/LocationFilterComplex.h"
#include "location/impl/Motion.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const float kAltitudeNoiseFactor = 20.0f;
// A receiver's accuracy is the radius within which the true position lies
// with 68 % probability: 1.5 standard deviations of a round Gaussian error.
const float kAccuracyPerSigma = 1.5f;
// What a reported speed may be off by (metres per second), and a reported
// bearing (radians, about 5 degrees).
const float kSpeedNoise = 0.5f;
const float kBearingNoise = 0.09f;
// How much the velocity drifts between reports, as the spectral density of a
// white acceleration (metres squared per second cubed): little, so that a
// steady drive is smoothed hard. A car speeding up or braking reports it, and
// the velocity's uncertainty widens to follow (KalmanAxis::measureVelocity);
// a turn or a stop passes the velocity gate below.
const float kAccelerationDensity = 0.001f;
// How fast a receiver that has not said how it moves may be going (metres per
// second): fast enough that its first fixes are followed, not held.
const float kUnknownSpeed = 30.0f;
// A reported velocity this far from the estimate (squared standard
// deviations over both axes: a chance below 1 % for noise) is a turn, a stop
// or a glitch.
const float kVelocityGate = 9.0f;
// A fix that claims perfect accuracy is taken as good to a centimetre, not
// as exact: an exact one would leave no variance to divide by.
const float kMinVariance = 1.0e-4f;

bool isValid(const Location& location) {
    return location.accuracy >= 0.0f && location.precision != PrecisionNone;
}

float atLeastMinimum(float variance) {
    return variance > kMinVariance ? variance : kMinVariance;
}

float positionVariance(const Location& fix) {
    const float sigma = fix.accuracy / kAccuracyPerSigma;
    return atLeastMinimum(sigma * sigma);
}

// Per axis: the speed noise, and the bearing noise across the way, which
// grows with the speed.
float velocityVariance(const Location& fix) {
    const float across = fix.speed * kBearingNoise;
    return atLeastMinimum(kSpeedNoise * kSpeedNoise + across * across);
}

}  // namespace

LocationFilterKalman::LocationFilterKalman() {
    reset();
}

void LocationFilterKalman::reset() {
    lastAccepted = LocationFilterComplex::droppedFix();
    east = KalmanAxis();
    north = KalmanAxis();
    hasHeldVelocity = false;
    heldEast = 0.0f;
    heldNorth = 0.0f;
    altitude = -1.0f;
    altitudeVariance = 0.0f;
}

Location LocationFilterKalman::filter(const Location& location) {
    if (!isValid(location)) {
        return LocationFilterComplex::droppedFix();
    }
    if (!isValid(lastAccepted) || secondsSinceLast(location) > kMaxPredictSeconds) {
        start(location);
    } else {
        update(location);
    }
    // Positions or speeds that are not numbers would spread to the estimate;
    // start again from this fix rather than hand it out.
    if (!isFinite()) {
        start(location);
    }
    lastAccepted = location;
    return adjustLocation(location);
}

// The first fix is known as well as its accuracy says, not better; so is its
// velocity, or hardly at all when it reports none.
void LocationFilterKalman::start(const Location& fix) {
    const float position = positionVariance(fix);
    float velocityEast = 0.0f;
    float velocityNorth = 0.0f;
    const bool known = Motion::velocity(fix, velocityEast, velocityNorth);
    const float velocity = known ? velocityVariance(fix) : kUnknownSpeed * kUnknownSpeed;
    east.start(0.0f, position, velocityEast, velocity);
    north.start(0.0f, position, velocityNorth, velocity);
    hasHeldVelocity = false;
    altitude = -1.0f;
    updateAltitude(fix);
}

void LocationFilterKalman::update(const Location& fix) {
    const float seconds = secondsSinceLast(fix);
    moveOriginTo(fix);
    east.predict(seconds, kAccelerationDensity);
    north.predict(seconds, kAccelerationDensity);
    measureVelocity(fix, seconds);
    // The fix is where the origin now is.
    const float variance = positionVariance(fix);
    east.measurePosition(0.0f, variance);
    north.measurePosition(0.0f, variance);
    updateAltitude(fix);
}

// From the last fix to this one: fixes at most kMaxPredictSeconds apart are
// near enough for a flat map.
void LocationFilterKalman::moveOriginTo(const Location& fix) {
    float latitudePerMetre, longitudePerMetre;
    Motion::degreesPerMetre(fix.latitude, latitudePerMetre, longitudePerMetre);
    east.shift(-Motion::longitudeDifference(lastAccepted.longitude, fix.longitude) / longitudePerMetre);
    north.shift(-(fix.latitude - lastAccepted.latitude) / latitudePerMetre);
}

// A velocity far from the estimate is taken when the next fix reports much the
// same: the receiver turned or stopped at the fix that first reported it, so
// the estimate moves as it would have had it known then.
void LocationFilterKalman::measureVelocity(const Location& fix, float seconds) {
    float velocityEast, velocityNorth;
    if (!Motion::velocity(fix, velocityEast, velocityNorth)) {
        hasHeldVelocity = false;
        return;
    }
    const float variance = velocityVariance(fix);
    const float surprise =
        east.velocitySurprise(velocityEast, variance) + north.velocitySurprise(velocityNorth, variance);
    if (surprise > kVelocityGate) {
        const float dEast = velocityEast - heldEast;
        const float dNorth = velocityNorth - heldNorth;
        const bool confirmed =
            hasHeldVelocity && (dEast * dEast + dNorth * dNorth) / (2.0f * variance) <= kVelocityGate;
        if (!confirmed) {
            hasHeldVelocity = true;
            heldEast = velocityEast;
            heldNorth = velocityNorth;
            return;
        }
        east.shift((heldEast - east.velocity()) * seconds);
        north.shift((heldNorth - north.velocity()) * seconds);
    }
    hasHeldVelocity = false;
    east.measureVelocity(velocityEast, variance);
    north.measureVelocity(velocityNorth, variance);
}

// The altitude follows its own coarser model: its uncertainty grows by the
// change of the measured altitude. A missing altitude (-1) measures nothing.
void LocationFilterKalman::updateAltitude(const Location& fix) {
    if (fix.altitude == -1.0f) {
        return;
    }
    const float noise = atLeastMinimum(fix.accuracy * kAltitudeNoiseFactor);
    if (altitude == -1.0f) {
        altitude = fix.altitude;
        altitudeVariance = noise;
        return;
    }
    altitudeVariance += kdFabsf(fix.altitude - lastAccepted.altitude);
    const float gain = altitudeVariance / (altitudeVariance + noise);
    altitude += gain * (fix.altitude - altitude);
    altitudeVariance -= gain * altitudeVariance;
}

bool LocationFilterKalman::isFinite() const {
    const float sum = east.position() + north.position() + east.velocity() + north.velocity() + altitude;
    return sum - sum == 0.0f;
}

// The fixes' own time stamps (milliseconds) when both carry one, else the
// time they were received.
float LocationFilterKalman::secondsSinceLast(const Location& fix) const {
    if (fix.fixTime > 0 && lastAccepted.fixTime > 0 && fix.fixTime > lastAccepted.fixTime) {
        return static_cast<float>(fix.fixTime - lastAccepted.fixTime) / 1000.0f;
    }
    return Motion::secondsBetween(lastAccepted, fix);
}

Location LocationFilterKalman::adjustLocation(const Location& fix) const {
    float latitudePerMetre, longitudePerMetre;
    Motion::degreesPerMetre(fix.latitude, latitudePerMetre, longitudePerMetre);
    Location adjusted = fix;
    adjusted.latitude = Motion::clampLatitude(fix.latitude + north.position() * latitudePerMetre);
    adjusted.longitude =
        Motion::longitudeDifference(0.0f, fix.longitude + east.position() * longitudePerMetre);
    adjusted.altitude = altitude;
    CoordConversion::toXY(adjusted.latitude, adjusted.longitude, adjusted.x, adjusted.y);
    return adjusted;
}

}  // namespace Location
