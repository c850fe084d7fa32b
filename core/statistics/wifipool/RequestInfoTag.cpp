#include "statistics/wifipool/RequestInfoTag.h"

#include <locale>
#include <sstream>

namespace Statistics {

void RequestInfoTag::appendNodeName(std::string& out) const {
    out += "r";
}

void RequestInfoTag::appendNodeTagText(std::string& out) const {
    std::ostringstream text;
    // No digit grouping or decimal comma from a global locale the application may have set.
    text.imbue(std::locale::classic());
    text << "type=\"" << escape(info->path) << "\"";
    if (info->precision == Location::PrecisionSatellite) {
        // Two spaces before lon: the form the server has always been sent.
        text << " lat=\"" << info->location.latitude << "\"  lon=\"" << info->location.longitude << "\"";
    }
    out += text.str();
}

void RequestInfoTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
