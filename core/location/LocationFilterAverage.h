#pragma once

#include "location/LocationFilterComplex.h"

namespace Location {

// The satellite provider's chain: minimum distance, position average, speed
// and course generation, course average. A jump of 83 m or more between
// satellite fixes starts the smoothing afresh, so the chain never averages
// across a teleport (a tunnel exit, a first good fix after a bad one).
class LocationFilterAverage : public LocationFilterComplex {
public:
    LocationFilterAverage();

    Location filter(const Location& location) override;

private:
    KDint32 lastX;
    KDint32 lastY;
};

}  // namespace Location
