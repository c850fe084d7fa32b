#pragma once

#include <deque>

#include "location/LocationFilter.h"

namespace Location {

// Gives fixes without a speed the mean speed over the last 5 fixes (distance
// from the oldest to the newest over the time between them).
class LocationFilterGenerateSpeed : public LocationFilter {
public:
    LocationFilterGenerateSpeed();

    Location filter(const Location& location) override;
    void reset() override;

private:
    std::deque<Location> window;
    float lastSpeed;
};

}  // namespace Location
