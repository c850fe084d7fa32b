#include "location/LocationFilterKalman.h"

#include "location/LocationFilterComplex.h"
#include "location/impl/Motion.h"
#include "math/CoordConversion.h"

namespace Location {

namespace {

const float kAltitudeNoiseFactor = 20.0f;
// A receiver's accuracy is the radius within which the true position lies
// with 68 % probability: 1.5 standard deviations of a round Gaussian error.
const float kAccuracyPerSigma = 1.5f;
// What a reported speed and bearing may be off by, in metres per second.
const float kMotionNoise = 0.5f;

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

// A variance of at least one world unit squared keeps the gain invertible
// for fixes that claim perfect accuracy.
float atLeastOne(float variance) {
    return variance > 1.0f ? variance : 1.0f;
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
    // A speed glitch would push the prediction far ahead; the fix's
    // displacement tells how it really moved.
    const Location fix =
        isValid(lastAccepted) ? Motion::withBelievableMotion(lastAccepted, location) : location;
    if (!isValid(lastAccepted)) {
        originX = fix.x;
        originY = fix.y;
        start(fix);
    } else {
        update(fix, measurementOf(fix));
    }
    // A degenerate fix (zero accuracy standing still) can make the gain
    // singular; start again from this fix rather than hand out NaN.
    if (!isFinite(estimate)) {
        originX = fix.x;
        originY = fix.y;
        start(fix);
    }
    lastAccepted = fix;
    return adjustLocation(location);
}

LocationFilterKalman::Vector LocationFilterKalman::measurementOf(const Location& fix) const {
    return Vector(static_cast<float>(static_cast<double>(fix.x) - originX),
                  static_cast<float>(static_cast<double>(fix.y) - originY), fix.altitude);
}

// The first fix is known as well as its accuracy says, not better: the
// covariance starts from its measurement noise.
void LocationFilterKalman::start(const Location& fix) {
    R = measurementNoise(fix);
    const Matrix inverseH = H.getInverse();
    estimate = times(inverseH, measurementOf(fix));
    P = inverseH * R * H.getTranspose().getInverse();
}

// Noise as variances in world units squared, from the fix's accuracy; the
// altitude keeps its own, coarser model.
Matrix LocationFilterKalman::measurementNoise(const Location& fix) const {
    int sigma = 0;
    CoordConversion::MtoXY(fix.latitude, fix.accuracy / kAccuracyPerSigma, sigma);
    const float variance = atLeastOne(static_cast<float>(sigma) * static_cast<float>(sigma));
    return diagonal(variance, variance, fix.accuracy * kAltitudeNoiseFactor, 1.0f);
}

void LocationFilterKalman::update(const Location& fix, const Vector& measurement) {
    const Step step = stepSinceLast(fix);
    R = measurementNoise(fix);
    const float variance = step.uncertainty * step.uncertainty;
    const Vector previous = measurementOf(lastAccepted);
    Q = diagonal(variance, variance, kdFabsf(measurement.z - previous.z), 1.0f);

    const Vector predicted = plus(times(F, estimate), times(B, step.displacement));
    const Matrix predictedP = F * P * F.getTranspose() + Q;
    const Matrix gain = predictedP * H.getTranspose() * (H * predictedP * H.getTranspose() + R).getInverse();
    const Vector innovation = measurement - times(H, predicted);
    estimate = plus(predicted, times(gain, innovation));
    P = predictedP - gain * H * predictedP;
}

// The prediction moves the estimate by the mean of the velocities the two
// fixes report (a turn between them is shared by both courses); its
// uncertainty grows with the receiver's speed and bearing noise and with the
// change of velocity between the fixes, or, when the fix says nothing about
// where it goes, with the distance it could have covered.
LocationFilterKalman::Step LocationFilterKalman::stepSinceLast(const Location& fix) const {
    const float seconds = secondsSinceLast(fix);
    int noise = 0;
    CoordConversion::vMtovXY(fix.latitude, kMotionNoise, noise);
    float vx, vy, lastVx, lastVy;
    const bool known = Motion::velocityXY(fix, vx, vy);
    const bool lastKnown = Motion::velocityXY(lastAccepted, lastVx, lastVy);
    float change;
    Step step;
    if (known && lastKnown) {
        step.displacement = Vector(0.5f * (vx + lastVx) * seconds, 0.5f * (vy + lastVy) * seconds, 0.0f);
        change = 0.5f * kdSqrtf((vx - lastVx) * (vx - lastVx) + (vy - lastVy) * (vy - lastVy));
    } else if (known) {
        step.displacement = Vector(vx * seconds, vy * seconds, 0.0f);
        change = kdSqrtf(vx * vx + vy * vy);
    } else {
        int reach = 0;
        CoordConversion::vMtovXY(fix.latitude,
                                 fix.speed > Motion::kWalkingPace ? fix.speed : Motion::kWalkingPace, reach);
        change = static_cast<float>(reach);
    }
    step.uncertainty = (static_cast<float>(noise) + change) * seconds;
    return step;
}

// The fixes' own time stamps (milliseconds) when both carry one, else the
// time they were received.
float LocationFilterKalman::secondsSinceLast(const Location& fix) const {
    if (fix.fixTime > 0 && lastAccepted.fixTime > 0 && fix.fixTime > lastAccepted.fixTime) {
        return static_cast<float>(fix.fixTime - lastAccepted.fixTime) / 1000.0f;
    }
    return Motion::secondsBetween(lastAccepted, fix);
}

// Latitude and longitude move from the fix's own by the estimate's offset
// from it: a round trip of the whole position through single-precision world
// coordinates would add a metre or more of rounding.
Location LocationFilterKalman::adjustLocation(const Location& fix) const {
    Location adjusted = fix;
    adjusted.x = toWorld(static_cast<double>(originX) + estimate.x);
    adjusted.y = toWorld(static_cast<double>(originY) + estimate.y);
    const Vector offset = estimate - measurementOf(fix);
    float metresPerUnit = 0.0f;
    CoordConversion::XYtoM(fix.latitude, 1000000, metresPerUnit);
    metresPerUnit /= 1.0e6f;
    float latitudePerMetre, longitudePerMetre;
    Motion::degreesPerMetre(fix.latitude, latitudePerMetre, longitudePerMetre);
    adjusted.latitude = Motion::clampLatitude(fix.latitude - offset.y * metresPerUnit * latitudePerMetre);
    adjusted.longitude = fix.longitude + offset.x * metresPerUnit * longitudePerMetre;
    adjusted.altitude = estimate.z;
    return adjusted;
}

}  // namespace Location
