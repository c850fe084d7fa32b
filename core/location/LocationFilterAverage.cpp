#include "location/LocationFilterAverage.h"

#include <boost/make_shared.hpp>

#include "location/LocationFilterAverageCourse.h"
#include "location/LocationFilterAveragePosition.h"
#include "location/LocationFilterGenerateCourse.h"
#include "location/LocationFilterGenerateSpeed.h"
#include "location/LocationFilterMinDistance.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const float kResetDistanceMetres = 83.0f;

}  // namespace

LocationFilterAverage::LocationFilterAverage() : lastX(0), lastY(0) {
    addFilter(boost::make_shared<LocationFilterMinDistance>());
    addFilter(boost::make_shared<LocationFilterAveragePosition>());
    addFilter(boost::make_shared<LocationFilterGenerateSpeed>());
    addFilter(boost::make_shared<LocationFilterGenerateCourse>());
    addFilter(boost::make_shared<LocationFilterAverageCourse>());
}

Location LocationFilterAverage::filter(const Location& location) {
    if (location.accuracy >= 0.0f && location.precision == PrecisionSatellite) {
        const bool hasLast = lastX != 0 && lastY != 0;
        if (hasLast &&
            CoordConversion::getDistance(lastX, lastY, location.x, location.y) >= kResetDistanceMetres) {
            reset();
        }
        lastX = location.x;
        lastY = location.y;
    }
    return LocationFilterComplex::filter(location);
}

}  // namespace Location
