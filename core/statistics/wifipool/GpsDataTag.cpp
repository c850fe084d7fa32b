#include "statistics/wifipool/GpsDataTag.h"

#include "util/NumberText.h"

namespace Statistics {

void GpsDataTag::appendNodeName(std::string& out) const {
    out += "gps";
}

void GpsDataTag::appendNodeTagText(std::string& out) const {
    out += "lat=\"" + Util::NumberText::fixed(lat, 6) + "\" lon=\"" + Util::NumberText::fixed(lon, 6) + "\"";
    if (hasSpeed) {
        out += " speed=\"" + Util::NumberText::fixed(speed, 6) + "\"";
    }
    if (hasCourse) {
        out += " course=\"" + Util::NumberText::fixed(course, 6) + "\"";
    }
}

void GpsDataTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
