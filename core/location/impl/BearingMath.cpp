#include "location/impl/BearingMath.h"

#include <KD/kd.h>

namespace Location {
namespace BearingMath {

namespace {

const float kPi = 3.1415927f;

float radiansToDegrees(float x) {
    KD_ASSERT(x != -1.f);
    return x * 180.0f / kPi;
}

}  // namespace

float normalizeDegrees(float x) {
    const float zero = 0.0f;
    float g = x - 360.0f * kdFloorf(x / 360.0f);
    // A tiny negative angle rounds up to exactly 360 in single precision.
    if (g >= 360.0f) {
        g = 0.0f;
    }
    KD_ASSERT(g >= zero && g < zero + 360.0f);
    return g;
}

float degreesToRadians(float grad) {
    KD_ASSERT(grad != -1.f);
    return grad * kPi / 180.0f;
}

float bearingOf(float dx, float dy) {
    KD_ASSERT(dx != 0 || dy != 0);
    return normalizeDegrees(radiansToDegrees(kdAtan2f(dx, -dy)));
}

float bearingFromSums(float sinSum, float cosSum) {
    return normalizeDegrees(radiansToDegrees(kdAtan2f(sinSum, cosSum)));
}

}  // namespace BearingMath
}  // namespace Location
