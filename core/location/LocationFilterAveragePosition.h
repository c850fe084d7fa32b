#pragma once

#include <deque>

#include "location/LocationFilter.h"

namespace Location {

// Replaces the position and altitude by their mean over the last 3 fixes,
// the older ones carried forward along the velocities the fixes report. While
// the receiver reports moving, the mean never steps back along its bearing.
// Main thread only, like the chain that owns it.
class LocationFilterAveragePosition : public LocationFilter {
public:
    LocationFilterAveragePosition();

    Location filter(const Location& location) override;
    void reset() override;

private:
    void keepFromGoingBack(const Location& newest, float& latitude, float& longitude) const;

    std::deque<Location> window;
    bool hasShown;
    float shownLatitude;
    float shownLongitude;
};

}  // namespace Location
