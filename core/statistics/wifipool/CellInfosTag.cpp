#include "statistics/wifipool/CellInfosTag.h"

namespace Statistics {

void CellInfosTag::appendNodeName(std::string& out) const {
    out += "cellinfos";
}

void CellInfosTag::appendNodeTagText(std::string& out) const {
    out += "network_type=\"" + escape(networkType) + "\" radio_type=\"" + escape(radioType) + "\"";
}

void CellInfosTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
