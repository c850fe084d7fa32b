#include "location/LocationFilterGenerateCourse.h"

#include "location/impl/BearingMath.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const float kFastSpeed = 2.7777779f;    // 10 km/h
const float kMovingSpeed = 1.3888890f;  // 5 km/h
const float kBearingAccuracy = 50.0f;   // metres
const KDtime kFastMemorySeconds = 600;
const float kMaxGateMetres = 75.0f;

}  // namespace

LocationFilterGenerateCourse::LocationFilterGenerateCourse() {
    reset();
}

Location LocationFilterGenerateCourse::filter(const Location& location) {
    if (location.speed >= kFastSpeed) {
        lastFastMovementTime = kdTime(nullptr);
    }
    float course;
    if (location.bearing >= 0.0f && location.accuracy < kBearingAccuracy && location.speed >= kMovingSpeed) {
        // Remembered too: the course of a fix that carries its own bearing is
        // the best known, and the course average works on remembered courses.
        course = location.bearing;
        lastCourse = course;
        anchorX = location.x;
        anchorY = location.y;
    } else if (anchorX == 0 && anchorY == 0) {
        anchorX = location.x;
        anchorY = location.y;
        course = lastCourse;
    } else {
        course = courseFromAnchor(location);
    }
    Location result = location;
    result.bearing = course;
    result.bearingXY = lastCourse;
    if (lastCourse == -1.0f) {
        result.precision = PrecisionNetwork;
    }
    return result;
}

float LocationFilterGenerateCourse::courseFromAnchor(const Location& location) {
    const bool recentlyFast = kdTime(nullptr) - lastFastMovementTime <= kFastMemorySeconds;
    if (recentlyFast) {
        float gate = 2.0f * location.accuracy;
        if (gate > kMaxGateMetres) {
            gate = kMaxGateMetres;
        }
        if (!(CoordConversion::getDistance(anchorX, anchorY, location.x, location.y) > gate)) {
            return lastCourse;
        }
    }
    const float dx = static_cast<float>(location.x) - static_cast<float>(anchorX);
    const float dy = static_cast<float>(location.y) - static_cast<float>(anchorY);
    if (dx == 0.0f && dy == 0.0f) {
        return lastCourse;
    }
    lastCourse = BearingMath::bearingOf(dx, dy);
    anchorX = location.x;
    anchorY = location.y;
    return lastCourse;
}

void LocationFilterGenerateCourse::reset() {
    lastFastMovementTime = 0;
    anchorX = 0;
    anchorY = 0;
    lastCourse = -1.0f;
}

}  // namespace Location
