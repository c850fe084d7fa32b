#pragma once

#include <KD/kd.h>

#include "location/Location.h"
#include "math/CoordConversion.h"

namespace location_test {

const float kMetresPerDegreeLatitude = 111320.0f;

// A satellite fix `north` and `east` metres from (lat, lon), received at
// timeNs, in both raw and world form.
inline Location::Location fixNear(float lat, float lon, float north, float east, float accuracy, KDust timeNs,
                                  float speed = -1.0f, float bearing = -1.0f,
                                  Location::LocationPrecision precision = Location::PrecisionSatellite) {
    Location::RawLocation raw = Location::RawLocation::unknown;
    raw.latitude = lat + north / kMetresPerDegreeLatitude;
    raw.longitude = lon + east / (kMetresPerDegreeLatitude * kdCosf(lat * 0.017453292f));
    raw.accuracy = accuracy;
    raw.speed = speed;
    raw.bearing = bearing;
    raw.precision = precision;
    raw.time = timeNs;
    Location::Location location(raw);
    location.initFromRaw();
    return location;
}

inline float metresBetween(const Location::Location& a, const Location::Location& b) {
    return CoordConversion::getDistance(a.latitude, a.longitude, b.latitude, b.longitude);
}

}  // namespace location_test
