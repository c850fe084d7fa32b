#include "location/impl/Motion.h"

#include "location/impl/BearingMath.h"
#include "math/CoordConversion.h"

namespace Location {
namespace Motion {

namespace {

const float kSemiMajorAxis = 6378137.0f;
const float kEccentricitySquared = 0.0066943800f;
// As the world projection, which stops there; the east-west scale would grow
// without bound towards the pole.
const float kMaxLatitude = 89.3f;

// Faster than anything that carries a receiver.
const float kMaxSpeed = 1.0e4f;

// How far a reported speed may be off the displacement beyond what the two
// fixes' accuracies explain: speed noise of a receiver, and a turn between
// fixes that makes the straight displacement shorter than the way driven.
const float kSpeedSlack = 2.0f;

// Written so that NaN is neither.
bool hasSpeed(const Location& fix) {
    return fix.speed >= 0.0f && fix.speed <= kMaxSpeed;
}

bool hasBearing(const Location& fix) {
    return fix.bearing >= 0.0f && fix.bearing <= 360.0f;
}

}  // namespace

const float kWalkingPace = 1.3888890f;

bool velocity(const Location& fix, float& east, float& north) {
    east = 0.0f;
    north = 0.0f;
    if (!hasSpeed(fix)) {
        return false;
    }
    if (!hasBearing(fix)) {
        return fix.speed < kWalkingPace;
    }
    const float radians = BearingMath::degreesToRadians(fix.bearing);
    east = fix.speed * kdSinf(radians);
    north = fix.speed * kdCosf(radians);
    return true;
}

bool velocityXY(const Location& fix, float& vx, float& vy) {
    float east, north;
    const bool known = velocity(fix, east, north);
    // World units per metre at the fix, kept to a hundredth of a unit.
    int perHundredMetres = 0;
    CoordConversion::MtoXY(fix.latitude, 100.0f, perHundredMetres);
    const float scale = static_cast<float>(perHundredMetres) / 100.0f;
    vx = east * scale;
    vy = -north * scale;
    return known;
}

bool isMoving(const Location& fix) {
    return hasSpeed(fix) && fix.speed >= kWalkingPace && hasBearing(fix);
}

bool reportsDirection(const Location& fix) {
    return hasSpeed(fix) && fix.speed > 0.0f && hasBearing(fix);
}

// From the meridian and prime-vertical radii of curvature.
void degreesPerMetre(float latitude, float& latitudeDegrees, float& longitudeDegrees) {
    const float absolute = kdFabsf(latitude);
    const float radians = BearingMath::degreesToRadians(absolute < kMaxLatitude ? absolute : kMaxLatitude);
    const float sine = kdSinf(radians);
    const float w = kdSqrtf(1.0f - kEccentricitySquared * sine * sine);
    const float meridian = kSemiMajorAxis * (1.0f - kEccentricitySquared) / (w * w * w);
    const float primeVertical = kSemiMajorAxis / w;
    const float degreesPerRadian = 57.295776f;
    latitudeDegrees = degreesPerRadian / meridian;
    longitudeDegrees = degreesPerRadian / (primeVertical * kdCosf(radians));
}

bool motionExplains(const Location& previous, const Location& fix) {
    const float seconds = secondsBetween(previous, fix);
    if (!hasSpeed(fix) || seconds <= 0.0f) {
        return true;
    }
    const float moved =
        CoordConversion::getDistance(previous.latitude, previous.longitude, fix.latitude, fix.longitude);
    const float unexplained = kdFabsf(fix.speed * seconds - moved);
    const float tolerance = previous.accuracy + fix.accuracy + kSpeedSlack * seconds;
    return !(unexplained > tolerance);
}

Location withBelievableMotion(const Location& previous, const Location& fix) {
    if (motionExplains(previous, fix)) {
        return fix;
    }
    Location believed = fix;
    believed.speed = previous.speed;
    believed.bearing = previous.bearing;
    believed.speedXY = previous.speedXY;
    believed.bearingXY = previous.bearingXY;
    return believed;
}

float clampLatitude(float latitude) {
    if (latitude > 90.0f) {
        return 90.0f;
    }
    return latitude < -90.0f ? -90.0f : latitude;
}

float longitudeDifference(float from, float to) {
    const float difference = to - from;
    if (difference > 180.0f) {
        return difference - 360.0f;
    }
    return difference < -180.0f ? difference + 360.0f : difference;
}

float secondsBetween(const Location& older, const Location& newer) {
    const KDint64 elapsed = static_cast<KDint64>(newer.time - older.time);
    return elapsed > 0 ? static_cast<float>(elapsed) / 1.0e9f : 0.0f;
}

}  // namespace Motion
}  // namespace Location
