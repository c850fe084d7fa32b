#include "statistics/wifipool/BssidTag.h"

#include <locale>
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
    // No digit grouping or decimal comma from a global locale the application may have set.
    text.imbue(std::locale::classic());
    text << "name=\"" << encodedName << "\" channel=\"" << channel << "\" sigstr=\"" << signalStrength
         << "\" age=\"0\"";
    out += text.str();
}

void BssidTag::appendContentText(std::string& out) const {
    out += escape(bssid);
}

}  // namespace Statistics
