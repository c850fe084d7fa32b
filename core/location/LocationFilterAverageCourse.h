#pragma once

#include <deque>

#include "location/LocationFilter.h"

namespace Location {

// Replaces the course by the circular mean of the last 3 courses, so that
// 350 and 10 degrees average to 0, not 180. Every fix must carry a course.
class LocationFilterAverageCourse : public LocationFilter {
public:
    Location filter(const Location& location) override;
    void reset() override;

private:
    std::deque<Location> window;
};

}  // namespace Location
