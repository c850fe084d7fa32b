#pragma once

#include "location/LocationFilter.h"
#include "math/Matrix.h"
#include "math/Vertex.h"

namespace Location {

// A linear Kalman filter over world x, y (relative to the first fix, to keep
// single precision) and altitude. The measurement noise follows the fix's
// accuracy. The prediction moves by the velocities the fixes report over the
// time between them (fixTime in milliseconds when both fixes carry one, else
// their receive times), and the process noise grows with the change of
// velocity and with the speed. Fixes without accuracy or precision are
// dropped and leave the state alone.
class LocationFilterKalman : public LocationFilter {
public:
    LocationFilterKalman();

    Location filter(const Location& location) override;
    void reset() override;

private:
    typedef Vertex<3, float> Vector;

    // How the estimate moves from the last accepted fix to a new one, and how
    // far off that may be (one standard deviation per axis), in world units.
    struct Step {
        Vector displacement;
        float uncertainty = 0.0f;
    };

    void start(const Location& fix);
    void update(const Location& fix, const Vector& measurement);
    Vector measurementOf(const Location& fix) const;
    Matrix measurementNoise(const Location& fix) const;
    Step stepSinceLast(const Location& fix) const;
    float secondsSinceLast(const Location& fix) const;
    Location adjustLocation(const Location& fix) const;

    KDint32 originX;
    KDint32 originY;
    Location lastAccepted;
    Vector estimate;
    Matrix P;
    Matrix F;
    Matrix H;
    Matrix B;
    Matrix Q;
    Matrix R;
};

}  // namespace Location
