#include "location/simulator/GpxRecorder.h"

#include "io/FileManager.h"
#include "location/simulator/impl/GpxTime.h"
#include "util/NumberText.h"

namespace Simulator {

namespace {

const char kHeader[] =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
    "<gpx version=\"1.1\" creator=\"mapcore\" xmlns=\"http://www.topografix.com/GPX/1/1\""
    " xmlns:mapcore=\"urn:mapcore:gpx:1\">\n"
    "  <trk>\n"
    "    <trkseg>\n";
const char kFooter[] =
    "    </trkseg>\n"
    "  </trk>\n"
    "</gpx>\n";

// Nine significant digits bring every float back exactly.
std::string valueText(float value) {
    return Util::NumberText::significant(value, 9);
}

void appendValue(std::string& out, const char* name, float value) {
    out += std::string("          <mapcore:") + name + ">" + valueText(value) + "</mapcore:" + name + ">\n";
}

void appendPoint(std::string& out, const GpxPoint& point) {
    out += "      <trkpt lat=\"" + valueText(point.latitude) + "\" lon=\"" + valueText(point.longitude) +
           "\">\n";
    if (point.altitude != -1.0f) {
        out += "        <ele>" + valueText(point.altitude) + "</ele>\n";
    }
    out += "        <time>" + GpxTime::format(point.timeMs) + "</time>\n";
    out += "        <extensions>\n";
    if (point.speed >= 0.0f) {
        appendValue(out, "speed", point.speed);
    }
    if (point.course >= 0.0f) {
        appendValue(out, "course", point.course);
    }
    if (point.accuracy >= 0.0f) {
        appendValue(out, "accuracy", point.accuracy);
    }
    out += "          <mapcore:precision>" + std::to_string(point.precision) + "</mapcore:precision>\n";
    out += "        </extensions>\n";
    out += "      </trkpt>\n";
}

}  // namespace

GpxRecorder::GpxRecorder()
    : startWallMs(static_cast<KDint64>(kdTime(nullptr)) * 1000), startUst(kdGetTimeUST()) {}

void GpxRecorder::recordLocation(float latitude, float longitude, float speed, float bearing, float accuracy,
                                 float altitude, int precision) {
    const KDint64 elapsedMs = static_cast<KDint64>((kdGetTimeUST() - startUst) / 1000000);
    const GpxPoint point = {latitude, longitude, altitude,  speed,
                            bearing,  accuracy,  precision, startWallMs + elapsedMs};
    points.push_back(point);
}

std::string GpxRecorder::toGpx() const {
    std::string out = kHeader;
    for (size_t i = 0; i < points.size(); ++i) {
        appendPoint(out, points[i]);
    }
    out += kFooter;
    return out;
}

bool GpxRecorder::save(const char* path) const {
    boost::shared_ptr<IO::OutputStream> stream = IO::FileManager::openOutput(path);
    if (!stream) {
        return false;
    }
    const std::string text = toGpx();
    return stream->write(text.data(), static_cast<int>(text.size())) == static_cast<int>(text.size());
}

}  // namespace Simulator
