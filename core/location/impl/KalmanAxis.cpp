#include "location/impl/KalmanAxis.h"

namespace Location {

namespace {

// Two standard deviations, squared.
const float kWidenBeyond = 4.0f;

}  // namespace

KalmanAxis::KalmanAxis() : estimatedPosition(0.0f), estimatedVelocity(0.0f), pp(1.0f), pv(0.0f), vv(1.0f) {}

void KalmanAxis::start(float position, float positionVariance, float velocity, float velocityVariance) {
    estimatedPosition = position;
    estimatedVelocity = velocity;
    pp = positionVariance;
    pv = 0.0f;
    vv = velocityVariance;
}

// P = F P F' + Q with F = [1 t; 0 1] and the discrete white-acceleration Q.
void KalmanAxis::predict(float seconds, float accelerationDensity) {
    const float t = seconds;
    estimatedPosition += estimatedVelocity * t;
    pp += 2.0f * t * pv + t * t * vv + accelerationDensity * t * t * t / 3.0f;
    pv += t * vv + accelerationDensity * t * t / 2.0f;
    vv += accelerationDensity * t;
}

// H = [1 0]: the gain is the first column of P over the innovation variance.
void KalmanAxis::measurePosition(float position, float variance) {
    const float innovationVariance = pp + variance;
    const float gainPosition = pp / innovationVariance;
    const float gainVelocity = pv / innovationVariance;
    const float innovation = position - estimatedPosition;
    estimatedPosition += gainPosition * innovation;
    estimatedVelocity += gainVelocity * innovation;
    vv -= gainVelocity * pv;
    pv -= gainPosition * pv;
    pp -= gainPosition * pp;
}

float KalmanAxis::velocitySurprise(float velocity, float variance) const {
    const float innovation = velocity - estimatedVelocity;
    return innovation * innovation / (vv + variance);
}

// H = [0 1]: the gain is the second column of P over the innovation variance.
void KalmanAxis::measureVelocity(float velocity, float variance) {
    const float innovation = velocity - estimatedVelocity;
    const float expected = vv + variance;
    if (innovation * innovation > kWidenBeyond * expected) {
        vv += innovation * innovation - expected;
    }
    const float innovationVariance = vv + variance;
    const float gainPosition = pv / innovationVariance;
    const float gainVelocity = vv / innovationVariance;
    estimatedPosition += gainPosition * innovation;
    estimatedVelocity += gainVelocity * innovation;
    pp -= gainPosition * pv;
    pv -= gainVelocity * pv;
    vv -= gainVelocity * vv;
}

}  // namespace Location
