#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "location/Location.h"
#include "statistics/wifipool/ChunkInfo.h"

namespace Statistics {

// One measured HTTP request. Filled by the speed collector on its owner
// thread until handed out with pop(); read-only afterwards.
struct RequestInfo {
    RequestInfo() : id(0), precision(Location::PrecisionNone), uploadSize(0), startTime(0), finished(false) {}

    int id;
    std::string path;
    Location::Location location;
    Location::LocationPrecision precision;
    long long uploadSize;
    // In arrival order.
    std::vector<boost::shared_ptr<ChunkInfo> > chunks;
    // kdGetTimeUST() when the request left.
    KDust startTime;
    bool finished;
};

}  // namespace Statistics
