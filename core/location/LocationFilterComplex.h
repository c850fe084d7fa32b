#pragma once

#include <boost/shared_ptr.hpp>
#include <vector>

#include "location/LocationFilter.h"

namespace Location {

// Runs its member filters in order. Fixes without accuracy or precision are
// dropped at once; network fixes (precision 1) pass untouched.
class LocationFilterComplex : public LocationFilter {
public:
    void addFilter(const boost::shared_ptr<LocationFilter>& member);

    Location filter(const Location& location) override;
    void reset() override;

    // The record a filter returns to drop a fix: RawLocation::unknown at world (0, 0).
    static Location droppedFix();

private:
    std::vector<boost::shared_ptr<LocationFilter> > filters;
};

}  // namespace Location
