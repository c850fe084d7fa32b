#include "location/LocationFilterAveragePosition.h"

#include "math/CoordConversion.h"

namespace Location {

namespace {

const size_t kWindowSize = 3;

}  // namespace

Location LocationFilterAveragePosition::filter(const Location& location) {
    window.push_back(location);
    while (window.size() > kWindowSize) {
        window.pop_front();
    }
    float latitudeSum = 0.0f;
    float longitudeSum = 0.0f;
    float altitudeSum = 0.0f;
    for (size_t i = 0; i < window.size(); ++i) {
        latitudeSum += window[i].latitude;
        longitudeSum += window[i].longitude;
        altitudeSum += window[i].altitude;
    }
    const float count = static_cast<float>(window.size());
    Location averaged = location;
    averaged.latitude = latitudeSum / count;
    averaged.longitude = longitudeSum / count;
    averaged.altitude = altitudeSum / count;
    CoordConversion::toXY(averaged.latitude, averaged.longitude, averaged.x, averaged.y);
    return averaged;
}

void LocationFilterAveragePosition::reset() {
    window.clear();
}

}  // namespace Location
