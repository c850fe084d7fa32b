#pragma once

#include <KD/kd.h>

namespace Location {

// How good a position is: none, what network positioning gives, or a
// satellite fix.
enum LocationPrecision : int { PrecisionNone = 0, PrecisionNetwork = 1, PrecisionSatellite = 2 };

// A fix as a provider reports it, in degrees and metres. Optional values are
// -1 when the source does not deliver them. Value type; any thread.
struct RawLocation {
    // Latitude and longitude 0, every optional value -1, precision none.
    static const RawLocation unknown;

    float latitude;
    float longitude;
    float speed;     // metres per second
    float bearing;   // degrees clockwise from north, [0, 360)
    float accuracy;  // metres
    float altitude;  // whatever unit the platform's fix uses
    LocationPrecision precision;
    // A second time stamp of the fix in milliseconds; only the Kalman filter
    // reads it. Simulated fixes carry -1.
    KDint64 fixTime;
    // kdGetTimeUST() when the fix was received.
    KDust time;

    // Maps optional values that cannot be meant (NaN, infinities, negative
    // speeds, bearings outside [0, 360]) to -1 and a bearing of 360 to 0.
    // False when the position itself is unusable: a latitude or longitude that
    // is not finite or lies outside +-90 / +-180, an accuracy that is not a
    // finite non-negative number, or a precision outside the known values.
    bool sanitize();
    // Latitude and longitude finite and within +-90 / +-180.
    bool hasUsablePosition() const;
};

}  // namespace Location
