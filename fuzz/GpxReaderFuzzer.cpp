// GPX files a user hands the track simulator, as raw bytes, through the
// reader: parsed from memory, and read back from a platform file when the
// first byte is odd. Whatever the bytes: a success has points on the globe
// with usable optional values and times that never go backwards; a failure
// says why and has no points.
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "location/simulator/GpxReader.h"

namespace {

bool optional(float value) {
    return value == -1.0f || (std::isfinite(value) && value >= 0.0f);
}

void checkPoints(bool read, const std::vector<Simulator::GpxPoint>& points, const std::string& error) {
    if (!read) {
        fuzz::check(points.empty(), "a failure has no points");
        fuzz::check(!error.empty(), "a failure says why");
        return;
    }
    fuzz::check(!points.empty(), "a success has points");
    for (size_t i = 0; i < points.size(); ++i) {
        const Simulator::GpxPoint& p = points[i];
        fuzz::check(std::fabs(p.latitude) <= 90.0f && std::fabs(p.longitude) <= 180.0f,
                    "points lie on the globe");
        fuzz::check(std::isfinite(p.altitude), "altitudes are finite");
        fuzz::check(optional(p.speed) && optional(p.course) && p.course < 360.0f,
                    "speed and course are usable");
        fuzz::check(std::isfinite(p.accuracy) && p.accuracy >= 0.0f, "every point has an accuracy");
        fuzz::check(p.precision == 1 || p.precision == 2, "precision is known");
        fuzz::check(i == 0 || p.timeMs >= points[i - 1].timeMs, "time never goes backwards");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    std::vector<Simulator::GpxPoint> points;
    std::string error;
    const std::vector<unsigned char> bytes(data, data + size);
    checkPoints(Simulator::GpxReader::parse(bytes, points, error), points, error);
    if (size > 0 && (data[0] & 1) != 0 && fuzz::writePlatformFile("/data/track.gpx", data, size)) {
        checkPoints(Simulator::GpxReader::readFile("/data/track.gpx", points, error), points, error);
    }
    return 0;
}
