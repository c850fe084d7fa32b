// GPX files a user hands the simulator, as raw bytes, through the track
// reader. Whatever the bytes: a success has points on the globe with finite
// optional values and times that never go backwards; a failure has an error
// message and no points.
#include <pal/Simulation.h>

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "location/simulator/GpxReader.h"

namespace {

void check(bool holds, const char* promise) {
    if (!holds) {
        std::fprintf(stderr, "mapcore fuzz: broken promise: %s\n", promise);
        std::abort();
    }
}

bool optional(float value) {
    return value == -1.0f || (std::isfinite(value) && value >= 0.0f);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const bool quiet = [] {
        pal::setAssertionHandler([](const char*, const char*, int) {});
        pal::setLogSink([](const char*) {});
        return true;
    }();
    (void)quiet;
    const std::vector<unsigned char> bytes(data, data + size);
    std::vector<Simulator::GpxPoint> points;
    std::string error;
    if (!Simulator::GpxReader::parse(bytes, points, error)) {
        check(points.empty(), "a failure has no points");
        check(!error.empty(), "a failure says why");
        return 0;
    }
    check(!points.empty(), "a success has points");
    for (size_t i = 0; i < points.size(); ++i) {
        const Simulator::GpxPoint& p = points[i];
        check(std::fabs(p.latitude) <= 90.0f && std::fabs(p.longitude) <= 180.0f, "points lie on the globe");
        check(std::isfinite(p.altitude), "altitudes are finite");
        check(optional(p.speed) && optional(p.course) && p.course < 360.0f, "speed and course are usable");
        check(std::isfinite(p.accuracy) && p.accuracy >= 0.0f, "every point has an accuracy");
        check(p.precision == 1 || p.precision == 2, "precision is known");
        check(i == 0 || p.timeMs >= points[i - 1].timeMs, "time never goes backwards");
    }
    return 0;
}
