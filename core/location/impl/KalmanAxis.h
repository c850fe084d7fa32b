#pragma once

namespace Location {

// One horizontal axis of a constant-velocity Kalman filter: a position, a
// velocity and their 2x2 covariance, in any consistent units (the location
// filter uses metres and metres per second). The axes of a position
// are filtered apart: keeping the cross-axis terms would cost a general
// matrix for a correlation the receivers do not report. Any thread; no
// shared state.
class KalmanAxis {
public:
    KalmanAxis();

    // Starts from a measured position and, when known, velocity, each as
    // certain as its variance says.
    void start(float position, float positionVariance, float velocity, float velocityVariance);

    // Moves the estimate on by its velocity. The velocity may change by a
    // white acceleration whose spectral density (units squared per second
    // cubed) is given, so the uncertainty grows with the time.
    void predict(float seconds, float accelerationDensity);

    void measurePosition(float position, float variance);
    // A measured velocity more than two standard deviations from the estimate
    // says the velocity changed more than the model allowed: its uncertainty
    // widens until the measurement is explained, so that a car speeding up is
    // followed while a steady one is smoothed hard.
    void measureVelocity(float velocity, float variance);

    // Moves the position estimate: to a new origin, or by a displacement the
    // prediction missed.
    void shift(float displacement) { estimatedPosition += displacement; }

    // How far a measured velocity is from the estimate, in squared standard
    // deviations of the difference.
    float velocitySurprise(float velocity, float variance) const;

    float position() const { return estimatedPosition; }
    float velocity() const { return estimatedVelocity; }

private:
    float estimatedPosition;
    float estimatedVelocity;
    // The covariance: position, position-velocity, velocity.
    float pp;
    float pv;
    float vv;
};

}  // namespace Location
