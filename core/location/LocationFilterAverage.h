#pragma once

#include "location/LocationFilterComplex.h"

namespace Location {

// The satellite provider's chain: minimum distance, position average, speed
// and course generation, course average. A jump of 83 m or more between
// satellite fixes starts the smoothing afresh, so the chain never averages
// across a teleport (a tunnel exit, a first good fix after a bad one); so does
// a gap of more than kMaxGapSeconds, after which the receiver may be anywhere
// within 83 m of where it was and the old fixes say nothing about it.
//
// A jump that the speed the fix itself reports cannot explain (150 m in a
// second at walking pace) is an outlier until the next fix confirms it: the
// chain drops it, so the marker does not leap there and back. A next fix
// within 83 m of it confirms the jump and starts the smoothing there.
class LocationFilterAverage : public LocationFilterComplex {
public:
    // A few fix intervals of a receiver that reports once a second; the
    // position average stops carrying fixes forward across the same gap.
    static constexpr float kMaxGapSeconds = 5.0f;

    LocationFilterAverage();

    Location filter(const Location& location) override;
    void reset() override;

private:
    bool isJump(const Location& from, const Location& location) const;
    bool isOutlier(const Location& location) const;

    bool hasLast;
    Location last;
    bool hasHeld;
    Location held;
};

}  // namespace Location
