#pragma once

#include "location/LocationFilter.h"
#include "math/Matrix.h"
#include "math/Vertex.h"

namespace Location {

// A linear Kalman filter over world x, y (relative to the first fix, to keep
// single precision) and altitude. The measurement noise grows with the fix's
// accuracy, the process noise with the last movement; a fix with speed and
// bearing moves the prediction by speed times the fixTime difference
// (milliseconds). Fixes without accuracy or precision are dropped and leave
// the state alone.
class LocationFilterKalman : public LocationFilter {
public:
    LocationFilterKalman();

    Location filter(const Location& location) override;
    void reset() override;

private:
    typedef Vertex<3, float> Vector;

    void start(const Vector& measurement);
    void update(const Location& fix, const Vector& measurement);
    Vector measurementOf(const Location& fix) const;
    Vector controlOf(const Location& fix) const;
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
