#pragma once

#include "location/LocationFilter.h"
#include "location/impl/KalmanAxis.h"

namespace Location {

// A linear Kalman filter with a constant-velocity model, east and north in
// metres apart, and a position-only one over altitude. Each fix measures the
// position, with noise from its accuracy, and the velocity when it reports a
// speed and bearing (or a standing speed), with a receiver's speed and bearing
// noise. Between fixes the estimate moves on by its own velocity (over fixTime
// in milliseconds when both fixes carry one, else their receive times), which
// may change by a white acceleration: estimating the velocity averages out the
// noise of the reported ones, which a prediction straight from them would
// carry into the position.
//
// A reported velocity far from the estimate is held back until the next fix
// confirms it: then it was a turn or a stop, and the interval since is
// predicted again by it; otherwise it was a glitch, and is left out.
//
// The estimate is kept as an offset from the newest fix, so it stays exact in
// single precision wherever the receiver goes, and the output moves the fix's
// own latitude and longitude by it. Fixes without accuracy or precision are
// dropped and leave the state alone; after a gap of more than
// kMaxPredictSeconds the filter starts afresh from the next fix. Main thread
// only, like its owner.
class LocationFilterKalman : public LocationFilter {
public:
    // Beyond this the prediction says nothing the fix does not.
    static constexpr float kMaxPredictSeconds = 30.0f;

    LocationFilterKalman();

    Location filter(const Location& location) override;
    void reset() override;

private:
    void start(const Location& fix);
    void update(const Location& fix);
    void moveOriginTo(const Location& fix);
    void measureVelocity(const Location& fix, float seconds);
    void updateAltitude(const Location& fix);
    bool isFinite() const;
    float secondsSinceLast(const Location& fix) const;
    Location adjustLocation(const Location& fix) const;

    Location lastAccepted;
    // Metres and metres per second from the last accepted fix.
    KalmanAxis east;
    KalmanAxis north;
    // A reported velocity that departed from the estimate, waiting for the
    // next fix to confirm it.
    bool hasHeldVelocity;
    float heldEast;
    float heldNorth;
    // -1 until a fix brings an altitude.
    float altitude;
    float altitudeVariance;
};

}  // namespace Location
