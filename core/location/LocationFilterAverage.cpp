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

LocationFilterAverage::LocationFilterAverage() : hasLast(false) {
    addFilter(boost::make_shared<LocationFilterMinDistance>());
    addFilter(boost::make_shared<LocationFilterAveragePosition>());
    addFilter(boost::make_shared<LocationFilterGenerateSpeed>());
    addFilter(boost::make_shared<LocationFilterGenerateCourse>());
    addFilter(boost::make_shared<LocationFilterAverageCourse>());
}

Location LocationFilterAverage::filter(const Location& location) {
    if (location.accuracy >= 0.0f && location.precision == PrecisionSatellite) {
        if (startsAfresh(location)) {
            LocationFilterComplex::reset();
        }
        hasLast = true;
        last = location;
    }
    return LocationFilterComplex::filter(location);
}

bool LocationFilterAverage::startsAfresh(const Location& location) const {
    if (!hasLast) {
        return false;
    }
    return CoordConversion::getDistance(last.x, last.y, location.x, location.y) >= kResetDistanceMetres ||
           Motion::secondsBetween(last, location) > kMaxGapSeconds;
}

void LocationFilterAverage::reset() {
    LocationFilterComplex::reset();
    hasLast = false;
}

}  // namespace Location
