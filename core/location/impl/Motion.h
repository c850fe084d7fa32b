#pragma once

#include "location/Location.h"

namespace Location {
namespace Motion {

// How a fix says it moves, for filters that carry positions through time.
// Single precision; any thread.

// Below this pace (5 km/h) receivers stop reporting a bearing, and a fix that
// reports no bearing counts as standing.
extern const float kWalkingPace;

// The velocity a fix reports, in world units per second (x east, y south).
// False when the fix reports no speed, or walking pace or more without a
// bearing: then nothing is known about where it goes.
bool velocityXY(const Location& fix, float& vx, float& vy);

// Seconds between the receive times of two fixes; 0 when the clock did not
// move forward from `older` to `newer`.
float secondsBetween(const Location& older, const Location& newer);

}  // namespace Motion
}  // namespace Location
