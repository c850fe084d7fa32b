#include "location/LocationFilterAveragePosition.h"

#include "location/impl/Motion.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const size_t kWindowSize = 3;

// A fix without a speed is averaged where it stands, as it always was: a
// receiver that never reports speed gives nothing to carry its fixes by.
bool carryingVelocity(const Location& fix, float& vx, float& vy) {
    if (fix.speed < 0.0f) {
        vx = 0.0f;
        vy = 0.0f;
        return true;
    }
    return Motion::velocityXY(fix, vx, vy);
}

// World coordinates saturate at the int32 limits, as CoordConversion's do.
KDint32 shifted(KDint32 value, float by) {
    const double moved = static_cast<double>(value) + kdRoundf(by);
    if (moved >= 2147483647.0) {
        return 0x7FFFFFFF;
    }
    if (moved <= -2147483648.0) {
        return -0x7FFFFFFF - 1;
    }
    return static_cast<KDint32>(moved);
}

}  // namespace

// A plain mean of the last fixes trails a moving receiver by a fix or more (14
// m at city driving speed). So each older fix is first carried forward to the
// newest one's time along the velocities the fixes report, between each two
// fixes by the mean of their velocities so that a turn between them is shared.
// Standing fixes are not moved and average as before. A fix that moves
// without saying where ends the carrying: it and older fixes are left out.
// Sums run over offsets from the newest fix, which single precision keeps
// exactly, rather than over whole latitudes.
Location LocationFilterAveragePosition::filter(const Location& location) {
    window.push_back(location);
    while (window.size() > kWindowSize) {
        window.pop_front();
    }
    const Location& newest = window.back();
    float latitudeOffset = 0.0f;
    float longitudeOffset = 0.0f;
    float altitudeSum = newest.altitude;
    size_t count = 1;
    float carryX = 0.0f;
    float carryY = 0.0f;
    float laterVx, laterVy;
    bool laterKnown = carryingVelocity(newest, laterVx, laterVy);
    for (size_t i = window.size() - 1; laterKnown && i-- > 0;) {
        const Location& older = window[i];
        float vx, vy;
        if (!carryingVelocity(older, vx, vy)) {
            break;
        }
        const float seconds = Motion::secondsBetween(older, window[i + 1]);
        carryX += 0.5f * (vx + laterVx) * seconds;
        carryY += 0.5f * (vy + laterVy) * seconds;
        float latitude = older.latitude;
        float longitude = older.longitude;
        if (carryX != 0.0f || carryY != 0.0f) {
            CoordConversion::toLL(shifted(older.x, carryX), shifted(older.y, carryY), latitude, longitude);
        }
        latitudeOffset += latitude - newest.latitude;
        longitudeOffset += longitude - newest.longitude;
        altitudeSum += older.altitude;
        ++count;
        laterVx = vx;
        laterVy = vy;
    }
    const float n = static_cast<float>(count);
    Location averaged = location;
    averaged.latitude = newest.latitude + latitudeOffset / n;
    averaged.longitude = newest.longitude + longitudeOffset / n;
    averaged.altitude = altitudeSum / n;
    CoordConversion::toXY(averaged.latitude, averaged.longitude, averaged.x, averaged.y);
    return averaged;
}

void LocationFilterAveragePosition::reset() {
    window.clear();
}

}  // namespace Location
