#include "statistics/wifipool/GpsDataTag.h"

#include <cstdio>

namespace Statistics {

void GpsDataTag::appendNodeName(std::string& out) const {
    out += "gps";
}

void GpsDataTag::appendNodeTagText(std::string& out) const {
    char text[64];
    std::snprintf(text, sizeof(text), "lat=\"%.6f\" lon=\"%.6f\"", lat, lon);
    out += text;
    if (hasSpeed) {
        std::snprintf(text, sizeof(text), " speed=\"%.6f\"", speed);
        out += text;
    }
    if (hasCourse) {
        std::snprintf(text, sizeof(text), " course=\"%.6f\"", course);
        out += text;
    }
}

void GpsDataTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
