#include "location/Location.h"

#include "math/CoordConversion.h"

namespace Location {

Location::Location() : Location(RawLocation::unknown) {}

Location::Location(const RawLocation& raw)
    : RawLocation(raw), x(0), y(0), speedXY(-1), bearingXY(-1.0f), accuracyXY(-1) {}

void Location::initFromRaw() {
    CoordConversion::toXY(latitude, longitude, x, y);
    speedXY = -1;
    if (speed >= 0.0f) {
        CoordConversion::vMtovXY(latitude, speed, speedXY);
    }
    accuracyXY = -1;
    if (accuracy >= 0.0f) {
        CoordConversion::MtoXY(latitude, accuracy, accuracyXY);
    }
    bearingXY = bearing >= 0.0f ? bearing : -1.0f;
}

void Location::updateRaw() {
    CoordConversion::toLL(x, y, latitude, longitude);
    speed = -1.0f;
    if (speedXY >= 0) {
        CoordConversion::vXYtovM(latitude, speedXY, speed);
    }
    accuracy = -1.0f;
    if (accuracyXY >= 0) {
        CoordConversion::XYtoM(latitude, accuracyXY, accuracy);
    }
    bearing = bearingXY >= 0.0f ? bearingXY : -1.0f;
    altitude = -1.0f;
}

}  // namespace Location
