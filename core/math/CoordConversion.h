#pragma once

#include <KD/kd.h>

// Conversions between geographic coordinates (degrees, WGS 84), Mercator world
// coordinates and metres, and distances on the ellipsoid.
//
// World coordinates are signed 32-bit integers on the elliptical Mercator
// projection with 2^31 units around the equator: X grows eastwards from 0 at
// longitude -180, Y grows southwards from 0 at northing +20037508 m. Results
// that do not fit in 32 bits saturate at the int32 limits.
//
// Stateless apart from the eccentricity computed at load; any thread may call it.
class CoordConversion {
public:
    // First eccentricity of the WGS 84 ellipsoid as used by the projection.
    static const float eK;

    static float GPS_Math_Deg_To_Rad(float degrees);
    static float GPS_Math_Rad_To_Deg(float radians);

    // Projected Mercator metres <-> world units.
    static int MercToXY(float metres);
    static float XYtoMerc(int xy);

    // A ground length at a latitude <-> world units (the Mercator scale factor).
    static void MtoXY(float latDeg, float metres, int& xy);
    static void XYtoM(float latDeg, int xy, float& metres);

    // The same conversions for speeds: metres per second <-> world units per second.
    static void vMtovXY(float latDeg, float metresPerSecond, int& xyPerSecond);
    static void vXYtovM(float latDeg, int xyPerSecond, float& metresPerSecond);

    // Latitudes are clamped to +-89.3 degrees; longitudes beyond +-180 give the
    // world's edge (0 or 0x7FFFFFFF).
    static void toXY(float latDeg, float lonDeg, int& x, int& y);
    static void toLL(int x, int y, float& latDeg, float& lonDeg);

    // Distances in metres: a spherical central angle times the ellipsoid's
    // radius of curvature in the direction of travel at the mean latitude.
    static float getDistance(float lat1, float lon1, float lat2, float lon2);
    static float getDistance(int x1, int y1, int x2, int y2);
    // Length of an east-west run of dx world units along world row y.
    static float getDistanceXY(float dx, float y);

    // a / b, or 1 when b is 0.
    static float __divc(float a, float b);
};
