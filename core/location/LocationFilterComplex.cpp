#include "location/LocationFilterComplex.h"

namespace Location {

namespace {

bool isDropped(const Location& location) {
    return location.accuracy < 0.0f || location.precision == PrecisionNone;
}

}  // namespace

void LocationFilterComplex::addFilter(const boost::shared_ptr<LocationFilter>& member) {
    filters.push_back(member);
}

Location LocationFilterComplex::droppedFix() {
    Location dropped(RawLocation::unknown);
    dropped.initFromRaw();
    return dropped;
}

Location LocationFilterComplex::filter(const Location& location) {
    if (isDropped(location)) {
        return droppedFix();
    }
    if (location.precision == PrecisionNetwork) {
        return location;
    }
    Location result = location;
    for (size_t i = 0; i < filters.size(); ++i) {
        result = filters[i]->filter(result);
        if (isDropped(result)) {
            return droppedFix();
        }
        if (result.precision == PrecisionNetwork) {
            return result;
        }
    }
    return result;
}

void LocationFilterComplex::reset() {
    for (size_t i = 0; i < filters.size(); ++i) {
        filters[i]->reset();
    }
}

}  // namespace Location
