#include "statistics/wifipool/CellInfoTag.h"

#include <locale>
#include <sstream>

namespace Statistics {

void CellInfoTag::appendNodeName(std::string& out) const {
    out += "cellinfo";
}

void CellInfoTag::appendNodeTagText(std::string& out) const {
    std::ostringstream text;
    // No digit grouping or decimal comma from a global locale the application may have set.
    text.imbue(std::locale::classic());
    text << "cellid=\"" << cellId << "\" lac=\"" << lac << "\" operatorid=\"" << escape(operatorId)
         << "\" countrycode=\"" << escape(countryCode) << "\" sigstr=\"" << signalStrength << "\" age=\"0\"";
    out += text.str();
}

void CellInfoTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
