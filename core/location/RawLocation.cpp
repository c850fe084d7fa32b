#include "location/RawLocation.h"

namespace Location {

namespace {

bool isFinite(float value) {
    return value == value && value - value == 0.0f;
}

// Keeps value when it lies in [0, limit], else marks it missing.
float optionalValue(float value, float limit) {
    return isFinite(value) && value >= 0.0f && value <= limit ? value : -1.0f;
}

}  // namespace

const RawLocation RawLocation::unknown = {0.0f, 0.0f, -1.0f, -1.0f, -1.0f, -1.0f, PrecisionNone, 0, 0};

bool RawLocation::sanitize() {
    // Faster than anything that carries a receiver; a value beyond it is noise.
    const float kMaxSpeed = 1.0e4f;
    speed = optionalValue(speed, kMaxSpeed);
    bearing = optionalValue(bearing, 360.0f);
    if (bearing == 360.0f) {
        bearing = 0.0f;
    }
    if (!isFinite(altitude)) {
        altitude = -1.0f;
    }
    const bool accuracyUsable = isFinite(accuracy) && accuracy >= 0.0f;
    const bool precisionKnown = precision == PrecisionNetwork || precision == PrecisionSatellite;
    return hasUsablePosition() && accuracyUsable && precisionKnown;
}

bool RawLocation::hasUsablePosition() const {
    return isFinite(latitude) && isFinite(longitude) && kdFabsf(latitude) <= 90.0f &&
           kdFabsf(longitude) <= 180.0f;
}

}  // namespace Location
