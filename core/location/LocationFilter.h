#pragma once

#include "location/Location.h"

namespace Location {

// One stage of fix smoothing: takes a record and returns a new one. A result
// with a negative accuracy means "drop this fix"; a result of precision 1
// ends a chain of filters for that fix. Filters keep state between fixes;
// each instance belongs to one thread (the main thread in the providers).
class LocationFilter {
public:
    virtual ~LocationFilter() {}
    virtual Location filter(const Location& location) = 0;
    // Forgets everything learnt from earlier fixes.
    virtual void reset() = 0;
};

}  // namespace Location
