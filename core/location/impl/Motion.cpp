#include "location/impl/Motion.h"

#include "location/impl/BearingMath.h"
#include "math/CoordConversion.h"

namespace Location {
namespace Motion {

const float kWalkingPace = 1.3888890f;

bool velocityXY(const Location& fix, float& vx, float& vy) {
    vx = 0.0f;
    vy = 0.0f;
    if (fix.speed < 0.0f) {
        return false;
    }
    if (fix.bearing < 0.0f) {
        return fix.speed < kWalkingPace;
    }
    int perSecond = 0;
    CoordConversion::vMtovXY(fix.latitude, fix.speed, perSecond);
    const float radians = BearingMath::degreesToRadians(fix.bearing);
    vx = static_cast<float>(perSecond) * kdSinf(radians);
    vy = -static_cast<float>(perSecond) * kdCosf(radians);
    return true;
}

float secondsBetween(const Location& older, const Location& newer) {
    const KDint64 elapsed = static_cast<KDint64>(newer.time - older.time);
    return elapsed > 0 ? static_cast<float>(elapsed) / 1.0e9f : 0.0f;
}

}  // namespace Motion
}  // namespace Location
