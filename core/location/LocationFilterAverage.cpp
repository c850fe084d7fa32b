#include "location/LocationFilterAverage.h"

#include <boost/make_shared.hpp>

#include "location/LocationFilterAverageCourse.h"
#include "location/LocationFilterAveragePosition.h"
#include "location/LocationFilterGenerateCourse.h"
#include "location/LocationFilterGenerateSpeed.h"
#include "location/LocationFilterMinDistance.h"
#include "location/impl/Motion.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const float kResetDistanceMetres = 83.0f;

}  // namespace

LocationFilterAverage::LocationFilterAverage() : hasLast(false), hasHeld(false) {
    addFilter(boost::make_shared<LocationFilterMinDistance>());
    addFilter(boost::make_shared<LocationFilterAveragePosition>());
    addFilter(boost::make_shared<LocationFilterGenerateSpeed>());
    addFilter(boost::make_shared<LocationFilterGenerateCourse>());
    addFilter(boost::make_shared<LocationFilterAverageCourse>());
}

Location LocationFilterAverage::filter(const Location& location) {
    if (location.accuracy >= 0.0f && location.precision == PrecisionSatellite) {
        if (isOutlier(location)) {
            hasHeld = true;
            held = location;
            return droppedFix();
        }
        const bool gap = hasLast && Motion::secondsBetween(last, location) > kMaxGapSeconds;
        if (gap || (hasLast && isJump(last, location))) {
            LocationFilterComplex::reset();
        }
        hasLast = true;
        last = location;
        hasHeld = false;
    }
    return LocationFilterComplex::filter(location);
}

bool LocationFilterAverage::isJump(const Location& from, const Location& location) const {
    return CoordConversion::getDistance(from.x, from.y, location.x, location.y) >= kResetDistanceMetres;
}

bool LocationFilterAverage::isOutlier(const Location& location) const {
    if (!hasLast || !isJump(last, location) || Motion::secondsBetween(last, location) > kMaxGapSeconds ||
        Motion::motionExplains(last, location)) {
        return false;
    }
    return !(hasHeld && !isJump(held, location));
}

void LocationFilterAverage::reset() {
    LocationFilterComplex::reset();
    hasLast = false;
    hasHeld = false;
}

}  // namespace Location
