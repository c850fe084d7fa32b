#include "location/LocationSmoother.h"

#include "location/impl/Motion.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

bool isDropped(const Location& location) {
    return location.accuracy < 0.0f || location.precision == PrecisionNone;
}

}  // namespace

LocationSmoother::LocationSmoother() : selected(Chain) {
    reset();
}

void LocationSmoother::select(Kind kind) {
    if (kind == selected) {
        return;
    }
    selected = kind;
    const Location& next = kind == Chain ? lastChain : lastKalman;
    if (isDropped(lastShown) || isDropped(next)) {
        return;
    }
    glideLatitude = lastShown.latitude - next.latitude;
    glideLongitude = Motion::longitudeDifference(next.longitude, lastShown.longitude);
    glideLeft = kSwitchFixes;
}

Location LocationSmoother::filter(const Location& location) {
    const Location fromChain = chain.filter(location);
    const Location fromKalman = kalman.filter(location);
    if (!isDropped(fromChain)) {
        lastChain = fromChain;
    }
    if (!isDropped(fromKalman)) {
        lastKalman = fromKalman;
    }
    Location result = selected == Chain ? fromChain : fromKalman;
    if (isDropped(result)) {
        return result;
    }
    glide(result);
    lastShown = result;
    return result;
}

// Moves the result by a shrinking share of the offset there was at the switch:
// four fifths on the first fix after it, nothing on the fifth.
void LocationSmoother::glide(Location& result) {
    if (glideLeft == 0) {
        return;
    }
    --glideLeft;
    const float share = static_cast<float>(glideLeft) / static_cast<float>(kSwitchFixes);
    result.latitude = Motion::clampLatitude(result.latitude + share * glideLatitude);
    result.longitude = Motion::longitudeDifference(0.0f, result.longitude + share * glideLongitude);
    CoordConversion::toXY(result.latitude, result.longitude, result.x, result.y);
}

void LocationSmoother::reset() {
    chain.reset();
    kalman.reset();
    lastChain = LocationFilterComplex::droppedFix();
    lastKalman = LocationFilterComplex::droppedFix();
    lastShown = LocationFilterComplex::droppedFix();
    glideLatitude = 0.0f;
    glideLongitude = 0.0f;
    glideLeft = 0;
}

}  // namespace Location
