#include "location/LocationFilterMinDistance.h"

#include "location/impl/Motion.h"
#include "math/CoordConversion.h"

namespace Location {

LocationFilterMinDistance::LocationFilterMinDistance()
    : hasLast(false), lastLatitude(0.0f), lastLongitude(0.0f) {}

Location LocationFilterMinDistance::filter(const Location& location) {
    if (!hasLast) {
        hasLast = true;
        lastLatitude = location.latitude;
        lastLongitude = location.longitude;
        return location;
    }
    const float distance =
        CoordConversion::getDistance(lastLatitude, lastLongitude, location.latitude, location.longitude);
    // A fix that reports moving along a bearing has not jittered away, it
    // has gone there: holding it back would make the position trail behind.
    if (0.5f * location.accuracy < distance || Motion::isMoving(location)) {
        lastLatitude = location.latitude;
        lastLongitude = location.longitude;
        return location;
    }
    Location held = location;
    held.latitude = lastLatitude;
    held.longitude = lastLongitude;
    CoordConversion::toXY(held.latitude, held.longitude, held.x, held.y);
    return held;
}

void LocationFilterMinDistance::reset() {
    hasLast = false;
    lastLatitude = 0.0f;
    lastLongitude = 0.0f;
}

}  // namespace Location
