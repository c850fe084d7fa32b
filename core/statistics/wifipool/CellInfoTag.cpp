#include "statistics/wifipool/CellInfoTag.h"

#include <sstream>

namespace Statistics {

void CellInfoTag::appendNodeName(std::string& out) const {
    out += "cellinfo";
}

void CellInfoTag::appendNodeTagText(std::string& out) const {
    std::ostringstream text;
    text << "cellid=\"" << cellId << "\" lac=\"" << lac << "\" operatorid=\"" << escape(operatorId)
         << "\" countrycode=\"" << escape(countryCode) << "\" sigstr=\"" << signalStrength << "\" age=\"0\"";
    out += text.str();
}

void CellInfoTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
