#pragma once

#include "location/LocationFilter.h"
#include "location/LocationFilterAverage.h"
#include "location/LocationFilterKalman.h"

namespace Location {

// How the satellite provider smooths its fixes: the filter chain
// (LocationFilterAverage) or the Kalman filter (LocationFilterKalman). Both run
// on every fix, so the one selected next has already settled on the track;
// after a switch the output glides from where the old one put it to the new
// one's position over kSwitchFixes fixes, so the marker does not jump. Both
// together cost about fourteen times building the raw record per fix, well
// below a microsecond. Main thread only, like the provider that owns it.
class LocationSmoother : public LocationFilter {
public:
    enum Kind { Chain = 0, Kalman = 1 };

    // Fixes over which a switch glides from the old position to the new one.
    static constexpr int kSwitchFixes = 5;

    LocationSmoother();

    // Takes effect from the next fix. Selecting the current kind does nothing.
    void select(Kind kind);
    Kind getSelected() const { return selected; }

    Location filter(const Location& location) override;
    void reset() override;

private:
    void glide(Location& result);

    LocationFilterAverage chain;
    LocationFilterKalman kalman;
    Kind selected;
    // The last positions each filter and the output gave, for the glide.
    Location lastChain;
    Location lastKalman;
    Location lastShown;
    float glideLatitude;
    float glideLongitude;
    int glideLeft;
};

}  // namespace Location
