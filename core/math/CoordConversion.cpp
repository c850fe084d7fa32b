#include "math/CoordConversion.h"

namespace {

const float kXYPerMetre = 53.586594f;     // 2^31 / (2 pi a)
const float kXYPerRadian = 341782624.0f;  // 2^31 / (2 pi)
const float kEquatorialRadius = 6378137.0f;
const float kHalfWorldWidth = 20037508.0f;
const float kDegToRad = 0.017453292f;
const float kRadToDeg = 57.295776f;
const float kQuarterPi = 0.7853982f;
const float kHalfPi = 1.5707964f;
const float kPi = 3.1415927f;
const float kMaxLatitude = 89.3f;

// The distance formulas carry their own ellipsoid values: e^2 and a(1 - e^2).
const float kDistanceE2 = 0.0067056213f;
const float kMeridionalNumerator = 6335367.5f;

// Truncation toward zero that saturates at the int32 limits and maps NaN to 0,
// as the ARM conversion instruction does. A plain cast is undefined outside the
// range (x86 turns 2^31, the east edge of the world, into INT_MIN).
KDint32 truncateToInt(float value) {
    if (value != value) {
        return 0;
    }
    if (value >= 2147483648.0f) {
        return 0x7FFFFFFF;
    }
    if (value <= -2147483648.0f) {
        return -0x7FFFFFFF - 1;
    }
    return static_cast<KDint32>(value);
}

float clamp(float value, float low, float high) {
    if (value < low) {
        return low;
    }
    if (value > high) {
        return high;
    }
    return value;
}

// The Mercator scale factor. The absolute value keeps the sign of the length
// at +-90 degrees, where the float cosine of the pole comes out as -4e-8.
float groundScale(float latDeg) {
    return kdFabsf(kdCosf(latDeg * kDegToRad));
}

// Geodetic latitude in radians of world row y, before any clamping: the
// conformal latitude of the spherical inverse, then its series expansion.
float latitudeOfRow(float y) {
    const float t = (-y / kXYPerMetre + kHalfWorldWidth) / kEquatorialRadius;
    const float chi = kHalfPi - 2.0f * kdAtanf(1.0f / kdExpf(t));
    return chi + 0.0033565515f * kdSinf(2.0f * chi) + 6.5718727e-6f * kdSinf(4.0f * chi) +
           1.7645643e-8f * kdSinf(6.0f * chi) + 5.3284783e-11f * kdSinf(8.0f * chi);
}

// lon1 - lon2 taken the short way round. Points on both sides of the
// antimeridian are subtracted relative to +-180, which is exact for close
// points; a plain difference of about 360 would lose metres to rounding.
float longitudeDifference(float lon1, float lon2) {
    const float difference = lon1 - lon2;
    if (difference > 180.0f) {
        return (lon1 - 180.0f) - (lon2 + 180.0f);
    }
    if (difference < -180.0f) {
        return (lon1 + 180.0f) - (lon2 - 180.0f);
    }
    return difference;
}

// Central angle C times Euler's radius of curvature in the azimuth whose sine
// is azimuthTerm / sin C, with the principal radii at the given latitude.
float distanceOnEllipsoid(float centralAngle, float azimuthTerm, float sinLatitude) {
    const float w = 1.0f - kDistanceE2 * sinLatitude * sinLatitude;
    const float meridional = CoordConversion::__divc(kMeridionalNumerator, kdPowf(w, 1.5f));
    const float transverse = CoordConversion::__divc(kEquatorialRadius, kdSqrtf(w));
    const float sinCentralAngle = kdSinf(centralAngle);
    // Distinct points closer than float resolves give no azimuth; the angle is
    // (next to) zero anyway, so any radius serves.
    if (sinCentralAngle == 0.0f) {
        return centralAngle * meridional;
    }
    const float sinAzimuth = clamp(azimuthTerm / sinCentralAngle, -1.0f, 1.0f);
    const float sin2 = sinAzimuth * sinAzimuth;
    const float radius =
        CoordConversion::__divc(meridional * transverse, transverse * (1.0f - sin2) + meridional * sin2);
    return centralAngle * radius;
}

}  // namespace

const float CoordConversion::eK = kdSqrtf(0.0066943765f);

float CoordConversion::GPS_Math_Deg_To_Rad(float degrees) {
    return degrees * kDegToRad;
}

float CoordConversion::GPS_Math_Rad_To_Deg(float radians) {
    return radians * kRadToDeg;
}

int CoordConversion::MercToXY(float metres) {
    return truncateToInt(metres * kXYPerMetre);
}

float CoordConversion::XYtoMerc(int xy) {
    return xy / kXYPerMetre;
}

void CoordConversion::MtoXY(float latDeg, float metres, int& xy) {
    xy = truncateToInt(metres * kXYPerMetre / groundScale(latDeg));
}

void CoordConversion::XYtoM(float latDeg, int xy, float& metres) {
    metres = xy * groundScale(latDeg) / kXYPerMetre;
}

void CoordConversion::vMtovXY(float latDeg, float metresPerSecond, int& xyPerSecond) {
    MtoXY(latDeg, metresPerSecond, xyPerSecond);
}

void CoordConversion::vXYtovM(float latDeg, int xyPerSecond, float& metresPerSecond) {
    XYtoM(latDeg, xyPerSecond, metresPerSecond);
}

void CoordConversion::toXY(float latDeg, float lonDeg, int& x, int& y) {
    if (lonDeg > 180.0f) {
        x = 0x7FFFFFFF;
    } else if (lonDeg < -180.0f) {
        x = 0;
    } else {
        // Where the compiler fuses the multiply and the add (ARM), the product
        // keeps the rounding that a separate multiply drops, and -180 degrees
        // lands a metre west of the world: the west edge saturates as the
        // east edge does.
        const KDint32 column =
            truncateToInt((kHalfWorldWidth + lonDeg * kDegToRad * kEquatorialRadius) * kXYPerMetre);
        x = column < 0 ? 0 : column;
    }

    const float phi = clamp(latDeg, -kMaxLatitude, kMaxLatitude) * kDegToRad;
    const float eSinPhi = eK * kdSinf(phi);
    const float northing =
        kdLogf(kdTanf(kQuarterPi + phi / 2.0f) / kdPowf(kdTanf(kQuarterPi + kdAsinf(eSinPhi) / 2.0f), eK)) *
        kEquatorialRadius;
    // Written as the truncation of the negated product (the same value) so that
    // rows south of the world square saturate at the south edge instead of
    // overflowing on negation.
    y = truncateToInt((kHalfWorldWidth - northing) * kXYPerMetre);
}

void CoordConversion::toLL(int x, int y, float& latDeg, float& lonDeg) {
    float phi = latitudeOfRow(static_cast<float>(y));
    float lambda = (x / kXYPerMetre - kHalfWorldWidth) / kEquatorialRadius;
    if (kdFabsf(phi) > kHalfPi) {
        phi = phi > 0.0f ? kHalfPi : -kHalfPi;
    }
    if (kdFabsf(lambda) > kPi) {
        lambda = lambda > 0.0f ? kPi : -kPi;
    }
    latDeg = phi * kRadToDeg;
    lonDeg = lambda * kRadToDeg;
}

float CoordConversion::getDistance(float lat1, float lon1, float lat2, float lon2) {
    if (lat1 == lat2 && lon1 == lon2) {
        return 0.0f;
    }
    // Differences are taken in degrees before scaling: exact for close points,
    // where converting each coordinate first would round away centimetres.
    const float deltaLat = (lat1 - lat2) * kDegToRad;
    const float deltaLon = longitudeDifference(lon1, lon2) * kDegToRad;
    const float sinHalfLat = kdSinf(deltaLat / 2.0f);
    const float sinHalfLon = kdSinf(deltaLon / 2.0f);
    const float cosLat2 = kdCosf(lat2 * kDegToRad);
    const float h =
        kdSqrtf(sinHalfLat * sinHalfLat + kdCosf(lat1 * kDegToRad) * cosLat2 * sinHalfLon * sinHalfLon);
    const float centralAngle = 2.0f * kdAsinf(clamp(h, -1.0f, 1.0f));
    const float meanLatitude = (lat1 + lat2) / 2.0f * kDegToRad;
    return distanceOnEllipsoid(centralAngle, cosLat2 * kdSinf(deltaLon), kdSinf(meanLatitude));
}

float CoordConversion::getDistance(int x1, int y1, int x2, int y2) {
    float lat1, lon1, lat2, lon2;
    toLL(x1, y1, lat1, lon1);
    toLL(x2, y2, lat2, lon2);
    return getDistance(lat1, lon1, lat2, lon2);
}

float CoordConversion::getDistanceXY(float dx, float y) {
    if (dx == 0.0f) {
        return 0.0f;
    }
    const float phi = latitudeOfRow(y);
    const float deltaLambda = dx / kXYPerRadian;
    const float cosPhi = kdCosf(phi);
    const float h = kdFabsf(cosPhi * kdSinf(deltaLambda / 2.0f));
    const float centralAngle = 2.0f * kdAsinf(clamp(h, -1.0f, 1.0f));
    return distanceOnEllipsoid(centralAngle, cosPhi * kdSinf(deltaLambda), kdSinf(phi));
}

float CoordConversion::__divc(float a, float b) {
    return b == 0.0f ? 1.0f : a / b;
}
