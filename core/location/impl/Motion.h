#pragma once

#include "location/Location.h"

namespace Location {
namespace Motion {

// How a fix says it moves, for filters that carry positions through time.
// Single precision; any thread.

// Below this pace (5 km/h) receivers stop reporting a bearing, and a fix that
// reports no bearing counts as standing.
extern const float kWalkingPace;

// The velocity a fix reports, in metres per second east and north. False
// when the fix reports no speed, or walking pace or more without a bearing:
// then nothing is known about where it goes.
bool velocity(const Location& fix, float& east, float& north);
// The same in world units per second (x east, y south).
bool velocityXY(const Location& fix, float& vx, float& vy);

// True when the fix reports moving at walking pace or faster along a bearing.
bool isMoving(const Location& fix);
// True when the fix reports a bearing and a speed above zero: it says which
// way it goes, however slowly.
bool reportsDirection(const Location& fix);

// Degrees of latitude and longitude per metre north and east at a latitude,
// on the WGS 84 ellipsoid; for displacements of up to a few kilometres.
void degreesPerMetre(float latitude, float& latitudeDegrees, float& longitudeDegrees);

// The fix as far as its reported motion can be believed: when the speed it
// reports cannot be reconciled with how far it moved since `previous`, either
// the speed is a glitch or the position is an outlier, and in both cases the
// motion `previous` reported is the better guess: the fix comes back with
// previous's speed and bearing. Fixes without a speed, or received at the same
// time as `previous`, come back unchanged.
Location withBelievableMotion(const Location& previous, const Location& fix);
// Whether the speed the fix reports can explain how far it moved since
// `previous`; true when there is nothing to compare (no speed, no time).
bool motionExplains(const Location& previous, const Location& fix);

// Latitude brought back within +-90: carrying or smoothing a position near a
// pole can take it past the pole.
float clampLatitude(float latitude);

// Degrees from one longitude to another the shorter way round, so that
// positions either side of the date line are next door, not a world apart.
float longitudeDifference(float from, float to);

// Seconds between the receive times of two fixes; 0 when the clock did not
// move forward from `older` to `newer`.
float secondsBetween(const Location& older, const Location& newer);

}  // namespace Motion
}  // namespace Location
