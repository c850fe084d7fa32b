#include "location/LocationFilterAveragePosition.h"

#include "location/impl/BearingMath.h"
#include "location/impl/Motion.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const size_t kWindowSize = 3;
// Carrying a fix further than this across a gap guesses more than it knows.
const float kMaxCarrySeconds = 5.0f;

// A fix without a speed is averaged where it stands, as it always was: a
// receiver that never reports speed gives nothing to carry its fixes by.
bool carryingVelocity(const Location& fix, float& east, float& north) {
    if (fix.speed < 0.0f) {
        east = 0.0f;
        north = 0.0f;
        return true;
    }
    return Motion::velocity(fix, east, north);
}

float wrapLongitude(float longitude) {
    return Motion::longitudeDifference(0.0f, longitude);
}

void addAltitude(const Location& fix, float& sum, size_t& count) {
    if (fix.altitude != -1.0f) {
        sum += fix.altitude;
        ++count;
    }
}

}  // namespace

// A plain mean of the last fixes trails a moving receiver by a fix or more (14
// m at city driving speed). So each older fix is first carried forward to the
// newest one's time along the velocities the fixes report, between each two
// fixes by the mean of their velocities so that a turn between them is shared.
// Standing fixes are not moved and average as before. A fix that moves
// without saying where, or across a long gap, ends the carrying: it and older
// fixes are left out.
//
// A fix whose reported speed its displacement belies is carried as the
// displacement says: one glitch of 100 m/s would otherwise throw the mean tens
// of metres ahead for as long as the fix stays in the window.
//
// The mean of three noisy fixes moves by a third of the difference between
// the newest and the one leaving the window: walking at 1.4 m/s with 6 m of
// noise, that now and then takes the mean metres behind where it was, and the
// marker runs back although the walker never turned. So while the newest fix
// reports a direction, the part of the step that goes back along
// the bearing is left out and the marker waits there; sideways it moves
// freely, and a fix that reports a new bearing turns the way with it.
//
// Sums run over offsets from the newest fix, which single precision keeps
// exactly, rather than over whole latitudes. A missing altitude (-1) is left
// out of the altitude's mean rather than averaged as a height.
LocationFilterAveragePosition::LocationFilterAveragePosition()
    : hasShown(false), shownLatitude(0.0f), shownLongitude(0.0f) {}

Location LocationFilterAveragePosition::filter(const Location& location) {
    window.push_back(window.empty() ? location : Motion::withBelievableMotion(window.back(), location));
    while (window.size() > kWindowSize) {
        window.pop_front();
    }
    const Location& newest = window.back();
    float latitudePerMetre, longitudePerMetre;
    Motion::degreesPerMetre(newest.latitude, latitudePerMetre, longitudePerMetre);
    float latitudeOffset = 0.0f;
    float longitudeOffset = 0.0f;
    float altitudeSum = 0.0f;
    size_t altitudeCount = 0;
    addAltitude(newest, altitudeSum, altitudeCount);
    size_t count = 1;
    float carriedEast = 0.0f;
    float carriedNorth = 0.0f;
    float laterEast, laterNorth;
    const bool newestKnown = carryingVelocity(newest, laterEast, laterNorth);
    for (size_t i = window.size() - 1; newestKnown && i-- > 0;) {
        const Location& older = window[i];
        float east, north;
        if (!carryingVelocity(older, east, north)) {
            break;
        }
        const float seconds = Motion::secondsBetween(older, window[i + 1]);
        const bool moved = east != 0.0f || north != 0.0f || laterEast != 0.0f || laterNorth != 0.0f;
        if (moved && seconds > kMaxCarrySeconds) {
            break;
        }
        carriedEast += 0.5f * (east + laterEast) * seconds;
        carriedNorth += 0.5f * (north + laterNorth) * seconds;
        latitudeOffset += older.latitude - newest.latitude + carriedNorth * latitudePerMetre;
        longitudeOffset +=
            Motion::longitudeDifference(newest.longitude, older.longitude) + carriedEast * longitudePerMetre;
        addAltitude(older, altitudeSum, altitudeCount);
        ++count;
        laterEast = east;
        laterNorth = north;
    }
    const float n = static_cast<float>(count);
    float latitude = newest.latitude + latitudeOffset / n;
    float longitude = newest.longitude + longitudeOffset / n;
    keepFromGoingBack(newest, latitude, longitude);
    Location averaged = location;
    averaged.latitude = Motion::clampLatitude(latitude);
    averaged.longitude = wrapLongitude(longitude);
    hasShown = true;
    shownLatitude = averaged.latitude;
    shownLongitude = averaged.longitude;
    averaged.altitude = altitudeCount > 0 ? altitudeSum / static_cast<float>(altitudeCount) : -1.0f;
    CoordConversion::toXY(averaged.latitude, averaged.longitude, averaged.x, averaged.y);
    return averaged;
}

void LocationFilterAveragePosition::keepFromGoingBack(const Location& newest, float& latitude,
                                                      float& longitude) const {
    if (!hasShown || !Motion::reportsDirection(newest)) {
        return;
    }
    float latitudePerMetre, longitudePerMetre;
    Motion::degreesPerMetre(newest.latitude, latitudePerMetre, longitudePerMetre);
    const float radians = BearingMath::degreesToRadians(newest.bearing);
    const float alongEast = kdSinf(radians);
    const float alongNorth = kdCosf(radians);
    const float east = Motion::longitudeDifference(shownLongitude, longitude) / longitudePerMetre;
    const float north = (latitude - shownLatitude) / latitudePerMetre;
    const float along = east * alongEast + north * alongNorth;
    if (along < 0.0f) {
        latitude -= along * alongNorth * latitudePerMetre;
        longitude -= along * alongEast * longitudePerMetre;
    }
}

void LocationFilterAveragePosition::reset() {
    window.clear();
    hasShown = false;
    shownLatitude = 0.0f;
    shownLongitude = 0.0f;
}

}  // namespace Location
