#include "location/simulator/GpxReader.h"

#include <tinyxml.h>

#include <algorithm>
#include <cstdio>
#include <cstring>

#include "io/BoundedReader.h"
#include "io/FileManager.h"
#include "location/simulator/impl/GpxTime.h"
#include "util/XmlLoader.h"

namespace Simulator {

namespace {

const float kMetresPerHdop = 5.0f;
const float kDefaultAccuracy = 10.0f;

// GPX nests about 8 deep and a point with all its values makes some 16 nodes.
Util::XmlLimits gpxLimits() {
    return Util::XmlLimits{GpxReader::kMaxBytes, 64, 32, GpxReader::kMaxPoints * 16};
}

bool isFinite(float value) {
    return value == value && value - value == 0.0f;
}

// A number that is the whole of text, finite.
bool parseNumber(const char* text, float& value) {
    if (text == nullptr) {
        return false;
    }
    while (*text == ' ' || *text == '\t' || *text == '\n' || *text == '\r') {
        ++text;
    }
    KDchar* end = nullptr;
    value = kdStrtof(text, &end);
    if (end == text) {
        return false;
    }
    while (*end == ' ' || *end == '\t' || *end == '\n' || *end == '\r') {
        ++end;
    }
    return *end == '\0' && isFinite(value);
}

// "gpxtpx:speed" and "speed" both name a speed.
bool hasLocalName(const TiXmlElement* element, const char* name) {
    const char* value = element->Value();
    const char* colon = std::strrchr(value, ':');
    return std::strcmp(colon != nullptr ? colon + 1 : value, name) == 0;
}

const TiXmlElement* findDescendant(const TiXmlElement* parent, const char* name) {
    for (const TiXmlElement* child = parent->FirstChildElement(); child != nullptr;
         child = child->NextSiblingElement()) {
        if (hasLocalName(child, name)) {
            return child;
        }
        const TiXmlElement* found = findDescendant(child, name);
        if (found != nullptr) {
            return found;
        }
    }
    return nullptr;
}

// A child of the point with that local name, else the first such element
// anywhere inside its <extensions>.
const TiXmlElement* findValue(const TiXmlElement* trkpt, const char* name) {
    for (const TiXmlElement* child = trkpt->FirstChildElement(); child != nullptr;
         child = child->NextSiblingElement()) {
        if (hasLocalName(child, name)) {
            return child;
        }
    }
    for (const TiXmlElement* child = trkpt->FirstChildElement(); child != nullptr;
         child = child->NextSiblingElement()) {
        if (hasLocalName(child, "extensions")) {
            const TiXmlElement* found = findDescendant(child, name);
            if (found != nullptr) {
                return found;
            }
        }
    }
    return nullptr;
}

class PointReader {
public:
    PointReader(std::vector<GpxPoint>& points, std::string& error) : points(points), error(error) {}

    bool read(const TiXmlElement* trkpt) {
        GpxPoint point = {0.0f, 0.0f, -1.0f, -1.0f, -1.0f, -1.0f, 2, -1};
        if (!parseNumber(trkpt->Attribute("lat"), point.latitude) ||
            !parseNumber(trkpt->Attribute("lon"), point.longitude) || point.latitude < -90.0f ||
            point.latitude > 90.0f || point.longitude < -180.0f || point.longitude > 180.0f) {
            return fail("latitude or longitude missing or out of range");
        }
        float hdop = -1.0f;
        float precision = -1.0f;
        if (!readOptional(trkpt, "ele", -1.0e6f, 1.0e6f, point.altitude) ||
            !readOptional(trkpt, "speed", 0.0f, 1.0e4f, point.speed) ||
            !readOptional(trkpt, "course", 0.0f, 360.0f, point.course) ||
            !readOptional(trkpt, "accuracy", 0.0f, 1.0e7f, point.accuracy) ||
            !readOptional(trkpt, "hdop", 0.0f, 1.0e4f, hdop) ||
            !readOptional(trkpt, "precision", 1.0f, 2.0f, precision)) {
            return false;
        }
        if (precision == 1.0f || precision == 2.0f) {
            point.precision = static_cast<int>(precision);
        } else if (precision >= 0.0f) {
            return fail("bad <precision>");
        }
        if (point.course == 360.0f) {
            point.course = 0.0f;
        }
        if (point.accuracy < 0.0f) {
            point.accuracy = hdop >= 0.0f ? hdop * kMetresPerHdop : kDefaultAccuracy;
        }
        return readTime(trkpt, point) && add(point);
    }

private:
    bool readOptional(const TiXmlElement* trkpt, const char* name, float low, float high, float& value) {
        const TiXmlElement* element = findValue(trkpt, name);
        if (element == nullptr) {
            return true;
        }
        if (!parseNumber(element->GetText(), value) || value < low || value > high) {
            value = -1.0f;
            return fail(std::string("bad <") + name + ">");
        }
        return true;
    }

    bool readTime(const TiXmlElement* trkpt, GpxPoint& point) {
        const TiXmlElement* time = trkpt->FirstChildElement("time");
        if (time != nullptr) {
            const char* text = time->GetText();
            if (text == nullptr || !GpxTime::parse(text, point.timeMs)) {
                return fail("bad <time>");
            }
        }
        if (!points.empty() && (points.back().timeMs < 0) != (point.timeMs < 0)) {
            return fail("<time> on some points only");
        }
        if (!points.empty() && point.timeMs < points.back().timeMs) {
            return fail("time goes backwards");
        }
        return true;
    }

    bool add(const GpxPoint& point) {
        if (points.size() >= GpxReader::kMaxPoints) {
            return fail("too many points");
        }
        points.push_back(point);
        return true;
    }

    bool fail(const std::string& reason) {
        char where[48];
        std::snprintf(where, sizeof(where), "track point %zu: ", points.size() + 1);
        error = where + reason;
        return false;
    }

    std::vector<GpxPoint>& points;
    std::string& error;
};

bool readPoints(const TiXmlElement* gpx, std::vector<GpxPoint>& points, std::string& error) {
    PointReader reader(points, error);
    for (const TiXmlElement* trk = gpx->FirstChildElement("trk"); trk != nullptr;
         trk = trk->NextSiblingElement("trk")) {
        for (const TiXmlElement* seg = trk->FirstChildElement("trkseg"); seg != nullptr;
             seg = seg->NextSiblingElement("trkseg")) {
            for (const TiXmlElement* pt = seg->FirstChildElement("trkpt"); pt != nullptr;
                 pt = pt->NextSiblingElement("trkpt")) {
                if (!reader.read(pt)) {
                    return false;
                }
            }
        }
    }
    if (points.empty()) {
        error = "no track points";
        return false;
    }
    return true;
}

}  // namespace

bool GpxReader::parse(const std::vector<unsigned char>& bytes, std::vector<GpxPoint>& points,
                      std::string& error) {
    points.clear();
    if (bytes.size() > kMaxBytes) {
        error = "file too large";
        return false;
    }
    if (std::find(bytes.begin(), bytes.end(), '\0') != bytes.end()) {
        error = "not a text file";
        return false;
    }
    TiXmlDocument doc;
    const char* text = reinterpret_cast<const char*>(bytes.data());
    if (!Util::XmlLoader::parse(text, bytes.size(), gpxLimits(), doc, error)) {
        return false;
    }
    const TiXmlElement* gpx = doc.RootElement();
    if (gpx == nullptr || !hasLocalName(gpx, "gpx")) {
        error = "no <gpx> root element";
        return false;
    }
    if (!readPoints(gpx, points, error)) {
        points.clear();
        return false;
    }
    return true;
}

bool GpxReader::readFile(const char* path, std::vector<GpxPoint>& points, std::string& error) {
    points.clear();
    boost::shared_ptr<IO::InputStream> stream = IO::FileManager::doOpenInput(path);
    if (!stream) {
        error = std::string("cannot open ") + path;
        return false;
    }
    std::vector<char> text;
    if (IO::BoundedReader::readAll(*stream, kMaxBytes, text) == IO::BoundedReader::TooLong) {
        error = "file too large";
        return false;
    }
    const std::vector<unsigned char> bytes(text.begin(), text.end());
    return parse(bytes, points, error);
}

}  // namespace Simulator
