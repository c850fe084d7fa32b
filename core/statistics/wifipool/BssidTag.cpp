#include "statistics/wifipool/BssidTag.h"

#include <sstream>

#include "util/Base64Coder.h"

namespace Statistics {

void BssidTag::appendNodeName(std::string& out) const {
    out += "bssid";
}

void BssidTag::appendNodeTagText(std::string& out) const {
    std::string encodedName;
    Util::Base64Coder::encode(name, encodedName);
    std::ostringstream text;
    text << "name=\"" << encodedName << "\" channel=\"" << channel << "\" sigstr=\"" << signalStrength
         << "\" age=\"0\"";
    out += text.str();
}

void BssidTag::appendContentText(std::string& out) const {
    out += escape(bssid);
}

}  // namespace Statistics
