#pragma once

#include <deque>

#include "location/LocationFilter.h"

namespace Location {

// Replaces the position and altitude by their mean over the last 3 fixes,
// the older ones carried forward along the velocities the fixes report.
class LocationFilterAveragePosition : public LocationFilter {
public:
    Location filter(const Location& location) override;
    void reset() override;

private:
    std::deque<Location> window;
};

}  // namespace Location
