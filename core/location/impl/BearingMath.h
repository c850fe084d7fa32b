#pragma once

namespace Location {
namespace BearingMath {

// Bearings are degrees clockwise from north in [0, 360). Single precision,
// through the platform's math; any thread.

// Brings any finite angle in degrees into [0, 360).
float normalizeDegrees(float x);
float degreesToRadians(float grad);
// The bearing of a world-coordinate displacement (Y grows southwards); the
// displacement must not be zero.
float bearingOf(float dx, float dy);
// The bearing of the direction whose sine and cosine are proportional to
// sinSum and cosSum.
float bearingFromSums(float sinSum, float cosSum);

}  // namespace BearingMath
}  // namespace Location
