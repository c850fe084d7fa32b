#pragma once

#include "location/LocationFilter.h"

namespace Location {

// Gives every fix a course: the fix's own bearing when it is moving and
// accurate enough, else the direction from an anchor the track has left.
// Within 10 minutes of fast movement the anchor must be left by more than
// the fix's uncertainty, so a car waiting at lights keeps its heading. A fix
// for which no course is known yet goes out with precision 1.
class LocationFilterGenerateCourse : public LocationFilter {
public:
    LocationFilterGenerateCourse();

    Location filter(const Location& location) override;
    void reset() override;

private:
    float courseFromAnchor(const Location& location);

    KDtime lastFastMovementTime;
    KDint32 anchorX;
    KDint32 anchorY;
    float lastCourse;
};

}  // namespace Location
