#include "location/LocationFilterKalman.h"

#include "location/LocationFilterComplex.h"
#include "location/impl/BearingMath.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const float kPositionNoiseMetres = 20.0f;
const float kAltitudeNoiseFactor = 20.0f;

bool isValid(const Location& location) {
    return location.accuracy >= 0.0f && location.precision != PrecisionNone;
}

// Column-vector products: the state lives in the first three rows, the
// fourth dimension only keeps the matrices invertible.
Vertex<3, float> times(const Matrix& a, const Vertex<3, float>& v) {
    return Vertex<3, float>(a.m[0] * v.x + a.m[1] * v.y + a.m[2] * v.z,
                            a.m[4] * v.x + a.m[5] * v.y + a.m[6] * v.z,
                            a.m[8] * v.x + a.m[9] * v.y + a.m[10] * v.z);
}

Vertex<3, float> plus(const Vertex<3, float>& a, const Vertex<3, float>& b) {
    return Vertex<3, float>(a.x + b.x, a.y + b.y, a.z + b.z);
}

bool isFinite(const Vertex<3, float>& v) {
    const float sum = v.x + v.y + v.z;
    return sum - sum == 0.0f;
}

// World coordinates saturate at the int32 limits, as CoordConversion's do.
KDint32 toWorld(double value) {
    if (value >= 2147483647.0) {
        return 0x7FFFFFFF;
    }
    if (value <= -2147483648.0) {
        return -0x7FFFFFFF - 1;
    }
    return static_cast<KDint32>(value);
}

Matrix diagonal(float a, float b, float c, float d) {
    return Matrix(a, 0, 0, 0, 0, b, 0, 0, 0, 0, c, 0, 0, 0, 0, d);
}

}  // namespace

LocationFilterKalman::LocationFilterKalman() {
    reset();
}

void LocationFilterKalman::reset() {
    originX = 0;
    originY = 0;
    // Without this the next fix would be taken as a measurement relative to
    // origin (0, 0) and the estimate would crawl in from the world's corner.
    lastAccepted = Location();
    lastAccepted.x = -1;
    lastAccepted.y = -1;
    estimate = Vector();
    F = Matrix::IDENTITY;
    H = Matrix::IDENTITY;
    P = Matrix::IDENTITY;
    B = Matrix::IDENTITY;
    Q = Matrix();
    R = Matrix::IDENTITY;
}

Location LocationFilterKalman::filter(const Location& location) {
    if (!isValid(location)) {
        return LocationFilterComplex::droppedFix();
    }
    if (!isValid(lastAccepted)) {
        originX = location.x;
        originY = location.y;
        start(measurementOf(location));
    } else {
        update(location, measurementOf(location));
    }
    // A degenerate fix (zero accuracy standing still) can make the gain
    // singular; start again from this fix rather than hand out NaN.
    if (!isFinite(estimate)) {
        originX = location.x;
        originY = location.y;
        start(measurementOf(location));
    }
    lastAccepted = location;
    return adjustLocation(location);
}

LocationFilterKalman::Vector LocationFilterKalman::measurementOf(const Location& fix) const {
    return Vector(static_cast<float>(static_cast<double>(fix.x) - originX),
                  static_cast<float>(static_cast<double>(fix.y) - originY), fix.altitude);
}

void LocationFilterKalman::start(const Vector& measurement) {
    const Matrix inverseH = H.getInverse();
    estimate = times(inverseH, measurement);
    P = inverseH * R * H.getTranspose().getInverse();
}

void LocationFilterKalman::update(const Location& fix, const Vector& measurement) {
    int metresXY = 0;
    CoordConversion::MtoXY(fix.latitude, kPositionNoiseMetres, metresXY);
    const float a = fix.accuracy;
    R = diagonal(a * metresXY, a * metresXY, a * kAltitudeNoiseFactor, 1.0f);
    const Vector previous = measurementOf(lastAccepted);
    Q = diagonal(kdFabsf(measurement.x - previous.x), kdFabsf(measurement.y - previous.y),
                 kdFabsf(measurement.z - previous.z), 1.0f);

    const Vector predicted = plus(times(F, estimate), times(B, controlOf(fix)));
    const Matrix predictedP = F * P * F.getTranspose() + Q;
    const Matrix gain = predictedP * H.getTranspose() * (H * predictedP * H.getTranspose() + R).getInverse();
    const Vector innovation = measurement - times(H, predicted);
    estimate = plus(predicted, times(gain, innovation));
    P = predictedP - gain * H * predictedP;
}

LocationFilterKalman::Vector LocationFilterKalman::controlOf(const Location& fix) const {
    if (fix.speedXY < 0 || fix.bearing < 0.0f) {
        return Vector();
    }
    const float seconds = static_cast<float>(fix.fixTime - lastAccepted.fixTime) / 1000.0f;
    const float distance = static_cast<float>(fix.speedXY) * seconds;
    const float radians = BearingMath::degreesToRadians(fix.bearing);
    return Vector(distance * kdSinf(radians), -distance * kdCosf(radians), 0.0f);
}

Location LocationFilterKalman::adjustLocation(const Location& fix) const {
    Location adjusted = fix;
    adjusted.x = toWorld(static_cast<double>(originX) + estimate.x);
    adjusted.y = toWorld(static_cast<double>(originY) + estimate.y);
    CoordConversion::toLL(adjusted.x, adjusted.y, adjusted.latitude, adjusted.longitude);
    adjusted.altitude = estimate.z;
    return adjusted;
}

}  // namespace Location
