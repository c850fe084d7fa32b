#include "location/LocationFilterAverageCourse.h"

#include "location/impl/BearingMath.h"

namespace Location {

namespace {

const size_t kWindowSize = 3;

}  // namespace

Location LocationFilterAverageCourse::filter(const Location& location) {
    KD_ASSERT(location.bearing != -1);
    if (location.bearing == -1 || location.bearingXY == -1) {
        return location;
    }
    window.push_back(location);
    while (window.size() > kWindowSize) {
        window.pop_front();
    }
    float sinSum = 0.0f;
    float cosSum = 0.0f;
    for (size_t i = 0; i < window.size(); ++i) {
        const float radians = BearingMath::degreesToRadians(window[i].bearingXY);
        sinSum += kdSinf(radians);
        cosSum += kdCosf(radians);
    }
    Location result = location;
    result.bearing = BearingMath::bearingFromSums(sinSum, cosSum);
    result.bearingXY = result.bearing;
    return result;
}

void LocationFilterAverageCourse::reset() {
    window.clear();
}

}  // namespace Location
