#pragma once

#include "location/RawLocation.h"

namespace Location {

// A fix together with its form in world coordinates, which the filters work
// on. World values are -1 where the raw value is missing. Value type; any
// thread.
struct Location : RawLocation {
    // RawLocation::unknown at world position (0, 0), world values -1.
    Location();
    // The raw part only; world part (0, 0, -1, -1, -1) until initFromRaw().
    explicit Location(const RawLocation& raw);

    // Fills the world part from the raw part.
    void initFromRaw();
    // Fills the raw part back from a world part a filter changed. The
    // altitude has no world form and becomes -1.
    void updateRaw();

    KDint32 x;
    KDint32 y;
    KDint32 speedXY;  // world units per second
    float bearingXY;
    KDint32 accuracyXY;
};

}  // namespace Location
